#ifndef ZRM_HOST_PROGRESS_LINE_H
#define ZRM_HOST_PROGRESS_LINE_H

#include <cstddef>
#include <cstdint>
#include <string>

namespace zrm::host {

/// A line on standard error that says how far the reading of a log has come, and is gone
/// afterwards. Without a terminal, nothing is written. One thread.
class ProgressLine {
public:
    ProgressLine();
    /// Removes the line.
    ~ProgressLine() { clear(); }
    ProgressLine(const ProgressLine&) = delete;
    ProgressLine& operator=(const ProgressLine&) = delete;

    /// Bytes read of bytes in all, and the entries found so far.
    void show(std::uint64_t read, std::uint64_t total, std::size_t entries);
    /// Removes the line, before anything else is written.
    void clear();

private:
    void write(const std::string& text);

    const bool m_isTerminal;
    std::size_t m_width = 0; ///< characters that are shown
};

} // namespace zrm::host

#endif
