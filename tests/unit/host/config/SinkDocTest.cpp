#include "host/config/SinkTypes.h"

#include <gtest/gtest.h>

#include <fstream>
#include <iterator>
#include <span>
#include <string>
#include <string_view>

using namespace zrm::host;

namespace {

std::string code(std::string_view text) {
    return '`' + std::string(text) + '`';
}

std::string bounds(const SinkOption& option, const std::string& unit) {
    return std::to_string(option.least) + unit + " to " + std::to_string(option.most) + unit;
}

std::string valueOf(const SinkOption& option) {
    std::string choices;
    for (const std::string_view choice : option.choices) {
        choices += (choices.empty() ? "" : ", ") + code(choice);
    }
    switch (option.kind) {
    case SinkOption::TEXT:
        return "text of at most " + std::to_string(option.most) + " bytes";
    case SinkOption::NUMBER:
        return "number, " + bounds(option, "");
    case SinkOption::DURATION:
        return "duration, " + bounds(option, "s");
    case SinkOption::CHOICE:
        return choices;
    case SinkOption::URL:
        return "URL";
    case SinkOption::ADDRESS:
        return "`HOST:PORT`";
    case SinkOption::PATH:
        return "absolute path";
    case SinkOption::OUTPUT:
        return "absolute path or `-`";
    case SinkOption::HEADERS:
    case SinkOption::LABELS:
    case SinkOption::ATTRIBUTES:
        return "table of texts";
    }
    return "";
}

std::string defaultOf(const SinkOption& option) {
    if (option.need == SinkOption::REQUIRED) {
        return "required";
    }
    if (option.value.empty()) {
        return "none";
    }
    return option.kind == SinkOption::NUMBER ? std::string(option.value)
                                             : code('"' + std::string(option.value) + '"');
}

std::string tableOf(std::span<const SinkOption> options) {
    std::string table = "| Key | Value | Default | Meaning |\n|---|---|---|---|\n";
    for (const SinkOption& option : options) {
        table += "| " + code(option.name) + " | " + valueOf(option) + " | " + defaultOf(option) +
                 " | " + std::string(option.meaning);
        if (!option.instead.empty()) {
            table += "; cannot be combined with " + code(option.instead);
        }
        table += " |\n";
    }
    return table;
}

std::string page() {
    std::ifstream stream(ZRM_DOCS "/configuration.md");
    return {std::istreambuf_iterator<char>(stream), {}};
}

TEST(SinkDoc, ThePageHasTheKeysThatEverySinkHas) {
    const std::string table = tableOf(SinkTypes::common());
    EXPECT_NE(page().find("\n" + table + "\n"), std::string::npos)
        << "docs/configuration.md lacks\n"
        << table;
}

TEST(SinkDoc, ThePageHasEveryTypeWithItsKeysAndAnExample) {
    const std::string text = page();
    for (const SinkType& type : SinkTypes::all()) {
        const std::string section = "\n#### `" + std::string(type.name) +
                                    "`: " + std::string(type.meaning) + "\n\n" +
                                    tableOf(type.options) + "\n";
        EXPECT_NE(text.find(section), std::string::npos)
            << "docs/configuration.md lacks" << section;
        EXPECT_NE(text.find("    type = \"" + std::string(type.name) + "\"\n"), std::string::npos)
            << type.name;
    }
}

} // namespace
