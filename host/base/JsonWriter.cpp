#include "host/base/JsonWriter.h"

#include "host/base/SteeringText.h"
#include "host/base/TimeText.h"
#include "host/base/Utf8.h"

#include <charconv>
#include <cmath>
#include <cstring>
#include <limits>
#include <stdexcept>

namespace zrm::host {

namespace {

constexpr std::uint64_t each = 0x0101010101010101;
constexpr std::uint64_t highBits = each * 0x80;

/// True for eight bytes of ASCII that need no escape in a JSON string. A subtraction sets the high
/// bit of a control character, a quote or a backslash, and by its borrow perhaps that of the byte
/// after one of these.
constexpr bool isPlain(std::uint64_t word) {
    const std::uint64_t marked =
        word | (word - each * ' ') | ((word ^ each * '"') - each) | ((word ^ each * '\\') - each);
    return (marked & highBits) == 0;
}

bool isPlain(char c) {
    const auto byte = static_cast<unsigned char>(c);
    return byte >= ' ' && byte < 0x80 && c != '"' && c != '\\';
}

/// Copies the leading part that needs no escape, and returns its length. There is room for the
/// whole text.
std::size_t copyPlain(std::string_view text, char* out) {
    std::uint64_t word;
    const auto copyWord = [&](std::size_t position) {
        std::memcpy(&word, text.data() + position, sizeof word);
        std::memcpy(out + position, &word, sizeof word);
        return isPlain(word);
    };
    std::size_t position = 0;
    while (position + sizeof word <= text.size() && copyWord(position)) {
        position += sizeof word;
    }
    if (position + sizeof word > text.size() && text.size() >= sizeof word &&
        copyWord(text.size() - sizeof word)) {
        return text.size(); // the last word has some bytes again
    }
    for (; position < text.size() && isPlain(text[position]); ++position) {
        out[position] = text[position];
    }
    return position;
}

} // namespace

JsonKey::JsonKey(std::string_view name) {
    JsonWriter::append(m_text, [name](JsonWriter& json) { json.value(name); });
    m_text = ',' + m_text + ':';
    m_size = m_text.size();
    m_text.resize(m_size + step);
    if (m_text.size() > sizeof JsonWriter::m_buffer) {
        JsonWriter::misused("a key is too long");
    }
}

void JsonWriter::misused(const char* problem) {
    throw std::logic_error(std::string("JSON: ") + problem);
}

void JsonWriter::finish() {
    if (m_next != Next::NOTHING) {
        misused("the value is not complete");
    }
    flush();
}

void JsonWriter::flush() {
    m_out.append(m_buffer, m_size);
    m_size = 0;
}

void JsonWriter::put(std::string_view text) {
    reserve(text.size());
    if (text.size() > sizeof m_buffer) {
        m_out += text;
        return;
    }
    std::memcpy(m_buffer + m_size, text.data(), text.size());
    m_size += text.size();
}

void JsonWriter::putString(std::string_view text) {
    put('"');
    if (text.size() < sizeof m_buffer - m_size) {
        const std::size_t plain = copyPlain(text, m_buffer + m_size);
        m_size += plain;
        if (plain == text.size()) {
            m_buffer[m_size++] = '"';
            return;
        }
        text.remove_prefix(plain);
    }
    putByParts(text);
    put('"');
}

/// Writes a text of any size and content.
void JsonWriter::putByParts(std::string_view text) {
    while (!text.empty()) {
        reserve(1);
        const std::string_view part = text.substr(0, sizeof m_buffer - m_size);
        const std::size_t plain = copyPlain(part, m_buffer + m_size);
        m_size += plain;
        text.remove_prefix(plain);
        if (plain < part.size()) {
            putSpecial(text);
        }
    }
}

/// Writes the first sequence, which needs an escape or is not ASCII, and removes it from the text.
void JsonWriter::putSpecial(std::string_view& text) {
    const Utf8::Sequence sequence = Utf8::firstSequence(text);
    const std::string_view bytes = text.substr(0, sequence.length);
    text.remove_prefix(sequence.length);
    if (!sequence.valid) {
        put(Utf8::replacement);
    } else if (sequence.length == 1) {
        putEscaped(bytes.front());
    } else if (const char32_t character = Utf8::character(bytes); Utf8::isSteering(character)) {
        putEscape(character);
    } else {
        put(bytes);
    }
}

/// Escapes a control character, the quote or the backslash; numerically if it has no short form.
void JsonWriter::putEscaped(char c) {
    constexpr std::string_view shortText = "\"\\\b\f\n\r\t";
    constexpr std::string_view letters = "\"\\bfnrt";
    if (const std::size_t index = shortText.find(c); index != std::string_view::npos) {
        put('\\');
        put(letters[index]);
    } else {
        putEscape(static_cast<unsigned char>(c));
    }
}

void JsonWriter::putEscape(char32_t character) {
    std::string escape; // so short that it allocates nothing
    SteeringText::appendEscape(escape, character);
    put(escape);
}

void JsonWriter::beginElement() {
    if (m_next == Next::NOTHING) {
        misused("a second value comes after the first");
    }
    if (isInObject()) {
        misused("a value in an object has no key");
    }
    if (m_next == Next::FURTHER) {
        put(',');
    }
}

JsonWriter& JsonWriter::begin(char bracket, bool isObject) {
    if (m_depth == mostNested) {
        misused("the value is nested too deeply");
    }
    beginValue();
    put(bracket);
    m_objects = m_objects << 1 | (isObject ? 1 : 0);
    ++m_depth;
    m_next = Next::FIRST;
    return *this;
}

JsonWriter& JsonWriter::end(char bracket, bool isObject) {
    if (m_depth == 0 || isInObject() != isObject) {
        misused("an end without its beginning");
    }
    if (m_next == Next::VALUE) {
        misused("a key has no value");
    }
    put(bracket);
    m_objects >>= 1;
    --m_depth;
    return endValue();
}

void JsonWriter::beginKey() const {
    if (!isInObject() || m_next == Next::VALUE) {
        misused("a key is not in an object, or follows another key");
    }
}

JsonWriter& JsonWriter::key(std::string_view name) {
    beginKey();
    if (m_next == Next::FURTHER) {
        put(',');
    }
    putString(name);
    put(':');
    m_next = Next::VALUE;
    return *this;
}

JsonWriter& JsonWriter::key(const JsonKey& name) {
    beginKey();
    const std::size_t begin = m_next == Next::FIRST ? 1 : 0; // the first key has no comma
    const std::size_t size = name.m_size - begin;
    reserve(name.m_text.size());
    for (std::size_t at = 0; at < size; at += JsonKey::step) {
        std::memcpy(m_buffer + m_size + at, name.m_text.data() + begin + at, JsonKey::step);
    }
    m_size += size;
    m_next = Next::VALUE;
    return *this;
}

JsonWriter& JsonWriter::value(std::string_view text) {
    beginValue();
    putString(text);
    return endValue();
}

template <typename Number> JsonWriter& JsonWriter::integer(Number number) {
    constexpr std::size_t mostDigits = std::numeric_limits<Number>::digits10 + 2; // with the sign
    beginValue();
    reserve(mostDigits);
    char* const begin = m_buffer + m_size;
    m_size +=
        static_cast<std::size_t>(std::to_chars(begin, begin + mostDigits, number).ptr - begin);
    return endValue();
}

JsonWriter& JsonWriter::signedInteger(std::int64_t number) {
    return integer(number);
}

JsonWriter& JsonWriter::unsignedInteger(std::uint64_t number) {
    return integer(number);
}

JsonWriter& JsonWriter::value(double number) {
    if (!std::isfinite(number)) {
        return null();
    }
    constexpr double leastFixed = 1e-4;
    constexpr double endOfFixed = 1e15;
    const double size = std::fabs(number);
    const bool isFixed = size == 0 || (size >= leastFixed && size < endOfFixed);
    char digits[32];
    const auto [end, error] =
        std::to_chars(digits, digits + sizeof digits, number,
                      isFixed ? std::chars_format::fixed : std::chars_format::scientific);
    const std::string_view text(digits, end);
    beginValue();
    put(text);
    if (isFixed && text.find('.') == std::string_view::npos) {
        put(".0");
    }
    return endValue();
}

JsonWriter& JsonWriter::time(std::int64_t milliseconds) {
    char text[UtcTime::mostBytes];
    return value(std::string_view(text, UtcTime::write(text, milliseconds)));
}

JsonWriter& JsonWriter::raw(std::string_view json) {
    beginValue();
    put(json);
    return endValue();
}

} // namespace zrm::host
