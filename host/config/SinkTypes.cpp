#include "host/config/SinkTypes.h"

#include <algorithm>
#include <array>

namespace {

using Option = SinkOption;

constexpr std::array<std::string_view, 1> typeNames = {"jsonl"};

constexpr std::array commonOptions = {
    Option{.name = "type",
           .kind = Option::CHOICE,
           .need = Option::REQUIRED,
           .value = "jsonl",
           .meaning = "how events are delivered",
           .choices = typeNames},
    Option{.name = "name",
           .kind = Option::TEXT,
           .need = Option::OPTIONAL,
           .value = "",
           .meaning = "what the sink is called in messages and metrics, and what its place in the "
                      "history is kept under; unique",
           .most = 128},
};

constexpr std::array jsonlOptions = {
    Option{.name = "path",
           .kind = Option::OUTPUT,
           .need = Option::REQUIRED,
           .value = "/var/log/zrm/events.jsonl",
           .meaning = "the file to which events are appended, or \"-\" for standard output"},
};

constexpr std::array<SinkType, typeNames.size()> types = {{
    {"jsonl", "one JSON object per event, one event per line", "path", jsonlOptions},
}};

} // namespace

std::span<const SinkOption> SinkTypes::common() noexcept {
    return commonOptions;
}

std::span<const SinkType> SinkTypes::all() noexcept {
    return types;
}

const SinkType* SinkTypes::find(std::string_view name) noexcept {
    const auto found = std::find_if(types.begin(), types.end(),
                                    [&](const SinkType& type) { return type.name == name; });
    return found == types.end() ? nullptr : &*found;
}
