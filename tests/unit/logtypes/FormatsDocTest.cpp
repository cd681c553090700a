#include "UserLogTest.h"

#include <gmock/gmock.h>

#include <fstream>
#include <iterator>
#include <map>
#include <sstream>

using namespace zrm;

// What docs/formats.md says of formats is run: the examples of its tables, and the ten worked
// specifiers with their sample lines.

namespace {

using testing::IsEmpty;

std::string fileText(const std::string& name) {
    std::ifstream stream(std::string(ZRM_SOURCE_DIR) + "/" + name);
    EXPECT_TRUE(stream) << name;
    return {std::istreambuf_iterator<char>(stream), {}};
}

std::vector<std::string> linesOf(const std::string& text) {
    std::vector<std::string> lines;
    std::istringstream stream(text);
    for (std::string line; std::getline(stream, line);) {
        lines.push_back(line);
    }
    return lines;
}

/// The texts in backquotes of a line.
std::vector<std::string> quoted(const std::string& line) {
    std::vector<std::string> texts;
    for (std::size_t begin = line.find('`'); begin != std::string::npos;) {
        const std::size_t end = line.find('`', begin + 1);
        texts.push_back(line.substr(begin + 1, end - begin - 1));
        begin = line.find('`', end + 1);
    }
    return texts;
}

/// The rows of the table with this heading.
std::vector<std::vector<std::string>> table(const std::string& heading) {
    std::vector<std::vector<std::string>> rows;
    bool isInside = false;
    for (const std::string& line : linesOf(fileText("docs/formats.md"))) {
        isInside = line == heading || (isInside && line.rfind("|", 0) == 0);
        if (isInside && line.find('`') != std::string::npos) {
            rows.push_back(quoted(line));
        }
    }
    return rows;
}

/// One of the worked specifiers.
struct Example {
    std::string title;
    std::string sample;
    std::string line;
    std::string configuration;
    std::map<std::string, std::string> columns;
};

std::vector<Example> examples() {
    std::vector<Example> found;
    bool isInside = false;
    for (const std::string& line : linesOf(fileText("docs/formats.md"))) {
        if (line.rfind("## ", 0) == 0) {
            isInside = line == "## Ten worked specifiers";
        } else if (isInside && line.rfind("### ", 0) == 0) {
            found.push_back({line.substr(4), "", "", "", {}});
        } else if (isInside && !found.empty()) {
            Example& example = found.back();
            if (line.rfind("Sample: ", 0) == 0) {
                example.sample = quoted(line).at(0);
            } else if (line.rfind("    /", 0) == 0) {
                example.configuration = line.substr(4);
            } else if (line.rfind("    ", 0) == 0) {
                example.line = line.substr(4);
            } else if (line.rfind("| ENTRY", 0) == 0) {
                example.columns[line.substr(2, line.find(' ', 2) - 2)] = quoted(line).at(0);
            }
        }
    }
    return found;
}

std::map<std::string, std::string> columnsOf(const zrm_rmlogent_data_t& row) {
    std::map<std::string, std::string> columns;
    const auto put = [&](const char* name, const std::string& text) {
        if (!text.empty()) {
            columns[name] = text;
        }
    };
    put("ENTRYTIME", columnText(row.entrytime));
    put("ENTRYSYS", columnText(row.entrysys));
    put("ENTRYSRC", columnText(row.entrysrc));
    put("ENTRYTYPE", columnText(row.entrytype));
    put("ENTRYCLASS", columnText(row.entryclass));
    put("ENTRYDESC", columnText(row.entrydesc));
    return columns;
}

class FormatsDoc : public UserLogTest {
protected:
    FormatsDoc() { m_clock.set(1795176000); } // 20 November 2026, 12:00:00
};

TEST_F(FormatsDoc, DirectivesReadWhatTheTableSays) {
    const auto rows = table("| Directive | Line | Column |");
    EXPECT_EQ(rows.size(), 13U);
    for (const auto& row : rows) {
        ASSERT_EQ(row.size(), 3U);
        makeLog("A , \"" + row[0] + "\" , description");
        long result = -1;
        EXPECT_EQ(columnText(format(row[1] + "\n", result).entrydesc), row[2]) << row[0];
        EXPECT_EQ(result, 0) << row[0];
    }
}

TEST_F(FormatsDoc, PrintDirectivesWriteWhatTheTableSays) {
    const auto rows = table("| Scan and print directive | Line | Column |");
    EXPECT_EQ(rows.size(), 7U);
    for (const auto& row : rows) {
        ASSERT_EQ(row.size(), 4U);
        makeLog("A , \"" + row[0] + "\" , description = \"" + row[1] + "\"");
        long result = -1;
        EXPECT_EQ(columnText(format(row[2] + "\n", result).entrydesc), row[3]) << row[1];
        EXPECT_EQ(result, 0) << row[1];
    }
}

TEST_F(FormatsDoc, TheStepsLeadToASpecifierThatMatches) {
    const std::string text = fileText("docs/formats.md");
    const std::size_t line = text.find("    2026-11-20 07:03:09 ERROR payment: Card declined\n");
    const std::size_t specifier = text.find("       A , \"");
    ASSERT_NE(line, std::string::npos);
    ASSERT_NE(specifier, std::string::npos);
    makeLog(text.substr(specifier + 7, text.find('\n', specifier) - specifier - 7));
    long result = -1;
    const auto columns =
        columnsOf(format(text.substr(line + 4, text.find('\n', line) - line - 3), result));
    EXPECT_EQ(columns, (std::map<std::string, std::string>{{"ENTRYTIME", "1261120070309000"},
                                                           {"ENTRYTYPE", "ERROR"},
                                                           {"ENTRYSRC", "payment"},
                                                           {"ENTRYDESC", "Card declined"}}));
}

TEST_F(FormatsDoc, TheTenWorkedSpecifiersMatchTheirSamples) {
    const auto all = examples();
    EXPECT_EQ(all.size(), 10U);
    for (const Example& example : all) {
        SCOPED_TRACE(example.title);
        const std::string sample = fileText(example.sample);
        const std::vector<std::string> lines = linesOf(sample);
        ASSERT_GE(lines.size(), 3U);
        EXPECT_EQ(lines[0], example.line);
        write(sample);
        makeLogOfLine(example.configuration.substr(example.configuration.find(' ')));
        RecordingTrace trace(TRC1_ERROR);
        const auto rows = report();
        EXPECT_THAT(trace.messages(), IsEmpty());
        ASSERT_EQ(rows.size(), lines.size());
        EXPECT_EQ(columnsOf(rows.back()), example.columns);
        for (std::size_t index = 0; index < lines.size(); ++index) {
            const std::string description = columnText(rows[lines.size() - 1 - index].entrydesc);
            EXPECT_FALSE(description.empty()) << lines[index];
            EXPECT_NE(lines[index].find(description), std::string::npos) << lines[index];
            long result = -1;
            EXPECT_EQ(columnText(format(lines[index] + "\n", result).entrydesc), description);
            EXPECT_EQ(result, 0) << "the same result while monitoring";
        }
    }
}

} // namespace
