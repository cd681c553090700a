#include "logs/LogManagerUtil.h"
#include "logs/ValidLog.h"
#include "require.h"

#include <cstdint>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include <unistd.h>

using namespace zrm;

// Any text may stand in a log configuration ('U' before it) or a syslog configuration ('D'); '^'
// in it stands for the name of an existing file. The records are those of a plain model of the
// reader, and each line is refused or gives a log that can be monitored.

namespace {

struct Files {
    Files() {
        directory =
            std::filesystem::temp_directory_path() / ("fuzz-config-" + std::to_string(getpid()));
        std::filesystem::create_directory(directory);
        log = directory / "log";
        config = directory / "config";
        std::ofstream(log).close();
    }
    ~Files() { std::filesystem::remove_all(directory); }

    std::filesystem::path directory;
    std::string log;
    std::string config;
};

/// The records of a text: pieces of at most 1023 characters, of which only those count that are no
/// comment, end in a newline and are not the last piece of a longer line.
std::vector<std::string> recordsOf(std::string_view text) {
    std::vector<std::string> records;
    bool tooLong = false;
    while (!text.empty()) {
        const std::string_view window = text.substr(0, 1023);
        const std::size_t newline = window.find('\n');
        const std::size_t size = newline == std::string_view::npos ? window.size() : newline + 1;
        // A piece ends for its reader at its first NUL.
        std::string_view piece = window.substr(0, size);
        piece = piece.substr(0, piece.find('\0'));
        text.remove_prefix(size);
        if (piece.starts_with('#')) {
            continue;
        }
        if (!piece.ends_with('\n')) {
            tooLong = true;
            continue;
        }
        piece.remove_suffix(1);
        const std::size_t start = piece.find_first_not_of(" \t\v\f\r\n");
        if (!tooLong && start != std::string_view::npos) {
            records.emplace_back(piece.substr(start));
        }
        tooLong = false;
    }
    return records;
}

void checkLog(const ValidLog& log, WhenceConfig whence) {
    const std::string_view name = log.fileNameLocal();
    require(name.starts_with('/') && std::filesystem::is_regular_file(name));
    require(log.pathLengthLocal() == name.rfind('/') + 1);
    require(std::string_view("SEAU").find(log.type()) != std::string_view::npos);
    require(log.debugMode() == 'Y' || log.debugMode() == 'N');
    const std::string_view procedure = log.procedure();
    require(procedure.empty() || log.type() == 'U' || log.type() == 'E');
    require(procedure.find("${@}") == std::string_view::npos);
    require(whence == CONFIG_USER || (log.type() == 'S' && log.debugMode() == 'N'));
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const Files files;
    if (size == 0) {
        return 0;
    }
    const WhenceConfig whence = data[0] == 'D' ? CONFIG_DEFAULT : CONFIG_USER;
    std::string text;
    for (std::size_t i = 1; i < size; ++i) {
        const char letter = static_cast<char>(data[i]);
        text += letter == '^' ? files.log : std::string(1, letter);
    }
    std::ofstream(files.config, std::ios::binary) << text;

    std::vector<std::unique_ptr<ValidLog>> logs;
    std::size_t read = 0;
    const std::vector<std::string> expected = recordsOf(text);
    while (char* const record = LogManagerUtil::getNextRec(files.config.c_str())) {
        require(read < expected.size() && expected[read] == record);
        ++read;
        // On the heap and of the exact size, where a step outside is found.
        const std::string_view line = record;
        const std::unique_ptr<char[]> copy(new char[line.size() + 1]());
        line.copy(copy.get(), line.size());
        auto log = std::make_unique<ValidLog>(whence, copy.get(),
                                              logs.empty() ? nullptr : logs.front().get());
        if (log->isValid()) {
            checkLog(*log, whence);
            for (const auto& earlier : logs) {
                require(std::string_view(earlier->fileNameLocal()) != log->fileNameLocal());
            }
            logs.push_back(std::move(log));
        }
    }
    require(read == expected.size());
    return 0;
}
