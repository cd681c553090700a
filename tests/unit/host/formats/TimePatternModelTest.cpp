// Random times in many forms: what the C library writes is read, and what is read is what the C
// library's own strptime() says.

#include "host/formats/TimePattern.h"

#include <array>
#include <cstdint>
#include <cstdlib>
#include <ctime>
#include <random>
#include <string>

#include <gtest/gtest.h>

using namespace zrm;
using namespace zrm::host;

namespace {

/// Patterns that say all of a date and a time of day, and that strptime() understands alike.
constexpr std::array complete = {
    "%Y-%m-%d %H:%M:%S", "%d/%b/%Y:%H:%M:%S",   "%y%m%d %H:%M:%S", "%A %B %e %T %Y",
    "%D %I:%M:%S %p",    "%Y%m%d%H%M%S",        "%a, %d %b %Y %T", "%F %k:%M:%S",
    "%j.%Y %T",          "%d.%m.%Y %l:%M:%S%p", "%h %d, %Y %R:%S", "%s",
};

/// Forms of times that "auto" knows, with all of a date and a time of day.
constexpr std::array common = {
    "%Y-%m-%dT%H:%M:%SZ",
    "%Y-%m-%d %H:%M:%S.123",
    "%Y-%m-%d %H:%M:%S,123456",
    "%Y%m%dT%H%M%S",
    "%Y%m%d%H%M%S",
    "%Y/%m/%d %H:%M:%S",
    "%d/%b/%Y:%H:%M:%S +0000",
    "%a %b %e %H:%M:%S %Y",
    "%a %b %e %H:%M:%S.123456 %Y",
    "%a, %d %b %Y %H:%M:%S GMT",
    "%d %b %Y %H:%M:%S.123",
    "%d-%b-%Y %H:%M:%S.123",
    "%y%m%d %k:%M:%S",
    "%m/%d/%Y %I:%M:%S %p",
    "%b %d, %Y %I:%M:%S %p",
    "%y/%m/%d %H:%M:%S",
    "%d.%m.%Y %H:%M:%S",
    "%s.25",
    "%s",
    "%s123",
    "%s123456",
};

class Random {
public:
    explicit Random(unsigned seed) : m_engine(seed) {}

    std::int64_t below(std::int64_t limit) {
        return std::uniform_int_distribution<std::int64_t>(0, limit - 1)(m_engine);
    }
    template <class List> const char* oneOf(const List& list) {
        return list[static_cast<std::size_t>(below(static_cast<std::int64_t>(list.size())))];
    }
    /// From 2001, since when seconds have ten digits, to 2067.
    std::time_t time() { return 1'000'000'000 + below(2'100'000'000); }

private:
    std::mt19937_64 m_engine;
};

std::string written(const char* pattern, std::time_t time) {
    std::tm parts;
    gmtime_r(&time, &parts);
    char text[128];
    return {text, std::strftime(text, sizeof text, pattern, &parts)};
}

/// What the text says, as seconds without regard to zones. -1 if it is not a time.
std::int64_t readBy(const TimePattern& pattern, const std::string& text) {
    EntryColumns columns;
    return pattern.read(text, columns) && columns.hasTime ? columns.time.seconds() : -1;
}

/// The same by the C library.
std::int64_t referenceOf(const char* pattern, const std::string& text) {
    std::tm parts{};
    parts.tm_isdst = -1;
    const char* const end = strptime(text.c_str(), pattern, &parts);
    if (end == nullptr || std::string(end).find_first_not_of(' ') != std::string::npos) {
        return -1;
    }
    return timegm(&parts);
}

class TimePatternModel : public testing::TestWithParam<unsigned> {
protected:
    void SetUp() override {
        setenv("TZ", "UTC", 1); // strftime()'s %s asks for it
        tzset();
    }
};

TEST_P(TimePatternModel, ReadsWhatTheLibraryWrites) {
    Random random(GetParam());
    const auto anyForm = TimePattern::common();
    for (int round = 0; round < 20'000; ++round) {
        const std::time_t time = random.time();
        const char* const pattern = random.oneOf(complete);
        const std::string text = written(pattern, time);
        ASSERT_EQ(readBy(**TimePattern::compile(pattern), text), time) << pattern << ": " << text;
        const std::string usual = written(random.oneOf(common), time);
        ASSERT_EQ(readBy(*anyForm, usual), time) << usual;
    }
}

TEST_P(TimePatternModel, AgreesWithTheLibraryOnChangedTimes) {
    Random random(GetParam());
    int times = 0;
    for (int round = 0; round < 20'000; ++round) {
        const char* const pattern = random.oneOf(complete);
        std::string text = written(pattern, random.time());
        for (std::int64_t change = random.below(3); change >= 0; --change) {
            const auto at = static_cast<std::size_t>(random.below(std::ssize(text)));
            text[at] = "0123456789 :/-,APMapNov"[random.below(23)];
        }
        const std::int64_t time = readBy(**TimePattern::compile(pattern), text);
        if (time != -1) {
            ++times;
            ASSERT_EQ(time, referenceOf(pattern, text)) << pattern << ": " << text;
        }
    }
    EXPECT_GT(times, 2'000);
}

INSTANTIATE_TEST_SUITE_P(Seeds, TimePatternModel, testing::Range(1U, 5U));

} // namespace
