#include "framework/LogEntry.h"
#include "host/formats/FormatDescription.h"
#include "monitor/BackwardBlock.h"
#include "monitor/EntryBlock.h"
#include "monitor/Generation.h"
#include "require.h"

#include <algorithm>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <string>
#include <string_view>
#include <vector>

#include <unistd.h>

using namespace zrm;
using namespace zrm::host;

// Whatever a file contains, reading forwards and backwards gives the same entries. The first byte
// says which lines are joined and how many of them.

namespace {

std::shared_ptr<const LineJoin> joinOf(std::uint8_t choice) {
    FormatDescription description;
    EntryLines& lines = description.lines;
    switch (choice % 4) {
    case 0:
        lines.indented = true;
        break;
    case 1:
        lines.starts = "^[a-m]";
        break;
    case 2:
        lines.continues = "x|^$";
        break;
    default:
        description.unwrap = "cri";
    }
    lines.limits.lines = choice / 4 % 8 + 2;
    lines.limits.bytes = choice / 32 * 40 + 10;
    return *makeLineJoin(description);
}

/// The texts that a block gives, each with the line that is judged.
template <class Block> void giveAll(Block& block, std::vector<std::string>& entries) {
    while (const char* const entry = block.next()) {
        entries.push_back(entry + std::string(block.text()));
    }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const std::string path =
        std::filesystem::temp_directory_path() / ("fuzz-joined-" + std::to_string(getpid()));
    if (size == 0) {
        return 0;
    }
    std::ofstream(path).write(reinterpret_cast<const char*>(data) + 1,
                              static_cast<std::streamsize>(size - 1));
    const auto file = Generation::open(path);
    const auto join = joinOf(data[0]);

    EntryBlock forward(0, join.get());
    forward.start(0, {});
    std::vector<std::string> expected;
    do {
        giveAll(forward, expected);
    } while (forward.fill(*file) == EntryBlock::Fill::more);
    while (const char* const entry = forward.rest()) {
        expected.push_back(entry + std::string(forward.text()));
    }
    require(forward.offset() == static_cast<std::int64_t>(size - 1));

    BackwardBlock backward(0, join.get());
    backward.start(static_cast<std::int64_t>(size - 1));
    std::vector<std::string> entries;
    while (backward.fill(*file) == BackwardBlock::Fill::more) {
        giveAll(backward, entries);
    }
    std::reverse(entries.begin(), entries.end());
    require(entries == expected);
    return 0;
}
