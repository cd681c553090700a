#ifndef ZRM_HOST_SINK_FACTORY_H
#define ZRM_HOST_SINK_FACTORY_H

#include "host/config/SinkConfig.h"
#include "host/sinks/Sink.h"

#include <memory>

namespace zrm::host {

/// Creates sinks of all types in SinkTypes. Stateless.
class SinkFactory {
public:
    /// The sink for a valid configuration. It has no effect outside the process before its first
    /// delivery.
    static std::unique_ptr<Sink> make(const SinkConfig& config);
};

} // namespace zrm::host

#endif
