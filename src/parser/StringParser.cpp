#include "parser/StringParser.h"

#include "base/TraceScope.h"
#include "parser/DirectiveRules.h"

#include <cstdio>
#include <cstring>
#include <new>
#include <string_view>
#include <utility>

namespace zrm {

namespace {

TRC1_Anchor anchor{"StringParser.cpp"};

constexpr char startPattern[] = " %*1[Aa] , \"%n";

/// The offset at which a specifier without a valid beginning fails.
std::size_t findBadStart(const char* text) {
    constexpr const char* expected[] = {"Aa", ",", "\""};
    const char* position = text;
    for (const char* const characters : expected) {
        position = skipWhiteSpace(position);
        if (*position == '\0' || std::strchr(characters, *position) == nullptr) {
            break;
        }
        ++position;
    }
    return static_cast<std::size_t>(position - text);
}

} // namespace

StringParser::StringParser(const char* formatSpecifier, const _KeywordFields* validFields) {
    TraceScope trace(anchor);
    initThis();
    std::snprintf(FieldName, sizeof FieldName, "ANCHOR");
    const char* const text = formatSpecifier != nullptr ? formatSpecifier : "";
    int length = 0;
    // Only the count matters: the pattern stores nothing.
    static_cast<void>(std::sscanf(text, startPattern, &length));
    if (length == 0) {
        trace.error()(
            "Scan for start of format specifier failed; looking for \"%s\" but found:  %s",
            startPattern, text);
        ObjectStatus = OBJECT_FAILED;
        m_learnedTo = findBadStart(text);
        return;
    }
    ObjectStatus = learnLogFormat(text + length - 1, validFields);
    m_learnedTo += static_cast<std::size_t>(length - 1);
    if (ObjectStatus == OBJECT_FORMAT_LEARNED && trace.isOn(TRC1_DETAIL)) {
        printChain();
    }
}

StringParser::StringParser(const char** formatPosition)
    : StringParser(formatPosition, OneDirective{}) {
    if (ObjectStatus == OBJECT_LEARNED && !learnRest(formatPosition)) {
        destroyRest();
        ObjectStatus = OBJECT_FAILED;
    }
}

StringParser::StringParser(const char** formatPosition, OneDirective) {
    TraceScope trace(anchor);
    initThis();
    const char* const begin = *formatPosition;
    *formatPosition = formatNextDirective(begin);
    m_distanceToEnd = static_cast<std::size_t>(*formatPosition - begin);
}

/// Learns the directives after this one in a loop. Recursion would use stack space in proportion to
/// the number of directives. Returns false if one of them fails.
bool StringParser::learnRest(const char** formatPosition) {
    TraceScope trace(anchor);
    for (StringParser* last = this;; last = last->ScanOrder.get()) {
        last->ScanOrder.reset(new (std::nothrow) StringParser(formatPosition, OneDirective{}));
        if (!last->ScanOrder) {
            trace.error()("Memory allocation for %d bytes failed.",
                          static_cast<int>(sizeof(StringParser)));
            return trace.result(false);
        }
        if (last->ScanOrder->ObjectStatus != OBJECT_LEARNED) {
            const bool isAtEnd = last->ScanOrder->ObjectStatus == OBJECT_NO_DIRECTIVE;
            last->ScanOrder.reset();
            return trace.result(isAtEnd);
        }
    }
}

/// Destroys the nodes after this one, the last one first and without recursion.
void StringParser::destroyRest() noexcept {
    std::unique_ptr<StringParser> reversed;
    while (ScanOrder) {
        std::unique_ptr<StringParser> rest = std::move(ScanOrder->ScanOrder);
        ScanOrder->ScanOrder = std::move(reversed);
        reversed = std::move(ScanOrder);
        ScanOrder = std::move(rest);
    }
    while (reversed) {
        reversed = std::move(reversed->ScanOrder);
    }
}

StringParser::~StringParser() {
    TraceScope trace(anchor);
    destroyRest();
    ScanDirective.reset();
    PrintDirective.reset();
    if (Value && findDataType(DataType) == nullptr) {
        trace.error()("Invalid datatype %d detected.  Unable to delete m_value.",
                      static_cast<int>(DataType));
    }
    trace.fine()("%s object destroyed.", FieldName);
}

void StringParser::initThis() {
    TraceScope trace(anchor);
    Suppressed = false;
    FieldName[0] = '\0';
    PrintDirective.reset();
    ScanDirective.reset();
    DataType = DATATYPE_BASE_NONE;
    ObjectStatus = OBJECT_FAILED;
    PrintIndex = -1;
    ScanOrder.reset();
    MaxFieldSize = MinFieldSize = Offset = Precision = 0;
    HasColumn = false;
    Value.reset();
}

_ObjectStatus StringParser::learnLogFormat(const char* format, const _KeywordFields* validFields) {
    TraceScope trace(anchor);
    const char* position = format;
    ScanOrder.reset(new (std::nothrow) StringParser(&position));
    if (!ScanOrder) {
        trace.error()("Memory allocation for %d bytes failed.",
                      static_cast<int>(sizeof(StringParser)));
        return trace.result(OBJECT_FAILED);
    }
    if (ScanOrder->ObjectStatus == OBJECT_LEARNED && parseFieldNames(position, validFields) > 0) {
        m_learnedTo = 0;
        return trace.result(OBJECT_FORMAT_LEARNED);
    }
    m_learnedTo += static_cast<std::size_t>(position - format);
    ScanOrder.reset();
    return trace.result(OBJECT_FAILED);
}

const char* StringParser::convertType2Char(_DataType type) noexcept {
    TraceScope trace(anchor);
    const DataTypeInfo* info = findDataType(type);
    return trace.result(info != nullptr ? info->defaultDirective : "");
}

/// The length of the scan directive without its "%n", for messages.
int StringParser::scanDirectiveLength() const noexcept {
    const std::string_view directive = scanDirective();
    const bool isCounted = directive.ends_with(consumedCount);
    return static_cast<int>(directive.size() - (isCounted ? consumedCount.size() : 0));
}

void StringParser::printChain() const {
    TraceScope trace(anchor);
    for (const StringParser* node = this; node != nullptr; node = node->next()) {
        node->printSelf();
    }
}

void StringParser::printSelf() const {
    TraceScope trace(anchor);
    trace.always()(
        "\n\tFieldName\t\t= %s\n\tthis\t\t\t= %p\n\tPrintIndex\t\t= %d\n"
        "\tScanOrder\t\t= %p\n\tOffset\t\t\t= %d\n\tMaxFieldSize\t\t= %d\n"
        "\tMinFieldSize\t\t= %d\n\tPrecision\t\t= %d\n\tScanDirective\t\t= \"%.*s\"\n"
        "\tPrintDirective\t\t= \"%s\"\n\tDataType\t\t= %d\n\tValue\t\t\t= %p\n"
        "\tSuppressed\t\t= %d\n\tObjectStatus\t\t= %d\n",
        FieldName, static_cast<const void*>(this), PrintIndex,
        static_cast<const void*>(ScanOrder.get()), static_cast<int>(Offset),
        static_cast<int>(MaxFieldSize), static_cast<int>(MinFieldSize), static_cast<int>(Precision),
        scanDirectiveLength(), scanDirective(), printDirective(), static_cast<int>(DataType),
        static_cast<const void*>(Value.get()), Suppressed ? 1 : 0, static_cast<int>(ObjectStatus));
}

} // namespace zrm
