#ifndef ZRM_HOST_LOG_LEDGERS_H
#define ZRM_HOST_LOG_LEDGERS_H

#include "host/diagnose/FollowView.h"
#include "monitor/FileIdentity.h"

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace zrm {
struct FollowSettings;
}

namespace zrm::host {

class JsonWriter;

/// Something that needs an operator's attention in a log that is monitored without an error.
struct LogWarning {
    /// missing, replaced, named_twice, failing, lost, without_time, not_records, quiet, dead or
    /// unparsed
    std::string kind;
    std::int64_t since; ///< when it was first seen
    std::string text;   ///< what is wrong and how to fix it, in sentences

    /// Writes `kind`, `since` and `text`, members of an object.
    void write(JsonWriter& json) const;
};

/// How a followed log is doing.
enum class LogHealth : unsigned char {
    ok,
    learning, ///< ok as far as is known: its rhythm is not yet
    quiet,    ///< nothing has come where something was expected
    unparsed, ///< most lines do not match the format any more
    dead,     ///< there is no file that can be read
};

/// A snapshot of what the monitor of one log has read and skipped since monitoring began. A refresh
/// that changes the log's type or procedure starts a new ledger. Times are in milliseconds since
/// 1970-01-01 UTC.
struct LogLedgerView {
    /// A line that did not match; its bytes, without the line end.
    struct Rejected {
        std::int64_t time;
        std::string line;
        std::string reason; ///< where and why it does not match
    };
    /// How often lines of the same shape did not match; see LineShapes.
    struct RejectedShape {
        std::string shape;
        std::int64_t count;
    };
    /// What the monitor missed because of a truncation.
    struct Skipped {
        std::int64_t time;
        std::int64_t from; ///< bytes of the current contents
        std::int64_t to;
        std::optional<std::int64_t> unread; ///< bytes of the old contents; none: unknown
        bool isRegrown; ///< the file was already larger than before when the truncation was seen
    };

    std::string log;                      ///< the full path, in UTF-8
    std::string file;                     ///< the same in the process's code page
    std::optional<FileIdentity> openFile; ///< the file that the monitor currently reads
    char type = 'S';
    std::string procedure;                          ///< a user log's format
    std::shared_ptr<const FollowSettings> settings; ///< null: a log of the log configuration
    std::optional<FollowView> follow;               ///< none: a log of the log configuration
    std::int64_t bytesRead = 0;
    std::int64_t lines = 0;
    std::int64_t rows = 0;
    std::int64_t formatErrors = 0;
    std::int64_t truncations = 0;
    std::int64_t skippedBytes = 0;
    std::int64_t withoutTime = 0; ///< rows
    std::int64_t restarts = 0;    ///< of the monitor
    std::optional<std::int64_t> lastEntry;

    std::vector<LogWarning> warnings; ///< empty unless filled in from LogWatch
    /// None: a log of the log configuration, or nobody has judged it.
    std::optional<LogHealth> health;

    // The latest ones, oldest first. Only for a log that was requested by name.
    std::vector<Rejected> rejected;
    std::vector<RejectedShape> shapes; ///< the most frequent first
    std::vector<Skipped> skipped;
};

/// Reads the ledgers of the monitored logs. Stateless.
class LogLedgers {
public:
    /// The ledgers of all monitored logs in the order of the Monitored Logs table, or only that of
    /// the log with this path, including its rejected lines and skipped ranges; empty when it is
    /// not monitored. May wait for a refresh to end. Any thread, while the agent runs.
    static std::vector<LogLedgerView> read(std::string_view log = {});

    /// Writes a ledger as an object; `withSamples` adds "rejected" and "skipped".
    static void write(JsonWriter& json, const LogLedgerView& ledger, bool withSamples);
};

} // namespace zrm::host

#endif
