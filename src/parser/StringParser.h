#ifndef ZRM_STRING_PARSER_H
#define ZRM_STRING_PARSER_H

#include "parser/BuildArea.h"
#include "parser/DataType.h"
#include "parser/PrintProgram.h"
#include "parser/ScanProgram.h"

#include <cstddef>
#include <memory>

namespace zrm {

struct PrintOption;

/// A name that a format may give its fields. A table of names holds at most maxKeywords entries and
/// ends with an entry whose minimum is 0. The index of an entry is the field's print index.
struct _KeywordFields {
    static constexpr int maxKeywords = 100;

    const char* keyword;
    int minimum; ///< minimum number of leading characters to specify
};

/// How far a node of a format's chain, or the whole format, was learned.
enum _ObjectStatus : int {
    OBJECT_FAILED = -1,
    OBJECT_NO_DIRECTIVE = 0,   ///< the scan format has no further directive
    OBJECT_LEARNED = 1,        ///< the node's directive was learned
    OBJECT_FORMAT_LEARNED = 2, ///< on the anchor: the whole format was learned
};

/// A line layout of a text log, learned from a format specifier. It is a chain with one node per
/// scan directive, headed by an anchor, which owns the chain. The anchor scans lines and prints
/// their fields into buffers. The chain is learned once. Scanning changes only the receiving
/// variables, so one chain serves one caller at a time.
class StringParser {
public:
    /// Learns a whole format. The object is usable if status() is then OBJECT_FORMAT_LEARNED. The
    /// keywords are needed only during construction.
    StringParser(const char* formatSpecifier, const _KeywordFields* validFields);
    /// Learns the directive after the character at `*formatPosition` and the rest of the chain.
    /// Sets `*formatPosition` to the last character read.
    explicit StringParser(const char** formatPosition);
    StringParser(const StringParser&) = delete;
    StringParser& operator=(const StringParser&) = delete;
    virtual ~StringParser();

    /// On the anchor: scans a line and prints its fields into the buffers, indexed by the fields'
    /// print indexes. Returns the number of fields printed, or -1 if the line does not match.
    int formatLine(const char* line, _FormatBuffer* buffers);
    /// On the anchor: scans a line into the receiving variables. Returns the number of directives,
    /// or -1 if the line does not match.
    int scanInput(const char* line);
    /// On the anchor: prints the values of the last scanned line. Returns the number of fields, or
    /// -1 if one cannot be printed.
    int formatFields(_FormatBuffer* buffers);

    // For explaining a format and its lines.

    /// Where one directive looks in a line, as offsets in the line.
    struct Place {
        bool isInside;         ///< false: the line ends before the directive's column
        bool isLiteralMatched; ///< the literal text before the directive is there
        bool isMatched;
        std::size_t value; ///< where the value begins, or where the line stops matching
        std::size_t end;   ///< one past the value, if matched
    };
    /// Scans this node's directive only, starting at `position` in the line unless the directive
    /// has a column. This is one step of scanInput, without its messages.
    Place locate(const char* line, std::size_t position) const;
    /// Prints the last scanned value as formatFields does. Returns false if it cannot be printed.
    bool printValue(_FormatBuffer& buffer) const;
    /// On the anchor: the offset in the specifier at which learning failed, or, if it succeeded,
    /// the offset of the scan format's opening quote.
    std::size_t learnedTo() const noexcept { return m_learnedTo; }
    /// Characters of the specifier from the last one of the previous directive (for the first, from
    /// the opening quote) to this directive's '%', and to its last character.
    std::size_t distanceToBegin() const noexcept { return m_distanceToBegin; }
    std::size_t distanceToEnd() const noexcept { return m_distanceToEnd; }

    /// Dumps this node and all nodes after it to the trace.
    void printChain() const;
    void printSelf() const;
    /// The default print directive of a type, its name in messages. Empty if it is not a type.
    static const char* convertType2Char(_DataType type) noexcept;

    // The learned properties.
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
    bool HasColumn = false; ///< distinguishes column 1 from no column
    unsigned Precision = 0;
    std::unique_ptr<unsigned char[]> Value; ///< the receiving variable

private:
    struct OneDirective {}; ///< selects the constructor that learns only one node

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
