#ifndef ZRM_HOST_JSON_WRITER_H
#define ZRM_HOST_JSON_WRITER_H

#include <concepts>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <ranges>
#include <string>
#include <string_view>

namespace zrm::host {

/// A key that is escaped once and written often. Immutable, so any thread.
class JsonKey {
public:
    /// Throws std::logic_error for a name of more than a few hundred bytes.
    explicit JsonKey(std::string_view name);

private:
    friend class JsonWriter;
    static constexpr std::size_t step = 16; ///< bytes that are copied together

    std::string m_text; ///< a comma, the key in quotes, a colon; then room for one more step
    std::size_t m_size; ///< without that room
};

/// Writes one JSON value piece by piece, without blanks, to the end of a text of the caller. Puts
/// the commas itself. Allocates nothing but the growth of the text, so it serves every event. For
/// one thread at a time.
///
/// A call that would not give JSON throws std::logic_error: a value in an object without a key, a
/// key anywhere else, the wrong end, a second value at the top, nesting beyond `mostNested`. So
/// does a value that is not complete in the end. The text may then have a part of the value.
class JsonWriter {
public:
    /// The number of objects and arrays that can be open at the same time.
    static constexpr unsigned mostNested = 64;

    JsonWriter(const JsonWriter&) = delete;
    JsonWriter& operator=(const JsonWriter&) = delete;

    /// Appends the value that `write` gives to the writer.
    template <std::invocable<JsonWriter&> Write>
    static void append(std::string& out, const Write& write) {
        JsonWriter json(out);
        write(json);
        json.finish();
    }

    /// The same as a new text.
    template <std::invocable<JsonWriter&> Write> static std::string text(const Write& write) {
        std::string out;
        append(out, write);
        return out;
    }

    JsonWriter& beginObject() { return begin('{', true); }
    JsonWriter& endObject() { return end('}', true); }
    JsonWriter& beginArray() { return begin('[', false); }
    JsonWriter& endArray() { return end(']', false); }

    /// The key of the value that comes next. Does not notice a key that the object already has.
    JsonWriter& key(std::string_view name);
    JsonWriter& key(const JsonKey& name);

    /// A string. Bytes that are not UTF-8 become U+FFFD, and characters beyond ASCII that steer how
    /// text is shown (Utf8::isSteering) are escaped.
    JsonWriter& value(std::string_view text);
    JsonWriter& value(const char* text) { return value(std::string_view(text)); }
    template <std::integral Number>
    requires(!std::same_as<Number, char>) JsonWriter& value(Number number) {
        if constexpr (std::same_as<Number, bool>) {
            return raw(number ? "true" : "false");
        } else if constexpr (std::signed_integral<Number>) {
            return signedInteger(number);
        } else {
            return unsignedInteger(number);
        }
    }
    /// Enough digits for the same number when they are read, with a point or an exponent. JSON has
    /// no infinity and no not-a-number: these become null.
    JsonWriter& value(double number);
    /// What it contains, or null.
    template <typename Value> JsonWriter& value(const std::optional<Value>& optional) {
        return optional ? value(*optional) : null();
    }
    /// An array of its elements.
    template <std::ranges::input_range List>
    requires(!std::convertible_to<const List&, std::string_view>)
        JsonWriter& value(const List& list) {
        beginArray();
        for (const auto& element : list) {
            value(element);
        }
        return endArray();
    }
    /// A time in milliseconds since 1970-01-01 UTC, as UtcTime writes it.
    JsonWriter& time(std::int64_t milliseconds);
    JsonWriter& null() { return raw("null"); }
    /// A value that is JSON already, which is not checked.
    JsonWriter& raw(std::string_view json);

    /// A key and its value.
    template <typename Value> JsonWriter& member(std::string_view name, const Value& content) {
        return key(name).value(content);
    }
    /// A key and a string, or null if the text is empty.
    JsonWriter& textOrNull(std::string_view name, std::string_view text) {
        return text.empty() ? key(name).null() : key(name).value(text);
    }

private:
    friend class JsonKey;

    /// What may come next.
    enum class Next : std::uint8_t {
        VALUE,   ///< the value at the top, or the one of a key
        FIRST,   ///< the first member or element, or the end
        FURTHER, ///< one more member or element, or the end
        NOTHING, ///< the value is complete
    };

    // cppcheck-suppress uninitMemberVarPrivate ; nothing of the buffer is read before it is written
    explicit JsonWriter(std::string& out) noexcept : m_out(out) {}
    [[noreturn]] static void misused(const char* problem);
    void finish();

    bool isInObject() const noexcept { return (m_objects & 1) != 0; }
    JsonWriter& begin(char bracket, bool isObject);
    JsonWriter& end(char bracket, bool isObject);
    void beginKey() const;
    void beginValue() {
        if (m_next != Next::VALUE) {
            beginElement();
        }
    }
    void beginElement();
    JsonWriter& endValue() noexcept {
        m_next = m_depth == 0 ? Next::NOTHING : Next::FURTHER;
        return *this;
    }
    template <typename Number> JsonWriter& integer(Number number);
    JsonWriter& signedInteger(std::int64_t number);
    JsonWriter& unsignedInteger(std::uint64_t number);

    void flush();
    /// Makes room in the buffer, where it has as much.
    void reserve(std::size_t bytes) {
        if (sizeof m_buffer - m_size < bytes) {
            flush();
        }
    }
    void put(char c) {
        reserve(1);
        m_buffer[m_size++] = c;
    }
    void put(std::string_view text);
    void putString(std::string_view text);
    void putByParts(std::string_view text);
    void putSpecial(std::string_view& text);
    void putEscaped(char c);
    void putEscape(char32_t character);

    std::string& m_out;
    std::size_t m_size = 0;      ///< bytes in the buffer
    std::uint64_t m_objects = 0; ///< a bit for each open level, the innermost lowest: is an object
    unsigned m_depth = 0;
    Next m_next = Next::VALUE;
    char m_buffer[1024]; ///< not yet in the text, whose growth is checked once for all of this
};

} // namespace zrm::host

#endif
