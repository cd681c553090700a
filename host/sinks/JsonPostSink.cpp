#include "host/sinks/JsonPostSink.h"

#include "base/TraceScope.h"

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"JsonPostSink.cpp"};

} // namespace

JsonPostSink::JsonPostSink(const SinkConfig& config, std::string_view path)
    : m_name(config.name), m_http(config, path) {}

void JsonPostSink::taken(std::size_t, const std::string&) const {}

std::size_t JsonPostSink::deliver(std::span<const EventRecord> events,
                                  const std::stop_token& giveUp) {
    TraceScope trace(anchor);
    if (!m_http.send(bodyOf(events), {}, giveUp)) {
        return trace.result(std::size_t{0});
    }
    taken(events.size(), m_http.answer());
    return trace.result(events.size());
}

} // namespace zrm::host
