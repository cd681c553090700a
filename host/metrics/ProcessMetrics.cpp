#include "host/metrics/ProcessMetrics.h"

#include "host/metrics/MetricText.h"

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <system_error>

#include <sys/resource.h>
#include <unistd.h>

namespace zrm::host {

namespace {

double seconds(const timeval& time) {
    constexpr double microseconds = 1e6;
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) / microseconds;
}

void collectTime(MetricText& text) {
    rusage usage{};
    if (getrusage(RUSAGE_SELF, &usage) == 0) {
        text.counter("process_cpu_seconds_total",
                     "Processor time that the agent has used, in seconds.");
        text.add(seconds(usage.ru_utime) + seconds(usage.ru_stime));
    }
}

void collectMemory(MetricText& text) {
    std::ifstream stream("/proc/self/statm");
    std::uint64_t size = 0;
    std::uint64_t resident = 0;
    if (stream >> size >> resident) {
        const auto page = static_cast<std::uint64_t>(sysconf(_SC_PAGESIZE));
        text.gauge("process_virtual_memory_bytes", "Size of the agent's address space.");
        text.add(size * page);
        text.gauge("process_resident_memory_bytes", "Memory of the agent that is resident.");
        text.add(resident * page);
    }
}

void collectDescriptors(MetricText& text) {
    std::error_code error;
    const std::filesystem::directory_iterator descriptors("/proc/self/fd", error);
    if (!error) {
        text.gauge("process_open_fds", "Descriptors that the agent has open.");
        text.add(static_cast<double>(std::distance(begin(descriptors), end(descriptors))));
    }
    rlimit limit{};
    if (getrlimit(RLIMIT_NOFILE, &limit) == 0 && limit.rlim_cur != RLIM_INFINITY) {
        text.gauge("process_max_fds", "Descriptors that the agent may have open.");
        text.add(static_cast<double>(limit.rlim_cur));
    }
}

} // namespace

ProcessMetrics::ProcessMetrics()
    : m_started(std::chrono::duration<double>(std::chrono::system_clock::now().time_since_epoch())
                    .count()) {}

void ProcessMetrics::collect(MetricText& text) {
    text.gauge("zrm_build_info", "The version of the agent, as a label.");
    text.add(1.0, {{"version", ZRM_VERSION}});
    text.gauge("process_start_time_seconds", "When the agent started, in seconds since 1970.");
    text.add(m_started);
    collectTime(text);
    collectMemory(text);
    collectDescriptors(text);
}

} // namespace zrm::host
