#include "host/framework/CodePages.h"

#include <algorithm>
#include <iterator>

namespace zrm::host {

namespace {

constexpr bool singleByteSet = true;
constexpr bool multiByteSet = false;

constexpr LOC2_Locale unknown{"", 0, singleByteSet};

// If several names have the same number, the first one is passed to iconv.
constexpr LOC2_Locale codeSets[] = {
    {"UTF-8", LOC2_UTF8, multiByteSet},
    {"ANSI_X3.4-1968", LOC2_ASCII, singleByteSet},
    {"US-ASCII", 367, singleByteSet},
    {"ASCII", 367, singleByteSet},
    {"646", 367, singleByteSet},
    {"ISO-8859-1", 819, singleByteSet},
    {"ISO-8859-2", 912, singleByteSet},
    {"ISO-8859-3", 913, singleByteSet},
    {"ISO-8859-4", 914, singleByteSet},
    {"ISO-8859-5", 915, singleByteSet},
    {"ISO-8859-6", 1089, singleByteSet},
    {"ISO-8859-7", 813, singleByteSet},
    {"ISO-8859-8", 916, singleByteSet},
    {"ISO-8859-9", 920, singleByteSet},
    {"ISO-8859-10", 919, singleByteSet},
    {"ISO-8859-13", 921, singleByteSet},
    {"ISO-8859-15", 923, singleByteSet},
    {"TIS-620", 874, singleByteSet},
    {"ISO-8859-11", 874, singleByteSet},
    {"KOI8-R", 878, singleByteSet},
    {"KOI8-U", 1168, singleByteSet},
    {"IBM437", 437, singleByteSet},
    {"CP437", 437, singleByteSet},
    {"IBM850", 850, singleByteSet},
    {"CP850", 850, singleByteSet},
    {"IBM852", 852, singleByteSet},
    {"CP852", 852, singleByteSet},
    {"IBM855", 855, singleByteSet},
    {"CP855", 855, singleByteSet},
    {"IBM857", 857, singleByteSet},
    {"CP857", 857, singleByteSet},
    {"IBM860", 860, singleByteSet},
    {"IBM862", 862, singleByteSet},
    {"IBM863", 863, singleByteSet},
    {"IBM865", 865, singleByteSet},
    {"IBM866", 866, singleByteSet},
    {"CP866", 866, singleByteSet},
    {"CP1250", 1250, singleByteSet},
    {"windows-1250", 1250, singleByteSet},
    {"CP1251", 1251, singleByteSet},
    {"windows-1251", 1251, singleByteSet},
    {"CP1252", 1252, singleByteSet},
    {"windows-1252", 1252, singleByteSet},
    {"IBM1252", 1252, singleByteSet},
    {"CP1253", 1253, singleByteSet},
    {"windows-1253", 1253, singleByteSet},
    {"CP1254", 1254, singleByteSet},
    {"windows-1254", 1254, singleByteSet},
    {"CP1255", 1255, singleByteSet},
    {"windows-1255", 1255, singleByteSet},
    {"CP1256", 1256, singleByteSet},
    {"windows-1256", 1256, singleByteSet},
    {"CP1257", 1257, singleByteSet},
    {"windows-1257", 1257, singleByteSet},
    {"CP1258", 1258, singleByteSet},
    {"windows-1258", 1258, singleByteSet},
    {"SJIS", 932, multiByteSet},
    {"Shift_JIS", 932, multiByteSet},
    {"GBK", 936, multiByteSet},
    {"BIG5", 950, multiByteSet},
    {"EUC-JP", 954, multiByteSet},
    {"EUC-TW", 964, multiByteSet},
    {"EUC-KR", 970, multiByteSet},
    {"UHC", 1363, multiByteSet},
    {"CP949", 1363, multiByteSet},
    {"BIG5-HKSCS", 1375, multiByteSet},
    {"GB2312", 1383, multiByteSet},
    {"EUC-CN", 1383, multiByteSet},
    {"GB18030", 1392, multiByteSet},
};

constexpr bool isPunctuation(char c) {
    return c == '-' || c == '_';
}

constexpr char lower(char c) {
    return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

/// Systems differ in how they write the names: "ISO-8859-1", "ISO8859-1", "iso_8859-1".
bool sameName(std::string_view left, std::string_view right) noexcept {
    auto l = left.begin();
    auto r = right.begin();
    for (;;) {
        l = std::find_if_not(l, left.end(), isPunctuation);
        r = std::find_if_not(r, right.end(), isPunctuation);
        if (l == left.end() || r == right.end()) {
            return l == left.end() && r == right.end();
        }
        if (lower(*l++) != lower(*r++)) {
            return false;
        }
    }
}

} // namespace

const LOC2_Locale* CodePages::byName(std::string_view codeSet) noexcept {
    const auto* const found =
        std::find_if(std::begin(codeSets), std::end(codeSets), [codeSet](const LOC2_Locale& known) {
            return sameName(known.codeSet, codeSet);
        });
    return found != std::end(codeSets) ? found : &unknown;
}

const LOC2_Locale* CodePages::byNumber(std::uint32_t codePage) noexcept {
    const auto* const found =
        std::find_if(std::begin(codeSets), std::end(codeSets),
                     [codePage](const LOC2_Locale& known) { return known.codePage == codePage; });
    return found != std::end(codeSets) ? found : nullptr;
}

} // namespace zrm::host
