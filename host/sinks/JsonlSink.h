#ifndef ZRM_HOST_JSONL_SINK_H
#define ZRM_HOST_JSONL_SINK_H

#include "host/config/SinkConfig.h"
#include "host/sinks/Sink.h"

#include <atomic>
#include <chrono>
#include <cstddef>
#include <optional>
#include <span>
#include <stop_token>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// Writes one JSON object per line and event to standard output or to a file. The file is appended
/// to, created if missing, and reopened if it was moved or removed; symbolic links are not
/// followed. Named pipes and devices are supported, too. A line is never torn or written twice: a
/// partly written line is removed or, if that is not possible, completed before anything else is
/// written. Used by one thread.
class JsonlSink : public Sink {
public:
    explicit JsonlSink(const SinkConfig& config);
    ~JsonlSink() override;
    JsonlSink(const JsonlSink&) = delete;
    JsonlSink& operator=(const JsonlSink&) = delete;

    std::string name() const override { return m_name; }
    std::size_t deliver(std::span<const EventRecord> events,
                        const std::stop_token& giveUp) override;
    std::string error() const override { return m_error; }
    std::optional<std::chrono::steady_clock::time_point> waitsSince() const override;

private:
    using Clock = std::chrono::steady_clock;

    bool ready();
    bool open();
    bool endLastLine();
    void close();
    bool movedAway();
    bool waitWritable(const std::stop_token& giveUp);
    std::size_t write(std::string_view text, const std::stop_token& giveUp);
    void takeBackTornLine();
    void fail(const char* call, int number);

    const std::string m_name;
    const std::string m_path; ///< "-" for standard output
    const bool m_isStandardOutput;
    int m_fd = -1;
    bool m_isRegular = false; ///< a regular file, for which a write never waits for a reader
    std::size_t m_unblockedWrite = 0; ///< bytes that a writable pipe takes without blocking
    std::size_t m_torn = 0;           ///< bytes of the next event's line already written
    Clock::time_point m_lookAgain{};  ///< when to compare the path with the open file next
    std::string m_text;               ///< the lines of one delivery
    std::vector<std::size_t> m_lines; ///< end offset of each line
    std::string m_error;
    std::atomic<Clock::rep> m_waitsSince{0}; ///< 0: it is not waiting
};

} // namespace zrm::host

#endif
