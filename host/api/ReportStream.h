#ifndef ZRM_HOST_REPORT_STREAM_H
#define ZRM_HOST_REPORT_STREAM_H

#include "host/analysis/LogReport.h"
#include "host/api/ReportRoom.h"
#include "host/events/RowJson.h"
#include "host/http/Message.h"

#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <mutex>
#include <string>

namespace zrm::host {

/// One report on its way to a client: read on a thread of its own, sent as it is found. Reading
/// goes no further ahead of the client than a block, and ends when the client leaves.
class ReportStream : private LogReport::Receiver {
public:
    using Clock = std::chrono::steady_clock;

    enum class Form {
        document, ///< one JSON object
        lines,    ///< an object per line: begin, row, progress, end
    };

    /// A client that takes its answer slowly keeps a place no longer than this.
    static constexpr std::chrono::minutes longest{10};

    ReportStream(ReportQuery query, std::unique_ptr<LogReport> report, Form form);
    ~ReportStream() override;

    /// Waits for the client's channel, then reads and sends. On the report's thread.
    void run();

    // On any thread.

    /// The channel to the client.
    void attach(std::shared_ptr<BodyChannel> channel);
    /// The state of the channel has changed.
    void wake();
    /// Nobody waits for the report any more.
    void cancel();

private:
    void row(const char* row, const LogReport::Fields& fields) override;
    void progress(std::int64_t read, std::int64_t total) override;

    void writeRow(JsonWriter& json, const char* row, const LogReport::Fields& fields) const;
    bool waitForChannel();
    bool isWanted();
    void endChannel();
    void writeDocument();
    void writeLines();
    void writeHead(JsonWriter& json) const;
    void writeTail(JsonWriter& json, const LogReport::Result& result) const;
    void send();

    const ReportQuery m_query;
    const std::unique_ptr<LogReport> m_report;
    const RowJson m_format;
    const Form m_form;
    const ReportRoom m_room;

    // Used by the report's thread.
    std::string m_text;           ///< not yet sent
    JsonWriter* m_json = nullptr; ///< of the document that is being written
    Clock::time_point m_sent{};
    Clock::time_point m_shown{}; ///< when the progress was written

    std::mutex m_mutex; ///< guards the members below
    std::condition_variable m_changed;
    std::shared_ptr<BodyChannel> m_channel;
    bool m_isCancelled = false;
};

} // namespace zrm::host

#endif
