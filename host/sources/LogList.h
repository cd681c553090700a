#ifndef ZRM_HOST_LOG_LIST_H
#define ZRM_HOST_LOG_LIST_H

#include "host/sources/LogFinder.h"

#include <chrono>
#include <functional>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <vector>

namespace zrm::host {

/// Keeps the agent's list of further logs (FurtherLogs) equal to what the [[log]] tables name and
/// match. The looks at the file system run on a thread of their own: one that a file system blocks
/// forever is abandoned at the end.
class LogList {
public:
    static constexpr std::chrono::seconds defaultInterval{5};

    /// Looked at besides the files of the configuration, for example by way of a descriptor.
    using OwnFiles = std::map<std::string, std::string>;

    /// `changed` is called on the list's thread after a changed list was published.
    explicit LogList(std::function<void()> changed,
                     std::chrono::seconds interval = defaultInterval);
    /// Does not wait for the thread.
    ~LogList();
    LogList(const LogList&) = delete;
    LogList& operator=(const LogList&) = delete;

    /// Takes the tables of the configuration and looks at once, on the calling thread; for the
    /// start, before the log manager exists. Publishes nothing if there are no tables.
    /// `monitored`: the logs that the history knows (EarlierRun).
    void begin(const std::vector<LogConfig>& logs, OwnFiles ownFiles,
               std::set<std::string> monitored = {});
    /// Starts the thread, which looks at every interval, and at once when the log manager
    /// refreshes. Returns false if no thread can be started.
    bool start();
    /// Takes the tables of a changed configuration. The thread looks soon.
    void apply(const std::vector<LogConfig>& logs, OwnFiles ownFiles);

    /// What this process's list found when it last looked. Never null. Any thread.
    static std::shared_ptr<const FoundLogs> found();

private:
    struct Shared;
    static void run(const std::shared_ptr<Shared>& shared);

    std::shared_ptr<Shared> m_shared;
};

} // namespace zrm::host

#endif
