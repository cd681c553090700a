#ifndef ZRM_HOST_FACT_LIST_H
#define ZRM_HOST_FACT_LIST_H

#include "host/cli/Terminal.h"

#include <string>
#include <utility>
#include <vector>

namespace zrm::host {

/// A list of names and values, one per line.
class FactList {
public:
    /// Adds a fact; a fact with an empty value is left out.
    void add(std::string name, const std::string& value, Colour colour = Colour::NONE);

    /// The lines; values are never shortened to the terminal's width.
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
