#ifndef ZRM_HOST_LOG_READER_H
#define ZRM_HOST_LOG_READER_H

#include "host/config/ConfigProblems.h"
#include "host/config/ConfigSection.h"
#include "host/config/HostConfig.h"
#include "host/config/ReadyFormats.h"

#include <map>
#include <string>
#include <vector>

namespace zrm::host {

/// Reads the [[log]] tables of a configuration file.
class LogReader {
public:
    /// `config` is what the rest of the file says: whether there is a history to resume from, and
    /// which files the agent writes itself. Records what is wrong with the tables in `problems`.
    LogReader(const HostConfig& config, ConfigProblems& problems);

    /// The logs of one table; meaningless when a problem was recorded.
    LogConfig read(const toml::table& table);

private:
    void readSource(ConfigSection& section, LogConfig& log);
    void readPaths(ConfigSection& section, LogConfig& log);
    void readExcludes(ConfigSection& section, LogConfig& log);
    void checkOwnFiles(ConfigSection& section, const std::string& path, unsigned line,
                       const LogConfig& log);
    void readType(ConfigSection& section, LogConfig& log);
    void readFormat(ConfigSection& section, LogConfig& log);
    std::string formatName(ConfigSection& section, const LogConfig& log) const;
    static void readEntryFormat(ConfigSection& section, LogConfig& log);
    void readMessages(ConfigSection& section, LogConfig& log);
    void readOutput(ConfigSection& section, LogConfig& log);
    static void useFormat(ConfigSection& section, const FormatDescription& format, LogConfig& log);
    void readNamed(ConfigSection& section, LogConfig& log);
    void checkTextFormat(ConfigSection& section, const LogConfig& log);
    void readFollowing(ConfigSection& section, LogConfig& log);
    void readResumption(ConfigSection& section, LogConfig& log);
    void readTimezone(ConfigSection& section, LogConfig& log);
    void readKeep(ConfigSection& section, LogConfig& log);
    static void readQuiet(ConfigSection& section, LogConfig& log);
    static std::vector<std::string> namesOfFields(ConfigSection& section,
                                                  const std::vector<ConfigSection::Text>& names);

    const HostConfig& m_config;
    ConfigProblems& m_problems;
    const ReadyFormats m_formats;
    std::map<std::string, std::string> m_ownFiles; ///< what each file that the agent writes is
    std::map<std::string, unsigned> m_paths;       ///< line number of each path, glob and name
};

} // namespace zrm::host

#endif
