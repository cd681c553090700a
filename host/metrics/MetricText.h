#ifndef ZRM_HOST_METRIC_TEXT_H
#define ZRM_HOST_METRIC_TEXT_H

#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <utility>
#include <vector>

namespace zrm::host {

/// Metrics while they are gathered for one scrape. One thread.
class MetricText {
public:
    /// Names and values; values are UTF-8.
    using Labels = std::vector<std::pair<std::string, std::string>>;

    MetricText();
    ~MetricText();
    MetricText(const MetricText&) = delete;
    MetricText& operator=(const MetricText&) = delete;

    // Begins a family; the values that are added next belong to it. Without a value it is left out.
    void counter(const std::string& name, const std::string& help);
    void gauge(const std::string& name, const std::string& help);
    void histogram(const std::string& name, const std::string& help);

    /// A value of a counter or gauge. No two of a family have the same labels.
    void add(double value, const Labels& labels = {});
    void add(std::uint64_t value, const Labels& labels = {});

    /// A value of a histogram: how many were up to each limit, how many there were, and their sum.
    void add(std::span<const double> limits, std::span<const std::uint64_t> upTo,
             std::uint64_t count, double sum, const Labels& labels);

    /// Everything in the form in which Prometheus reads it.
    std::string text() const;

private:
    struct Families;
    std::unique_ptr<Families> m_families;
};

} // namespace zrm::host

#endif
