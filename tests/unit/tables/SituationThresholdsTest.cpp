// How a Log Entries situation reads its frequency and period thresholds from its conditions.

#include "tables/zrm_rmlogent_base.h"
#include "tables/zrm_rmlogent_manager.h"

#include "TestRequest.h"
#include "support/RecordingTrace.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <climits>
#include <cstring>
#include <memory>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr int equal = 1;
constexpr int notEqual = 2;
constexpr int greaterOrEqual = 3;
constexpr int lessOrEqual = 4;
constexpr int less = 5;
constexpr int greater = 6;

template <typename Integer> std::string bytesOf(Integer value) {
    std::string bytes(sizeof value, '\0');
    std::memcpy(bytes.data(), &value, sizeof value);
    return bytes;
}

class SituationThresholds : public testing::Test {
protected:
    /// Opens the situation and returns the messages traced.
    std::vector<std::string> open(unsigned traceClass) {
        m_trace.clear();
        m_trace.setLevel(traceClass);
        m_request.reset(m_manager.CreateCtreq(&m_test, nullptr));
        m_trace.setLevel(0);
        return m_trace.messages();
    }

    /// The two columns as AddData leaves them in a row.
    std::pair<int, int> columns() {
        zrm_rmlogent_data_t row;
        std::memset(&row, 0x77, sizeof row);
        m_test.accepts = [](const char*) { return false; };
        static_cast<zrm_rmlogent_base&>(*m_request).AddData(&row, 1);
        return {row.freqthresh, row.periodthrs};
    }

    /// How many rows the situation collects when offered one that meets its other conditions.
    unsigned passed() {
        zrm_rmlogent_data_t row;
        std::memset(&row, ' ', sizeof row);
        m_test.accepts = nullptr;
        static_cast<zrm_rmlogent_base&>(*m_request).AddData(&row, 1);
        return m_request->count;
    }

    /// The fine messages and the columns with this FREQTHRESH condition and a period of 60.
    std::pair<std::vector<std::string>, int> frequency(int op, const std::string& bytes,
                                                       int length = -32768) {
        m_test.filters.clear();
        m_test.raw("FREQTHRESH", op, 496, bytes, length).number("PERIODTHRS", equal, 60);
        auto messages = open(TRC1_FINE);
        EXPECT_FALSE(messages.empty());
        messages.pop_back(); // that of the period
        return {messages, columns().first};
    }

    zrm_rmlogent_manager m_manager{"ZRM", "RMLOGENT"};
    TestRequest m_test{SAMPLE_SITUATION};
    RecordingTrace m_trace{0};
    std::unique_ptr<ctreq> m_request;
};

TEST_F(SituationThresholds, NoneMeansZeroColumns) {
    EXPECT_THAT(open(TRC1_FINE | TRC1_ERROR), IsEmpty());
    EXPECT_EQ(columns(), std::pair(0, 0));
}

TEST_F(SituationThresholds, EachOperatorBecomesAnInclusiveBound) {
    using Messages = std::vector<std::string>;
    const auto three = bytesOf<std::int64_t>(3);
    EXPECT_EQ(frequency(greaterOrEqual, three),
              std::pair(Messages{"Frequency threshold is >= 3."}, 3));
    EXPECT_EQ(frequency(greater, three), std::pair(Messages{"Frequency threshold is >= 4."}, 4));
    EXPECT_EQ(frequency(lessOrEqual, three),
              std::pair(Messages{"Frequency threshold is <= 3."}, 3));
    EXPECT_EQ(frequency(less, three), std::pair(Messages{"Frequency threshold is <= 2."}, 2));
}

TEST_F(SituationThresholds, ABoundBelowOneIsNotAThreshold) {
    using Messages = std::vector<std::string>;
    const std::pair none(Messages{}, 0);
    EXPECT_EQ(frequency(less, bytesOf<std::int64_t>(1)), none);
    EXPECT_EQ(frequency(lessOrEqual, bytesOf<std::int64_t>(0)), none);
    EXPECT_EQ(frequency(greaterOrEqual, bytesOf<std::int64_t>(-5)), none);
    EXPECT_EQ(frequency(greater, bytesOf<std::int64_t>(-1)), none);
    EXPECT_EQ(frequency(greater, bytesOf<std::int64_t>(0)),
              std::pair(Messages{"Frequency threshold is >= 1."}, 1));
}

TEST_F(SituationThresholds, BoundsWrapAroundAtTheTypesEnds) {
    using Messages = std::vector<std::string>;
    EXPECT_EQ(frequency(greater, bytesOf<std::int64_t>(INT64_MAX)), std::pair(Messages{}, 0));
    EXPECT_EQ(frequency(less, bytesOf<std::int64_t>(INT64_MIN)),
              std::pair(Messages{"Frequency threshold is <= 9223372036854775807."}, -1));
}

TEST_F(SituationThresholds, ValuesAreReadByTheirLength) {
    // The bytes after the value distinguish a read of 8 bytes from shorter ones.
    const auto value = bytesOf<std::int64_t>(0x0000000100020003);
    for (const int length : {0, 1, 3, 5, 6, 7, 8}) {
        const auto [messages, column] = frequency(greaterOrEqual, value, length);
        EXPECT_THAT(messages, ElementsAre("Frequency threshold is >= 4295098371.")) << length;
        EXPECT_EQ(column, 0x00020003) << "cut to 32 bits";
    }
    EXPECT_EQ(frequency(greaterOrEqual, value, 2).second, 3);
    EXPECT_EQ(frequency(greaterOrEqual, value, 4).second, 0x00020003);
}

TEST_F(SituationThresholds, ShortValuesAreSigned) {
    EXPECT_EQ(frequency(greaterOrEqual, bytesOf<std::int16_t>(-3)).second, 0);
    EXPECT_EQ(frequency(greaterOrEqual, bytesOf<std::int32_t>(-3)).second, 0);
    EXPECT_EQ(frequency(greaterOrEqual, bytesOf<std::int16_t>(3)).second, 3);
    EXPECT_EQ(frequency(greaterOrEqual, bytesOf<std::int32_t>(70000)).second, 70000);
}

TEST_F(SituationThresholds, ValuesNeedNotBeAligned) {
    m_test.number("FREQTHRESH", greaterOrEqual, 3).number("PERIODTHRS", equal, 60);
    TestRequest::Filter& filter = m_test.filters.front();
    filter.bytes.insert(filter.bytes.begin(), 'x');
    filter.info.value = filter.bytes.data() + 1;
    open(0);
    EXPECT_EQ(columns(), std::pair(3, 60));
}

TEST_F(SituationThresholds, FrequencyOfAnotherTypeIsIgnored) {
    m_test.raw("FREQTHRESH", greaterOrEqual, 452, "3").number("PERIODTHRS", equal, 60);
    EXPECT_THAT(open(TRC1_ERROR),
                ElementsAre("Invalid FREQTHRESH threshold data type; value is 452, expected value "
                            "is 496.  Threshold ignored."));
    EXPECT_EQ(columns(), std::pair(0, 0));
}

TEST_F(SituationThresholds, FrequencyWithAnotherOperatorIsIgnored) {
    for (const int op : {0, equal, notEqual, 7, -1}) {
        m_test.filters.clear();
        m_test.number("FREQTHRESH", op, 3).number("PERIODTHRS", equal, 60);
        EXPECT_THAT(open(TRC1_ERROR),
                    ElementsAre("Invalid FREQTHRESH threshold compare operator; value is " +
                                std::to_string(op) + ". Threshold ignored."));
        EXPECT_EQ(columns(), std::pair(0, 0));
    }
}

TEST_F(SituationThresholds, FrequencyOfAnImpossibleLengthIsIgnored) {
    for (const int length : {-1, 9, 32767}) {
        m_test.filters.clear();
        m_test.raw("FREQTHRESH", greaterOrEqual, 496, bytesOf<std::int64_t>(3), length)
            .number("PERIODTHRS", equal, 60);
        EXPECT_THAT(open(TRC1_ERROR),
                    ElementsAre("Size of FREQTHRESH threshold is " + std::to_string(length) +
                                " which does not equal expected size of 8. Threshold ignored."));
        EXPECT_EQ(columns(), std::pair(0, 0));
    }
}

TEST_F(SituationThresholds, ThePeriodIsCheckedInTheSameWay) {
    m_test.number("FREQTHRESH", greaterOrEqual, 3)
        .raw("PERIODTHRS", equal, 500, "60")
        .number("PERIODTHRS", greaterOrEqual, 60)
        .raw("PERIODTHRS", equal, 496, bytesOf<std::int64_t>(60), 9)
        .raw("PERIODTHRS", equal, 496, bytesOf<std::int64_t>(60), -1)
        .number("PERIODTHRS", equal, 0)
        .number("PERIODTHRS", equal, -60);
    EXPECT_THAT(
        open(TRC1_ERROR),
        ElementsAre("Invalid PERIODTHRS threshold data type; value is 500, expected value is 496.  "
                    "Threshold ignored.",
                    "Invalid PERIODTHRS threshold compare operator; value is 3. Threshold ignored.",
                    "Size of PERIODTHRS threshold is 9 which does not equal expected size of 8. "
                    "Threshold ignored.",
                    "Size of PERIODTHRS threshold is -1 which does not equal expected size of 8. "
                    "Threshold ignored."));
    EXPECT_EQ(columns(), std::pair(0, 0));
    m_test.raw("PERIODTHRS", equal, 496, bytesOf<std::int16_t>(90));
    EXPECT_THAT(open(TRC1_FINE),
                ElementsAre("Frequency threshold is >= 3.", "Period threshold is 90."));
    EXPECT_EQ(columns(), std::pair(3, 90));
}

TEST_F(SituationThresholds, OneWithoutTheOtherIsInert) {
    m_test.number("FREQTHRESH", greaterOrEqual, 1).number("PERIODTHRS", equal, 0);
    open(0);
    EXPECT_EQ(columns(), std::pair(0, 0));
    EXPECT_EQ(passed(), 1U);
    m_test.filters.clear();
    m_test.number("PERIODTHRS", equal, 60).number("FREQTHRESH", less, 1);
    open(0);
    EXPECT_EQ(columns(), std::pair(0, 0));
    EXPECT_EQ(passed(), 1U);
}

TEST_F(SituationThresholds, TheFirstUsableOneHolds) {
    m_test.number("FREQTHRESH", equal, 9)
        .number("FREQTHRESH", greaterOrEqual, 0)
        .number("FREQTHRESH", greaterOrEqual, 2)
        .raw("FREQTHRESH", equal, 1, "") // not read
        .number("FREQTHRESH", greaterOrEqual, 5)
        .number("PERIODTHRS", equal, 60);
    EXPECT_THAT(open(TRC1_ERROR), ElementsAre("Invalid FREQTHRESH threshold compare operator; "
                                              "value is 1. Threshold ignored."));
    EXPECT_EQ(columns(), std::pair(2, 60));
    m_test.filters.clear();
    m_test.number("PERIODTHRS", equal, 60)
        .number("PERIODTHRS", equal, 90)
        .raw("PERIODTHRS", less, 1, "") // not read either
        .number("FREQTHRESH", greaterOrEqual, 2);
    EXPECT_THAT(open(TRC1_ERROR), IsEmpty());
    EXPECT_EQ(columns(), std::pair(2, 60));
}

TEST_F(SituationThresholds, ConditionsAreReadUntilBothAreKnown) {
    m_test.text("LOGNAME", equal, "messages")
        .number("PERIODTHRS", equal, 60)
        .text("ENTRYSRC", equal, "sshd")
        .number("FREQTHRESH", lessOrEqual, 3)
        .text("ENTRYTYPE", equal, "never reached");
    std::vector<std::string> messages = open(TRC1_DETAIL);
    ASSERT_EQ(messages.size(), 5U);
    messages.erase(messages.begin()); // the object's creation
    EXPECT_THAT(messages,
                ElementsAre("Filter column name  = LOGNAME.", "Filter column name  = PERIODTHRS.",
                            "Filter column name  = ENTRYSRC.",
                            "Filter column name  = FREQTHRESH."));
    EXPECT_EQ(m_test.fetched, 4);
    EXPECT_EQ(columns(), std::pair(3, 60));
}

TEST_F(SituationThresholds, ColumnsAreRewrittenForEachRequest) {
    m_test.number("FREQTHRESH", lessOrEqual, 3).number("PERIODTHRS", equal, 5'000'000'000);
    open(0);
    TestRequest plainTest(SAMPLE_SITUATION, "plain");
    const std::unique_ptr<ctreq> plain(m_manager.CreateCtreq(&plainTest, nullptr));
    m_manager.requests().Add(m_request.get());
    m_manager.requests().Add(plain.get());
    std::vector<std::pair<int, int>> offered;
    const auto look = [&](const char* row) {
        zrm_rmlogent_data_t copy;
        std::memcpy(&copy, row, sizeof copy);
        offered.emplace_back(copy.freqthresh, copy.periodthrs);
        return false;
    };
    m_test.accepts = look;
    plainTest.accepts = look;
    zrm_rmlogent_data_t rows[2];
    std::memset(rows, 0x77, sizeof rows);
    m_trace.clear();
    m_trace.setLevel(TRC1_FINE);
    m_manager.AddDataToEvent(rows, 2);
    EXPECT_THAT(m_trace.messages(), ElementsAre("Event passed to situation alpha for evaluation.",
                                                "Event passed to situation plain for evaluation."));
    const auto period = static_cast<int>(static_cast<std::int32_t>(5'000'000'000));
    EXPECT_THAT(offered, ElementsAre(std::pair(3, period), std::pair(3, period), std::pair(0, 0),
                                     std::pair(0, 0)));
}

} // namespace
