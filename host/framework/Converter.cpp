#include "host/framework/Converter.h"

#include "host/base/Utf8.h"
#include "host/framework/IconvCache.h"

#include <algorithm>
#include <cerrno>

namespace zrm::host {

namespace {

std::string_view substituteOf(const LOC2_Locale& codeSet) noexcept {
    if (codeSet.codePage == LOC2_UTF8) {
        return Utf8::replacement;
    }
    return codeSet.singleByte ? "\x1A" : "?";
}

/// The target of one conversion and its fill level.
class Target {
public:
    Target(const LOC2_Locale& codeSet, char* data, std::size_t size) noexcept
        : m_data(data), m_size(size), m_substitute(substituteOf(codeSet)) {}

    /// Appends as much of a text of single-byte characters as fits; true when all of it fits.
    bool put(std::string_view text) noexcept {
        const std::size_t fitting = std::min(text.size(), room());
        std::copy_n(text.data(), fitting, m_data + m_written);
        m_written += fitting;
        return fitting == text.size();
    }
    /// The same for valid UTF-8.
    bool putUtf8(std::string_view text) noexcept {
        const std::string_view fitting = Utf8::prefix(text, room());
        put(fitting);
        return fitting.size() == text.size();
    }
    /// Appends the substitution character; false when there is no room for it.
    bool putSubstitute() noexcept { return m_substitute.size() <= room() && put(m_substitute); }

    char* end() noexcept { return m_data + m_written; }
    void advanceTo(const char* end) noexcept { m_written = static_cast<std::size_t>(end - m_data); }
    std::size_t room() const noexcept { return m_size - m_written; }
    std::size_t written() const noexcept { return m_written; }

private:
    char* m_data;
    std::size_t m_size;
    std::string_view m_substitute;
    std::size_t m_written = 0;
};

bool copyUtf8(Target& target, std::string_view source) noexcept {
    while (!source.empty()) {
        const std::size_t valid = Utf8::validPrefix(source);
        if (!target.putUtf8(source.substr(0, valid))) {
            return false;
        }
        source.remove_prefix(valid);
        if (!source.empty()) {
            if (!target.putSubstitute()) {
                return false;
            }
            source.remove_prefix(Utf8::firstSequence(source).length);
        }
    }
    return true;
}

/// ASCII has no characters beyond 127.
bool copyAscii(Target& target, std::string_view source) noexcept {
    while (!source.empty()) {
        const std::size_t valid = Utf8::asciiPrefix(source);
        if (!target.put(source.substr(0, valid))) {
            return false;
        }
        source.remove_prefix(valid);
        if (!source.empty()) {
            if (!target.putSubstitute()) {
                return false;
            }
            source.remove_prefix(1);
        }
    }
    return true;
}

/// Length of the source that one substitution character stands for, after iconv refused it.
std::size_t refusedLength(const LOC2_Locale& from, std::string_view source, int error) noexcept {
    if (from.codePage == LOC2_UTF8) {
        return Utf8::firstSequence(source).length;
    }
    // EINVAL: the text ends within a character.
    return error == EINVAL ? source.size() : 1;
}

/// One call of iconv on the rest of the source or, without a source, to flush the converter.
/// Returns 0, or errno.
int step(iconv_t converter, Target& target, std::string_view* source) noexcept {
    // A character that does not fit may be partly written: restore what it has overwritten.
    constexpr std::size_t maxCharacter = 8;
    char saved[maxCharacter];
    const std::size_t savedSize = std::min(target.room(), maxCharacter);
    char* const limit = target.end() + target.room();
    std::copy_n(limit - savedSize, savedSize, saved);

    // iconv does not write to its source despite its declaration.
    char* in = source != nullptr ? const_cast<char*>(source->data()) : nullptr;
    std::size_t inLeft = source != nullptr ? source->size() : 0;
    char* out = target.end();
    std::size_t outLeft = target.room();
    const bool failed = iconv(converter, source != nullptr ? &in : nullptr, &inLeft, &out,
                              &outLeft) == static_cast<std::size_t>(-1);
    const int error = failed ? errno : 0;
    target.advanceTo(out);
    const std::size_t unused = std::min(outLeft, savedSize);
    std::copy_n(saved + savedSize - unused, unused, limit - unused);
    if (source != nullptr) {
        source->remove_prefix(source->size() - inLeft);
    }
    return error;
}

bool convertWith(iconv_t converter, Target& target, const LOC2_Locale& from,
                 std::string_view source) noexcept {
    for (;;) {
        const int error = step(converter, target, &source);
        if (error == E2BIG || step(converter, target, nullptr) != 0) {
            return false;
        }
        if (error == 0) {
            return true;
        }
        if (!target.putSubstitute()) {
            return false;
        }
        source.remove_prefix(refusedLength(from, source, error));
    }
}

} // namespace

Converted Converter::convert(const LOC2_Locale& to, char* target, std::size_t targetSize,
                             const LOC2_Locale& from, std::string_view source) noexcept {
    Target out(to, target, targetSize);
    // Most text is ASCII, which is the same in every code set.
    const std::size_t ascii = Utf8::asciiPrefix(source);
    if (!out.put(source.substr(0, ascii))) {
        return {out.written(), false};
    }
    source.remove_prefix(ascii);
    if (source.empty()) {
        return {out.written(), true};
    }
    bool complete = false;
    if (to.codePage == from.codePage && to.codePage == LOC2_UTF8) {
        complete = copyUtf8(out, source);
    } else if (to.codePage == from.codePage && to.singleByte) {
        const bool isAscii = to.codePage == LOC2_ASCII;
        complete = isAscii ? copyAscii(out, source) : out.put(source);
    } else {
        const iconv_t converter = IconvCache::find(to, from);
        if (converter == IconvCache::none()) {
            return {0, false, false};
        }
        complete = convertWith(converter, out, from, source);
    }
    return {out.written(), complete};
}

} // namespace zrm::host
