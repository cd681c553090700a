#include "host/diagnose/FormatSuggestion.h"

#include "base/EntryFields.h"
#include "host/base/JsonWriter.h"
#include "host/config/ReadyFormats.h"
#include "host/diagnose/FormatProposal.h"
#include "host/diagnose/TomlText.h"

#include <algorithm>
#include <cmath>
#include <memory>
#include <utility>

namespace zrm::host {

namespace {

constexpr std::size_t glanceLines = 60; ///< that decide whether a format is tried on all

double percent(double share) {
    return std::floor(share * 1000) / 10;
}

double partOf(std::size_t part, std::size_t whole) {
    return whole == 0 ? 0 : static_cast<double>(part) / static_cast<double>(whole);
}

/// Lines in sequence from the beginning, the middle and the end.
std::vector<std::string> glance(const std::vector<std::string>& lines) {
    if (lines.size() <= glanceLines) {
        return lines;
    }
    std::vector<std::string> some;
    constexpr std::size_t part = glanceLines / 3;
    for (const std::size_t begin : {std::size_t{0}, lines.size() / 2, lines.size() - part}) {
        const auto at = lines.begin() + static_cast<std::ptrdiff_t>(begin);
        some.insert(some.end(), at, at + part);
    }
    return some;
}

/// Whether the format finds a field in a description of these lines that no syslog line has.
bool extracts(const FormatDescription& description, const std::vector<std::string>& lines) {
    const auto format = makeFormat(description);
    FormatDescription plain;
    plain.type = "syslog";
    const auto base = makeFormat(plain);
    if (!format || !base) {
        return false;
    }
    const auto reader = (*format)->reader();
    const auto baseReader = (*base)->reader();
    for (const std::string& line : lines) {
        EntryColumns columns;
        EntryColumns baseColumns;
        if (reader->read(line, columns) && baseReader->read(line, baseColumns)) {
            EntryFields fields;
            EntryFields baseFields;
            reader->readFields(line, fields);
            baseReader->readFields(line, baseFields);
            if (fields.all().size() > baseFields.all().size()) {
                return true;
            }
        }
    }
    return false;
}

/// Whether a path such as /var/log/nginx/access.log names the program of a format.
bool namesProgram(std::string_view log, std::string_view format) {
    const std::string_view program = format.substr(0, format.find('-'));
    const bool isApache = program == "apache" && log.find("httpd") != std::string_view::npos;
    return isApache || log.find(program) != std::string_view::npos;
}

} // namespace

class FormatSuggestion::Search {
public:
    Search(const std::vector<std::string>& lines, std::string_view log)
        : m_lines(lines), m_glance(glance(lines)), m_log(log) {}

    void look(const ReadyFormat& ready) {
        if (ready.format.type == "syslog") {
            lookAtSyslog(ready);
            return;
        }
        const auto first = FormatFit::of(ready.format, m_glance);
        if (!first || first->fitting == 0) {
            return;
        }
        const auto fit = FormatFit::of(ready.format, m_lines);
        if (fit && fit->fitting > 0) {
            add({{ready.name}, ready.about, *fit, "", ready.isGeneric});
        }
    }

    std::vector<Choice> take() {
        if (m_syslog) {
            add(std::move(*m_syslog));
        }
        // Formats of the same score are in the order of their names already.
        std::stable_sort(m_found.begin(), m_found.end(), [](const Found& one, const Found& other) {
            return std::pair(one.score, one.isNamed) > std::pair(other.score, other.isNamed);
        });
        std::vector<Choice> choices;
        for (const Found& found : m_found) {
            if (choices.size() < mostChoices) {
                choices.push_back(found.choice);
                choices.back().table = TomlText::logTable(m_log, found.choice.names);
                choices.back().equals = equalsOf(found);
            }
        }
        return choices;
    }

    std::optional<Choice> propose() const {
        const std::optional<FormatDescription> format = proposeFormat(m_lines);
        const auto fit = format ? FormatFit::of(*format, m_lines) : refused("");
        if (!fit) {
            return std::nullopt;
        }
        return Choice{
            {}, "made from the shape of the lines", *fit, TomlText::logTable(m_log, *format), true};
    }

private:
    struct Found {
        double score;
        bool isNamed; ///< the path of the log names the program
        Choice choice;
    };

    std::vector<std::string> equalsOf(const Found& found) const {
        std::vector<std::string> names;
        for (const Found& other : m_found) {
            if (&other != &found && other.score == found.score) {
                names.insert(names.end(), other.choice.names.begin(), other.choice.names.end());
            }
        }
        return names;
    }

    /// Of several formats that read the same, the one that is made for a program is better.
    void add(Choice choice) {
        constexpr double generic = 0.01;
        const double score = choice.fit.score() - (choice.isGeneric ? generic : 0);
        const bool isNamed = !choice.names.empty() && namesProgram(m_log, choice.names.front());
        m_found.push_back({score, isNamed, std::move(choice)});
    }

    /// All formats of this type read the same lines: those that find fields are named together.
    void lookAtSyslog(const ReadyFormat& ready) {
        if (!m_isSyslogKnown) {
            m_isSyslogKnown = true;
            FormatDescription plain;
            plain.type = "syslog";
            const auto fit = FormatFit::of(plain, m_lines);
            if (fit && fit->fitting > 0) {
                m_syslog = Choice{{}, "lines of a system logger", *fit, "", true};
            }
        }
        if (m_syslog && !ready.format.extracts.empty() && extracts(ready.format, m_lines)) {
            m_syslog->names.push_back(ready.name);
        }
    }

    const std::vector<std::string>& m_lines;
    const std::vector<std::string> m_glance;
    const std::string_view m_log;
    bool m_isSyslogKnown = false;
    std::optional<Choice> m_syslog;
    std::vector<Found> m_found;
};

double FormatSuggestion::leastScore(const Choice& best, std::string_view log) {
    // That a format of another program finds the time is no sign that the log is that program's.
    const bool isBare = best.fit.withType == 0 && best.fit.withSource == 0;
    if (isBare && !best.names.empty() && !namesProgram(log, best.names.front())) {
        return best.fit.scoreWithoutProgram();
    }
    return best.fit.score() + (best.isGeneric ? leastGain : leastGainOverOwn);
}

FormatSuggestion FormatSuggestion::of(const ReadyFormats& formats, std::vector<std::string> lines,
                                      std::string_view log) {
    if (lines.size() > mostLines) {
        lines.resize(mostLines);
    }
    for (std::string& line : lines) {
        line.resize(std::min(line.size(), longestLine));
    }
    FormatSuggestion suggestion;
    suggestion.m_lines = lines.size();
    if (lines.empty()) {
        return suggestion;
    }
    Search search(lines, log);
    for (const ReadyFormats::Place& place : formats.list()) {
        if (const auto ready = ReadyFormats::load(place)) {
            search.look(*ready);
        }
    }
    suggestion.m_ready = search.take();
    suggestion.m_proposal = search.propose();
    if (suggestion.m_proposal && !suggestion.m_ready.empty() &&
        suggestion.m_proposal->fit.score() < leastScore(suggestion.m_ready.front(), log)) {
        suggestion.m_proposal.reset();
    }
    return suggestion;
}

namespace {

void write(JsonWriter& json, const FormatSuggestion::Choice& choice) {
    const FormatFit& fit = choice.fit;
    json.beginObject().key("formats").beginArray();
    for (const std::string& name : choice.names) {
        json.value(name);
    }
    json.endArray().member("fits_equally", choice.equals).member("description", choice.about);
    json.member("percent", percent(fit.share()));
    json.member("percent_time", percent(partOf(fit.withTime, fit.entries)));
    json.member("percent_type", percent(partOf(fit.withType, fit.entries)));
    json.member("percent_source", percent(partOf(fit.withSource, fit.entries)));
    json.member("entries", fit.entries).member("table", choice.table).endObject();
}

} // namespace

std::string FormatSuggestion::json() const {
    return JsonWriter::text([this](JsonWriter& json) {
        json.beginObject().member("lines", m_lines).key("ready").beginArray();
        for (const Choice& choice : m_ready) {
            write(json, choice);
        }
        json.endArray().key("proposal");
        if (m_proposal) {
            write(json, *m_proposal);
        } else {
            json.null();
        }
        json.endObject();
    });
}

} // namespace zrm::host
