#include "host/sources/CommandSource.h"

#include "base/EntryFields.h"
#include "base/ErrorText.h"
#include "host/base/JsonWriter.h"
#include "host/base/RetryPause.h"
#include "host/base/TimeText.h"
#include "host/sources/CommandChild.h"
#include "host/sources/StreamEntries.h"
#include "logs/ZoneTime.h"

#include <algorithm>
#include <cerrno>
#include <thread>
#include <utility>

namespace zrm::host {

namespace {

using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;

/// A command that has run for this long did not fail at once.
constexpr auto longRun = 60s;
class CommandReading final : public EntrySource::Reading {
public:
    CommandReading(const CommandConfig& config, std::unique_ptr<EntryFormat::Reader> reader,
                   const LineJoin* join)
        : m_config(config), m_reader(std::move(reader)), m_entries(join),
          m_pause(config.pause, CommandConfig::longestPause) {}

    void startAt(Start) override {}
    void resumeAt(const std::string&) override {}
    void recall(const std::string&, std::chrono::seconds) override { m_isOver = true; }

    char* next() override;
    std::string position() override { return ""; }
    std::string takeBack() override { return ""; }
    void wait(std::chrono::milliseconds most) override;
    const std::string& problem() const noexcept override { return m_problem; }
    std::optional<EntrySource::Remark> takeRemark() override;

    bool read(EntryColumns& columns) override;
    std::string_view reason() const noexcept override {
        return m_reader ? m_reader->reason() : std::string_view();
    }
    std::string_view text() const noexcept override { return m_entries.text(); }
    bool isTextCut() const noexcept override { return m_entries.isCut(); }
    void readFields(EntryFields& fields) override {
        if (m_reader) {
            m_reader->readFields(text(), fields);
        }
    }

private:
    void start();
    void finish();
    void fail(const std::string& why);

    const CommandConfig& m_config;
    const std::unique_ptr<EntryFormat::Reader> m_reader; ///< null: lines are descriptions
    CommandChild m_child;
    StreamEntries m_entries;
    bool m_isOver = false; ///< it is not started any more
    std::string m_problem;
    std::string m_remarked; ///< what it last said on standard error while it ran
    RetryPause m_pause;
    Clock::time_point m_started{};
    Clock::time_point m_retry{};
};

void CommandReading::start() {
    m_entries.begin();
    m_started = Clock::now();
    if (const int error = m_child.start(m_config.arguments)) {
        fail(std::string("the command cannot be started: ") + ErrorText(error).text());
        return;
    }
    m_problem.clear();
}

char* CommandReading::next() {
    for (;;) {
        if (char* const entry = m_entries.next()) {
            return entry;
        }
        if (!m_child.isRunning()) {
            if (m_isOver || Clock::now() < m_retry) {
                return nullptr;
            }
            start();
            continue;
        }
        // Asked before the output is read: what the process has written is there when it has ended.
        // Its children may keep the output open.
        const bool hasEnded = m_child.hasEnded();
        const auto [room, size] = m_entries.room();
        const ssize_t count = m_child.read(room, size);
        if (count > 0) {
            m_entries.add(static_cast<std::size_t>(count));
        } else if (count == 0 || errno != EAGAIN || hasEnded) {
            finish();
        } else {
            return nullptr;
        }
    }
}

/// Ends the command. What is left of its output can still be read.
void CommandReading::finish() {
    m_entries.end();
    if (Clock::now() - m_started >= longRun) {
        m_pause.reset();
    }
    const bool hasEnded = m_child.waitForEnd(); // what closes its output is usually about to end
    const std::string how = m_child.end();
    fail((hasEnded ? how : "the command has closed its output and gone on, so it was ended") +
         (m_child.lastError().empty() ? "" : ", after '" + m_child.lastError() + "'"));
}

void CommandReading::fail(const std::string& why) {
    m_isOver = !m_config.restarts;
    m_retry = Clock::now() + m_pause.next();
    m_problem = why + (m_isOver ? ", and is not started again" : ", and is started again");
}

void CommandReading::wait(std::chrono::milliseconds most) {
    if (m_child.isRunning()) {
        m_child.readErrors();
        m_child.wait(m_entries.patience(most));
        m_child.readErrors();
        return;
    }
    const auto pause = std::chrono::ceil<std::chrono::milliseconds>(m_retry - Clock::now());
    std::this_thread::sleep_for(m_isOver ? most
                                         : std::clamp<std::chrono::milliseconds>(pause, 0ms, most));
}

/// The first line on standard error of a command that goes on; a second one says nothing new.
std::optional<EntrySource::Remark> CommandReading::takeRemark() {
    const std::string& error = m_child.lastError();
    if (!m_child.isRunning() || error.empty() || !m_remarked.empty()) {
        return std::nullopt;
    }
    m_remarked = error;
    return EntrySource::Remark{false, "The command says on standard error: '" + error + "'."};
}

bool CommandReading::read(EntryColumns& columns) {
    if (m_reader && !m_reader->read(text(), columns)) {
        return false;
    }
    if (!m_reader) {
        columns.description = text();
    }
    return true;
}

std::string definitionOf(const CommandConfig& config, const Defined<EntryFormat>& format,
                         const Defined<LineJoin>& join) {
    return JsonWriter::text([&](JsonWriter& json) {
        json.beginObject().member("command", config.arguments);
        json.member("pause", std::int64_t{config.pause.count()});
        json.member("restarts", config.restarts);
        json.member("format", format ? format->definition() : std::string());
        json.member("join", join ? join->definition() : std::string()).endObject();
    });
}

} // namespace

CommandSource::CommandSource(CommandConfig config, Defined<EntryFormat> format,
                             Defined<LineJoin> join)
    : m_config(std::move(config)), m_format(std::move(format)), m_join(std::move(join)),
      m_definition(definitionOf(m_config, m_format, m_join)) {}

std::unique_ptr<EntrySource::Reading> CommandSource::reading() const {
    return std::make_unique<CommandReading>(m_config, m_format ? m_format->reader() : nullptr,
                                            m_join.value.get());
}

} // namespace zrm::host
