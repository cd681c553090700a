#include "FollowedWorld.h"

#include <algorithm>
#include <cstdio>
#include <filesystem>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace fs = std::filesystem;

namespace {

constexpr int mostGenerations = 6;

} // namespace

FollowedWorld::FollowedWorld(Style style, unsigned mostLines, std::mt19937& random)
    : m_style(style), m_mostLines(mostLines), m_random(random),
      m_path(m_directory.file("app.log")) {
    create();
    reopen();
}

FollowedWorld::~FollowedWorld() {
    close(m_descriptor);
    endLateWriter();
}

std::string FollowedWorld::random(std::size_t most) {
    return std::string(m_random() % most, static_cast<char>('a' + m_random() % 26));
}

/// What may follow the first line of an entry.
std::string FollowedWorld::furtherLines() {
    std::string lines;
    for (auto line = m_mostLines > 1 ? m_random() % m_mostLines : 0; line > 0; --line) {
        lines += "\n " + random(30);
    }
    return lines;
}

void FollowedWorld::touch(const std::string& path) {
    ++m_tick;
    const timespec time{1'700'000'000 + m_tick / 1000, m_tick % 1000 * 1'000'000};
    const timespec times[] = {time, time};
    utimensat(AT_FDCWD, path.c_str(), times, 0);
}

/// Makes an empty file that has the log's name.
void FollowedWorld::create() {
    if (m_style == Style::SYMLINK) {
        m_target = m_directory.file("t" + std::to_string(++m_names) + ".txt");
        m_directory.write(fs::path(m_target).filename().string(), "");
        fs::create_symlink(m_target, m_path + ".link");
        fs::rename(m_path + ".link", m_path);
    } else {
        m_target = m_path;
        m_directory.write("app.log", "");
    }
    m_files[m_target] = std::make_shared<File>();
    touch(m_target);
}

/// The program that writes opens the log anew.
void FollowedWorld::reopen() {
    if (m_files.count(m_target) == 0) {
        create();
    }
    leaveLateWriter();
    m_descriptor = open(m_target.c_str(), O_WRONLY | O_APPEND | O_CLOEXEC);
    m_written = m_files[m_target];
    m_isReopenDue = false;
}

void FollowedWorld::append(int descriptor, const std::string& text) {
    if (::write(descriptor, text.data(), text.size()) < 0) {
        std::perror("write");
    }
    ++m_tick;
    const timespec time{1'700'000'000 + m_tick / 1000, m_tick % 1000 * 1'000'000};
    const timespec times[] = {time, time};
    futimens(descriptor, times);
}

void FollowedWorld::write(int lines) {
    std::string text;
    for (; lines > 0; --lines) {
        if (m_written->isOpenEnded) {
            const std::string end = random(20) + furtherLines();
            m_entries[static_cast<std::size_t>(m_written->entries.back())].text += end;
            m_written->isOpenEnded = false;
            text += end + "\n";
        } else {
            const auto number = m_entries.size();
            m_entries.push_back({std::to_string(number) + ":" + random(80) + furtherLines()});
            m_written->entries.push_back(static_cast<int>(number));
            text += m_entries.back().text + "\n";
        }
    }
    append(text);
}

void FollowedWorld::writeLongLine() {
    if (m_written->isOpenEnded) {
        write(1);
    }
    const auto number = m_entries.size();
    std::string text = std::to_string(number) + ":" + std::string(2000 + m_random() % 300'000, 'L');
    append(text.substr(0, 1500));
    append(text.substr(1500) + "\n");
    m_entries.push_back({text});
    m_written->entries.push_back(static_cast<int>(number));
}

void FollowedWorld::writeHalf() {
    if (!m_written->isOpenEnded) {
        const auto number = m_entries.size();
        m_entries.push_back(
            {std::to_string(number) + ":" + random(20) + furtherLines(), false, true});
        m_written->entries.push_back(static_cast<int>(number));
        m_written->isOpenEnded = true;
        append(m_entries.back().text);
    }
}

/// Moves the numbered generations up and drops the oldest.
void FollowedWorld::shift() {
    if (m_style != Style::NUMBERED) {
        return;
    }
    for (int number = mostGenerations; number >= 1; --number) {
        for (const char* const suffix : {"", ".gz"}) {
            const std::string from = m_path + "." + std::to_string(number) + suffix;
            const auto found = m_files.find(from);
            if (found == m_files.end()) {
                continue;
            }
            if (number == mostGenerations) {
                if (found->second == m_written) {
                    reopen();
                }
                if (found->second == m_lateFile) {
                    endLateWriter();
                }
                fs::remove(from);
            } else {
                const std::string to = m_path + "." + std::to_string(number + 1) + suffix;
                fs::rename(from, to);
                m_files[to] = found->second;
            }
            m_files.erase(from);
        }
    }
}

std::string FollowedWorld::rotatedName() {
    return m_style == Style::NUMBERED ? m_path + ".1"
                                      : m_path + "-" + std::to_string(20260000 + ++m_names);
}

void FollowedWorld::rotateByName(bool creates) {
    if (m_files.count(m_target) == 0) {
        return;
    }
    endLateWriter();
    ++m_rotations;
    m_rotatedLast = m_files[m_target];
    if (m_style == Style::SYMLINK) {
        create();
    } else {
        shift();
        const std::string to = rotatedName();
        fs::rename(m_path, to);
        m_files[to] = m_files[m_path];
        m_files.erase(m_path);
        if (creates) {
            create();
        }
    }
    m_isReopenDue = true;
    findMissing();
}

void FollowedWorld::copyAndTruncate(bool losesLines) {
    if (m_style == Style::SYMLINK || m_files.count(m_path) == 0) {
        return;
    }
    endLateWriter();
    m_rotatedLast.reset();
    shift();
    const std::string to = rotatedName();
    fs::copy_file(m_path, to);
    touch(to);
    const std::shared_ptr<File> file = m_files[m_path];
    m_files[to] = std::make_shared<File>(*file);
    if (losesLines && m_written == file && !file->isOpenEnded) {
        write(2);
    }
    fs::resize_file(m_path, 0);
    touch(m_path);
    *file = File{};
    findMissing();
}

void FollowedWorld::truncate() {
    if (m_files.count(m_target) != 0) {
        fs::resize_file(m_target, 0);
        touch(m_target);
        *m_files[m_target] = File{};
        findMissing();
    }
}

/// The fake compression: a head before the contents.
void FollowedWorld::compress() {
    std::vector<std::string> plain;
    for (const auto& [path, file] : m_files) {
        if (path != m_target && file != m_written && !path.ends_with(".gz")) {
            plain.push_back(path);
        }
    }
    if (plain.empty() || m_style == Style::SYMLINK) {
        return;
    }
    const std::string& from = plain[m_random() % plain.size()];
    if (m_files[from] == m_lateFile) {
        endLateWriter();
    }
    struct stat status;
    stat(from.c_str(), &status);
    const std::string name = fs::path(from).filename().string();
    m_directory.write(name + ".gz", "GZ");
    std::FILE* const in = std::fopen(from.c_str(), "r");
    std::FILE* const out = std::fopen((from + ".gz").c_str(), "a");
    char block[4096];
    while (const std::size_t count = std::fread(block, 1, sizeof block, in)) {
        std::fwrite(block, 1, count, out);
    }
    std::fclose(in);
    std::fclose(out);
    const timespec times[] = {status.st_mtim, status.st_mtim};
    utimensat(AT_FDCWD, (from + ".gz").c_str(), times, 0);
    m_files[from + ".gz"] = std::make_shared<File>(*m_files[from]);
    fs::remove(from);
    m_files.erase(from);
    findMissing();
}

void FollowedWorld::removeGeneration() {
    std::vector<std::string> others;
    for (const auto& [path, file] : m_files) {
        if (path != m_target && file != m_written) {
            others.push_back(path);
        }
    }
    if (!others.empty()) {
        const std::string& path = others[m_random() % others.size()];
        if (m_files[path] == m_lateFile) {
            endLateWriter();
        }
        fs::remove(path);
        m_files.erase(path);
        findMissing();
    }
}

void FollowedWorld::removeAndCreate() {
    if (m_style != Style::SYMLINK && m_files.count(m_path) != 0 && !hasContradictingTime()) {
        endLateWriter();
        fs::remove(m_path);
        m_files.erase(m_path);
        reopen();
        findMissing();
    }
}

/// Replaces the log by a copy of it, as editors do.
void FollowedWorld::replace() {
    if (m_style == Style::SYMLINK || m_files.count(m_path) == 0 || m_files[m_path] != m_written ||
        m_written->isOpenEnded) {
        return;
    }
    const std::string copy = m_directory.file("4913");
    fs::copy_file(m_path, copy);
    fs::rename(copy, m_path);
    touch(m_path);
    m_files[m_path] = std::make_shared<File>(*m_written);
    reopen();
}

bool FollowedWorld::has(const File& file, int entry) const {
    return std::find(file.entries.begin(), file.entries.end(), entry) != file.entries.end();
}

/// Marks the entries that are in no file that can be found.
void FollowedWorld::findMissing() {
    std::set<int> there;
    for (const auto& [path, file] : m_files) {
        if (m_style != Style::SYMLINK || path == m_target || m_held.count(file) != 0 ||
            (!m_isFollowed && has(*file, m_last))) {
            there.insert(file->entries.begin(), file->entries.end());
        }
    }
    for (const auto& file : m_held) {
        there.insert(file->entries.begin(), file->entries.end());
    }
    for (std::size_t i = static_cast<std::size_t>(m_delivered + 1); i < m_entries.size(); ++i) {
        m_entries[i].mayMiss = m_entries[i].mayMiss || there.count(static_cast<int>(i)) == 0;
    }
    findMissingLate();
}

void FollowedWorld::print() const {
    for (const auto& [path, file] : m_files) {
        struct stat status {};
        stat(path.c_str(), &status);
        std::fprintf(stderr, "%s inode %lu time %ld.%09ld:", fs::path(path).filename().c_str(),
                     static_cast<unsigned long>(status.st_ino),
                     static_cast<long>(status.st_mtim.tv_sec), status.st_mtim.tv_nsec);
        for (const int entry : file->entries) {
            std::fprintf(stderr, " %d", entry);
        }
        for (const int entry : file->lateEntries) {
            std::fprintf(stderr, " L%d", entry);
        }
        std::fputc('\n', stderr);
    }
}
