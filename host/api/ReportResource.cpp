#include "host/api/ReportResource.h"

#include "base/EntryFields.h"
#include "base/TraceScope.h"
#include "host/api/ReportStream.h"
#include "host/base/TimeText.h"
#include "host/config/ConditionBuilder.h"
#include "host/config/ConditionParser.h"
#include "host/http/JsonFields.h"
#include "host/http/RequestRefused.h"
#include "host/http/Router.h"

#include <condition_variable>
#include <mutex>
#include <optional>
#include <set>
#include <string>
#include <system_error>
#include <thread>
#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"ReportResource.cpp"};

constexpr std::size_t mostConditions = 100;
constexpr const char* lines = "application/x-ndjson";

/// The default end of a report: the last time that a stamp can express.
constexpr const char* endOfTime = "1991231235959999";

std::string readTime(JsonFields& fields, const char* key, std::optional<std::string> text) {
    if (!text) {
        return endOfTime;
    }
    std::optional<std::string> stamp = TimeText::toStamp(*text);
    if (!stamp) {
        fields.refuse(key, "'" + *text +
                               "' is not a time; write it like 2026-11-20T07:03:09, followed by Z "
                               "or +01:00 unless it is local, or as a 16-digit time stamp");
    }
    return std::move(*stamp);
}

std::vector<Condition> readLog(JsonFields& fields, const std::string& log) {
    auto conditions = ConditionBuilder::ofLog(log);
    if (!conditions) {
        fields.refuse("log", conditions.error());
    }
    return std::move(*conditions);
}

/// The names of fields. What looks like the name in a condition is refused.
std::vector<std::string> readFieldNames(JsonFields& fields) {
    std::vector<std::string> names = fields.texts("fields", EntryFields::most);
    for (std::size_t index = 0; index < names.size(); ++index) {
        const std::string& name = names[index];
        const auto refuse = [&](const std::string& what, const std::string& cure) {
            fields.refuse("fields[" + std::to_string(index) + "]", {what, cure, ""});
        };
        if (name.empty() || name.size() > EntryFields::longestName) {
            refuse("is not the name of a field", "write 1 to " +
                                                     std::to_string(EntryFields::longestName) +
                                                     " bytes, or \"*\" for all fields");
        }
        if (name.starts_with("field.")) {
            refuse("'" + name + "' begins with 'field.'", "write '" + name.substr(6) + "'");
        }
    }
    return names;
}

Condition bound(_IntfOper op, std::string stamp) {
    Condition condition;
    condition.column = "ENTRYTIME";
    condition.op = op;
    condition.text = std::move(stamp);
    return condition;
}

} // namespace

ReportRequest ReportRequest::parse(std::string_view body) {
    JsonFields fields(body);
    ReportRequest report;
    report.log = fields.text("log");
    report.conditions = readLog(fields, report.log);
    report.from = readTime(fields, "from", fields.text("from"));
    report.to = readTime(fields, "to", fields.optionalText("to"));
    const std::vector<std::string> where = fields.texts("where", mostConditions);
    report.limit = static_cast<std::size_t>(fields.optionalNumber("limit", 1, mostRows)
                                                .value_or(static_cast<std::int64_t>(report.limit)));
    report.fields = readFieldNames(fields);
    fields.refuseUnknown();
    if (report.from > report.to) {
        fields.refuse("to", "is before from");
    }
    report.conditions.push_back(bound(INTF_GREATER_OR_EQUAL, report.from));
    report.conditions.push_back(bound(INTF_LESS_OR_EQUAL, report.to));
    const ConditionParser parser("RMLOGENT");
    for (std::size_t index = 0; index < where.size(); ++index) {
        Result<Condition> condition = parser.parse(where[index]);
        if (!condition) {
            fields.refuse("where[" + std::to_string(index) + "]", condition.error());
        }
        report.where.push_back(*condition);
        report.conditions.push_back(std::move(*condition));
    }
    return report;
}

/// The reports that are being read.
class ReportResource::Running {
public:
    /// Reads a report on a thread of its own. Throws RequestRefused.
    static void start(const std::shared_ptr<Running>& running,
                      const std::shared_ptr<ReportStream>& stream);
    void cancel();
    void waitForEnd(std::chrono::steady_clock::time_point limit);

private:
    bool add(const std::shared_ptr<ReportStream>& stream);
    void remove(const std::shared_ptr<ReportStream>& stream);

    std::mutex m_mutex; ///< guards the members below
    std::condition_variable m_ended;
    std::set<std::shared_ptr<ReportStream>> m_streams;
    bool m_isEnding = false;
};

bool ReportResource::Running::add(const std::shared_ptr<ReportStream>& stream) {
    const std::lock_guard guard(m_mutex);
    if (!m_isEnding) {
        m_streams.insert(stream);
    }
    return !m_isEnding;
}

void ReportResource::Running::remove(const std::shared_ptr<ReportStream>& stream) {
    {
        const std::lock_guard guard(m_mutex);
        m_streams.erase(stream);
    }
    m_ended.notify_all();
}

/// The thread is left behind where a file system does not let it go.
void ReportResource::Running::start(const std::shared_ptr<Running>& running,
                                    const std::shared_ptr<ReportStream>& stream) {
    if (!running->add(stream)) {
        throw RequestRefused(503, "the agent is stopping", "");
    }
    try {
        std::thread([running, stream]() mutable {
            stream->run();
            running->remove(stream);
        }).detach();
    } catch (const std::system_error&) {
        running->remove(stream);
        throw RequestRefused(503, "the agent has no thread for the report: try again", "");
    }
}

void ReportResource::Running::cancel() {
    const std::lock_guard guard(m_mutex);
    m_isEnding = true;
    for (const std::shared_ptr<ReportStream>& stream : m_streams) {
        stream->cancel();
    }
}

void ReportResource::Running::waitForEnd(std::chrono::steady_clock::time_point limit) {
    std::unique_lock lock(m_mutex);
    m_ended.wait_until(lock, limit, [this] { return m_streams.empty(); });
}

ReportResource::ReportResource(TableManager& entries)
    : m_entries(entries), m_running(std::make_shared<Running>()) {}

ReportResource::~ReportResource() {
    cancel();
}

void ReportResource::cancel() {
    m_running->cancel();
}

void ReportResource::waitForEnd(std::chrono::steady_clock::time_point limit) {
    m_running->waitForEnd(limit);
}

void ReportResource::addRoutes(Router& router) {
    router.add("POST", "/api/v1/reports",
               [this](const HttpRequest& request) { return report(request); });
}

HttpAnswer ReportResource::report(const HttpRequest& request) {
    TraceScope trace(anchor);
    ReportRequest wanted = ReportRequest::parse(request.body);
    std::unique_ptr<LogReport> report = LogReport::open(wanted, m_entries);
    if (report == nullptr) {
        throw RequestRefused(404, "the agent does not monitor this log", "log");
    }
    if (!report->isOpen()) {
        throw RequestRefused(503, "the agent cannot take any more requests", "");
    }
    if (!wanted.fields.empty() && !report->hasFields()) {
        throw RequestRefused(400,
                             {"the entries of a log of the log configuration have no fields",
                              "leave out 'fields', or monitor the log with [[log]]", "fields"});
    }
    const bool isLines = request.accept.find(lines) != std::string::npos;
    const auto stream = std::make_shared<ReportStream>(std::move(wanted), std::move(report),
                                                       isLines ? ReportStream::Form::lines
                                                               : ReportStream::Form::document);
    Running::start(m_running, stream);
    // The last copy is gone with the connection, or where the answer never reaches one.
    const std::shared_ptr<ReportStream> client(stream.get(),
                                               [stream](ReportStream*) { stream->cancel(); });
    HttpAnswer answer;
    answer.contentType = isLines ? lines : answer.contentType;
    answer.stream.begin = [client](std::shared_ptr<BodyChannel> channel) {
        client->attach(std::move(channel));
    };
    answer.stream.changed = [client] { client->wake(); };
    return answer;
}

} // namespace zrm::host
