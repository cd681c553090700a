#include "host/formats/PatternBytes.h"

namespace zrm::host {

namespace {

constexpr std::string_view special = "*+?{}|()^$";

bool isLetter(unsigned byte) noexcept {
    const unsigned lower = byte | 0x20U;
    return lower >= 'a' && lower <= 'z';
}

bool isDigit(unsigned byte) noexcept {
    return byte >= '0' && byte <= '9';
}

bool isWordByte(unsigned byte) noexcept {
    return isLetter(byte) || isDigit(byte) || byte == '_';
}

bool isBlank(unsigned byte) noexcept {
    return byte == ' ' || byte == '\t' || byte == '\n' || byte == '\f' || byte == '\r';
}

} // namespace

bool PatternBytes::take(std::string_view text) {
    const bool isNext = m_rest.starts_with(text);
    m_rest.remove_prefix(isNext ? text.size() : 0);
    return isNext;
}

/// Adds bytes that the expression names, with their other case if that does not matter.
bool PatternBytes::add(ByteSet& set, unsigned first, unsigned last) const {
    constexpr unsigned ascii = 0x80;
    if (first > last || (m_flags.foldsCase && last >= ascii)) {
        return false;
    }
    for (unsigned byte = first; byte <= last; ++byte) {
        set.add(byte);
        if (m_flags.foldsCase && isLetter(byte)) {
            set.add(byte ^ 0x20U);
        }
    }
    return true;
}

std::optional<ByteSet> PatternBytes::read() {
    ByteSet set;
    if (take("[")) {
        return bracketed();
    }
    if (m_rest.starts_with('\\')) {
        return escaped();
    }
    if (take(".")) {
        set.add(m_flags.dotIsAnything ? ByteSet::end : '\n');
        set.invert();
        return set;
    }
    const auto byte = static_cast<unsigned char>(m_rest[0]);
    if (special.find(m_rest[0]) != special.npos || !add(set, byte, byte)) {
        return std::nullopt;
    }
    m_rest.remove_prefix(1);
    return set;
}

/// The byte that an escape stands for, if it is one.
std::optional<unsigned char> PatternBytes::escapedByte() const {
    constexpr std::string_view names = "ntrfva";
    constexpr std::string_view bytes = "\n\t\r\f\v\a";
    if (m_rest.size() < 2) {
        return std::nullopt;
    }
    const auto byte = static_cast<unsigned char>(m_rest[1]);
    const std::size_t name = names.find(m_rest[1]);
    if (name != names.npos) {
        return bytes[name];
    }
    return byte < 0x80 && !isWordByte(byte) ? std::optional(byte) : std::nullopt;
}

std::optional<ByteSet> PatternBytes::escaped() {
    ByteSet set;
    if (const std::optional<unsigned char> byte = escapedByte()) {
        m_rest.remove_prefix(2);
        add(set, *byte, *byte);
        return set;
    }
    const unsigned kind = m_rest.size() > 1 ? static_cast<unsigned char>(m_rest[1]) : 0;
    const auto lower = static_cast<char>(kind | 0x20U);
    if (!isLetter(kind) || (lower != 'd' && lower != 'w' && lower != 's')) {
        return std::nullopt;
    }
    m_rest.remove_prefix(2);
    for (unsigned byte = 0; byte < ByteSet::end; ++byte) {
        if (lower == 'd' ? isDigit(byte) : lower == 'w' ? isWordByte(byte) : isBlank(byte)) {
            set.add(byte);
        }
    }
    if (kind != static_cast<unsigned char>(lower)) {
        set.invert();
    }
    return set;
}

/// The rest of "[...]".
std::optional<ByteSet> PatternBytes::bracketed() {
    ByteSet set;
    const bool isInverted = take("^");
    if (m_rest.starts_with(']')) {
        return std::nullopt;
    }
    while (!take("]")) {
        if (m_rest.empty() || m_rest.starts_with("[:") || !addRange(set)) {
            return std::nullopt;
        }
    }
    if (isInverted) {
        set.invert();
    }
    return set;
}

/// A byte within brackets.
std::optional<unsigned char> PatternBytes::takeByte() {
    const bool isEscape = m_rest.starts_with('\\');
    const std::optional<unsigned char> byte =
        isEscape         ? escapedByte()
        : m_rest.empty() ? std::nullopt
                         : std::optional(static_cast<unsigned char>(m_rest[0]));
    m_rest.remove_prefix(!byte ? 0 : isEscape ? 2 : 1);
    return byte;
}

/// A byte, a range or a kind of bytes within brackets.
bool PatternBytes::addRange(ByteSet& set) {
    const std::optional<unsigned char> first = takeByte();
    if (!first) {
        const std::optional<ByteSet> kind = escaped();
        if (kind) {
            set.addAll(*kind);
        }
        return kind.has_value();
    }
    if (!m_rest.starts_with('-') || m_rest.starts_with("-]")) {
        return add(set, *first, *first);
    }
    take("-");
    const std::optional<unsigned char> last = takeByte();
    return last && add(set, *first, *last);
}

} // namespace zrm::host
