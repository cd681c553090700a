#include "UserLogTest.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <cctype>

using namespace zrm;

// The time stamp of a user log's entry, made of the texts of its fields. The clock stands at 5
// October 2006, 12:34:56.

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

void put(char (&text)[8], const std::string& value) {
    value.copy(text, 7);
    text[std::min<std::size_t>(value.size(), 7)] = '\0';
}

class UserLogTime : public UserLogTest {
protected:
    UserLogTime() {
        makeLog(wholeLine);
        m_trace.clear();
    }

    /// The stamp that results from a bad field, and the message about it.
    void expectRefused(const _EntryTimeBuffers& texts, const char* stamp, const char* field,
                       const char* text) {
        m_trace.clear();
        EXPECT_EQ(timeOf(texts), stamp);
        EXPECT_THAT(m_trace.messages(), ElementsAre(std::string("Error: invalid ") + field +
                                                    " found in event entrytime; '" + text + "'"));
    }

    RecordingTrace m_trace{TRC1_ERROR};
};

TEST_F(UserLogTime, IsBuiltFromItsFields) {
    EXPECT_EQ(timeOf({"1999", "12", "31", "23", "59", "58"}), "0991231235958000");
    EXPECT_EQ(timeOf({"06", "1", "2", "3", "4", "5"}), "1060102030405000");
    EXPECT_EQ(timeOf({" 6", "+1", " 02", "\t3", "04", "005"}), "1060102030405000");
    EXPECT_THAT(m_trace.messages(), IsEmpty());
}

TEST_F(UserLogTime, WithoutFieldsIsTheCurrentTime) {
    EXPECT_EQ(timeOf(_EntryTimeBuffers{}), "1061005123400000") << "the second is never the clock's";
    EXPECT_EQ(timeOf({"", "", "", "", "", "9"}), "1061005123409000");
    EXPECT_EQ(timeOf({"2001", "", "", "", "", ""}), "1011005123400000");
    EXPECT_EQ(timeOf({"", "3", "", "", "", ""}), "1060305123400000");
    EXPECT_EQ(timeOf({"", "", "", "7", "", ""}), "1061005073400000");
    EXPECT_EQ(timeOf({"", "", "", "7", "8", ""}), "1061005070800000");
    m_clock.set(883612799); // 31 December 1997, 23:59:59
    EXPECT_EQ(timeOf(_EntryTimeBuffers{}), "0971231235900000");
}

TEST_F(UserLogTime, YearsHaveTwoDigitsAndACentury) {
    const char* const years[][2] = {{"2069", "169"}, {"1970", "070"}, {"0", "100"},
                                    {"69", "169"},   {"70", "070"},   {"2000", "100"},
                                    {"12345", "145"}};
    for (const auto& [year, stamp] : years) {
        _EntryTimeBuffers texts{"", "2", "3", "4", "5", "6"};
        put(texts.year, year);
        EXPECT_EQ(timeOf(texts), std::string(stamp) + "0203040506000");
    }
    EXPECT_EQ(timeOf({"-1", "2", "3", "4", "5", "6"}), "1060203040506000") << "-1 is unknown";
    EXPECT_EQ(timeOf({"-5", "2", "3", "4", "5", "6"}), "1-50203040506000");
    EXPECT_THAT(m_trace.messages(), IsEmpty());
    expectRefused({"20x6", "2", "3", "4", "5", "6"}, "1060203040506000", "year", "20x6");
    expectRefused({"06 ", "2", "3", "4", "5", "6"}, "1060203040506000", "year", "06 ");
}

TEST_F(UserLogTime, MonthsAreNumbersOrNames) {
    constexpr const char* names[] = {"Jan", "Feb", "Mar", "Apr", "May", "Jun",
                                     "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"};
    for (int month = 1; month <= 12; ++month) {
        char stamp[64];
        std::snprintf(stamp, sizeof stamp, "106%02d03040506000", month);
        _EntryTimeBuffers texts{"06", "", "3", "4", "5", "6"};
        put(texts.month, std::to_string(month));
        EXPECT_EQ(timeOf(texts), stamp);
        EXPECT_TRUE(numericMonth());
        put(texts.month, names[month - 1]);
        EXPECT_EQ(timeOf(texts), stamp);
        EXPECT_FALSE(numericMonth());
        for (char* character = texts.month; *character != '\0'; ++character) {
            *character = static_cast<char>(std::toupper(*character));
        }
        EXPECT_EQ(timeOf(texts), stamp);
    }
    EXPECT_EQ(timeOf({"06", "August", "3", "4", "5", "6"}), "1060803040506000");
    EXPECT_EQ(timeOf({"06", "DECxyz", "3", "4", "5", "6"}), "1061203040506000");
    EXPECT_THAT(m_trace.messages(), IsEmpty());
}

TEST_F(UserLogTime, TheLogLearnsWhichKindOfMonthItHas) {
    EXPECT_TRUE(numericMonth());
    EXPECT_EQ(timeOf({"06", "Mar", "1", "2", "3", "4"}), "1060301020304000");
    EXPECT_FALSE(numericMonth());
    EXPECT_EQ(timeOf({"06", "3", "1", "2", "3", "4"}), "1060301020304000");
    EXPECT_TRUE(numericMonth());
    EXPECT_THAT(m_trace.messages(), IsEmpty());
}

TEST_F(UserLogTime, RefusesMonthsOfNeitherKind) {
    for (const bool numeric : {true, false}) {
        for (const char* month :
             {"0", "13", "-1", "5th", "12x", "0x", "xyz", "jan", "Ja", "99999"}) {
            numericMonth() = numeric;
            _EntryTimeBuffers texts{"06", "", "3", "4", "5", "6"};
            put(texts.month, month);
            expectRefused(texts, "1061003040506000", "month", month);
            EXPECT_TRUE(numericMonth());
        }
    }
}

TEST_F(UserLogTime, DaysDependOnTheMonth) {
    constexpr int lengths[] = {31, 29, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31};
    for (int month = 1; month <= 12; ++month) {
        _EntryTimeBuffers texts{"01", "", "", "4", "5", "6"};
        put(texts.month, std::to_string(month));
        char stamp[64];
        put(texts.day, std::to_string(lengths[month - 1]));
        std::snprintf(stamp, sizeof stamp, "101%02d%02d040506000", month, lengths[month - 1]);
        EXPECT_EQ(timeOf(texts), stamp);
        put(texts.day, std::to_string(lengths[month - 1] + 1));
        std::snprintf(stamp, sizeof stamp, "101%02d05040506000", month);
        expectRefused(texts, stamp, "day", texts.day);
    }
    EXPECT_EQ(timeOf({"01", "", "31", "4", "5", "6"}), "1011031040506000");
    expectRefused({"01", "", "32", "4", "5", "6"}, "1011005040506000", "day", "32");
    expectRefused({"01", "1", "0", "4", "5", "6"}, "1010105040506000", "day", "0");
    expectRefused({"01", "1", "2nd", "4", "5", "6"}, "1010105040506000", "day", "2nd");
    expectRefused({"01", "1", "-2", "4", "5", "6"}, "1010105040506000", "day", "-2");
    expectRefused({"01", "Feb", "30", "4", "5", "6"}, "1010205040506000", "day", "30");
}

TEST_F(UserLogTime, HoursMayHaveAnAmOrPm) {
    const struct {
        const char* text;
        const char* hour;
    } hours[] = {
        {"0", "00"},    {"24", "24"},    {"23", "23"},   {"12am", "12"},
        {"12pm", "24"}, {"1pm", "13"},   {"1 PM", "13"}, {"11 Am", "11"},
        {"7a", "07"},   {"7 pxy", "19"}, {" 9p", "21"},  {"-0", "00"},
    };
    for (const auto& [text, hour] : hours) {
        _EntryTimeBuffers texts{"06", "2", "3", "", "5", "6"};
        put(texts.hour, text);
        EXPECT_EQ(timeOf(texts), std::string("1060203") + hour + "0506000") << text;
    }
    EXPECT_THAT(m_trace.messages(), IsEmpty());
    for (const char* text : {"13pm", "0am", "25", "-1", "-1pm", "pm", "7x", "7 ", "x", "24p"}) {
        _EntryTimeBuffers texts{"06", "2", "3", "", "5", "6"};
        put(texts.hour, text);
        expectRefused(texts, "1060203120506000", "hour", text);
    }
}

TEST_F(UserLogTime, MinutesAndSecondsEndAt59) {
    EXPECT_EQ(timeOf({"06", "2", "3", "4", "0", "0"}), "1060203040000000");
    EXPECT_EQ(timeOf({"06", "2", "3", "4", "59", "59"}), "1060203045959000");
    EXPECT_THAT(m_trace.messages(), IsEmpty());
    for (const char* text : {"60", "-1", "x", "5x"}) {
        _EntryTimeBuffers texts{"06", "2", "3", "4", "", "6"};
        put(texts.minute, text);
        expectRefused(texts, "1060203043406000", "minute", text);
    }
    for (const char* text : {"75", "60", "-1", "x", "5.5"}) {
        _EntryTimeBuffers texts{"06", "2", "3", "4", "5", ""};
        put(texts.second, text);
        expectRefused(texts, "1060203040500000", "second", text);
    }
}

TEST_F(UserLogTime, AReportSuppliesTheYear) {
    UserlogBufferInfo context{};
    context.century = 1;
    context.year = 6;
    context.month = 1;
    context.day = 3;
    EXPECT_EQ(timeOf({"", "1", "2", "4", "5", "6"}, &context), "1060102040506000");
    EXPECT_EQ(context.day, 2);
    EXPECT_EQ(timeOf({"", "12", "31", "4", "5", "6"}, &context), "1051231040506000");
    EXPECT_EQ(context.year, 5);
    EXPECT_EQ(context.month, 12);
    EXPECT_EQ(context.day, 31);
    EXPECT_EQ(timeOf({"", "12", "31", "4", "5", "6"}, &context), "1051231040506000");
    EXPECT_EQ(timeOf({"", "11", "30", "4", "5", "6"}, &context), "1051130040506000");
    EXPECT_EQ(timeOf({"", "11", "30", "4", "5", "6"}, &context), "1051130040506000");
    EXPECT_EQ(timeOf({"", "12", "1", "4", "5", "6"}, &context), "1041201040506000");
    EXPECT_EQ(timeOf({"", "12", "2", "4", "5", "6"}, &context), "1031202040506000");
}

TEST_F(UserLogTime, AReportGoesBackAcrossTheCentury) {
    UserlogBufferInfo context{};
    context.century = 1;
    context.year = 1;
    context.month = 1;
    context.day = 1;
    EXPECT_EQ(timeOf({"", "1", "2", "4", "5", "6"}, &context), "1000102040506000");
    EXPECT_EQ(timeOf({"", "1", "3", "4", "5", "6"}, &context), "0990103040506000");
    EXPECT_EQ(timeOf({"", "1", "4", "4", "5", "6"}, &context), "0980104040506000");
}

TEST_F(UserLogTime, AReportsDateStaysWhereMonthOrDayIsUnknown) {
    UserlogBufferInfo context{};
    context.century = 0;
    context.year = 98;
    context.month = 3;
    context.day = 4;
    EXPECT_EQ(timeOf({"", "", "2", "4", "5", "6"}, &context), "0981002040506000");
    EXPECT_EQ(timeOf({"", "12", "", "4", "5", "6"}, &context), "0981205040506000");
    EXPECT_EQ(context.year, 98);
    EXPECT_EQ(context.month, 3);
    EXPECT_EQ(context.day, 4);
    EXPECT_EQ(timeOf({"2005", "12", "24", "4", "5", "6"}, &context), "1051224040506000");
    EXPECT_EQ(context.month, 3) << "an entry with a year needs no context";
}

TEST_F(UserLogTime, NeedsTheClockOnlyForWhatIsUnknown) {
    const Fault fault("time", EFAULT, {.times = -1});
    EXPECT_EQ(timeOf({"06", "2", "3", "4", "5", ""}), "1060203040500000");
    EXPECT_THAT(m_trace.messages(), IsEmpty());
    EXPECT_EQ(timeOf({"06", "2", "3", "4", "", "6"}), "failed");
    EXPECT_THAT(m_trace.messages(),
                ElementsAre("Error: unable to determine current time to complete event entrytime. "
                            "errno = 14; Bad address."));
}

TEST_F(UserLogTime, NeedsTheLocalTime) {
    m_clock.set(now + 1000);
    const Fault fault("localtime_r", EOVERFLOW);
    EXPECT_EQ(timeOf({"06", "2", "3", "4", "", "6"}), "failed");
    EXPECT_THAT(m_trace.messages(),
                ElementsAre("Error: unable to determine current time to complete event entrytime. "
                            "errno = 75; Value too large for defined data type."));
    EXPECT_EQ(timeOf({"06", "2", "3", "4", "", "6"}), "1060203045106000") << "asked again";
}

TEST_F(UserLogTime, LooksUpTheZoneOncePerSecond) {
    m_clock.set(now + 2000);
    const Fault fault("localtime_r", EOVERFLOW, {.skip = 1, .times = -1});
    for (int line = 0; line < 100; ++line) {
        EXPECT_EQ(timeOf({"", "2", "3", "4", "5", "6"}), "1060203040506000");
    }
    EXPECT_EQ(fault.calls(), 1);
}

TEST_F(UserLogTime, AStampOfAnotherLengthIsRefused) {
    m_clock.set(4102444800); // 1 January 2100
    EXPECT_EQ(timeOf({"", "2", "3", "4", "5", "6"}), "failed");
    EXPECT_THAT(m_trace.messages(),
                ElementsAre("Error: formatting of entrytime into table row failed; expected to "
                            "write 15 characters but wrote 16."));
    m_trace.clear();
    EXPECT_EQ(timeOf({"-15", "2", "3", "4", "5", "6"}), "failed");
    EXPECT_THAT(m_trace.messages(),
                ElementsAre("Error: formatting of entrytime into table row failed; expected to "
                            "write 15 characters but wrote 16."));
}

TEST_F(UserLogTime, ALineWhoseTimeFailsHasNoRow) {
    m_clock.set(4102444800);
    EXPECT_EQ(timeOf("a line\n"), "failed");
}

} // namespace
