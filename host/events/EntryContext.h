#ifndef ZRM_HOST_ENTRY_CONTEXT_H
#define ZRM_HOST_ENTRY_CONTEXT_H

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// The texts of a log's last entries, for the events of the newest one. Allocates only in keep.
/// Used by the log's thread.
class EntryContext {
public:
    static constexpr std::size_t mostEntries = 100;
    static constexpr std::size_t longestEntry = 2048;   ///< bytes of each that are kept
    static constexpr std::size_t mostBytes = 64 * 1024; ///< of all that an event gets

    /// From now on keeps this many entries before the newest one; 0: none at all.
    void keep(std::size_t entries);
    bool isKept() const noexcept { return !m_texts.empty(); }

    /// Adds the newest entry. Only if entries are kept.
    void add(std::string_view text);

    /// The entries before the newest one, at most this many, the oldest first.
    std::vector<std::string_view> before(std::size_t entries) const;

private:
    std::size_t count() const noexcept;
    /// The text that was added this many entries before the newest one.
    const std::string& text(std::size_t ago) const noexcept;

    std::vector<std::string> m_texts; ///< a ring
    std::uint64_t m_added = 0;        ///< entries added to it
};

} // namespace zrm::host

#endif
