// The host's implementation of locale.h.
#include "framework/locale.h"

#include "base/Ascii.h"

#include "host/framework/CodePages.h"
#include "host/framework/Converter.h"
#include "host/framework/Status.h"

#include <cstring>

#include <langinfo.h>

using namespace zrm::host;

namespace {

void report(std::uint32_t* status, std::uint32_t value) noexcept {
    if (status != nullptr) {
        *status = value;
    }
}

std::uint32_t statusOf(const Converted& converted) noexcept {
    if (!converted.supported) {
        return Status::noConversion;
    }
    return converted.complete ? Status::ok : Status::truncated;
}

} // namespace

LOC2_Locale* LOC2_GetLocale(int /*category*/, int /*territory*/, int /*flags*/,
                            std::uint32_t* status) {
    report(status, Status::ok);
    // The agent's handle is not const, but nothing writes through it.
    return const_cast<LOC2_Locale*>(CodePages::byName(nl_langinfo(CODESET)));
}

std::uint32_t LOC2_GetLocaleNumInfo(LOC2_Locale* locale, int item, std::uint32_t* status) {
    const bool known = locale != nullptr && item == LOC2_CODEPAGE;
    report(status, known ? Status::ok : Status::invalidArgument);
    return known ? locale->codePage : 0;
}

namespace {

[[gnu::noinline]] std::int32_t translate(std::uint32_t targetCodePage, char* target,
                                         std::uint32_t targetSize, std::uint32_t sourceCodePage,
                                         const char* source, std::uint32_t sourceLength,
                                         std::uint32_t* resultLength, bool terminates,
                                         std::uint32_t* status) {
    Converted converted{0, false, false};
    if (!terminates || targetSize > 0) {
        const std::size_t room = terminates ? targetSize - 1 : targetSize;
        const LOC2_Locale* const to = CodePages::byNumber(targetCodePage);
        const LOC2_Locale* const from = CodePages::byNumber(sourceCodePage);
        if (to != nullptr && from != nullptr) {
            converted = Converter::convert(*to, target, room, *from, {source, sourceLength});
        }
        if (terminates) {
            target[converted.written] = '\0';
        }
    }
    report(resultLength, static_cast<std::uint32_t>(converted.written));
    report(status, statusOf(converted));
    return static_cast<std::int32_t>(converted.written);
}

} // namespace

std::int32_t LOC2_TranslateString(std::uint32_t targetCodePage, char* target,
                                  std::uint32_t targetSize, std::uint32_t sourceCodePage,
                                  const char* source, std::uint32_t sourceLength,
                                  std::uint32_t* resultLength, int flags, std::uint32_t* status) {
    const bool terminates = (flags & LOC2_NO_TERMINATOR) == 0;
    // The common case: ASCII, which is the same in every known code page, and it fits.
    if (!terminates && sourceLength > 0 && sourceLength <= targetSize &&
        CodePages::isKnown(targetCodePage) && CodePages::isKnown(sourceCodePage) &&
        zrm::isAscii({source, sourceLength})) {
        std::memcpy(target, source, sourceLength);
        report(resultLength, sourceLength);
        report(status, Status::ok);
        return static_cast<std::int32_t>(sourceLength);
    }
    return translate(targetCodePage, target, targetSize, sourceCodePage, source, sourceLength,
                     resultLength, terminates, status);
}
