#include "host/config/ReadyFormats.h"

#include "host/config/ConfigProblems.h"
#include "host/config/ConfigSection.h"
#include "host/config/ConfigText.h"
#include "host/config/FormatReader.h"

#include <algorithm>
#include <filesystem>
#include <string_view>
#include <system_error>
#include <utility>

namespace zrm::host {

namespace {

constexpr const char* usualDirectories[] = {"/etc/zrm/formats", "/usr/share/zrm/formats"};
constexpr std::string_view ending = ".toml";
constexpr std::size_t longestName = 64;
constexpr std::size_t mostSamples = 200;

bool exists(const std::string& path) {
    std::error_code error;
    return std::filesystem::exists(std::filesystem::symlink_status(path, error));
}

/// How many characters must be changed, added or left out to make one name of the other.
std::size_t differenceOf(std::string_view one, std::string_view other) {
    std::vector<std::size_t> row(other.size() + 1);
    for (std::size_t at = 0; at <= other.size(); ++at) {
        row[at] = at;
    }
    for (std::size_t i = 1; i <= one.size(); ++i) {
        std::size_t diagonal = std::exchange(row[0], i);
        for (std::size_t j = 1; j <= other.size(); ++j) {
            const std::size_t changed = diagonal + (one[i - 1] == other[j - 1] ? 0 : 1);
            diagonal = row[j];
            row[j] = std::min({changed, row[j - 1] + 1, row[j] + 1});
        }
    }
    return row.back();
}

bool isNear(std::string_view wanted, std::string_view name) {
    constexpr std::size_t mostWrong = 2;
    constexpr std::size_t leastPart = 3;
    return differenceOf(wanted, name) <= mostWrong ||
           (wanted.size() >= leastPart && name.find(wanted) != std::string_view::npos) ||
           (name.size() >= leastPart && wanted.find(name) != std::string_view::npos);
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
    : m_directories(std::move(directories)) {
    m_directories.insert(m_directories.end(), std::begin(usualDirectories),
                         std::end(usualDirectories));
}

bool ReadyFormats::isName(const std::string& name) {
    constexpr std::string_view characters = "abcdefghijklmnopqrstuvwxyz0123456789-_.";
    return !name.empty() && name.size() <= longestName && name.front() != '.' &&
           name.find_first_not_of(characters) == std::string::npos;
}

std::string ReadyFormats::nearTo(const std::string& name) const {
    constexpr std::size_t mostNames = 5;
    std::string names;
    std::size_t count = 0;
    for (const Place& place : list()) {
        if (count < mostNames && isNear(name, place.name)) {
            names += (count++ == 0 ? "'" : ", '") + place.name + "'";
        }
    }
    return names;
}

Result<ReadyFormat> ReadyFormats::find(const std::string& name) const {
    if (!isName(name)) {
        return refused("'" + name.substr(0, longestName) + "' is not the name of a ready format",
                       "write a name that 'zrmctl formats list' shows, or say with type = "
                       "\"regex\" or \"text\" that this is a format of your own");
    }
    for (const std::string& directory : m_directories) {
        const Place place{name, directory + '/' + name + std::string(ending)};
        if (!exists(place.path)) {
            continue;
        }
        return load(place).map_error([&](std::vector<std::string>&& texts) {
            return Problem{"the format '" + name + "' cannot be used: " + texts.front()};
        });
    }
    const std::string names = nearTo(name);
    return refused("'" + name + "' is not a ready format",
                   names.empty() ? "write a name that 'zrmctl formats list' shows"
                                 : "write a name such as " + names);
}

std::vector<ReadyFormats::Place> ReadyFormats::list() const {
    std::map<std::string, std::string> found;
    for (const std::string& directory : m_directories) {
        std::error_code error;
        for (std::filesystem::directory_iterator at(directory, error), end;
             !error && at != end && found.size() < mostFormats; at.increment(error)) {
            const std::string file = at->path().filename().string();
            const std::string name =
                file.substr(0, file.size() - std::min(file.size(), ending.size()));
            if (file.ends_with(ending) && isName(name)) {
                found.emplace(name, at->path().string());
            }
        }
    }
    std::vector<Place> places;
    for (auto& [name, path] : found) {
        places.push_back({name, path});
    }
    return places;
}

Result<ReadyFormat, std::vector<std::string>> ReadyFormats::load(const Place& place) {
    ConfigProblems problems(place.path);
    ReadyFormat ready;
    ready.name = place.name;
    ready.path = place.path;
    Result<std::string> text = ConfigText::read(place.path, largestFile);
    if (!text) {
        problems.add(0, {text.error().what, "make it a readable file of at most 256 KiB"});
    } else {
        ready.text = std::move(*text);
        if (const std::optional<toml::table> file = ConfigText::parse(ready.text, problems)) {
            read(*file, problems, ready);
        }
    }
    if (!problems.none()) {
        return tl::unexpected(problems.texts());
    }
    return ready;
}

} // namespace zrm::host
