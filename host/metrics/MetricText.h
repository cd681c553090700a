#ifndef ZRM_HOST_METRIC_TEXT_H
#define ZRM_HOST_METRIC_TEXT_H

#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <utility>
#include <vector>

namespace zrm::host {

/// Collects metrics for one scrape. Used by one thread.
class MetricText {
public:
    /// Names and values; values are UTF-8.
    using Labels = std::vector<std::pair<std::string, std::string>>;

    MetricText();
    ~MetricText();
    MetricText(const MetricText&) = delete;
    MetricText& operator=(const MetricText&) = delete;

    // Begins a family; values added next belong to it. A family without values is left out.
    void counter(const std::string& name, const std::string& help);
    void gauge(const std::string& name, const std::string& help);
    void histogram(const std::string& name, const std::string& help);

    /// Adds a value of a counter or gauge. Labels must be unique within a family.
    void add(double value, const Labels& labels = {});
    void add(std::uint64_t value, const Labels& labels = {});

    /// Adds a value of a histogram: the count up to each limit, the total count, and the sum.
    void add(std::span<const double> limits, std::span<const std::uint64_t> upTo,
             std::uint64_t count, double sum, const Labels& labels);

    /// All metrics in the Prometheus text format.
    std::string text() const;

private:
    struct Families;
    std::unique_ptr<Families> m_families;
};

} // namespace zrm::host

#endif
