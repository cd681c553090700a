#ifndef ZRM_TESTS_PARSER_PROBE_H
#define ZRM_TESTS_PARSER_PROBE_H

#include "parser/StringParser.h"

#include <array>
#include <cstring>
#include <string>

using namespace zrm;

/// The field names of user logs.
inline constexpr _KeywordFields testKeywords[] = {
    {"year", 2},   {"month", 2},  {"day", 2},  {"hour", 2},  {"minute", 2},      {"second", 2},
    {"system", 2}, {"source", 2}, {"type", 2}, {"class", 2}, {"description", 2}, {nullptr, 0},
};

/// A parser whose steps and state are accessible to tests.
class ParserProbe : public StringParser {
public:
    explicit ParserProbe(const std::string& format, const _KeywordFields* fields = testKeywords)
        : StringParser(format.c_str(), fields) {}
    explicit ParserProbe(const char** position) : StringParser(position) {}

    using StringParser::DataType;
    using StringParser::FieldName;
    using StringParser::HasColumn;
    using StringParser::MaxFieldSize;
    using StringParser::ObjectStatus;
    using StringParser::PrintIndex;
    using StringParser::ScanOrder;
    using StringParser::Suppressed;
    using StringParser::Value;

    using StringParser::allocateVariableStorage;
    using StringParser::convertEscape;
    using StringParser::defaultPrintDirective;
    using StringParser::extractVariableSize;
    using StringParser::findDirective;
    using StringParser::getFieldName;
    using StringParser::getPrintDirective;
    using StringParser::validateKeywordTable;
    using StringParser::validatePrintConvcode;
    using StringParser::validateScanConvcode;

    bool isLearned() const { return status() == OBJECT_FORMAT_LEARNED; }
    /// The node of the directive with this number, counted from 1, or null.
    const StringParser* node(int number) const {
        const StringParser* result = next();
        for (; result != nullptr && number > 1; --number) {
            result = result->next();
        }
        return result;
    }
};

/// Format buffers of one size for every keyword.
class TestBuffers {
public:
    explicit TestBuffers(long room = 2000) {
        for (std::size_t i = 0; i < m_buffers.size(); ++i) {
            m_texts[i].assign(static_cast<std::size_t>(room) + 1, '\0');
            m_buffers[i] = {m_texts[i].data(), room};
        }
    }
    _FormatBuffer* get() { return m_buffers.data(); }
    std::string text(const char* keyword) const { return m_texts[index(keyword)].c_str(); }
    long room(const char* keyword) const { return m_buffers[index(keyword)].room; }

private:
    static std::size_t index(const char* keyword) {
        std::size_t result = 0;
        while (std::strcmp(testKeywords[result].keyword, keyword) != 0) {
            ++result;
        }
        return result;
    }

    std::array<std::string, 11> m_texts;
    std::array<_FormatBuffer, 11> m_buffers;
};

#endif
