#include "host/base/DurationText.h"

#include <array>
#include <charconv>
#include <cstdint>
#include <limits>
#include <system_error>

namespace zrm::host {

std::optional<std::chrono::seconds> DurationText::parse(std::string_view text) {
    struct Unit {
        std::string_view name;
        std::int64_t seconds;
    };
    static constexpr std::array<Unit, 4> units = {{{"s", 1}, {"m", 60}, {"h", 3600}, {"d", 86400}}};
    constexpr std::int64_t longest = std::numeric_limits<std::int32_t>::max();
    std::int64_t number = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    if (error != std::errc() || number < 1) {
        return std::nullopt;
    }
    text.remove_prefix(static_cast<std::size_t>(end - text.data()));
    for (const Unit& unit : units) {
        if (text == unit.name && number <= longest / unit.seconds) {
            return std::chrono::seconds(number * unit.seconds);
        }
    }
    return std::nullopt;
}

} // namespace zrm::host
