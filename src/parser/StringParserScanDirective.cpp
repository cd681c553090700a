#include "parser/StringParser.h"

#include "base/ErrorText.h"
#include "base/TraceScope.h"
#include "parser/DirectiveRules.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <new>

namespace zrm {

namespace {

TRC1_Anchor anchor{"StringParserScanDirective.cpp"};

} // namespace

const char* StringParser::formatNextDirective(const char* position) {
    TraceScope trace(anchor);
    _BuildArea area(position);
    const int found = findDirective(&area);
    m_distanceToBegin = static_cast<std::size_t>(area.position - position) - (found == 0 ? 1 : 0);
    if (found == 1) {
        ObjectStatus = OBJECT_NO_DIRECTIVE;
    } else if (found == 0 && buildScanDirective(&area) == 0) {
        ObjectStatus = OBJECT_LEARNED;
    }
    return area.position;
}

/// Reads the directive after its '%' and stores it. Returns 0 or -1.
int StringParser::buildScanDirective(_BuildArea* area) {
    TraceScope trace(anchor);
    if (*area->position == '(' && extractOffset(area) != 0) {
        return trace.result(-1);
    }
    if (*area->position == '*') {
        if (!area->append('*')) {
            return trace.result(-1);
        }
        Suppressed = true;
        ++area->position;
    }
    const int widthPosition = extractMaxFieldWidth(area);
    if (widthPosition < 0) {
        return trace.result(-1);
    }
    DataType = extractVariableSize(area);
    if (validateScanConvcode(area) != 0) {
        return trace.result(-1);
    }
    // A directive that has no room left for the count is still learned, but matches no line.
    area->append(consumedCount.data(), consumedCount.size());
    if (allocateVariableStorage(area, widthPosition) != 0 ||
        !storeDirective(*area, ScanDirective)) {
        return trace.result(-1);
    }
    m_scan.compile(ScanDirective.get(), MaxFieldSize);
    return trace.result(0);
}

int StringParser::findDirective(_BuildArea* area) {
    TraceScope trace(anchor);
    for (;;) {
        const char character = *++area->position;
        if (character == '\0' || !area->append(character)) {
            return trace.result(-1);
        }
        if (character == '"') {
            return trace.result(1);
        }
        if (character == '\\' && !takeEscape(area)) {
            return trace.result(-1);
        }
        if (character == '%') {
            ++area->position;
            if (*area->position != '%') {
                return trace.result(0);
            }
            if (!area->append('%')) {
                return trace.result(-1);
            }
        }
    }
}

/// Replaces the backslash that was just appended with the character that the escape stands for, and
/// moves the position to the escape's second character.
bool StringParser::takeEscape(_BuildArea* area) {
    if (area->position[1] == '\0') {
        return false;
    }
    const char meant = convertEscape(*++area->position);
    if (meant == '\0') {
        return false;
    }
    area->removeLast();
    return area->append(meant);
}

char StringParser::convertEscape(char escaped) {
    TraceScope trace(anchor);
    for (const Escape& escape : escapes) {
        if (escape.written == escaped) {
            return trace.result(escape.meant);
        }
    }
    trace.error()("Invalid escape sequence found : '%c%c'", '\\', escaped);
    return trace.result('\0');
}

int StringParser::extractOffset(_BuildArea* area) {
    TraceScope trace(anchor);
    const char* const text = area->position + 1;
    int column = 0;
    int length = 0;
    static_cast<void>(std::sscanf(text, "%d)%n", &column, &length));
    if (length == 0) {
        trace.error()("Invalid column position syntax; expected '(column)'; found %s",
                      area->position);
        return trace.result(-1);
    }
    if (column < 1 || column > maxColumn || length > maxColumnCharacters) {
        trace.error()("Invalid column position specified: %.*s; ZERO < column <= %d.", length, text,
                      maxColumn);
        return trace.result(-1);
    }
    Offset = static_cast<unsigned>(column - 1);
    HasColumn = true;
    area->position = text + length;
    return trace.result(0);
}

int StringParser::extractMaxFieldWidth(_BuildArea* area) {
    TraceScope trace(anchor);
    const auto widthPosition = static_cast<int>(area->count);
    const char* const text = area->position;
    if (!isDigit(*text)) {
        return trace.result(widthPosition);
    }
    const std::size_t zeros = std::strspn(text, "0");
    const std::size_t length = std::strspn(text, "0123456789");
    const std::size_t digits = length - zeros;
    int width = 0;
    if (digits <= static_cast<std::size_t>(maxScanWidthDigits)) {
        width = static_cast<int>(std::strtol(text, nullptr, 10));
    }
    if (width < 1 || width > maxScanWidth) {
        trace.error()("Invalid field width specified: %.*s; ZERO < width <= %d.",
                      static_cast<int>(length), text, maxScanWidth);
        return trace.result(-1);
    }
    if (!area->append(text + zeros, digits)) {
        return trace.result(-1);
    }
    MaxFieldSize = static_cast<unsigned>(width);
    area->position = text + length;
    return trace.result(widthPosition);
}

_DataType StringParser::extractVariableSize(_BuildArea* area) {
    TraceScope trace(anchor);
    for (const SizeModifier& modifier : sizeModifiers) {
        if (std::strncmp(area->position, modifier.text.data(), modifier.text.size()) != 0) {
            continue;
        }
        if (!area->append(modifier.text.data(), modifier.text.size())) {
            break;
        }
        area->position += modifier.text.size();
        if (*area->position == '\0' || !area->append(*area->position)) {
            break;
        }
        return trace.result(modifier.base);
    }
    return trace.result(DATATYPE_BAD);
}

int StringParser::validateScanConvcode(_BuildArea* area) {
    TraceScope trace(anchor);
    const char code = *area->position;
    const ConversionCode* conversion = nullptr;
    for (const ConversionCode& candidate : conversionCodes) {
        if (candidate.scans && candidate.code == code && isAllowed(candidate.modifiers, DataType)) {
            conversion = &candidate;
        }
    }
    bool isEscapeBad = false;
    if (conversion == nullptr || (code == '[' && !copyScanSet(area, isEscapeBad))) {
        if (!isEscapeBad) {
            // At the end of the text there is no code. A blank keeps the record complete.
            trace.error()("Invalid convcode or receiving variable size specified for code %c.  "
                          "Directive is %.*s",
                          code != '\0' ? code : ' ', area->length(), area->buffer);
        }
        return trace.result(-1);
    }
    DataType = static_cast<_DataType>(DataType + conversion->number);
    if (DataType == DATATYPE_CHAR && MaxFieldSize > 1) {
        DataType = DATATYPE_STRING;
    }
    if (findDataType(DataType) == nullptr) {
        trace.error()("Invalid datatype of %d computed; directive is %.*s",
                      static_cast<int>(DataType), area->length(), area->buffer);
        return trace.result(-1);
    }
    return trace.result(0);
}

/// Copies a scan set, whose '[' is already in the buffer, up to its ']'. Returns false if the set
/// has no end or an invalid escape, which is then already traced.
bool StringParser::copyScanSet(_BuildArea* area, bool& isEscapeBad) {
    bool isFirst = true;
    for (;;) {
        const char character = *++area->position;
        if (character == '\0' || character == '"' || !area->append(character)) {
            return false;
        }
        if (character == '\\' && !takeEscape(area)) {
            isEscapeBad = *area->position != '\\'; // else the text ends after the backslash
            return false;
        }
        if (character == ']' && !isFirst) {
            return true;
        }
        isFirst = isFirst && character == '^' && area->position[-1] == '[';
    }
}

int StringParser::allocateVariableStorage(_BuildArea* area, long widthPosition) {
    TraceScope trace(anchor);
    const DataTypeInfo* info = findDataType(DataType);
    if (Suppressed || info == nullptr) {
        return trace.result(Suppressed ? 0 : -1);
    }
    std::size_t size = receiverSize(info->receiver);
    if (info->receiver == Receiver::TEXT) {
        if (MaxFieldSize == 0) {
            MaxFieldSize = defaultTextSize;
            // If it does not fit, the text lacks the width, but scanning still applies it.
            area->insert(static_cast<std::size_t>(widthPosition), defaultTextWidth.data(),
                         defaultTextWidth.size());
        }
        size = MaxFieldSize + 1;
    } else if (info->receiver == Receiver::CHARACTER) {
        MaxFieldSize = 1;
    }
    Value.reset(new (std::nothrow) unsigned char[size]());
    if (!Value) {
        const ErrorText error(errno);
        trace.error()("Memory allocation failed for %d bytes; errno = %d; %s",
                      static_cast<int>(size), error.number(), error.text());
        return trace.result(-1);
    }
    return trace.result(0);
}

/// Stores a copy of a finished directive. Returns false, with a message, if memory runs out.
bool StringParser::storeDirective(const _BuildArea& area,
                                  std::unique_ptr<char[]>& directive) const {
    TraceScope trace(anchor);
    const std::size_t size = area.count + 1;
    directive.reset(new (std::nothrow) char[size]);
    if (!directive) {
        const ErrorText error(errno);
        trace.error()("Memory allocation failed for %d bytes; errno = %d; %s",
                      static_cast<int>(size), error.number(), error.text());
        return trace.result(false);
    }
    std::memcpy(directive.get(), area.buffer, size);
    return trace.result(true);
}

} // namespace zrm
