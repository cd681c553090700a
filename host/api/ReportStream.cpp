#include "host/api/ReportStream.h"

#include "base/ProcessValues.h"
#include "base/TraceScope.h"
#include "host/base/JsonWriter.h"
#include "host/config/Columns.h"
#include "host/framework/RequestLimit.h"

#include <exception>
#include <utility>

namespace zrm::host {

namespace {

using namespace std::chrono_literals;

TRC1_Anchor anchor{"ReportStream.cpp"};

constexpr std::size_t textAtOnce = 64 * 1024; ///< bytes
constexpr std::chrono::milliseconds sendInterval = 100ms;
constexpr std::chrono::milliseconds progressInterval = 250ms;

} // namespace

ReportStream::ReportStream(ReportQuery query, std::unique_ptr<LogReport> report, Form form)
    : m_query(std::move(query)), m_report(std::move(report)), m_format(m_report->layout()),
      m_form(form) {}

ReportStream::~ReportStream() = default;

void ReportStream::attach(std::shared_ptr<BodyChannel> channel) {
    {
        const std::lock_guard guard(m_mutex);
        if (!m_isCancelled) {
            m_channel.swap(channel);
        }
    }
    if (channel != nullptr) { // it is not wanted any more
        channel->end();
    }
    m_changed.notify_all();
}

void ReportStream::wake() {
    {
        const std::lock_guard guard(m_mutex); // the thread is before its check, or waits
    }
    m_changed.notify_all();
}

void ReportStream::cancel() {
    {
        const std::lock_guard guard(m_mutex);
        m_isCancelled = true;
    }
    m_changed.notify_all();
}

bool ReportStream::waitForChannel() {
    std::unique_lock lock(m_mutex);
    m_changed.wait(lock, [this] { return m_isCancelled || m_channel != nullptr; });
    return m_channel != nullptr;
}

bool ReportStream::isWanted() {
    const std::lock_guard guard(m_mutex);
    return !m_isCancelled && m_channel->isOpen();
}

void ReportStream::run() {
    TraceScope trace(anchor);
    if (!waitForChannel()) {
        return;
    }
    try {
        const RequestLimit limit(Clock::now() + longest, [this] { return !isWanted(); });
        m_form == Form::document ? writeDocument() : writeLines();
        send();
    } catch (const std::exception& exception) {
        // The client sees that the end is missing.
        trace.error()("A report on %s failed: %s", m_query.log.c_str(), exception.what());
    }
    endChannel();
}

/// The channel refers to this object, too.
void ReportStream::endChannel() {
    std::shared_ptr<BodyChannel> channel;
    {
        const std::lock_guard guard(m_mutex);
        channel = std::move(m_channel);
    }
    channel->end();
}

void ReportStream::writeDocument() {
    JsonWriter::append(m_text, [this](JsonWriter& json) {
        m_json = &json;
        json.beginObject();
        writeHead(json);
        json.key("rows").beginArray();
        const LogReport::Result result = m_report->run(*this);
        json.endArray();
        writeTail(json, result);
        json.endObject();
    });
}

void ReportStream::writeLines() {
    const auto line = [this](const char* key, const auto& write) {
        JsonWriter::append(m_text, [&](JsonWriter& json) {
            json.beginObject().key(key).beginObject();
            write(json);
            json.endObject().endObject();
        });
        m_text += '\n';
    };
    line("begin", [this](JsonWriter& json) { writeHead(json); });
    const LogReport::Result result = m_report->run(*this);
    line("end", [&](JsonWriter& json) { writeTail(json, result); });
}

void ReportStream::writeHead(JsonWriter& json) const {
    json.member("log", m_query.log).member("from", m_query.from).member("to", m_query.to);
    json.key("columns").beginArray();
    for (const Column& column : columnsOf("RMLOGENT")) {
        json.value(column.name);
    }
    json.endArray().member("limit", m_query.limit);
}

void ReportStream::writeTail(JsonWriter& json, const LogReport::Result& result) const {
    json.member("count", result.count).member("truncated", result.isTruncated);
    result.reach.write(json);
    json.member("skipped", result.skipped).key("files").beginArray();
    for (const FollowedReport::File& file : result.files) {
        json.beginObject().member("file", file.path).member("bytes", file.size);
        json.member("read", file.isRead).textOrNull("problem", file.problem).endObject();
    }
    json.endArray().member("max_rows", gMaxRows);
}

void ReportStream::writeRow(JsonWriter& json, const char* row,
                            const LogReport::Fields& fields) const {
    json.beginObject();
    m_format.writeMembers(json, row);
    if (!m_query.fields.empty()) {
        json.key("fields").raw(fields.text.empty() ? "{}" : fields.text);
    }
    if (fields.isCut) {
        json.member("fields_cut", true);
    }
    json.endObject();
}

void ReportStream::row(const char* row, const LogReport::Fields& fields) {
    if (m_form == Form::document) {
        writeRow(*m_json, row, fields);
    } else {
        JsonWriter::append(m_text, [&](JsonWriter& json) {
            json.beginObject().key("row");
            writeRow(json, row, fields);
            json.endObject();
        });
        m_text += '\n';
    }
    if (m_text.size() >= textAtOnce) {
        send();
    }
}

void ReportStream::progress(std::int64_t read, std::int64_t total) {
    const Clock::time_point now = Clock::now();
    if (m_form == Form::lines && now - m_shown >= progressInterval) {
        m_shown = now;
        JsonWriter::append(m_text, [&](JsonWriter& json) {
            json.beginObject().key("progress").beginObject();
            json.member("read", read).member("total", total).endObject().endObject();
        });
        m_text += '\n';
    }
    if (now - m_sent >= sendInterval) {
        send();
    }
}

/// Sends the text when the client has taken what was sent before.
void ReportStream::send() {
    std::unique_lock lock(m_mutex);
    m_changed.wait(
        lock, [this] { return m_isCancelled || !m_channel->isOpen() || m_channel->isReady(); });
    m_channel->send(std::exchange(m_text, {}));
    m_sent = Clock::now();
}

} // namespace zrm::host
