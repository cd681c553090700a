// After each entry, a log's own row equals any other row built from the same entry.

#include "TestLog.h"

#include <cstring>
#include <random>

using namespace zrm;

namespace {

std::string bytesOf(const zrm_rmlogent_data_t& row) {
    return {reinterpret_cast<const char*>(&row), sizeof row};
}

class EntryRowTest : public MonitoredFile {
protected:
    zrm_rmlogent_data_t* own() { return m_log.ownRow(); }
    /// A row with the common columns filled by the log and all others blank.
    zrm_rmlogent_data_t blankRow() const {
        zrm_rmlogent_data_t row;
        std::memset(&row, ' ', sizeof row);
        m_log.fillCommonColumns(&row);
        return row;
    }
    std::size_t random(std::size_t most) {
        return std::uniform_int_distribution<std::size_t>(0, most)(m_engine);
    }

    FakeClock m_clock{1160049600};
    TestLog m_log{*m_line};
    std::mt19937 m_engine{1};
};

/// What entries of a log type do to a row, chosen at random.
struct Entry {
    char letter;
    bool isRejected;
    bool overruns;
    bool statesLengths;
    std::size_t length;
    std::size_t lengthInUTF8;

    void fill(LogFile& log, zrm_rmlogent_data_t* place) const {
        EntryRow row(log, place);
        std::memset(row->entrytime, letter,
                    offsetof(zrm_rmlogent_data_t, entrydesc) -
                        offsetof(zrm_rmlogent_data_t, entrytime));
        std::memset(row->uentrysrc, letter, sizeof row->uentrysrc);
        std::memset(row->uentrydesc, letter, lengthInUTF8);
        if (isRejected) {
            row.reject();
        } else if (overruns) {
            constexpr std::size_t past = 700; // into ULOGPATH
            char* const bytes = reinterpret_cast<char*>(place);
            std::memset(bytes + offsetof(zrm_rmlogent_data_t, entrydesc), letter, past);
            row.restoreCommonColumns();
        } else {
            std::memset(row->entrydesc, letter, length);
            if (statesLengths) {
                row.setDescriptionLengths(length, static_cast<std::int32_t>(lengthInUTF8));
            }
        }
    }
};

TEST_F(EntryRowTest, BeginsWithOnlyTheCommonColumnsFilled) {
    zrm_rmlogent_data_t other;
    std::memset(&other, '#', sizeof other);
    for (zrm_rmlogent_data_t* const place : {own(), &other}) {
        const EntryRow row(m_log, place);
        EXPECT_EQ(&row.columns(), place);
        EXPECT_EQ(row.isOwn(), place == own());
        EXPECT_EQ(bytesOf(*place), bytesOf(blankRow()));
    }
}

TEST_F(EntryRowTest, TheOwnRowEqualsAnyOtherAfterRandomEntries) {
    for (int i = 0; i < 5000 && !HasFailure(); ++i) {
        const Entry entry{.letter = static_cast<char>('a' + random(25)),
                          .isRejected = random(5) == 0,
                          .overruns = random(5) == 0,
                          .statesLengths = random(3) > 0,
                          .length = random(sizeof zrm_rmlogent_data_t::entrydesc),
                          .lengthInUTF8 = random(sizeof zrm_rmlogent_data_t::uentrydesc)};
        zrm_rmlogent_data_t other;
        std::memset(&other, '#', sizeof other);
        entry.fill(m_log, &other);
        entry.fill(m_log, own());
        ASSERT_EQ(bytesOf(*own()), bytesOf(other)) << "entry " << i;
    }
}

TEST_F(EntryRowTest, AnUnknownOrTooLongLengthCountsAsTheWholeColumn) {
    for (const std::int32_t lengthInUTF8 : {-1, 100'000}) {
        {
            EntryRow row(m_log, own());
            std::memset(row->entrydesc, 'x', sizeof row->entrydesc);
            std::memset(row->uentrydesc, 'x', sizeof row->uentrydesc);
            row.setDescriptionLengths(100'000, lengthInUTF8);
        }
        const EntryRow row(m_log, own());
        EXPECT_EQ(bytesOf(row.columns()), bytesOf(blankRow()));
    }
}

TEST_F(EntryRowTest, OnlyWhatTheLastEntryMayHaveWrittenIsCleared) {
    {
        EntryRow row(m_log, own());
        row.setDescriptionLengths(10, 20);
    }
    own()->entrydesc[10] = own()->uentrydesc[20] = own()->logname[127] = '#';
    const EntryRow row(m_log, own());
    EXPECT_EQ(row->entrydesc[10], '#');
    EXPECT_EQ(row->uentrydesc[20], '#');
    EXPECT_EQ(row->logname[127], '#');
}

} // namespace
