#include "host/sources/CommandSource.h"

#include "base/EntryFields.h"
#include "base/ErrorText.h"
#include "framework/LogEntry.h"
#include "host/base/JsonWriter.h"
#include "host/base/RetryPause.h"
#include "host/base/TimeText.h"
#include "host/sources/CommandChild.h"
#include "logs/ZoneTime.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <thread>
#include <utility>
#include <vector>

namespace zrm::host {

namespace {

using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;

/// A command that has run for this long did not fail at once.
constexpr auto longRun = 60s;
constexpr std::size_t longestText = EntryKeep::longestText;
constexpr std::size_t roomForLines = 2 * longestText;

/// The lines of a stream that is read in blocks. Of a longer line only the beginning is given.
class StreamLines {
public:
    StreamLines() : m_room(roomForLines + 1) {}

    void clear() noexcept { m_begin = m_end = 0, m_isSkipping = false; }
    /// The next whole line, terminated and without its end; null if there is none.
    char* next() noexcept {
        for (;;) {
            char* const begin = m_room.data() + m_begin;
            const std::size_t length = m_end - m_begin;
            auto* const end = static_cast<char*>(std::memchr(begin, '\n', length));
            if (end == nullptr) {
                return length > longestText ? cut() : nullptr;
            }
            m_begin += static_cast<std::size_t>(end - begin) + 1;
            if (!std::exchange(m_isSkipping, false)) {
                return give(begin, static_cast<std::size_t>(end - begin));
            }
        }
    }
    /// The last line, which has no end; null if there is none.
    char* rest() noexcept {
        char* const begin = m_room.data() + m_begin;
        const std::size_t length = m_end - m_begin;
        const bool isLine = length > 0 && !m_isSkipping;
        clear();
        return isLine ? give(begin, length) : nullptr;
    }
    /// Room to read into, once there is no further line.
    std::pair<char*, std::size_t> room() noexcept {
        std::memmove(m_room.data(), m_room.data() + m_begin, m_end - m_begin);
        m_end -= std::exchange(m_begin, 0);
        return {m_room.data() + m_end, roomForLines - m_end};
    }
    void add(std::size_t count) noexcept { m_end += count; }

    std::string_view text() const noexcept { return m_text; }
    bool isCut() const noexcept { return m_isCut; }

private:
    /// The line is longer than any text: what follows is passed over.
    char* cut() noexcept {
        char* const begin = m_room.data() + m_begin;
        const std::size_t length = m_end - m_begin;
        m_begin = m_end;
        return std::exchange(m_isSkipping, true) ? nullptr : give(begin, length);
    }
    char* give(char* begin, std::size_t length) noexcept {
        length -= length > 0 && begin[length - 1] == '\r' ? 1 : 0;
        m_isCut = length > longestText;
        length = std::min(length, longestText);
        begin[length] = '\0';
        m_text = {begin, length};
        return begin;
    }

    std::vector<char> m_room;
    std::size_t m_begin = 0;
    std::size_t m_end = 0;
    bool m_isSkipping = false; ///< until the end of the line
    bool m_isCut = false;
    std::string_view m_text;
};

class CommandReading final : public EntrySource::Reading {
public:
    CommandReading(const CommandConfig& config, std::unique_ptr<EntryFormat::Reader> reader)
        : m_config(config), m_reader(std::move(reader)),
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
    std::string_view text() const noexcept override { return m_lines.text(); }
    bool isTextCut() const noexcept override { return m_lines.isCut(); }
    void readFields(EntryFields& fields) override {
        if (m_reader) {
            m_reader->readFields(text(), fields);
        }
    }

private:
    void start();
    char* finish();
    void fail(const std::string& why);

    const CommandConfig& m_config;
    const std::unique_ptr<EntryFormat::Reader> m_reader; ///< null: lines are descriptions
    CommandChild m_child;
    StreamLines m_lines;
    bool m_isOver = false; ///< it is not started any more
    std::string m_problem;
    std::string m_remarked; ///< what it last said on standard error while it ran
    RetryPause m_pause;
    Clock::time_point m_started{};
    Clock::time_point m_retry{};
};

void CommandReading::start() {
    m_lines.clear();
    m_started = Clock::now();
    if (const int error = m_child.start(m_config.arguments)) {
        fail(std::string("the command cannot be started: ") + ErrorText(error).text());
        return;
    }
    m_problem.clear();
}

char* CommandReading::next() {
    if (!m_child.isRunning()) {
        if (m_isOver || Clock::now() < m_retry) {
            return nullptr;
        }
        start();
    }
    while (m_child.isRunning()) {
        if (char* const line = m_lines.next()) {
            return line;
        }
        // Asked before the output is read: what the process has written is there when it has ended.
        // Its children may keep the output open.
        const bool hasEnded = m_child.hasEnded();
        const auto [room, size] = m_lines.room();
        const ssize_t count = m_child.read(room, size);
        if (count <= 0) {
            return count == 0 || errno != EAGAIN || hasEnded ? finish() : nullptr;
        }
        m_lines.add(static_cast<std::size_t>(count));
    }
    return nullptr;
}

/// Ends the command. Gives the last line, if that has no end.
char* CommandReading::finish() {
    char* const rest = m_lines.rest();
    if (Clock::now() - m_started >= longRun) {
        m_pause.reset();
    }
    const std::string how = m_child.end();
    fail(how + (m_child.lastError().empty() ? "" : ", after '" + m_child.lastError() + "'"));
    return rest;
}

void CommandReading::fail(const std::string& why) {
    m_isOver = !m_config.restarts;
    m_retry = Clock::now() + m_pause.next();
    m_problem = why + (m_isOver ? ", and is not started again" : ", and is started again");
}

void CommandReading::wait(std::chrono::milliseconds most) {
    if (m_child.isRunning()) {
        m_child.readErrors();
        m_child.wait(most);
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

std::string definitionOf(const CommandConfig& config, const Defined<EntryFormat>& format) {
    return JsonWriter::text([&](JsonWriter& json) {
        json.beginObject().member("command", config.arguments);
        json.member("pause", std::int64_t{config.pause.count()});
        json.member("restarts", config.restarts);
        json.member("format", format ? format->definition() : std::string()).endObject();
    });
}

} // namespace

CommandSource::CommandSource(CommandConfig config, Defined<EntryFormat> format)
    : m_config(std::move(config)), m_format(std::move(format)),
      m_definition(definitionOf(m_config, m_format)) {}

std::unique_ptr<EntrySource::Reading> CommandSource::reading() const {
    return std::make_unique<CommandReading>(m_config, m_format ? m_format->reader() : nullptr);
}

} // namespace zrm::host
