#ifndef ZRM_HOST_PATTERN_BYTES_H
#define ZRM_HOST_PATTERN_BYTES_H

#include "host/formats/PatternCode.h"

#include <optional>
#include <string_view>

namespace zrm::host {

/// Takes the part of an expression that stands for one byte off its beginning: a letter, an escape,
/// a dot or what is in brackets.
class PatternBytes {
public:
    struct Flags {
        bool dotIsAnything = false; ///< also a line end
        bool foldsCase = false;
    };

    PatternBytes(std::string_view& expression, Flags flags) : m_rest(expression), m_flags(flags) {}

    /// The bytes that it stands for. None if it is not known; the expression is then of no use.
    std::optional<ByteSet> read();

private:
    std::optional<ByteSet> bracketed();
    std::optional<ByteSet> escaped();
    std::optional<unsigned char> escapedByte() const;
    std::optional<unsigned char> takeByte();
    bool addRange(ByteSet& set);
    bool add(ByteSet& set, unsigned first, unsigned last) const;
    bool take(std::string_view text);

    std::string_view& m_rest;
    const Flags m_flags;
};

} // namespace zrm::host

#endif
