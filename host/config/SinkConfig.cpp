#include "host/config/SinkConfig.h"

namespace zrm::host {

namespace {

/// The option's value, or an empty one when it is missing.
template <typename Type> Type valueOf(const SinkConfig& config, std::string_view option) {
    const auto found = config.options.find(option);
    return found == config.options.end() ? Type{} : std::get<Type>(found->second);
}

} // namespace

SinkConfig SinkConfig::jsonl(const std::string& path) {
    return {"jsonl", path == "-" ? "standard output" : path, {{"path", path}}};
}

std::string SinkConfig::text(std::string_view option) const {
    return valueOf<std::string>(*this, option);
}

std::int64_t SinkConfig::number(std::string_view option) const {
    return valueOf<std::int64_t>(*this, option);
}

std::chrono::milliseconds SinkConfig::duration(std::string_view option) const {
    return valueOf<std::chrono::milliseconds>(*this, option);
}

SinkConfig::Texts SinkConfig::texts(std::string_view option) const {
    return valueOf<Texts>(*this, option);
}

} // namespace zrm::host
