#ifndef ZRM_SCAN_PROGRAM_H
#define ZRM_SCAN_PROGRAM_H

#include "parser/DataType.h"

#include <array>
#include <cstdint>

namespace zrm {

/// One scan directive (literal text, then one conversion, then "%n") made ready for scanning. It
/// reads a line as the C library's sscanf would with the same directive, white space and digits
/// being those of the "C" locale and the decimal point the process's, without reading the
/// directive's text anew for each line. Compiled once, then read-only: any number of threads may
/// run it into values of their own.
class ScanProgram {
public:
    static constexpr int endOfInput = -1; ///< the text ended before the conversion had anything
    static constexpr int mismatch = 0;

    ScanProgram() = default;
    ScanProgram(const ScanProgram&) = delete;
    ScanProgram& operator=(const ScanProgram&) = delete;

    /// Compiles the directive, whose text must live as long as the program. A text without a width
    /// of its own takes at most `textWidth` characters (0: any number, for suppressed ones).
    void compile(const char* directive, unsigned textWidth) noexcept;

    /// Scans `text` into `value`, the receiving variable of the directive's data type; a suppressed
    /// directive uses none. Texts are terminated, single characters are not. Returns the number
    /// of characters that the directive took, MISMATCH or endOfInput. A directive without its
    /// "%n" cannot say how many it took and gives MISMATCH.
    int run(const char* text, void* value) const noexcept;

    /// Where a scan of `text` looks for the value. Explains what run does; scanning needs it not.
    struct Place {
        const char* position; ///< the value's beginning, or where the leading text does not fit
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

    const char* m_literal = nullptr; ///< the leading text, a '%' written twice
    const char* m_literalEnd = nullptr;
    bool m_isOneCharacter = false; ///< the leading text is, and it matches itself alone
    bool m_isOneSpace = false;     ///< the leading text is one white space, which matches any
    Kind m_kind = Kind::NOTHING;
    Receiver m_receiver = Receiver::INTEGER4;
    bool m_isSuppressed = false;
    bool m_isCounted = false; ///< the directive has its "%n"
    bool m_isSigned = false;
    bool m_skipsWhiteSpace = true;
    unsigned m_base = 10;             ///< of an integer; 0: its prefix says
    unsigned m_width = 0;             ///< most characters taken
    unsigned m_fewDigits = 0;         ///< of a number that is read at once
    const bool* m_accepted = nullptr; ///< characters of a text, by their codes
    CharacterSet m_set{};             ///< the characters of a scan set
    bool m_isUntil = false;           ///< the set lacks one character alone, m_stop
    char m_stop = '\0';
    char m_decimalPoint[8] = ".";
};

} // namespace zrm

#endif
