#include "host/config/ReadyFiles.h"

#include <algorithm>
#include <filesystem>
#include <map>
#include <string_view>
#include <system_error>
#include <utility>

namespace zrm::host {

namespace {

constexpr std::string_view ending = ".toml";

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

} // namespace

ReadyFiles::ReadyFiles(std::vector<std::string> directories)
    : m_directories(std::move(directories)) {}

std::optional<ReadyFiles::Place> ReadyFiles::find(const std::string& name) const {
    for (const std::string& directory : m_directories) {
        Place place{name, directory + '/' + name + std::string(ending)};
        if (exists(place.path)) {
            return place;
        }
    }
    return std::nullopt;
}

bool ReadyFiles::isName(const std::string& name) {
    constexpr std::string_view characters = "abcdefghijklmnopqrstuvwxyz0123456789-_.";
    return !name.empty() && name.size() <= longestName && name.front() != '.' &&
           name.find_first_not_of(characters) == std::string::npos;
}

std::string ReadyFiles::nearTo(const std::string& name) const {
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

std::vector<ReadyFiles::Place> ReadyFiles::list() const {
    std::map<std::string, std::string> found;
    for (const std::string& directory : m_directories) {
        std::error_code error;
        for (std::filesystem::directory_iterator at(directory, error), end;
             !error && at != end && found.size() < mostFiles; at.increment(error)) {
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

} // namespace zrm::host
