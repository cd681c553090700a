#ifndef ZRM_FURTHER_LOGS_H
#define ZRM_FURTHER_LOGS_H

#include <functional>
#include <memory>
#include <set>
#include <string>
#include <vector>

namespace zrm {

struct FollowSettings;

/// A log to follow that the log configuration does not name.
struct FurtherLog {
    /// Absolute path, UTF-8. Of a log that is not a file (FollowSettings::source): ASCII without
    /// any '/'.
    std::string name;
    char type = 'S';
    char debugMode = 'N';
    std::string procedure; ///< empty: none
    std::shared_ptr<const FollowSettings> settings;
};

/// The list of logs that the framework configures besides the log configuration: the framework
/// publishes it, and the log manager takes it at each refresh. Any thread.
namespace FurtherLogs {

/// At most one log of each name.
using List = std::vector<FurtherLog>;

/// Exchanges the list. The log manager takes it over when it receives its next signal to refresh;
/// what is published before the log manager exists needs no signal. From the first list on, even an
/// empty one, the agent waits for logs rather than end without any, and does not fall back to the
/// syslog configuration.
void publish(std::shared_ptr<const List> logs);

/// The list published last; null if there was none.
std::shared_ptr<const List> published();

/// The log manager says which logs of the list it does not follow: the log configuration names
/// them, too, or they cannot be followed at all.
void noteLeftOut(std::set<std::string> names);

/// True if the log manager does not follow this log of the list, as it said last.
bool isLeftOut(const std::string& name);

/// Sets what a refresh calls, or nothing. The function runs on the log manager's thread, holds no
/// lock of this list, and must not wait. The one before may still run when this returns.
void setOnRefresh(std::function<void()> called);

/// Calls that function: a refresh has begun.
void noteRefresh();

} // namespace FurtherLogs

} // namespace zrm

#endif
