#include "host/config/ReadyRules.h"

#include "host/config/ConfigProblems.h"
#include "host/config/ConfigSection.h"
#include "host/config/ReadyFileReader.h"
#include "host/config/SituationReader.h"

#include <iterator>
#include <utility>

namespace zrm::host {

namespace {

constexpr const char* usualDirectories[] = {"/etc/zrm/rules", "/usr/share/zrm/rules"};
constexpr std::size_t mostSamples = 200;

std::vector<std::string> withUsual(std::vector<std::string> directories) {
    directories.insert(directories.end(), std::begin(usualDirectories), std::end(usualDirectories));
    return directories;
}

ReadyRule::Sample readSample(ConfigSection& section, const std::string& format) {
    ReadyRule::Sample sample;
    if (!section.has("entry")) {
        section.problem("entry", "is missing", "write the whole entry, without its line end");
    }
    sample.entry = section.text("entry").value_or("");
    sample.line = section.line("entry");
    sample.format = section.text("format").value_or(format);
    sample.isMiss = section.truth("miss").value_or(false);
    section.refuseUnknownKeys();
    return sample;
}

void readSamples(ConfigSection& section, ReadyRule& rule) {
    const auto tables = section.tables("sample");
    if (tables && tables->size() > mostSamples) {
        section.problem("sample", "has " + std::to_string(tables->size()) + " tables",
                        "write at most " + std::to_string(mostSamples));
        return;
    }
    for (const toml::table* const table : tables.value_or(std::vector<const toml::table*>())) {
        ConfigSection sample = section.inner("sample", *table);
        rule.samples.push_back(readSample(sample, rule.format));
    }
}

/// The situation has the name of its rule, and takes the log of whoever uses it.
void readSituation(ConfigSection& section, ConfigProblems& problems, ReadyRule& rule) {
    const toml::table* const table = section.table("situation");
    if (table == nullptr) {
        if (!section.has("situation")) {
            section.problem("situation", "is missing", "write it as [situation]");
        }
        return;
    }
    for (const char* const key : {"name", "log"}) {
        ConfigSection("situation", *table, problems)
            .refuse(key, "belongs to the configuration that uses the rule");
    }
    auto named = std::make_shared<toml::table>(*table);
    named->insert_or_assign("name", rule.name);
    const std::vector<LogConfig> none;
    SituationReader reader(none, problems);
    rule.situation = reader.read(*table, rule.name);
    rule.table = std::move(named);
}

void read(const toml::table& file, ConfigProblems& problems, ReadyRule& rule) {
    ConfigSection section("", file, problems);
    rule.about = section.text("description").value_or("");
    for (const auto& [log, line] :
         section.texts("logs").value_or(std::vector<ConfigSection::Text>())) {
        rule.logs.push_back(log);
    }
    rule.format = section.text("format").value_or("");
    readSituation(section, problems, rule);
    readSamples(section, rule);
    section.refuseUnknownKeys();
}

} // namespace

ReadyRules::ReadyRules(std::vector<std::string> directories)
    : m_files(withUsual(std::move(directories))) {}

Result<ReadyRule> ReadyRules::find(const std::string& name) const {
    if (!ReadyFiles::isName(name)) {
        return refused("'" + name.substr(0, ReadyFiles::longestName) +
                           "' is not the name of a ready situation",
                       "write a name that 'zrmctl rules list' shows");
    }
    if (const auto place = m_files.find(name)) {
        return load(*place).map_error([&](std::vector<std::string>&& texts) {
            return Problem{"the rule '" + name + "' cannot be used: " + texts.front()};
        });
    }
    const std::string names = m_files.nearTo(name);
    return refused("'" + name + "' is not a ready situation",
                   names.empty() ? "write a name that 'zrmctl rules list' shows"
                                 : "write a name such as " + names);
}

Result<ReadyRule, std::vector<std::string>> ReadyRules::load(const Place& place) {
    return readReadyFile<ReadyRule>(place, read);
}

} // namespace zrm::host
