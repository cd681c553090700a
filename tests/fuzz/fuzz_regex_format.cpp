#include "host/formats/PatternProgram.h"
#include "require.h"

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include <re2/re2.h>

using namespace zrm::host;

// "EXPRESSION\nENTRY": the program of an expression takes an entry apart as the library does, or
// says that it does not know.

namespace {

void compare(const re2::RE2& expression, const PatternProgram& program, std::string_view text) {
    std::vector<const char*> places(2 * program.groups());
    const PatternProgram::Outcome outcome = program.match(text, places);
    if (outcome == PatternProgram::Outcome::unknown) {
        return;
    }
    std::vector<re2::StringPiece> groups(program.groups() + 1);
    const bool isMatch =
        expression.Match(re2::StringPiece(text.data(), text.size()), 0, text.size(),
                         re2::RE2::ANCHOR_START, groups.data(), static_cast<int>(groups.size()));
    require(isMatch == (outcome == PatternProgram::Outcome::match));
    for (std::size_t group = 1; isMatch && group < groups.size(); ++group) {
        const char* const begin = groups[group].data();
        require(places[2 * group - 2] == begin);
        require(begin == nullptr || places[2 * group - 1] == begin + groups[group].size());
    }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string_view input(reinterpret_cast<const char*>(data), size);
    const std::size_t end = input.find('\n');
    if (end == input.npos || end > 200) {
        return 0;
    }
    re2::RE2::Options options;
    options.set_encoding(re2::RE2::Options::EncodingLatin1);
    options.set_log_errors(false);
    options.set_max_mem(1 << 20);
    const std::string pattern(input.substr(0, end));
    const re2::RE2 expression(pattern, options);
    const auto program = PatternProgram::compile(pattern);
    if (!expression.ok() || !program) {
        return 0;
    }
    require(static_cast<int>(program->groups()) == expression.NumberOfCapturingGroups());
    // On the heap and of the exact size, where a step outside is found.
    const std::size_t length = input.size() - end - 1;
    const std::unique_ptr<char[]> entry(new char[length]);
    input.copy(entry.get(), length, end + 1);
    compare(expression, *program, {entry.get(), length});
    return 0;
}
