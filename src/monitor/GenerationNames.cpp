#include "monitor/GenerationNames.h"

#include <algorithm>
#include <array>
#include <memory>
#include <set>
#include <tuple>

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>

namespace zrm {

namespace {

constexpr std::size_t mostFiles = 10'000;
constexpr int digitsOfDate = 6; ///< from this many digits on, a number is a date
constexpr int mostDigits = 18;  ///< that fit a number
constexpr std::array<std::string_view, 7> compressions = {".gz", ".xz",   ".zst", ".bz2",
                                                          ".Z",  ".lzma", ".lz4"};

std::string_view withoutCompression(std::string_view name) noexcept {
    for (const std::string_view suffix : compressions) {
        if (name.size() > suffix.size() && name.ends_with(suffix)) {
            return name.substr(0, name.size() - suffix.size());
        }
    }
    return name;
}

/// Judges what a generation's name has in addition to the log's: ".1", "-20261119".
std::optional<GenerationName> parseAddition(std::string_view addition) {
    GenerationName result;
    if (addition == ".old") {
        result.scheme = GenerationName::Scheme::plain;
        return result;
    }
    if (addition.size() < 2 ||
        std::string_view("-._").find(addition[0]) == std::string_view::npos) {
        return std::nullopt;
    }
    bool isOneNumber = true;
    for (const char character : addition.substr(1)) {
        if (character >= '0' && character <= '9') {
            if (++result.digits > mostDigits) {
                return std::nullopt;
            }
            result.number = result.number * 10 + static_cast<std::uint64_t>(character - '0');
        } else if (std::string_view("-._:T").find(character) != std::string_view::npos) {
            isOneNumber = false;
        } else {
            return std::nullopt;
        }
    }
    if (result.digits >= digitsOfDate) {
        result.scheme = GenerationName::Scheme::dated;
        return result;
    }
    if (result.digits > 0 && isOneNumber && addition[0] == '.') {
        result.scheme = GenerationName::Scheme::numbered;
        result.digits = 0;
        return result;
    }
    return std::nullopt;
}

bool isSameScheme(const GenerationName& a, const GenerationName& b) noexcept {
    return a.scheme == b.scheme && a.digits == b.digits;
}

bool hasOrder(const GenerationName& name) noexcept {
    return name.scheme == GenerationName::Scheme::numbered ||
           name.scheme == GenerationName::Scheme::dated;
}

/// Grows with youth.
std::int64_t rank(const GenerationName& name) noexcept {
    const auto number = static_cast<std::int64_t>(name.number);
    return name.scheme == GenerationName::Scheme::numbered ? -number : number;
}

} // namespace

bool isCompressedName(std::string_view name) noexcept {
    return withoutCompression(name).size() != name.size();
}

std::optional<GenerationName> GenerationName::parse(std::string_view name, std::string_view log) {
    const std::string_view plain = withoutCompression(name);
    if (name.size() > log.size() && name.starts_with(log)) {
        const std::string_view addition =
            plain.size() > log.size() ? plain.substr(log.size()) : std::string_view();
        return parseAddition(addition).value_or(GenerationName{});
    }
    // "app.log" may become "app-20261119.log" or "app.1.log".
    const std::size_t dot = log.rfind('.');
    if (dot == std::string_view::npos || dot == 0) {
        return std::nullopt;
    }
    const std::string_view stem = log.substr(0, dot);
    const std::string_view extension = log.substr(dot);
    if (plain.size() <= log.size() || !plain.starts_with(stem) || !plain.ends_with(extension)) {
        return std::nullopt;
    }
    return parseAddition(plain.substr(stem.size(), plain.size() - stem.size() - extension.size()));
}

namespace {

/// Adds those of one directory.
void addGenerations(const std::string& directory, std::string_view log,
                    const std::vector<ino_t>& inodes, std::vector<GenerationFile>& files) {
    const std::unique_ptr<DIR, int (*)(DIR*)> entries(opendir(directory.c_str()), closedir);
    if (!entries) {
        return;
    }
    // Only this call uses the stream. NOLINTNEXTLINE(concurrency-mt-unsafe)
    while (const dirent* const entry =
               files.size() < mostFiles ? readdir(entries.get()) : nullptr) {
        if (entry->d_name == log) {
            continue;
        }
        auto name = GenerationName::parse(entry->d_name, log);
        if (!name && std::find(inodes.begin(), inodes.end(), entry->d_ino) != inodes.end()) {
            name = GenerationName{};
        }
        struct stat status;
        if (!name ||
            fstatat(dirfd(entries.get()), entry->d_name, &status, AT_SYMLINK_NOFOLLOW) != 0 ||
            !S_ISREG(status.st_mode)) {
            continue;
        }
        files.push_back({directory + entry->d_name,
                         {status.st_dev, status.st_ino},
                         static_cast<std::int64_t>(status.st_mtim.tv_sec) * 1'000'000'000 +
                             status.st_mtim.tv_nsec,
                         status.st_size,
                         *name,
                         isCompressedName(entry->d_name)});
    }
}

} // namespace

std::string rotationDirectory(const std::string& logPath, const std::string& rotatedTo) {
    if (rotatedTo.empty()) {
        return rotatedTo;
    }
    const bool isAbsolute = rotatedTo.front() == '/';
    return (isAbsolute ? std::string() : logPath.substr(0, logPath.rfind('/') + 1)) + rotatedTo +
           '/';
}

std::vector<GenerationFile> findGenerations(const std::string& logPath,
                                            const std::vector<ino_t>& inodes,
                                            const std::string& rotatedTo) {
    std::vector<GenerationFile> files;
    const std::size_t slash = logPath.rfind('/');
    if (slash == std::string::npos) {
        return files;
    }
    const std::string_view log = std::string_view(logPath).substr(slash + 1);
    addGenerations(logPath.substr(0, slash + 1), log, inodes, files);
    const std::string moved = rotationDirectory(logPath, rotatedTo);
    struct stat mine;
    struct stat other;
    if (!moved.empty() && stat(moved.c_str(), &other) == 0 &&
        stat(logPath.substr(0, slash + 1).c_str(), &mine) == 0 &&
        !(FileIdentity{mine.st_dev, mine.st_ino} == FileIdentity{other.st_dev, other.st_ino})) {
        addGenerations(moved, log, inodes, files);
    }
    return files;
}

std::vector<GenerationFile> youngerThan(const std::vector<GenerationFile>& files,
                                        const GenerationReference& reference) {
    std::vector<GenerationFile> generations;
    std::optional<GenerationFile> self;
    for (const GenerationFile& file : files) {
        if (reference.identity && file.identity == *reference.identity) {
            self = file;
        } else if (file.name.scheme != GenerationName::Scheme::other) {
            generations.push_back(file);
        }
    }
    const bool isByName =
        self && hasOrder(self->name) &&
        std::all_of(generations.begin(), generations.end(), [&](const GenerationFile& file) {
            return isSameScheme(file.name, self->name);
        });
    const auto age = [isByName](const GenerationFile& file) {
        return isByName ? rank(file.name) : file.modified;
    };
    const std::int64_t limit = isByName ? rank(self->name)
                               : self   ? std::max(self->modified, reference.modified)
                                        : reference.modified;
    std::erase_if(generations, [&](const GenerationFile& file) { return age(file) <= limit; });
    // A late writer may have written to an older one last.
    const bool isSortedByName =
        !generations.empty() && hasOrder(generations.front().name) &&
        std::all_of(generations.begin(), generations.end(), [&](const GenerationFile& file) {
            return isSameScheme(file.name, generations.front().name);
        });
    const auto place = [isSortedByName](const GenerationFile& file) {
        return isSortedByName ? rank(file.name) : file.modified;
    };
    std::sort(generations.begin(), generations.end(),
              [&](const GenerationFile& a, const GenerationFile& b) {
                  return std::tuple(place(a), !a.isCompressed, std::string_view(a.path)) <
                         std::tuple(place(b), !b.isCompressed, std::string_view(b.path));
              });
    return generations;
}

std::vector<GenerationFile> newestFirst(std::vector<GenerationFile> files) {
    std::erase_if(files, [](const GenerationFile& file) {
        return file.name.scheme == GenerationName::Scheme::other;
    });
    const bool isByName = std::all_of(files.begin(), files.end(), [&](const GenerationFile& file) {
        return isSameScheme(file.name, files.front().name);
    });
    const auto age = [isByName](const GenerationFile& file) {
        return isByName ? rank(file.name) : file.modified;
    };
    std::sort(files.begin(), files.end(), [&](const GenerationFile& a, const GenerationFile& b) {
        return std::tuple(age(b), a.isCompressed, std::string_view(a.path)) <
               std::tuple(age(a), b.isCompressed, std::string_view(b.path));
    });
    std::set<std::string_view> plain;
    for (const GenerationFile& file : files) {
        if (!file.isCompressed) {
            plain.insert(file.path);
        }
    }
    std::vector<GenerationFile> generations;
    for (const GenerationFile& file : files) {
        if (!file.isCompressed || !plain.contains(withoutCompression(file.path))) {
            generations.push_back(file);
        }
    }
    return generations;
}

} // namespace zrm
