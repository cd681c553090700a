#ifndef ZRM_STRING_PARSER_H
#define ZRM_STRING_PARSER_H

#include "parser/BuildArea.h"
#include "parser/DataType.h"
#include "parser/FormatBuffer.h"
#include "parser/KeywordFields.h"
#include "parser/PrintProgram.h"
#include "parser/ScanProgram.h"

#include <cstddef>
#include <memory>

namespace zrm {

struct PrintOption;

/// How far a node of a format's chain, or the whole format, was learned.
enum _ObjectStatus : int {
    OBJECT_FAILED = -1,
    OBJECT_NO_DIRECTIVE = 0,   ///< the scan format holds no further directive
    OBJECT_LEARNED = 1,        ///< the node's directive
    OBJECT_FORMAT_LEARNED = 2, ///< the anchor: the whole format
};

/// A line layout of a text log, learned from a format specifier: a chain with one node for each
/// scan directive, headed by an anchor. The anchor scans lines and prints their fields into
/// buffers. Learning fills the chain once; scanning changes only the receiving variables, so one
/// chain serves one caller at a time. The anchor owns the chain.
class StringParser {
public:
    /// Learns a whole format; usable when status() is then OBJECT_FORMAT_LEARNED. The keywords
    /// must live as long as the object is constructed.
    StringParser(const char* formatSpecifier, const _KeywordFields* validFields);
    /// Learns the directive that follows the character at `*formatPosition`, and the rest of the
    /// chain behind it; `*formatPosition` is then the last character that was read.
    explicit StringParser(const char** formatPosition);
    StringParser(const StringParser&) = delete;
    StringParser& operator=(const StringParser&) = delete;
    virtual ~StringParser();

    /// On the anchor: scans a line and prints its fields into the buffers, which the fields' print
    /// indexes index. Returns the number of fields printed; -1 when the line does not fit.
    int formatLine(const char* line, _FormatBuffer* buffers);
    /// On the anchor: scans a line into the receiving variables. Returns the number of directives;
    /// -1 when the line does not fit.
    int scanInput(const char* line);
    /// On the anchor: prints the values of the line scanned last. Returns the number of fields; -1
    /// when one cannot be printed.
    int formatFields(_FormatBuffer* buffers);

    // For explaining a format and its lines.

    /// Where one directive looks in a line; offsets in the line.
    struct Place {
        bool isInside;         ///< false: the line ends before the directive's column
        bool isLiteralMatched; ///< the literal text in front of the directive is there
        bool isMatched;
        std::size_t value; ///< where the value begins, or where the line stops fitting
        std::size_t end;   ///< behind the value, when matched
    };
    /// Scans this node's directive alone, from `position` in the line, which the directive's column
    /// overrules: a step of scanInput, without its messages.
    Place locate(const char* line, std::size_t position) const;
    /// Prints the value scanned last as formatFields does; false when it cannot be printed.
    bool printValue(_FormatBuffer& buffer) const;
    /// On the anchor: the offset in the specifier at which learning began to go wrong. On an anchor
    /// that was learned: of the scan format's opening quote.
    std::size_t learnedTo() const noexcept { return m_learnedTo; }
    /// Characters of the specifier from the last one of the directive before (from the opening
    /// quote, for the first) to this directive's '%', and to its last one.
    std::size_t distanceToBegin() const noexcept { return m_distanceToBegin; }
    std::size_t distanceToEnd() const noexcept { return m_distanceToEnd; }

    /// Dumps this node and all behind it to the trace.
    void printChain() const;
    void printSelf() const;
    /// The default print directive of a type, which names it in messages; "" for no type.
    static const char* convertType2Char(_DataType type) noexcept;

    // What was learned.
    _ObjectStatus status() const noexcept { return ObjectStatus; }
    const StringParser* next() const noexcept { return ScanOrder.get(); }
    const char* fieldName() const noexcept { return FieldName; }
    const char* scanDirective() const noexcept { return ScanDirective ? ScanDirective.get() : ""; }
    const char* printDirective() const noexcept {
        return PrintDirective ? PrintDirective.get() : "";
    }
    _DataType dataType() const noexcept { return DataType; }
    bool isSuppressed() const noexcept { return Suppressed; }
    int printIndex() const noexcept { return PrintIndex; }
    unsigned offset() const noexcept { return Offset; }
    unsigned maxFieldSize() const noexcept { return MaxFieldSize; }
    unsigned minFieldSize() const noexcept { return MinFieldSize; }
    unsigned precision() const noexcept { return Precision; }

protected:
    void initThis();
    _ObjectStatus learnLogFormat(const char* format, const _KeywordFields* validFields);

    // Scan directives. The build area's position is the last character read.
    const char* formatNextDirective(const char* position);
    int findDirective(_BuildArea* area);
    int extractOffset(_BuildArea* area);
    int extractMaxFieldWidth(_BuildArea* area);
    _DataType extractVariableSize(_BuildArea* area);
    int validateScanConvcode(_BuildArea* area);
    int allocateVariableStorage(_BuildArea* area, long widthPosition);
    char convertEscape(char escaped);

    // Print directives.
    const char* getPrintDirective(const char* text);
    int validatePrintDirective(_BuildArea* area);
    int validatePrintOptions(_BuildArea* area);
    int extractMinFieldWidth(_BuildArea* area);
    int extractPrecision(_BuildArea* area);
    int validatePrintConvcode(_BuildArea* area, _DataType modifierBase);
    int defaultPrintDirective(_BuildArea* area);

    // Field names.
    int parseFieldNames(const char* text, const _KeywordFields* validFields);
    bool validateKeywordTable(const _KeywordFields* validFields);
    const char* getFieldName(const char* text, const _KeywordFields* validFields);

    static constexpr std::size_t fieldNameSize = 16;

    bool Suppressed = false;
    char FieldName[fieldNameSize] = "";
    std::unique_ptr<char[]> PrintDirective;
    std::unique_ptr<char[]> ScanDirective;
    _DataType DataType = DATATYPE_BASE_NONE;
    _ObjectStatus ObjectStatus = OBJECT_FAILED;
    int PrintIndex = -1;
    std::unique_ptr<StringParser> ScanOrder; ///< the next node
    unsigned MaxFieldSize = 0;
    unsigned MinFieldSize = 0;
    unsigned Offset = 0;    ///< column - 1
    bool HasColumn = false; ///< tells column 1 from none
    unsigned Precision = 0;
    std::unique_ptr<unsigned char[]> Value; ///< the receiving variable

private:
    struct OneDirective {}; ///< chooses the constructor that learns no chain

    StringParser(const char** formatPosition, OneDirective);
    bool learnRest(const char** formatPosition);
    void destroyRest() noexcept;
    bool takeEscape(_BuildArea* area);
    int buildScanDirective(_BuildArea* area);
    bool copyScanSet(_BuildArea* area, bool& isEscapeBad);
    int scanDirectiveLength() const noexcept;
    bool storeDirective(const _BuildArea& area, std::unique_ptr<char[]>& directive) const;
    bool isPrintOptionKept(const PrintOption& option, unsigned given, const char* text) const;
    void warnOfRefusedOption(const PrintOption& option, const char* text) const;
    void warnOfRivalOption(const PrintOption& option) const;

    ScanProgram m_scan;
    PrintProgram m_print;
    std::size_t m_learnedTo = 0;
    std::size_t m_distanceToBegin = 0;
    std::size_t m_distanceToEnd = 0;
};

} // namespace zrm

#endif
