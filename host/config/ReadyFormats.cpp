#include "host/config/ReadyFormats.h"

#include "host/config/ConfigProblems.h"
#include "host/config/ConfigSection.h"
#include "host/config/FormatReader.h"
#include "host/config/ReadyFileReader.h"

#include <algorithm>
#include <string_view>
#include <utility>

namespace zrm::host {

namespace {

constexpr const char* usualDirectories[] = {"/etc/zrm/formats", "/usr/share/zrm/formats"};
constexpr std::size_t mostSamples = 200;

std::vector<std::string> withUsual(std::vector<std::string> directories) {
    directories.insert(directories.end(), std::begin(usualDirectories), std::end(usualDirectories));
    return directories;
}

ReadyFormat::Sample readSample(ConfigSection& section) {
    ReadyFormat::Sample sample;
    const std::optional<std::string> entry = section.text("entry");
    if (!section.has("entry")) {
        section.problem("entry", "is missing", "write the whole entry, without its line end");
    }
    sample.entry = entry.value_or("");
    sample.line = section.line("entry");
    sample.time = section.text("time").value_or("");
    for (const char* const column : {"system", "source", "type", "class", "description"}) {
        sample.columns[column] = section.text(column).value_or("");
    }
    if (std::optional<ConfigSection> fields = section.section("fields")) {
        for (const std::string& name : fields->keys()) {
            sample.fields[name] = fields->text(name).value_or("");
        }
    }
    sample.isRejected = section.truth("rejected").value_or(false);
    section.refuseUnknownKeys();
    return sample;
}

void readSamples(ConfigSection& section, ReadyFormat& ready) {
    const auto tables = section.tables("sample");
    if (tables && tables->size() > mostSamples) {
        section.problem("sample", "has " + std::to_string(tables->size()) + " tables",
                        "write at most " + std::to_string(mostSamples));
        return;
    }
    for (const toml::table* const table : tables.value_or(std::vector<const toml::table*>())) {
        ConfigSection sample = section.inner("sample", *table);
        ready.samples.push_back(readSample(sample));
    }
}

void read(const toml::table& file, ConfigProblems& problems, ReadyFormat& ready) {
    ConfigSection section("", file, problems);
    ready.about = section.text("description").value_or("");
    ready.isGeneric = section.truth("generic").value_or(false);
    const std::string type = section.text("type").value_or("syslog");
    const std::vector<const char*> types = formatTypes();
    if (std::find(types.begin(), types.end(), type) == types.end()) {
        section.problem("type", "'" + type + "' is not a type that formats have",
                        R"(write for example type = "regex")");
        return;
    }
    if (auto format = FormatReader::read(section, type)) {
        ready.format = std::move(*format);
    }
    readSamples(section, ready);
    section.refuseUnknownKeys();
}

} // namespace

ReadyFormats::ReadyFormats(std::vector<std::string> directories)
    : m_files(withUsual(std::move(directories))) {}

std::vector<ReadyFormats::Place> ReadyFormats::list() const {
    return m_files.list();
}

Result<ReadyFormat> ReadyFormats::find(const std::string& name) const {
    if (!ReadyFiles::isName(name)) {
        return refused("'" + name.substr(0, ReadyFiles::longestName) +
                           "' is not the name of a ready format",
                       "write a name that 'zrmctl formats list' shows, or say with type = "
                       "\"regex\" or \"text\" that this is a format of your own");
    }
    if (const auto place = m_files.find(name)) {
        return load(*place).map_error([&](std::vector<std::string>&& texts) {
            return Problem{"the format '" + name + "' cannot be used: " + texts.front()};
        });
    }
    const std::string names = m_files.nearTo(name);
    return refused("'" + name + "' is not a ready format",
                   names.empty() ? "write a name that 'zrmctl formats list' shows"
                                 : "write a name such as " + names);
}

Result<ReadyFormat, std::vector<std::string>> ReadyFormats::load(const Place& place) {
    return readReadyFile<ReadyFormat>(place, read);
}

} // namespace zrm::host
