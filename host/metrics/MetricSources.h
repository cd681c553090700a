#ifndef ZRM_HOST_METRIC_SOURCES_H
#define ZRM_HOST_METRIC_SOURCES_H

#include <atomic>

namespace zrm::host {

class MetricText;

/// A part of the host that provides metrics.
class MetricSource {
public:
    virtual ~MetricSource() = default;

    /// Adds the current metrics, each family once. Any thread, several at a time.
    virtual void collect(MetricText& text) = 0;
};

/// Metrics of the process: version, start, processor time, memory, descriptors. What the system
/// does not report is left out.
class ProcessMetrics : public MetricSource {
public:
    /// The process counts as started when this object is created.
    ProcessMetrics();

    void collect(MetricText& text) override;

private:
    const double m_started; ///< seconds since 1970-01-01 UTC
};

/// The result of the last change of the configuration file. Written by one thread, read by any.
struct ConfigReload {
    std::atomic<bool> isTakenOver{true};     ///< false: the current file cannot be used
    std::atomic<bool> hasRemovedMost{false}; ///< more than half of the situations are gone
};

/// Metrics on whether the agent's situations match its configuration file.
class ConfigMetrics : public MetricSource {
public:
    /// The reload must outlive the object.
    explicit ConfigMetrics(const ConfigReload& reload) : m_reload(reload) {}

    void collect(MetricText& text) override;

private:
    const ConfigReload& m_reload;
};

class LogWatch;

/// Metrics of the monitored logs, from the Monitored Logs table.
class LogMetrics : public MetricSource {
public:
    /// `watch` must outlive the object.
    explicit LogMetrics(const LogWatch& watch) : m_watch(watch) {}

    void collect(MetricText& text) override;

private:
    const LogWatch& m_watch;
};

class SituationSet;

/// Metrics of the situations: their states and counts.
class SituationMetrics : public MetricSource {
public:
    /// `situations` must outlive the object.
    explicit SituationMetrics(const SituationSet& situations) : m_situations(situations) {}

    void collect(MetricText& text) override;

private:
    const SituationSet& m_situations;
};

class Delivery;

/// Metrics of event delivery: the queue, the history, the sinks.
class DeliveryMetrics : public MetricSource {
public:
    /// `delivery` must outlive the object.
    explicit DeliveryMetrics(Delivery& delivery) : m_delivery(delivery) {}

    void collect(MetricText& text) override;

private:
    Delivery& m_delivery;
};

class EventStream;
class HttpServer;

/// Metrics of the server itself: requests, connections, event stream clients.
class HttpMetrics : public MetricSource {
public:
    /// Both must outlive the object.
    HttpMetrics(const HttpServer& server, const EventStream& stream)
        : m_server(server), m_stream(stream) {}

    void collect(MetricText& text) override;

private:
    const HttpServer& m_server;
    const EventStream& m_stream;
};

} // namespace zrm::host

#endif
