// What a clock remembers of the line before never changes what it makes of a line.

#include "logtypes/SyslogClock.h"

#include "logs/FollowSettings.h"
#include "support/Faults.h"
#include "support/TimeZone.h"

#include <gtest/gtest.h>

#include <cstring>
#include <limits>
#include <memory>
#include <random>
#include <string>
#include <string_view>
#include <vector>

using namespace zrm;

namespace {

constexpr std::int64_t always = std::numeric_limits<std::int64_t>::min();
constexpr std::int64_t noon = 1160049600; // 5 October 2006, 12:00:00 UTC

struct Reading {
    SyslogHead::Form form{};
    std::size_t end = 0;
    std::string stamp;
    EntryMoment::Kind kind{};
    std::int64_t seconds = 0;

    bool operator==(const Reading&) const = default;
};

std::ostream& operator<<(std::ostream& stream, const Reading& reading) {
    return stream << static_cast<int>(reading.form) << ' ' << reading.end << ' ' << reading.stamp
                  << ' ' << static_cast<int>(reading.kind) << ' ' << reading.seconds;
}

class SyslogClockTest : public testing::Test {
protected:
    void use(std::vector<ZoneOffset> zone) {
        FollowSettings settings;
        settings.zone = std::move(zone);
        m_settings = std::make_shared<const FollowSettings>(settings);
        m_clock = std::make_unique<SyslogClock>(m_settings);
    }

    Reading read(std::string_view line) {
        return reading([&](char* stamp) { return m_clock->read(line, stamp); });
    }
    /// What the line is without the lines before it.
    Reading readAlone(std::string_view line) const {
        return reading(
            [&](char* stamp) { return SyslogClock::readOnce(line, *m_settings, nullptr, stamp); });
    }
    void expectTheSame(const std::string& line) { EXPECT_EQ(read(line), readAlone(line)) << line; }
    std::string stampOf(std::string_view line) { return read(line).stamp; }

    TimeZone m_zone{"CET-1CEST,M3.5.0,M10.5.0/3"};
    FakeClock m_now{noon};
    std::shared_ptr<const FollowSettings> m_settings = std::make_shared<const FollowSettings>();
    std::unique_ptr<SyslogClock> m_clock = std::make_unique<SyslogClock>(m_settings);

private:
    template <typename Read> static Reading reading(const Read& readInto) {
        std::string stamp(16, ' ');
        lastEntryMoment = {};
        const SyslogHead head = readInto(stamp.data());
        const bool hasSeconds = lastEntryMoment.kind != EntryMoment::Kind::column;
        return {head.form, head.end, stamp, lastEntryMoment.kind,
                hasSeconds ? lastEntryMoment.seconds : 0};
    }
};

TEST_F(SyslogClockTest, ReadsTheSecondsOfAMinute) {
    EXPECT_EQ(stampOf("Oct  5 07:03:09 web1 a: b"), "1061005070309000");
    EXPECT_EQ(stampOf("Oct  5 07:03:59 web1 a: b"), "1061005070359000");
    EXPECT_EQ(stampOf("Oct  5 07:03:00 web1 a: b"), "1061005070300000");
    EXPECT_EQ(stampOf("Oct  5 07:04:00 web1 a: b"), "1061005070400000");
    EXPECT_EQ(stampOf("<34>1 2006-10-05T05:04:01.5Z web1 a - - - b"), "1061005070401000");
    EXPECT_EQ(stampOf("<3>1 2006-10-05T05:04:02.123456Z web1 a - - - b"), "1061005070402000");
}

TEST_F(SyslogClockTest, ALeapSecondIsNotOfTheMinute) {
    EXPECT_EQ(stampOf("2005-12-31T23:59:59Z web1 a: b"), "1060101005959000");
    EXPECT_EQ(stampOf("2005-12-31T23:59:60Z web1 a: b"), "1060101010000000");
    EXPECT_EQ(stampOf("2005-12-31T23:59:58Z web1 a: b"), "1060101005958000");
    EXPECT_EQ(read("2005-12-31T23:59:61Z web1 a: b").form, SyslogHead::Form::none);
}

TEST_F(SyslogClockTest, AnotherZoneIsAnotherMinute) {
    EXPECT_EQ(stampOf("2006-10-05T05:03:09Z web1 a: b"), "1061005070309000");
    EXPECT_EQ(stampOf("2006-10-05T05:03:10+02:00 web1 a: b"), "1061005050310000");
    EXPECT_EQ(stampOf("2006-10-05T05:03:10+02 web1 a: b"), "1061005050310000");
    EXPECT_EQ(stampOf("2006-10-05T05:03:11 web1 a: b"), "1061005050311000");
    EXPECT_EQ(stampOf("2006-10-05T05:03:12Z web1 a: b"), "1061005070312000");
    EXPECT_EQ(read("2006-10-05T05:03:13Zx web1 a: b").form, SyslogHead::Form::none);
}

TEST_F(SyslogClockTest, TheYearFollowsTheClock) {
    m_now.set(1167516000); // 30 December 2006, 22:00:00 UTC
    EXPECT_EQ(stampOf("Jan  1 00:30:00 web1 a: b"), "1060101003000000");
    m_now.set(1167516000 + 7200); // half an hour less than a day before that time
    EXPECT_EQ(stampOf("Jan  1 00:30:00 web1 a: b"), "1070101003000000");
    m_now.set(1167516000); // the clock is set back
    EXPECT_EQ(stampOf("Jan  1 00:30:00 web1 a: b"), "1060101003000000");
}

TEST_F(SyslogClockTest, AClockMayChangeWithinAMinute) {
    constexpr std::int64_t change = noon + 30;
    use({{always, 0}, {change, 3600}});
    EXPECT_EQ(stampOf("2006-10-05T12:00:29 web1 a: b"), "1061005140029000");
    EXPECT_EQ(stampOf("2006-10-05T12:00:31 web1 a: b"), "1061005130031000") << "was skipped";
    EXPECT_EQ(stampOf("2006-10-05T12:00:29 web1 a: b"), "1061005140029000");
    EXPECT_EQ(stampOf("2006-10-05T13:00:31 web1 a: b"), "1061005140031000");
}

TEST_F(SyslogClockTest, AZoneMayDifferBySeconds) {
    use({{always, 1172}});
    EXPECT_EQ(stampOf("2006-10-05T12:00:29 web1 a: b"), "1061005134057000");
    EXPECT_EQ(stampOf("2006-10-05T12:00:33 web1 a: b"), "1061005134101000");
}

TEST_F(SyslogClockTest, MakesTheSameOfALineWhateverCameBefore) {
    const std::vector<std::vector<ZoneOffset>> zones = {
        {}, {{always, 0}}, {{always, 20700}, {noon + 30, 19800}}, {{always, -1172}}};
    constexpr std::string_view priorities[] = {"", "", "<34>", "<165>1 ", "<13>1 ", "<9999>", "<>"};
    constexpr std::string_view minutes[] = {
        "Oct  5 07:03:",     "Oct 05 07:03:",     "Oct  5 07:04:",     "Dec 31 23:59:",
        "Jan  1 00:00:",     "Feb 29 12:00:",     "Oct 29 02:30:",     "2006-10-05T07:03:",
        "2006-10-05T14:00:", "2006-12-31T23:59:", "2006-10-29T02:30:", "2006-02-30T02:30:",
        "no time at all"};
    constexpr std::string_view seconds[] = {"00", "01", "29", "30", "58",
                                            "59", "60", "61", "9",  "x9"};
    constexpr std::string_view fractions[] = {"", "", ".5", ".123456", ",250", "."};
    constexpr std::string_view offsets[] = {"",      "",    "Z",      "z", "+02:00",
                                            "+0200", "+02", "-04:30", "x"};
    constexpr std::string_view rests[] = {" web1 a[1]: b", " web1 a - - - b", " ", "", "\t"};
    constexpr std::int64_t times[] = {noon,       noon,       noon,      noon + 1,
                                      1167609599, 1167609600, 1167523200};
    constexpr unsigned seed = 20061005;
    std::mt19937 random(seed);
    const auto oneOf = [&random](const auto& choices) {
        return choices[std::uniform_int_distribution<std::size_t>(0,
                                                                  std::size(choices) - 1)(random)];
    };
    std::string priority;
    std::string minute;
    std::string offset;
    for (int line = 0; line < 60'000 && !HasFailure(); ++line) {
        if (line % 15'000 == 0) {
            use(zones[static_cast<std::size_t>(line) / 15'000]);
        }
        // Most parts are those of the line before.
        if (random() % 4 == 0) {
            priority = oneOf(priorities);
            minute = oneOf(minutes);
            offset = oneOf(offsets);
        }
        if (random() % 16 == 0) {
            m_now.set(oneOf(times));
        }
        std::string text = priority + minute;
        text.append(oneOf(seconds)).append(minute[0] == '2' ? oneOf(fractions) : "");
        text.append(minute[0] == '2' ? offset : "").append(oneOf(rests));
        if (random() % 16 == 0) {
            text.resize(random() % (text.size() + 1));
        }
        expectTheSame(text);
    }
}

} // namespace
