#ifndef ZRM_HOST_SINK_FACTORY_H
#define ZRM_HOST_SINK_FACTORY_H

#include "host/config/SinkConfig.h"
#include "host/sinks/Sink.h"

#include <memory>

namespace zrm::host {

/// Makes sinks of every type in SinkTypes. Stateless.
class SinkFactory {
public:
    /// The sink of a configuration that was read without a problem. It touches nothing outside
    /// the process before its first delivery.
    static std::unique_ptr<Sink> make(const SinkConfig& config);
};

} // namespace zrm::host

#endif
