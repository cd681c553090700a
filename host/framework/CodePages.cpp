#include "host/framework/CodePages.h"

#include <algorithm>
#include <iterator>

namespace {

constexpr bool kSingleByte = true;
constexpr bool kMultiByte = false;

constexpr LOC2_Locale kUnknown{"", 0, kSingleByte};

// Where several names have one number, the first is the one that iconv is asked for.
constexpr LOC2_Locale kCodeSets[] = {
    {"UTF-8", LOC2_UTF8, kMultiByte},
    {"ANSI_X3.4-1968", LOC2_ASCII, kSingleByte},
    {"US-ASCII", 367, kSingleByte},
    {"ASCII", 367, kSingleByte},
    {"646", 367, kSingleByte},
    {"ISO-8859-1", 819, kSingleByte},
    {"ISO-8859-2", 912, kSingleByte},
    {"ISO-8859-3", 913, kSingleByte},
    {"ISO-8859-4", 914, kSingleByte},
    {"ISO-8859-5", 915, kSingleByte},
    {"ISO-8859-6", 1089, kSingleByte},
    {"ISO-8859-7", 813, kSingleByte},
    {"ISO-8859-8", 916, kSingleByte},
    {"ISO-8859-9", 920, kSingleByte},
    {"ISO-8859-10", 919, kSingleByte},
    {"ISO-8859-13", 921, kSingleByte},
    {"ISO-8859-15", 923, kSingleByte},
    {"TIS-620", 874, kSingleByte},
    {"ISO-8859-11", 874, kSingleByte},
    {"KOI8-R", 878, kSingleByte},
    {"KOI8-U", 1168, kSingleByte},
    {"IBM437", 437, kSingleByte},
    {"CP437", 437, kSingleByte},
    {"IBM850", 850, kSingleByte},
    {"CP850", 850, kSingleByte},
    {"IBM852", 852, kSingleByte},
    {"CP852", 852, kSingleByte},
    {"IBM855", 855, kSingleByte},
    {"CP855", 855, kSingleByte},
    {"IBM857", 857, kSingleByte},
    {"CP857", 857, kSingleByte},
    {"IBM860", 860, kSingleByte},
    {"IBM862", 862, kSingleByte},
    {"IBM863", 863, kSingleByte},
    {"IBM865", 865, kSingleByte},
    {"IBM866", 866, kSingleByte},
    {"CP866", 866, kSingleByte},
    {"CP1250", 1250, kSingleByte},
    {"windows-1250", 1250, kSingleByte},
    {"CP1251", 1251, kSingleByte},
    {"windows-1251", 1251, kSingleByte},
    {"CP1252", 1252, kSingleByte},
    {"windows-1252", 1252, kSingleByte},
    {"IBM1252", 1252, kSingleByte},
    {"CP1253", 1253, kSingleByte},
    {"windows-1253", 1253, kSingleByte},
    {"CP1254", 1254, kSingleByte},
    {"windows-1254", 1254, kSingleByte},
    {"CP1255", 1255, kSingleByte},
    {"windows-1255", 1255, kSingleByte},
    {"CP1256", 1256, kSingleByte},
    {"windows-1256", 1256, kSingleByte},
    {"CP1257", 1257, kSingleByte},
    {"windows-1257", 1257, kSingleByte},
    {"CP1258", 1258, kSingleByte},
    {"windows-1258", 1258, kSingleByte},
    {"SJIS", 932, kMultiByte},
    {"Shift_JIS", 932, kMultiByte},
    {"GBK", 936, kMultiByte},
    {"BIG5", 950, kMultiByte},
    {"EUC-JP", 954, kMultiByte},
    {"EUC-TW", 964, kMultiByte},
    {"EUC-KR", 970, kMultiByte},
    {"UHC", 1363, kMultiByte},
    {"CP949", 1363, kMultiByte},
    {"BIG5-HKSCS", 1375, kMultiByte},
    {"GB2312", 1383, kMultiByte},
    {"EUC-CN", 1383, kMultiByte},
    {"GB18030", 1392, kMultiByte},
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
    const auto* const found = std::find_if(
        std::begin(kCodeSets), std::end(kCodeSets),
        [codeSet](const LOC2_Locale& known) { return sameName(known.codeSet, codeSet); });
    return found != std::end(kCodeSets) ? found : &kUnknown;
}

const LOC2_Locale* CodePages::byNumber(std::uint32_t codePage) noexcept {
    const auto* const found =
        std::find_if(std::begin(kCodeSets), std::end(kCodeSets),
                     [codePage](const LOC2_Locale& known) { return known.codePage == codePage; });
    return found != std::end(kCodeSets) ? found : nullptr;
}
