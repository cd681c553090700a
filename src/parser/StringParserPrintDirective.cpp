#include "parser/StringParser.h"

#include "base/TraceScope.h"
#include "parser/DirectiveRules.h"
#include "parser/PrintOptions.h"

#include <cstdio>
#include <cstring>

#include <langinfo.h>

namespace zrm {

namespace {

TRC1_Anchor anchor{"StringParserPrintDirective.cpp"};

constexpr char openingPattern[] = "= \"%n";
constexpr int openingLength = 3; ///< minimum number of characters for the pattern to match

} // namespace

const char* StringParser::getPrintDirective(const char* text) {
    TraceScope trace(anchor);
    _BuildArea area(skipWhiteSpace(text));
    if (*area.position != '=') {
        if (defaultPrintDirective(&area) != 0) {
            return trace.result<const char*>(nullptr);
        }
    } else {
        int length = 0;
        static_cast<void>(std::sscanf(area.position, openingPattern, &length));
        if (length == 0) {
            trace.error()("Error in print directive for field %s. Expected \"%.*s\"; found \"%s\"",
                          FieldName, openingLength, openingPattern, area.position);
            return trace.result<const char*>(nullptr);
        }
        area.position += length - 1;
        const int found = findDirective(&area);
        if (found < 0 || (found == 0 && validatePrintDirective(&area) != 0)) {
            return trace.result<const char*>(nullptr);
        }
        area.removeLast(); // the closing quote
        area.position = skipWhiteSpace(area.position + 1);
    }
    if (!storeDirective(area, PrintDirective)) {
        return trace.result<const char*>(nullptr);
    }
    m_print.compile(PrintDirective.get(), DataType);
    return trace.result(area.position);
}

int StringParser::validatePrintDirective(_BuildArea* area) {
    TraceScope trace(anchor);
    if (validatePrintOptions(area) != 0 || extractMinFieldWidth(area) != 0) {
        return trace.result(-1);
    }
    if (*area->position == '.' && extractPrecision(area) != 0) {
        return trace.result(-1);
    }
    if (validatePrintConvcode(area, extractVariableSize(area)) != 0) {
        return trace.result(-1);
    }
    const int found = findDirective(area);
    if (found == 0) {
        trace.error()("Error: multiple format specifiers found in print directive for field %s.",
                      FieldName);
    }
    return trace.result(found == 1 ? 0 : -1);
}

int StringParser::validatePrintOptions(_BuildArea* area) {
    TraceScope trace(anchor);
    unsigned given = 0;
    for (; *area->position != '\0'; ++area->position) {
        const PrintOption* option = nullptr;
        for (const PrintOption& candidate : printOptions) {
            if (candidate.character == *area->position) {
                option = &candidate;
            }
        }
        if (option == nullptr) {
            return trace.result(0);
        }
        if (isPrintOptionKept(*option, given, area->position)) {
            if (!area->append(option->character)) {
                return trace.result(-1);
            }
            given |= option->flag;
        }
    }
    return trace.result(-1);
}

/// Decides whether to keep an option. `given` holds the options already kept. Warns if it is
/// dropped, unless it is a repetition. `text` is the print text starting at the option.
bool StringParser::isPrintOptionKept(const PrintOption& option, unsigned given,
                                     const char* text) const {
    TraceScope trace(anchor);
    const DataTypeInfo* scanned = findDataType(DataType);
    if (scanned == nullptr || !isAllowed(option.types, *scanned)) {
        warnOfRefusedOption(option, text);
        return trace.result(false);
    }
    const bool meetsRival = (given & option.rival) != 0;
    const bool isRepeated = (given & option.flag) != 0;
    if (meetsRival && (option.isYielding || !isRepeated)) {
        warnOfRivalOption(option);
    }
    if ((meetsRival && option.isYielding) || isRepeated) {
        return trace.result(false);
    }
    if (option.flag == groupingFlag && trace.isOn(TRC1_FINE)) {
        const char separator = *nl_langinfo(THOUSEP);
        // A locale without grouping has no separator. A blank keeps the record complete.
        trace.fine()("Integer \"thousands_sep\" is '%c'.", separator != '\0' ? separator : ' ');
    }
    return trace.result(true);
}

void StringParser::warnOfRefusedOption(const PrintOption& option, const char* text) const {
    TraceScope trace(anchor);
    const char* const type = convertType2Char(DataType);
    switch (option.refusal) {
    case OptionRefusal::OPTION:
        trace.detail()("Warning: cannot use '%c' option character in the print directive for field "
                       "%s which has a scan data type of \"%s\". Print directive is \"%s\".",
                       option.character, FieldName, type, text);
        break;
    case OptionRefusal::THOUSANDS:
        trace.detail()("Warning: cannot use '%c' option character in the print directive for field "
                       "%s  which has a scan data type of \"%s\". Print directive is \"%s\".",
                       option.character, FieldName, type, text);
        break;
    case OptionRefusal::ZERO:
        trace.detail()("Warning: cannot use zero padding in the print directive for field %s which "
                       "has a scan data type of \"%s\". Print directive is \"%s\".",
                       FieldName, type, text);
        break;
    }
}

void StringParser::warnOfRivalOption(const PrintOption& option) const {
    TraceScope trace(anchor);
    if (option.flag == blankFlag) {
        trace.detail()(
            "Warning: '%c' option overrides '%c' option in print directive for field %s.", '+', ' ',
            FieldName);
    } else if (option.flag == signFlag) {
        trace.detail()("Warning: '%c' option overrides '%c'option in print directive for field %s.",
                       '+', ' ', FieldName);
    } else {
        trace.detail()(
            "Warning: left justification overrides zero padding in print directive for field %s.",
            FieldName);
    }
}

int StringParser::extractMinFieldWidth(_BuildArea* area) {
    TraceScope trace(anchor);
    if (!isDigit(*area->position)) {
        return trace.result(0);
    }
    int width = 0;
    int length = 0;
    static_cast<void>(std::sscanf(area->position, "%d%n", &width, &length));
    if (width < 1 || width > maxPrintWidth || length > maxPrintWidthDigits) {
        trace.error()("Invalid minimum field width specified: %.*s; ZERO < min width <= %d.",
                      length, area->position, maxPrintWidth);
        return trace.result(-1);
    }
    if (!area->append(area->position, static_cast<std::size_t>(length))) {
        return trace.result(-1);
    }
    MinFieldSize = static_cast<unsigned>(width);
    area->position += length;
    return trace.result(0);
}

int StringParser::extractPrecision(_BuildArea* area) {
    TraceScope trace(anchor);
    const char* const text = area->position;
    int precision = 0;
    int length = 0;
    static_cast<void>(std::sscanf(text, ".%d%n", &precision, &length));
    if (length == 0) {
        length = 1;
    }
    // sscanf also accepts a sign or white space before the digits, which no directive may contain.
    const bool isWritten = length == 1 || isDigit(text[1]);
    if (!isWritten || precision < 0 || precision > maxPrecision ||
        length > maxPrecisionCharacters) {
        trace.error()("Invalid precision specified for field %s: %s; ZERO <= precision <= %d.",
                      FieldName, text, maxPrecision);
        return trace.result(-1);
    }
    if (!area->append(text, static_cast<std::size_t>(length))) {
        return trace.result(-1);
    }
    Precision = static_cast<unsigned>(precision);
    area->position += length;
    return trace.result(0);
}

int StringParser::validatePrintConvcode(_BuildArea* area, _DataType modifierBase) {
    TraceScope trace(anchor);
    const ConversionCode* conversion = nullptr;
    for (const ConversionCode& candidate : conversionCodes) {
        if (candidate.prints && candidate.code == *area->position &&
            isAllowed(candidate.modifiers, modifierBase)) {
            conversion = &candidate;
        }
    }
    if (conversion == nullptr) {
        trace.error()("Invalid convcode or variable size specified in print directive for field "
                      "%s. Directive is %.*s",
                      FieldName, area->length(), area->buffer);
        return trace.result(-1);
    }
    const auto type = static_cast<_DataType>(modifierBase + conversion->number);
    const DataTypeInfo* const printed = findDataType(type);
    const DataTypeInfo* const scanned = findDataType(DataType);
    if (printed == nullptr) {
        trace.error()("Invalid datatype of %d computed from directive for field %s. Directive is "
                      "%.*s",
                      static_cast<int>(type), FieldName, area->length(), area->buffer);
        return trace.result(-1);
    }
    const bool isFirstCharacter = type == DATATYPE_CHAR && DataType == DATATYPE_STRING;
    if (!isFirstCharacter && (scanned == nullptr || printed->group != scanned->group)) {
        trace.error()("Scan and print data types are not compatible for field %s. Scan type is "
                      "%s; print type is %s.",
                      FieldName, convertType2Char(DataType), printed->defaultDirective);
        return trace.result(-1);
    }
    if (isFirstCharacter) {
        DataType = DATATYPE_CHAR;
    }
    return trace.result(0);
}

int StringParser::defaultPrintDirective(_BuildArea* area) {
    TraceScope trace(anchor);
    const char* const directive = convertType2Char(DataType);
    const bool isCopied = *directive != '\0' && area->append(directive, std::strlen(directive));
    return trace.result(isCopied ? 0 : -1);
}

} // namespace zrm
