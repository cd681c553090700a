#include "host/diagnose/FormatTrial.h"

#include "agent/zrmmain.h"
#include "host/framework/TraceCapture.h"
#include "host/framework/TraceControl.h"
#include "logtypes/UserLogFile.h"
#include "parser/StringParser.h"
#include "support/TemporaryDirectory.h"
#include "support/TestValidLog.h"

#include <gmock/gmock.h>

#include <cstdlib>
#include <filesystem>
#include <iostream>
#include <map>
#include <random>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

constexpr char payment[] =
    R"(A , "%d-%d-%d %d:%d:%d %s %64[^:]: %256[^\n]" , year month day hour minute second type source description)";

FormatTrial::Line only(const std::string& format, const std::string& line) {
    const FormatTrial::Result result = FormatTrial::run(format, {line});
    EXPECT_TRUE(result.accepted) << result.reason;
    return result.lines.empty() ? FormatTrial::Line() : result.lines.at(0);
}

std::map<std::string, std::string> rowOf(const FormatTrial::Line& line) {
    return {line.row.begin(), line.row.end()};
}

TEST(FormatTrial, DescribesTheDirectives) {
    const std::string format = R"(A, "[%*s] %(20)4d at\t%[^\"]\"" , year type = "%.3s")";
    const FormatTrial trial(format);
    ASSERT_TRUE(trial.isAccepted()) << trial.result().reason;
    std::vector<std::string> texts;
    for (const FormatTrial::Directive& directive : trial.result().directives) {
        texts.push_back(directive.text);
        EXPECT_EQ(format.substr(directive.from, directive.to - directive.from), directive.text);
    }
    EXPECT_THAT(texts, ElementsAre("%*s", "%(20)4d", R"(%[^\"])"));
    EXPECT_EQ(trial.result().directives[0].field, "");
    EXPECT_EQ(trial.result().directives[0].column, "");
    EXPECT_EQ(trial.result().directives[1].field, "year");
    EXPECT_EQ(trial.result().directives[1].column, "ENTRYTIME");
    EXPECT_EQ(trial.result().directives[2].field, "type");
    EXPECT_EQ(trial.result().directives[2].column, "ENTRYTYPE");
}

TEST(FormatTrial, ReturnsTheConfigurationLine) {
    EXPECT_EQ(FormatTrial("  A , \"%s\" , type", "/var/log/x.log").result().configurationLine,
              "/var/log/x.log ;N ;U ;A , \"%s\" , type");
    EXPECT_EQ(FormatTrial("A").result().configurationLine, "");
}

struct Refused {
    const char* format;
    std::size_t position;
    const char* reason; ///< a part of it
};

TEST(FormatTrial, ReportsWhyAndWhereAFormatIsRefused) {
    const Refused cases[] = {
        {"", 0, "Scan for start of format specifier failed"},
        {"B , \"%s\" , type", 0, "Scan for start of format specifier failed"},
        {"  A ; \"%s\" , type", 4, "Scan for start of format specifier failed"},
        {"A , %s", 4, "Scan for start of format specifier failed"},
        {"A , \"%s , type", 14, "ends too early"},
        {"A , \"%d\\", 7, "The format ends with a backslash"},
        {"A , \"no directive\" , type", 17, "no directive between"},
        {"A , \"%d %q\" , day", 9, "Invalid convcode"},
        {"A , \"%(1000)s\" , type", 6, "Invalid column position specified: 1000)"},
        {"A , \"%0d\" , day", 6, "Invalid field width specified: 0;"},
        {"A , \"\\f%s\" , type", 6, "Invalid escape sequence"},
        {"A , \"%s\" type", 7, "Error found in format command"},
        {"A , \"%s %s\" , type sauce", 19, "Error while processing directive #2; "},
        {"A , \"%s\" , type source", 16, "extraneous data included in format specifier:  source"},
        {"A , \"%s\" , type = \"%d\"", 11, "Scan and print data types are not compatible"},
        {"A , \"%s\" ,\n type", 10, "holds neither line ends"},
    };
    for (const Refused& refused : cases) {
        const FormatTrial trial(refused.format);
        EXPECT_FALSE(trial.isAccepted()) << refused.format;
        EXPECT_EQ(trial.result().position, refused.position) << refused.format;
        EXPECT_THAT(trial.result().reason, HasSubstr(refused.reason)) << refused.format;
        EXPECT_THAT(trial.result().directives, IsEmpty());
    }
}

TEST(FormatTrial, ADirectiveMayBeTooLong) {
    const FormatTrial trial("A , \"" + std::string(300, 'x') + "%s\" , type");
    EXPECT_FALSE(trial.isAccepted());
    EXPECT_THAT(trial.result().reason, HasSubstr("too long"));
    EXPECT_EQ(trial.result().position, 5U + 255U);
}

TEST(FormatTrial, TheConfigurationLineMayBeTooLong) {
    const std::string format = "A , \"%s\" ,";
    const std::string log = "/x.log";
    const std::size_t most = 1022 - log.size() - std::string(" ;N ;U ;").size();
    const auto padded = [&](std::size_t size) {
        return format + std::string(size - format.size() - 4, ' ') + "type";
    };
    EXPECT_TRUE(FormatTrial(padded(most), log).isAccepted());
    const FormatTrial trial(padded(most + 1), log);
    EXPECT_FALSE(trial.isAccepted());
    EXPECT_EQ(trial.result().position, std::nullopt);
    EXPECT_THAT(trial.result().reason, HasSubstr("1023 characters"));
}

TEST(FormatTrial, ItsLengthIncludesTheExpandedNames) {
    const std::string name = "/" + std::string(399, 'x');
    EXPECT_TRUE(FormatTrial("A , \"${@}${@} %s\" , type", "/" + std::string(99, 'x')).isAccepted());
    const FormatTrial trial("A , \"${@}%s${@}%s${@}\" , type type", name);
    EXPECT_FALSE(trial.isAccepted());
    EXPECT_EQ(trial.result().reason,
              "With each ${@} replaced by the log's name the format has 1222 "
              "characters; it may have 1022. Write the name in fewer places.");
}

TEST(FormatTrial, ManyNamesTakeNoMemory) {
    std::string format = "A , \"";
    for (int i = 0; i < 250'000; ++i) {
        format += "${@}";
    }
    const std::string name = "/" + std::string(1'000'000, 'x'); // 250 GB, written out
    EXPECT_THAT(FormatTrial(format, name).result().reason, HasSubstr("would have 2000"));
    EXPECT_THAT(
        FormatTrial("${@}" + std::string(2000, ' '), "/" + std::string(900, '%')).result().reason,
        HasSubstr("would have"));
}

TEST(FormatTrial, ReturnsFieldsAndRowOfALineThatFits) {
    const std::string text = "2026-11-20 07:03:09 ERROR payment: Card declined";
    const FormatTrial::Line line = only(payment, text);
    EXPECT_TRUE(line.matched);
    EXPECT_EQ(line.line, text);
    EXPECT_EQ(line.failedAt, std::nullopt);
    EXPECT_EQ(line.directive, std::nullopt);
    EXPECT_EQ(line.reason, "");
    ASSERT_THAT(line.fields, SizeIs(9));
    EXPECT_EQ(line.fields[1].value, "11");
    EXPECT_EQ(line.fields[8].name, "description");
    EXPECT_EQ(line.fields[8].column, "ENTRYDESC");
    EXPECT_EQ(line.fields[8].value, "Card declined");
    EXPECT_EQ(text.substr(line.fields[8].from, line.fields[8].to - line.fields[8].from),
              "Card declined");
    EXPECT_EQ(text.substr(line.fields[7].from, line.fields[7].to - line.fields[7].from), "payment");
    auto row = rowOf(line);
    EXPECT_EQ(row["ENTRYTIME"], "1261120070309000");
    EXPECT_EQ(row["ENTRYTYPE"], "ERROR");
    EXPECT_EQ(row["ENTRYSRC"], "payment");
    EXPECT_EQ(row["ENTRYSYS"], "");
    EXPECT_EQ(row["UENTRYDESC"], "Card declined");
}

TEST(FormatTrial, ValuesAreThoseInTheColumns) {
    const FormatTrial::Line line =
        only(R"(A , "%d %*s %s" , class = "pid %05d" description)", "42 skipped 17\u00e9");
    ASSERT_THAT(line.fields, SizeIs(2));
    EXPECT_EQ(line.fields[0].value, "pid 00042");
    EXPECT_EQ(line.fields[0].directive, 0U);
    EXPECT_EQ(line.fields[1].directive, 2U);
    EXPECT_EQ(line.fields[1].from, 11U);
    EXPECT_EQ(line.fields[1].to, 15U);
}

struct Unfit {
    const char* scan;
    const char* line;
    std::size_t failedAt;
    std::size_t directive;
    const char* reason;
};

TEST(FormatTrial, ReportsWhereALineStopsFitting) {
    const Unfit cases[] = {
        {"%d-%d", "12 13", 2, 1, "The text \"-\" of the format is expected here."},
        {"%d-%d", "12-x", 3, 1, "A number for %d is expected here."},
        {"%d x", "word", 0, 0, "A number for %d is expected here."},
        {"%s %s", "one", 3, 1, "The line ends here; a text for %31s is expected here."},
        {"<%d", "", 0, 0, "A line without text is skipped."},
        {"%s:%s", "one", 3, 1,
         "The line ends here; the text \":\" of the format is expected here."},
        {"%[0-9]%s", "x", 0, 0, "A character of the set in %31[0-9] is expected here."},
        {"%s %(30)s", "one two", 7, 1, "The line ends before column 30, where this field begins."},
    };
    for (const Unfit& unfit : cases) {
        std::string format = std::string("A , \"") + unfit.scan + "\" , type";
        if (std::string(unfit.scan).find('%') != std::string(unfit.scan).rfind('%')) {
            format += " type";
        }
        const FormatTrial::Line line = only(format, unfit.line);
        EXPECT_FALSE(line.matched) << unfit.line;
        EXPECT_EQ(line.failedAt, unfit.failedAt) << unfit.scan;
        if (*unfit.line != '\0') {
            EXPECT_EQ(line.directive, unfit.directive) << unfit.scan;
        }
        EXPECT_EQ(line.reason, unfit.reason) << unfit.scan;
        EXPECT_THAT(line.row, IsEmpty());
        EXPECT_EQ(line.fields.size(), *unfit.line != '\0' ? unfit.directive : 0U);
    }
}

TEST(FormatTrial, ALineThatFitsMayHaveABadTime) {
    const FormatTrial::Line line = only(R"(A , "%s %s" , month description)", "Foo bar");
    EXPECT_TRUE(line.matched);
    EXPECT_EQ(line.reason, "Error: invalid month found in event entrytime; 'Foo'");
}

TEST(FormatTrial, AFormatThatPrintsNothingYieldsNoRow) {
    const FormatTrial::Line line = only(R"(A , "%*s" ,)", "word");
    EXPECT_FALSE(line.matched);
    EXPECT_EQ(line.failedAt, std::nullopt);
    EXPECT_EQ(line.reason, "The format prints no field, so that no line gives a row.");
}

TEST(FormatTrial, ALongLineIsReadAsSeveral) {
    const FormatTrial::Result result = FormatTrial::run(
        R"(A , "%s" , description)", {std::string(2046, 'x'), std::string(5000, 'y')});
    ASSERT_THAT(result.lines, SizeIs(4));
    EXPECT_EQ(result.lines[0].line.size(), 2046U);
    EXPECT_EQ(result.lines[1].line.size(), 2047U);
    EXPECT_EQ(result.lines[3].line.size(), 906U);
    EXPECT_EQ(result.matched, 4U);
}

TEST(FormatTrial, CountsCoverage) {
    const FormatTrial::Result result = FormatTrial::run(R"(A , "%d" , day)", {"1", "2", "word"});
    EXPECT_EQ(result.matched, 2U);
    EXPECT_DOUBLE_EQ(FormatTrial::percent(result), 66.6);
    EXPECT_DOUBLE_EQ(FormatTrial::percent(FormatTrial::run(R"(A , "%d" , day)", {})), 0.0);
}

TEST(FormatTrial, PositionsInALineThatIsNotUtf8ReferToTheShownText) {
    const std::string json =
        FormatTrial::json(FormatTrial::run(R"(A , "%s %d" , type day)", {"\xe9\xe9 x"}));
    EXPECT_THAT(json, HasSubstr("\"line\":\"\uFFFD\uFFFD x\""));
    EXPECT_THAT(json, HasSubstr("\"failed_at\":7,"));
    EXPECT_THAT(json, HasSubstr("{\"from\":0,\"to\":6,\"name\":\"type\""));
}

TEST(FormatTrial, LeavesTheTraceAlone) {
    const TemporaryDirectory directory;
    TraceControl::openFile(directory.file("trace"));
    TraceControl::configure("error+detail+fine");
    FormatTrial::run(R"(A , "%d" , day)", {"1", "word"});
    FormatTrial::run(R"(A , "%q" , day)", {});
    TraceControl::configure("error");
    TraceControl::openFile("");
    EXPECT_FALSE(std::filesystem::exists(directory.file("trace")) &&
                 std::filesystem::file_size(directory.file("trace")) > 0);
}

TEST(FormatTrial, WritesJson) {
    EXPECT_EQ(
        FormatTrial::json(FormatTrial::run("A", {"x"})),
        R"({"accepted":false,"reason":"Scan for start of format specifier failed; looking )"
        R"(for \" %*1[Aa] , \"%n\" but found:  A","position":1,"directives":[],"lines":[],)"
        R"("coverage":{"lines":0,"matched":0,"percent":0.0},"configuration_line":null,"table":null})");
    EXPECT_EQ(
        FormatTrial::json(FormatTrial::run("A,\"%d\",day", {"x"})),
        R"({"accepted":true,"reason":null,"position":null,"directives":[{"text":"%d",)"
        R"("from":3,"to":5,"field":"day","column":"ENTRYTIME"}],"lines":[{"line":"x",)"
        R"("matched":false,"fields":[],"row":null,"failed_at":0,"directive":0,"reason":)"
        R"("A number for %d is expected here."}],"coverage":{"lines":1,"matched":0,)"
        R"("percent":0.0},"configuration_line":"/path/to/the.log ;N ;U ;A,\"%d\",day","table":null})");
}

// The trial against the agent itself: the same configuration line, the same rows.

/// A log of a configuration line that has learned its format, as its monitor would.
class MonitoredLog : public UserLogFile {
public:
    explicit MonitoredLog(const ValidLog& line) : UserLogFile(line, Unmonitored{}) {
        auto format = std::make_unique<StringParser>(procedure(), fields());
        if (format->status() == OBJECT_FORMAT_LEARNED) {
            SPAnchor = std::move(format);
        }
    }
    bool isLearned() const { return SPAnchor != nullptr; }
};

class Generator {
public:
    Generator() : m_seed(environment("ZRM_TEST_SEED", std::random_device{}())), m_random(m_seed) {
        std::cout << "FormatTrial: ZRM_TEST_SEED=" << m_seed << '\n';
    }
    static std::uint64_t environment(const char* name, std::uint64_t missing) {
        const char* const text = std::getenv(name);
        return text != nullptr ? std::strtoull(text, nullptr, 10) : missing;
    }
    unsigned below(unsigned limit) { return static_cast<unsigned>(m_random() % limit); }
    template <std::size_t Size> std::string pick(const char* const (&choices)[Size]) {
        return choices[below(Size)];
    }
    std::string format() {
        constexpr const char* pieces[] = {"%d", "%s",  "%5c", "%[^:]", "%*s", "%(4)s",
                                          "%x", "%lf", ":",   " ",     "\t",  "-",
                                          "%%", "\\t", "%q",  "${@}",  "%3d", "%[^\t]"};
        constexpr const char* names[] = {
            "year",   "month",  "day",  "hour",        "minute",         "second",
            "system", "source", "type", "description", "class = \"%s\"", "class"};
        constexpr const char* gaps[] = {"", " ", " ", "\t"};
        std::string text = pick(gaps) + "A" + pick(gaps) + "," + pick(gaps) + "\"";
        unsigned fields = 0;
        for (unsigned count = 1 + below(6); count > 0; --count) {
            const std::string piece = pick(pieces);
            fields += piece[0] == '%' && piece[1] != '%' && piece[1] != '*' ? 1 : 0;
            text += piece;
        }
        text += "\"" + pick(gaps) + ",";
        for (; fields > below(20) / 19; --fields) {
            text += pick(gaps) + " " + pick(names);
        }
        return text;
    }
    std::string line() {
        constexpr const char* pieces[] = {"12",  "2026", "-", ":",  " ",    "word", "x",
                                          "Nov", "3.5",  "%", "\t", "\xe9", "31",   "7"};
        std::string text;
        for (unsigned count = below(9); count > 0; --count) {
            text += pick(pieces);
        }
        return text;
    }

private:
    std::uint64_t m_seed;
    std::mt19937_64 m_random;
};

TEST(FormatTrial, NeverDisagreesWithTheAgent) {
    TemporaryDirectory directory;
    const std::string path = directory.write("a.log", "");
    Generator generator;
    const auto cases = static_cast<int>(Generator::environment("ZRM_TEST_CASES", 3000));
    int accepted = 0;
    int matched = 0;
    for (int i = 0; i < cases; ++i) {
        const std::string format = generator.format();
        FormatTrial trial(format, path);
        TraceCapture quiet;
        // Blanks in front of a format would part it from its ';'.
        const std::string written = format.substr(format.find_first_not_of(" \t"));
        const MonitoredLog log(*validLog(path, " ;N ;U ;" + written));
        ASSERT_EQ(trial.isAccepted(), log.isLearned()) << format;
        if (!log.isLearned()) {
            continue;
        }
        ++accepted;
        for (int turn = 0; turn < 10; ++turn) {
            const std::string text = generator.line();
            std::string line = text + "\n";
            zrm_rmlogent_data_t row{};
            const bool fits =
                const_cast<MonitoredLog&>(log).formatEntryAsRow(line.data(), &row, nullptr) == 0;
            const FormatTrial::Line tried = trial.scan(text);
            ASSERT_EQ(tried.matched, fits) << format << '\n' << text;
            if (!fits) {
                ASSERT_NE(tried.reason, "") << format << '\n' << text;
                ASSERT_LE(tried.failedAt.value_or(0), text.size());
                continue;
            }
            ++matched;
            ASSERT_EQ(tried.failedAt, std::nullopt) << format << '\n' << text;
            // The fields, one behind the other, are what the row's columns begin with.
            std::map<std::string, std::string> columns;
            for (const FormatTrial::Field& field : tried.fields) {
                ASSERT_LE(field.from, field.to);
                ASSERT_LE(field.to, text.size());
                columns[field.column] += field.value;
            }
            const auto expect = [&](const char* name, const char* column, std::size_t width) {
                std::string wanted = columns[name].substr(0, width);
                wanted.resize(width, ' ');
                ASSERT_EQ(std::string(column, width), wanted) << name << '\n'
                                                              << format << '\n'
                                                              << text;
            };
            expect("ENTRYSYS", row.entrysys, sizeof row.entrysys);
            expect("ENTRYSRC", row.entrysrc, sizeof row.entrysrc);
            expect("ENTRYTYPE", row.entrytype, sizeof row.entrytype);
            expect("ENTRYCLASS", row.entryclass, sizeof row.entryclass);
            expect("ENTRYDESC", row.entrydesc, sizeof row.entrydesc);
        }
    }
    EXPECT_GT(accepted, cases / 10);
    EXPECT_GT(matched, cases / 10);
}

} // namespace
