#include "parser/StringParser.h"

#include "base/TraceScope.h"

#include <cstring>

namespace zrm {

namespace {

TRC1_Anchor anchor{"StringParserScan.cpp"};

constexpr std::size_t notMeasured = static_cast<std::size_t>(-1);

} // namespace

int StringParser::formatLine(const char* line, _FormatBuffer* buffers) {
    TraceScope trace(anchor);
    return trace.result(scanInput(line) > 0 ? formatFields(buffers) : -1);
}

int StringParser::scanInput(const char* line) {
    TraceScope trace(anchor);
    if (line[0] != '\0' && line[1] == '\0') {
        trace.detail()("This is a blank line.");
        return trace.result(-1);
    }
    const char* position = line;
    std::size_t length = notMeasured;
    int count = 0;
    for (StringParser* node = ScanOrder.get(); node != nullptr; node = node->ScanOrder.get()) {
        if (node->HasColumn) {
            length = length == notMeasured ? std::strlen(line) : length;
            if (node->Offset >= length) {
                trace.error()("Error: offset of %d for column '%s' exceeds string length of %d. "
                              "Scan terminated.",
                              static_cast<int>(node->Offset + 1), node->FieldName,
                              static_cast<int>(length));
                return trace.result(-1);
            }
            position = line + node->Offset;
        }
        const int consumed = node->m_scan.run(position, node->Value.get());
        if (consumed == ScanProgram::endOfInput) {
            trace.error()("Error: end of input found while scanning for variable #%d; %s. Looking "
                          "for %.*s. Scan terminated.",
                          count + 1, node->FieldName, node->scanDirectiveLength(),
                          node->scanDirective());
            return trace.result(-1);
        }
        if (consumed == ScanProgram::mismatch) {
            trace.error()("Error: scan failed for variable #%d; %s. Looking for %.*s; found %s. "
                          "Scan terminated.",
                          count + 1, node->FieldName, node->scanDirectiveLength(),
                          node->scanDirective(), position);
            return trace.result(-1);
        }
        position += consumed;
        ++count;
    }
    return trace.result(count);
}

int StringParser::formatFields(_FormatBuffer* buffers) {
    TraceScope trace(anchor);
    int count = 0;
    for (StringParser* node = ScanOrder.get(); node != nullptr; node = node->ScanOrder.get()) {
        if (node->Suppressed || !node->PrintDirective || node->PrintDirective[0] == '\0' ||
            buffers[node->PrintIndex].room < 1) {
            continue;
        }
        if (!node->m_print.isCompiled()) {
            trace.error()("Error: formatting failed for field %s; unknown datatype: %d",
                          node->FieldName, static_cast<int>(node->DataType));
            continue;
        }
        if (!node->m_print.run(node->Value.get(), buffers[node->PrintIndex])) {
            trace.error()("Error: print failed for field %s.", node->FieldName);
            return trace.result(-1);
        }
        ++count;
    }
    return trace.result(count);
}

StringParser::Place StringParser::locate(const char* line, std::size_t position) const {
    TraceScope trace(anchor);
    if (HasColumn) {
        if (Offset >= std::strlen(line)) {
            return {false, false, false, std::strlen(line), 0};
        }
        position = Offset;
    }
    const char* const begin = line + position;
    const ScanProgram::Place place = m_scan.findValue(begin);
    const int consumed = m_scan.run(begin, Value.get());
    const bool isMatched = consumed != ScanProgram::endOfInput && consumed != ScanProgram::mismatch;
    return {true, place.isLiteralMatched, isMatched,
            static_cast<std::size_t>(place.position - line),
            isMatched ? position + static_cast<std::size_t>(consumed) : 0};
}

bool StringParser::printValue(_FormatBuffer& buffer) const {
    TraceScope trace(anchor);
    return trace.result(m_print.isCompiled() && m_print.run(Value.get(), buffer));
}

} // namespace zrm
