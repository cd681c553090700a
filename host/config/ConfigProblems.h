#ifndef ZRM_HOST_CONFIG_PROBLEMS_H
#define ZRM_HOST_CONFIG_PROBLEMS_H

#include "host/base/Result.h"

#include <string>
#include <utility>
#include <vector>

namespace zrm::host {

/// All problems of a host configuration file, so that one look at the messages is enough to fix the
/// file.
class ConfigProblems {
public:
    explicit ConfigProblems(std::string file);

    /// Adds a problem, whose field is a key. Line 0: the file as a whole.
    void add(unsigned line, const Problem& problem);

    /// The line that stands for line 0 while the object exists: where the file asks for what is
    /// read from somewhere else.
    class Place {
    public:
        Place(ConfigProblems& problems, unsigned line)
            : m_problems(problems), m_before(std::exchange(problems.m_line, line)) {}
        Place(const Place&) = delete;
        Place& operator=(const Place&) = delete;
        ~Place() { m_problems.m_line = m_before; }

    private:
        ConfigProblems& m_problems;
        const unsigned m_before;
    };
    /// The line that a problem would have.
    unsigned lineOr(unsigned line) const noexcept { return line > 0 ? line : m_line; }

    bool none() const noexcept { return m_problems.empty(); }
    std::size_t count() const noexcept { return m_problems.size() + m_more; }
    /// "FILE:LINE: KEY: WHAT; CURE" for each of the first problems added, in the order of the
    /// lines, and how many more there are.
    std::vector<std::string> texts() const;

private:
    struct Entry {
        unsigned line;
        std::string text;
    };

    static constexpr std::size_t mostTexts = 100;

    const std::string m_file;
    std::vector<Entry> m_problems;
    std::size_t m_more = 0; ///< that are only counted
    unsigned m_line = 0;    ///< in place of none
};

} // namespace zrm::host

#endif
