#ifndef ZRM_HOST_FACT_LIST_H
#define ZRM_HOST_FACT_LIST_H

#include "host/cli/Terminal.h"

#include <string>
#include <utility>
#include <vector>

namespace zrm::host {

/// Names and what they are, one below the other.
class FactList {
public:
    /// Adds a fact; one whose value is empty is left out.
    void add(std::string name, const std::string& value, Colour colour = Colour::NONE);

    /// The lines; values are whole, whatever the terminal's width.
    std::string text(const Terminal& terminal) const;

private:
    struct Fact {
        std::string name;
        std::string value;
        Colour colour;
    };
    std::vector<Fact> m_facts;
};

} // namespace zrm::host

#endif
