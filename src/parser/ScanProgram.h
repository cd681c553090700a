#ifndef ZRM_SCAN_PROGRAM_H
#define ZRM_SCAN_PROGRAM_H

#include "parser/DataType.h"

#include <array>
#include <cstdint>

namespace zrm {

/// A compiled scan directive: literal text, one conversion, then "%n". It reads a line as the C
/// library's sscanf would with the same directive, but does not parse the directive for each line.
/// White space and digits are those of the "C" locale, the decimal point is the process's.
/// Compiled once, then read-only: any number of threads may run it concurrently, each with its own
/// values.
class ScanProgram {
public:
    static constexpr int endOfInput = -1; ///< the text ended before the conversion read anything
    static constexpr int mismatch = 0;

    ScanProgram() = default;
    ScanProgram(const ScanProgram&) = delete;
    ScanProgram& operator=(const ScanProgram&) = delete;

    /// Compiles the directive. Its text must live as long as the program. A text without its own
    /// width takes at most `textWidth` characters (0: no limit, for suppressed texts).
    void compile(const char* directive, unsigned textWidth) noexcept;

    /// Scans `text` into `value`, the receiving variable of the directive's data type; a suppressed
    /// directive uses none. Texts are terminated, single characters are not. Returns the number of
    /// characters consumed, mismatch or endOfInput. A directive without its "%n" cannot count what
    /// it consumed and returns mismatch.
    int run(const char* text, void* value) const noexcept;

    /// Where a scan of `text` looks for the value. Used to explain a scan, not to scan.
    struct Place {
        const char* position; ///< start of the value, or where the leading text does not match
        bool isLiteralMatched;
    };
    Place findValue(const char* text) const noexcept;

private:
    enum class Kind { NOTHING, INTEGER, FLOATING, TEXT, CHARACTERS };
    enum class Outcome { MATCHED, MISMATCHED, END };
    using CharacterSet = std::array<bool, 256>;

    const char* compileConversion(const char* code, unsigned base) noexcept;
    const char* compileSet(const char* set) noexcept;
    int scan(const char* text, void* value) const noexcept;
    Outcome matchLiteral(const char*& position) const noexcept;
    bool skipShortLiteral(const char*& position) const noexcept;
    bool scanShortNumber(const char*& position, void* value) const noexcept;
    Outcome scanInteger(const char*& position, void* value) const noexcept;
    Outcome scanFloating(const char*& position, void* value) const noexcept;
    Outcome scanText(const char*& position, char* value) const noexcept;
    const char* findStop(const char* begin) const noexcept;
    const char* findRefused(const char* begin) const noexcept;
    Outcome scanCharacters(const char*& position, char* value) const noexcept;
    void storeInteger(std::uint64_t magnitude, bool isNegative, bool overflowed,
                      void* value) const noexcept;

    const char* m_literal = nullptr; ///< the leading text, with each '%' doubled
    const char* m_literalEnd = nullptr;
    bool m_isOneCharacter = false; ///< the leading text is one character that matches only itself
    bool m_isOneSpace = false;     ///< the leading text is one white space, which matches any
    Kind m_kind = Kind::NOTHING;
    Receiver m_receiver = Receiver::INTEGER4;
    bool m_isSuppressed = false;
    bool m_isCounted = false; ///< the directive ends with "%n"
    bool m_isSigned = false;
    bool m_skipsWhiteSpace = true;
    unsigned m_base = 10;             ///< of an integer; 0: taken from its prefix
    unsigned m_width = 0;             ///< maximum number of characters
    unsigned m_fewDigits = 0;         ///< digits of a number that is read at once
    const bool* m_accepted = nullptr; ///< accepted characters of a text, indexed by code
    CharacterSet m_set{};             ///< the characters of a scan set
    bool m_isUntil = false;           ///< the set excludes only one character, m_stop
    char m_stop = '\0';
    char m_decimalPoint[8] = ".";
};

} // namespace zrm

#endif
