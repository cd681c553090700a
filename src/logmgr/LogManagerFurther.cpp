// The part of LogManager for logs that the framework configures besides the log configuration.

#include "base/TraceScope.h"
#include "logmgr/LogManager.h"
#include "monitor/LogFile.h"

#include <map>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace zrm {

namespace {

TRC1_Anchor anchor{"LogManagerFurther.cpp"};

} // namespace

bool LogManager::takeFurtherLogs() {
    TraceScope trace(anchor);
    std::shared_ptr<const FurtherLogs::List> published = FurtherLogs::published();
    const bool isNew = published != FurtherLogsTaken;
    FurtherLogsTaken = std::move(published);
    return trace.result(isNew);
}

std::uint32_t LogManager::buildFurtherLogs() {
    TraceScope trace(anchor);
    if (!FurtherLogsTaken) {
        return trace.result(std::uint32_t{0});
    }
    // A name may have two objects: one that this refresh retires, and the one that it builds.
    std::map<std::string_view, LogFile*> followed;
    std::map<std::string_view, LogFile*> configured;
    LogFile* object = FirstLogObject;
    for (std::uint32_t i = 0; i < NumLogs; ++i) {
        if (object->followSettings() != nullptr) {
            followed.emplace(object->fileNameLocal(), object);
        } else if (!object->isMarked()) {
            configured.emplace(object->fileNameLocal(), object);
        }
        object = object->next();
    }
    struct Build {
        std::unique_ptr<ValidLog> log;
        LogFile* present;
    };
    std::vector<Build> builds;
    std::set<std::string> leftOut;
    for (const FurtherLog& further : *FurtherLogsTaken) {
        auto log = std::make_unique<ValidLog>(further);
        if (!log->isValid()) {
            leftOut.insert(further.name);
            continue;
        }
        if (configured.contains(log->fileNameLocal())) {
            trace.detail()("The log configuration names %s, too; its line applies.",
                           log->fileNameLocal());
            leftOut.insert(further.name);
            continue;
        }
        const auto present = followed.find(log->fileNameLocal());
        builds.push_back({std::move(log), present == followed.end() ? nullptr : present->second});
        if (const Build& last = builds.back();
            last.present != nullptr && !canMonitor(*last.present, *last.log)) {
            // Ask all of them before waiting for the first: together they take as long as one.
            last.present->askToStop();
        }
    }
    FurtherLogs::noteLeftOut(std::move(leftOut));
    for (const Build& build : builds) {
        buildLogObject(*build.log, build.present);
    }
    return trace.result(static_cast<std::uint32_t>(builds.size()));
}

} // namespace zrm
