#include "host/config/SinkReader.h"

#include "host/config/HttpUrl.h"
#include "host/config/SinkOptionReader.h"

#include <utility>

namespace zrm::host {

namespace {

/// The default name of a sink. From a URL it takes only host and port, since the rest is often
/// secret.
std::string defaultName(const SinkType& type, const std::string& target) {
    if (const std::optional<HttpUrl> url = HttpUrl::parse(target)) {
        return std::string(type.name) + ' ' + url->authority();
    }
    if (type.name == "jsonl") {
        return SinkConfig::jsonl(target).name;
    }
    return std::string(type.name) + ' ' + target;
}

} // namespace

SinkReader::SinkReader(ConfigProblems& problems) : m_problems(problems) {}

SinkConfig SinkReader::read(const toml::table& table) {
    SinkConfig sink;
    ConfigSection section("sink", table, m_problems);
    for (const SinkOption& option : SinkTypes::common()) {
        readOption(section, option, sink);
    }
    sink.type = sink.text("type");
    sink.name = sink.text("name");
    sink.options.clear();
    // The allowed keys depend on the type; without one nothing more can be checked.
    if (const SinkType* const type = SinkTypes::find(sink.type)) {
        for (const SinkOption& option : type->options) {
            readOption(section, option, sink);
        }
        if (sink.name.empty() && !section.has("name")) {
            sink.name = defaultName(*type, sink.text(type->target));
        }
        checkUnique(section, *type, sink);
        section.refuseUnknownKeys();
    }
    return sink;
}

void SinkReader::readOption(ConfigSection& section, const SinkOption& option, SinkConfig& sink) {
    const std::string name(option.name);
    if (std::optional<SinkConfig::Value> value =
            SinkOptionReader(section, m_problems).read(option)) {
        sink.options.insert_or_assign(name, std::move(*value));
    }
    if (option.need == SinkOption::REQUIRED && !section.has(name)) {
        section.problem(name, "is missing",
                        "write " + name + " = \"" + std::string(option.value) + '"');
    }
    if (!option.instead.empty() && section.has(name) && section.has(option.instead)) {
        section.problem(name, "cannot be combined with " + std::string(option.instead),
                        "leave one of them out");
    }
}

void SinkReader::checkUnique(ConfigSection& section, const SinkType& type, const SinkConfig& sink) {
    const std::string target = sink.text(type.target);
    const auto [sameTarget, isNewTarget] =
        m_targets.emplace(sink.type + ' ' + target, section.line(type.target));
    const auto [sameName, isNewName] = m_names.emplace(sink.name, section.line("name"));
    if (!isNewTarget && !target.empty()) {
        section.problem(type.target,
                        "the sink at line " + std::to_string(sameTarget->second) + " has '" +
                            target + "' already",
                        "give each sink a " + std::string(type.target) + " of its own");
    } else if (!isNewName && !sink.name.empty()) {
        section.problem("name",
                        "the sink at line " + std::to_string(sameName->second) + " is called '" +
                            sink.name + "' too",
                        "give each sink a name of its own");
    }
}

} // namespace zrm::host
