#ifndef ZRM_PRINT_PROGRAM_H
#define ZRM_PRINT_PROGRAM_H

#include "parser/DataType.h"

#include <cstddef>
#include <cstring>

namespace zrm {

/// The buffer for the texts of one keyword's fields, written one after the other without
/// terminators. The caller sets it up before each line.
struct _FormatBuffer {
    char* position; ///< where the next text goes
    long room;      ///< characters still free

    /// Writes as much of the text as fits.
    void append(const char* text, std::size_t length) noexcept {
        if (room > 0 && length > 0) {
            const std::size_t written =
                length < static_cast<std::size_t>(room) ? length : static_cast<std::size_t>(room);
            std::memcpy(position, text, written);
            advance(written);
        }
    }
    /// Skips `length` characters already written at the position. They must fit in the room.
    void advance(std::size_t length) noexcept {
        position += length;
        room -= static_cast<long>(length);
    }
};

/// A print directive compiled for values of one data type. It writes what snprintf would write but
/// does not use it for common directives: constant text, plain texts and characters, and decimal
/// integers with or without a minimum width. Compiled once, then read-only.
class PrintProgram {
public:
    PrintProgram() = default;
    PrintProgram(const PrintProgram&) = delete;
    PrintProgram& operator=(const PrintProgram&) = delete;

    /// Compiles the directive for values of `type`. Its text must live as long as the program.
    /// Returns false if `type` is not a data type.
    bool compile(const char* directive, _DataType type) noexcept;
    bool isCompiled() const noexcept { return m_directive != nullptr; }

    /// Appends the printed value (a receiving variable of the type) to the buffer, cut to the
    /// available room. Returns false if the C library fails to print it.
    bool run(const void* value, _FormatBuffer& buffer) const noexcept;

private:
    enum class Kind { CONSTANT, TEXT, CHARACTER, INTEGER, LIBRARY };

    Kind classify(const char* conversion) noexcept;
    bool print(const void* value, _FormatBuffer& buffer) const noexcept;
    void printInteger(const void* value, _FormatBuffer& buffer) const noexcept;
    bool printByLibrary(const void* value, _FormatBuffer& buffer) const noexcept;

    const char* m_directive = nullptr;
    std::size_t m_prefixLength = 0;
    const char* m_suffix = nullptr;
    std::size_t m_suffixLength = 0;
    Kind m_kind = Kind::LIBRARY;
    Receiver m_receiver = Receiver::TEXT;
    bool m_isSigned = false;
    char m_fill = ' ';
    std::size_t m_width = 0;      ///< minimum width of an integer
    bool m_isBareInteger = false; ///< 32 bits, without surrounding text
};

} // namespace zrm

#endif
