#include "host/formats/TimePattern.h"
#include "require.h"

#include <cstdint>
#include <string>
#include <string_view>

using namespace zrm;
using namespace zrm::host;

// "PATTERN\nTEXT": a text that is a time by a pattern gives a valid one, and the same when it is
// read again; one that is not leaves the columns alone.

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string_view input(reinterpret_cast<const char*>(data), size);
    const std::size_t end = input.find('\n');
    const auto pattern = TimePattern::compile(std::string(input.substr(0, end)));
    if (!pattern) {
        require(!pattern.error().what.empty() && pattern.error().field == "time_format");
        return 0;
    }
    // On the heap and of the exact size, where a step outside is found.
    const std::string text(end == input.npos ? std::string_view() : input.substr(end + 1));
    TimeMemo memo(*pattern);
    EntryColumns first;
    EntryColumns second;
    const bool isTime = memo.read(text, first);
    require(memo.read(text, second) == isTime && first.hasTime == second.hasTime);
    require(first.time.seconds() == second.time.seconds() && first.offset == second.offset);
    require(isTime || !first.hasTime);
    require(!first.hasTime || (first.time.isValid() && first.time.second < 60));
    return 0;
}
