#ifndef ZRM_TEST_LOG_FINDER_H
#define ZRM_TEST_LOG_FINDER_H

#include "host/sources/LogFinder.h"
#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <map>
#include <string>
#include <utility>
#include <vector>

class LogFinderTest : public testing::Test {
protected:
    static zrm::host::LogConfig table(std::vector<std::string> paths,
                                      std::vector<std::string> excludes = {}) {
        zrm::host::LogConfig log;
        log.paths = std::move(paths);
        log.excludes = std::move(excludes);
        log.line = 1;
        return log;
    }
    std::string file(const std::string& name) { return directory.file(name); }
    std::string create(const std::string& name) { return directory.write(name, "x\n"); }
    void rename(const std::string& from, const std::string& to) {
        std::filesystem::rename(file(from), file(to));
    }
    void look() { found = finder.look(logs, ownFiles, now); }
    std::vector<std::string> names() const {
        std::vector<std::string> list;
        for (const zrm::FurtherLog& log : found.logs) {
            list.push_back(log.name);
        }
        return list;
    }
    bool isNewcomer(const std::string& name) const {
        for (const zrm::FurtherLog& log : found.logs) {
            if (log.name == name) {
                return log.settings->isNewcomer;
            }
        }
        ADD_FAILURE() << name << " is not in the list";
        return false;
    }
    /// Why the file is passed over; empty if it is not.
    std::string reason(const std::string& name) const {
        for (const zrm::host::FoundLogs::Source& source : found.sources) {
            for (const zrm::host::FoundLogs::PassedOver& passed : source.passedOver) {
                if (passed.file == name) {
                    return passed.reason;
                }
            }
        }
        return "";
    }

    TemporaryDirectory directory;
    zrm::host::LogFinder finder;
    std::vector<zrm::host::LogConfig> logs;
    std::map<std::string, std::string> ownFiles;
    zrm::host::LogFinder::Clock::time_point now{};
    zrm::host::FoundLogs found;
};

#endif
