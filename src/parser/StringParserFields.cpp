#include "parser/StringParser.h"

#include "base/TraceScope.h"
#include "parser/DirectiveRules.h"

#include <cstdio>
#include <cstring>

namespace zrm {

namespace {

TRC1_Anchor anchor{"StringParserFields.cpp"};

constexpr char startPattern[] = "\" , %n";

/// The length of the field name at the start of the text, if it matches at least the minimum of
/// `keyword`; otherwise 0.
std::size_t matchKeyword(const char* text, const _KeywordFields& keyword) {
    const std::size_t nameLength = std::strcspn(text, "= \t\n\v\f\r");
    const bool isNamed = nameLength >= static_cast<std::size_t>(keyword.minimum) &&
                         std::strncmp(text, keyword.keyword, nameLength) == 0;
    return isNamed ? nameLength : 0;
}

} // namespace

int StringParser::parseFieldNames(const char* text, const _KeywordFields* validFields) {
    TraceScope trace(anchor);
    int length = 0;
    static_cast<void>(std::sscanf(text, startPattern, &length));
    if (length == 0) {
        trace.error()("Error found in format command; expected \"%s\", found \"%s\". ",
                      startPattern, text);
        return trace.result(0);
    }
    if (!validateKeywordTable(validFields)) {
        return trace.result(0);
    }
    const char* position = text + length;
    int named = 0;
    for (StringParser* node = ScanOrder.get(); node != nullptr; node = node->ScanOrder.get()) {
        m_learnedTo = static_cast<std::size_t>(position - text);
        position = node->getFieldName(position, validFields);
        if (position == nullptr) {
            trace.error()("Error while processing directive #%d; %.*s.", named + 1,
                          node->scanDirectiveLength(), node->scanDirective());
            node->ObjectStatus = OBJECT_FAILED;
            return trace.result(-1);
        }
        ++named;
    }
    if (named > 0 && *position != '\0') {
        m_learnedTo = static_cast<std::size_t>(position - text);
        trace.error()("Error: extraneous data included in format specifier:  %s ", position);
        return trace.result(-1);
    }
    return trace.result(named);
}

bool StringParser::validateKeywordTable(const _KeywordFields* validFields) {
    TraceScope trace(anchor);
    int number = 1;
    for (const _KeywordFields* entry = validFields; entry != nullptr && entry->minimum > 0;
         ++entry, ++number) {
        if (number > _KeywordFields::maxKeywords) {
            trace.error()(
                "Internal error: number of entries in keyword table exceeds maximum of %d.",
                _KeywordFields::maxKeywords);
            return trace.result(false);
        }
        if (entry->keyword == nullptr || *entry->keyword == '\0') {
            trace.error()(
                "Internal error: entry #%d in keyword table is invalid; keyword is missing.",
                number);
            return trace.result(false);
        }
        const auto length = static_cast<int>(std::strlen(entry->keyword));
        if (entry->minimum > length) {
            trace.error()("Internal error: entry #%d in keyword table is invalid; minimum field "
                          "size, %d, exceeds length of keyword, %d.",
                          number, entry->minimum, length);
            return trace.result(false);
        }
        trace.fine()("Keyword table entry #%d is (%.*s)%s.", number, entry->minimum, entry->keyword,
                     entry->keyword + entry->minimum);
    }
    if (number == 1) {
        trace.error()("Internal error: valid keyword table is empty.");
    }
    return trace.result(number > 1);
}

const char* StringParser::getFieldName(const char* text, const _KeywordFields* validFields) {
    TraceScope trace(anchor);
    if (Suppressed) {
        std::snprintf(FieldName, sizeof FieldName, "*");
        return trace.result(text);
    }
    for (int index = 0; validFields[index].minimum > 0; ++index) {
        const std::size_t length = matchKeyword(text, validFields[index]);
        if (length > 0) {
            std::snprintf(FieldName, sizeof FieldName, "%s", validFields[index].keyword);
            PrintIndex = index;
            return trace.result(getPrintDirective(text + length));
        }
    }
    return trace.result<const char*>(nullptr);
}

} // namespace zrm
