#include "host/sinks/SinkFactory.h"

#include "host/sinks/AlertmanagerSink.h"
#include "host/sinks/JsonlSink.h"
#include "host/sinks/OtlpSink.h"
#include "host/sinks/SyslogSink.h"
#include "host/sinks/WebhookSink.h"

#include <algorithm>
#include <array>
#include <string_view>

namespace zrm::host {

namespace {

struct Maker {
    std::string_view type;
    std::unique_ptr<Sink> (*make)(const SinkConfig& config);
};

template <typename Type> std::unique_ptr<Sink> made(const SinkConfig& config) {
    return std::make_unique<Type>(config);
}

constexpr std::array makers = {
    Maker{"jsonl", made<JsonlSink>},
    Maker{"webhook", made<WebhookSink>},
    Maker{"alertmanager", made<AlertmanagerSink>},
    Maker{"syslog", made<SyslogSink>},
    Maker{"otlp", made<OtlpSink>},
};

} // namespace

std::unique_ptr<Sink> SinkFactory::make(const SinkConfig& config) {
    const auto maker = std::find_if(makers.begin(), makers.end(),
                                    [&](const Maker& known) { return known.type == config.type; });
    return maker == makers.end() ? nullptr : maker->make(config);
}

} // namespace zrm::host
