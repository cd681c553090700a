#include "host/metrics/MetricText.h"

#include <cstddef>
#include <limits>

#include <prometheus/metric_family.h>
#include <prometheus/text_serializer.h>

namespace zrm::host {

using prometheus::ClientMetric;
using prometheus::MetricFamily;
using prometheus::MetricType;

struct MetricText::Families {
    std::vector<MetricFamily> list;

    void begin(const std::string& name, const std::string& help, MetricType type) {
        list.push_back({name, help, type, {}});
    }
    ClientMetric& add(const Labels& labels) {
        ClientMetric& metric = list.back().metric.emplace_back();
        for (const auto& [name, value] : labels) {
            metric.label.push_back({name, value});
        }
        return metric;
    }
};

MetricText::MetricText() : m_families(std::make_unique<Families>()) {}

MetricText::~MetricText() = default;

void MetricText::counter(const std::string& name, const std::string& help) {
    m_families->begin(name, help, MetricType::Counter);
}

void MetricText::gauge(const std::string& name, const std::string& help) {
    m_families->begin(name, help, MetricType::Gauge);
}

void MetricText::histogram(const std::string& name, const std::string& help) {
    m_families->begin(name, help, MetricType::Histogram);
}

void MetricText::add(double value, const Labels& labels) {
    ClientMetric& metric = m_families->add(labels);
    metric.counter.value = value; // the family's type determines which one is written
    metric.gauge.value = value;
}

void MetricText::add(std::uint64_t value, const Labels& labels) {
    add(static_cast<double>(value), labels);
}

void MetricText::add(std::span<const double> limits, std::span<const std::uint64_t> upTo,
                     std::uint64_t count, double sum, const Labels& labels) {
    ClientMetric& metric = m_families->add(labels);
    metric.histogram.sample_count = count;
    metric.histogram.sample_sum = sum;
    for (std::size_t at = 0; at < limits.size(); ++at) {
        metric.histogram.bucket.push_back({upTo[at], limits[at]});
    }
    metric.histogram.bucket.push_back({count, std::numeric_limits<double>::infinity()});
}

std::string MetricText::text() const {
    std::vector<MetricFamily> families;
    for (const MetricFamily& family : m_families->list) {
        if (!family.metric.empty()) {
            families.push_back(family);
        }
    }
    return prometheus::TextSerializer().Serialize(families);
}

} // namespace zrm::host
