#include "host/sources/NamedSources.h"

#include "host/sources/CommandSource.h"
#include "host/sources/JournalSource.h"

#include <memory>
#include <utility>

namespace zrm::host {

namespace {

std::shared_ptr<const EntrySource> sourceOf(const LogConfig& log) {
    if (log.journal) {
        return std::make_shared<const JournalSource>(*log.journal, log.messages, log.follow.join);
    }
    return std::make_shared<const CommandSource>(*log.command, log.follow.format, log.follow.join);
}

} // namespace

void addNamedSources(const std::vector<LogConfig>& logs, FoundLogs& found) {
    for (std::size_t index = 0; index < logs.size(); ++index) {
        const LogConfig& log = logs[index];
        if (!log.isSource()) {
            continue;
        }
        auto settings = std::make_shared<FollowSettings>(log.follow);
        settings->source.value = sourceOf(log);
        found.logs.push_back(
            {log.name, log.letter, log.debug ? 'Y' : 'N', "", std::move(settings)});
        found.sources[index].paths = {log.name};
        found.sources[index].files = {log.name};
    }
}

} // namespace zrm::host
