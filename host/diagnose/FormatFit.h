#ifndef ZRM_HOST_FORMAT_FIT_H
#define ZRM_HOST_FORMAT_FIT_H

#include "host/base/Result.h"
#include "host/formats/FormatDescription.h"

#include <cstddef>
#include <string>
#include <vector>

namespace zrm::host {

/// How much of some lines a format reads.
struct FormatFit {
    std::size_t lines = 0;   ///< that were looked at
    std::size_t fitting = 0; ///< those of entries that fit
    std::size_t entries = 0; ///< that fit
    // Of the entries that fit, those that give:
    std::size_t withTime = 0;
    std::size_t withType = 0;   ///< the log's own, not a default
    std::size_t withSource = 0; ///< the same
    std::size_t withDetail = 0; ///< anything but a time and a description
    bool namesProgram = false;  ///< entries without a source get the name of the program

    /// 0 to 1.
    double share() const noexcept;
    /// What makes one format better than another for the same lines: the share, and how much is
    /// known of each entry. 0 to 1.
    double score() const noexcept;
    /// The same, but it does not count that the format names the program where an entry does not.
    double scoreWithoutProgram() const noexcept;

    /// Whether an entry that was read is one of the format. Every line is an entry of a syslog
    /// file, but one in no form that system loggers write is nothing but a description.
    static bool fits(const FormatDescription& format, const EntryColumns& columns) noexcept;
    /// Applies a format to lines in their order, each without its line end. Lines in front of the
    /// first entry are left out if a format of several lines says that they continue one.
    static Result<FormatFit> of(const FormatDescription& format,
                                const std::vector<std::string>& lines);
};

} // namespace zrm::host

#endif
