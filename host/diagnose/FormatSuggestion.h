#ifndef ZRM_HOST_FORMAT_SUGGESTION_H
#define ZRM_HOST_FORMAT_SUGGESTION_H

#include "host/diagnose/FormatFit.h"

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

class ReadyFormats;
struct ReadyFormat;

/// Which ready formats fit some lines of a log, or what a format for them could be.
class FormatSuggestion {
public:
    static constexpr std::size_t mostLines = 1000;    ///< further ones are not looked at
    static constexpr std::size_t longestLine = 16384; ///< bytes; the rest is not looked at
    static constexpr std::size_t mostChoices = 3;
    /// A ready format that reads a smaller share is not suggested alone.
    static constexpr double leastShare = 0.6;
    /// By how much the score of a format that is made for the lines must exceed that of the best
    /// ready one: more if that is of one program, which knows its lines better.
    static constexpr double leastGain = 0.05;
    static constexpr double leastGainOverOwn = 0.15;

    struct Choice {
        std::vector<std::string> names; ///< several of type "syslog"; empty: a proposal
        std::string about;
        FormatFit fit;
        std::string table;                 ///< the [[log]] table to write
        bool isGeneric = false;            ///< of many programs
        std::vector<std::string> equals{}; ///< other ready formats that read as much
    };

    /// `log` is the path for the table.
    static FormatSuggestion of(const ReadyFormats& formats, std::vector<std::string> lines,
                               std::string_view log);

    std::size_t lines() const noexcept { return m_lines; }
    /// The best first; those that fit no line are left out. Of several that read as much, the one
    /// whose program the log's path names comes first, then they are in the order of their names.
    const std::vector<Choice>& ready() const noexcept { return m_ready; }
    /// A format made for the lines, if it finds more in them than the best of the ready ones.
    const std::optional<Choice>& proposal() const noexcept { return m_proposal; }
    /// As the JSON object that the API answers.
    std::string json() const;

private:
    class Search;

    /// Of a proposal that is worth to be shown beside the best of the ready formats.
    static double leastScore(const Choice& best, std::string_view log);

    std::size_t m_lines = 0;
    std::vector<Choice> m_ready;
    std::optional<Choice> m_proposal;
};

} // namespace zrm::host

#endif
