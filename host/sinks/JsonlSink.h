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

/// Writes one JSON object per event, one per line, to standard output or to a file. The file is
/// appended to, made when missing, and opened again when it was moved away or removed; a symbolic
/// link is not followed. A pipe of the file system and a device are written, too. A line is
/// never torn or written twice: what a failed write left of a line is taken back, or, where that
/// is not possible, completed before anything else is written. Used by one thread.
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
    bool m_isRegular = false;         ///< a regular file never makes a write wait for a reader
    std::size_t m_unblockedWrite = 0; ///< bytes that a pipe with room takes without waiting
    std::size_t m_torn = 0;           ///< bytes of the next event's line that are written already
    Clock::time_point m_lookAgain{};  ///< when the path is compared with the open file next
    std::string m_text;               ///< the lines of one delivery
    std::vector<std::size_t> m_lines; ///< where each of them ends
    std::string m_error;
    std::atomic<Clock::rep> m_waitsSince{0}; ///< 0: it does not
};

} // namespace zrm::host

#endif
