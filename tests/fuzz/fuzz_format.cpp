#include "parser/ScanProgram.h"
#include "parser/StringParser.h"

#include <array>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>

using namespace zrm;

// Format specifiers: the first line of the input is one, the second a line of the log. What is
// learned must scan as the C library scans and write nothing outside the buffers.

namespace {

constexpr _KeywordFields keywords[] = {
    {"year", 2},   {"month", 2},  {"day", 2},  {"hour", 2},  {"minute", 2},      {"second", 2},
    {"system", 2}, {"source", 2}, {"type", 2}, {"class", 2}, {"description", 2}, {nullptr, 0},
};
constexpr std::size_t longestFormat = 1023; // that of a configuration line

bool endsWithCount(const std::string& directive) {
    return directive.size() > 2 && directive.compare(directive.size() - 2, 2, "%n") == 0;
}

/// Compares one directive's scanning with the C library's.
void compareWithLibrary(const StringParser& node, const std::string& line) {
    const std::string directive = node.scanDirective();
    if (!endsWithCount(directive) ||
        (node.dataType() == DATATYPE_STRING && !node.isSuppressed() &&
         directive.find(std::to_string(node.maxFieldSize())) == std::string::npos)) {
        return; // no count, or no room for the width: the C library would have no limit
    }
    alignas(16) std::array<char, 1040> ours{};
    alignas(16) std::array<char, 1040> theirs{};
    ScanProgram program;
    program.compile(directive.c_str(), node.maxFieldSize());
    const int consumed = program.run(line.c_str(), ours.data());
    int count = 0;
    const int fields = node.isSuppressed()
                           ? std::sscanf(line.c_str(), directive.c_str(), &count)
                           : std::sscanf(line.c_str(), directive.c_str(), theirs.data(), &count);
    const int expected = fields == EOF ? ScanProgram::endOfInput : count;
    // A long double has bytes that hold nothing.
    const DataTypeInfo* type = findDataType(node.dataType());
    const bool isPadded = type != nullptr && type->receiver == Receiver::LONG_DOUBLE;
    if (consumed != expected ||
        (consumed > 0 && std::memcmp(ours.data(), theirs.data(), isPadded ? 10 : 1040) != 0)) {
        std::fprintf(stderr, "\"%s\" took %d, not %d, of \"%s\"\n", directive.c_str(), consumed,
                     expected, line.c_str());
        std::abort();
    }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string input(reinterpret_cast<const char*>(data), size);
    const std::size_t end = input.find('\n');
    const std::string format = input.substr(0, std::min(end, longestFormat));
    const std::string line = end == std::string::npos ? "" : input.substr(end + 1).c_str();
    StringParser parser(format.c_str(), keywords);
    if (parser.status() != OBJECT_FORMAT_LEARNED) {
        return 0;
    }
    for (const StringParser* node = parser.next(); node != nullptr; node = node->next()) {
        compareWithLibrary(*node, line);
    }
    // Buffers of the heap, exactly as long as their room, so that a byte too many is found.
    std::array<std::unique_ptr<char[]>, 11> texts;
    std::array<_FormatBuffer, 11> buffers{};
    for (std::size_t index = 0; index < buffers.size(); ++index) {
        const std::size_t room = index < 6 ? 7 : index * 8;
        texts[index] = std::make_unique<char[]>(room);
        buffers[index] = {texts[index].get(), static_cast<long>(room)};
    }
    parser.formatLine(line.c_str(), buffers.data());
    return 0;
}
