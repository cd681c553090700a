#include "host/cli/CsvText.h"

#include <gtest/gtest.h>

using namespace zrm::host;

TEST(CsvTextTest, FieldsAreSeparatedByCommas) {
    EXPECT_EQ(CsvText::record({"a", "", "c d"}), "a,,c d\r\n");
    EXPECT_EQ(CsvText::record({}), "\r\n");
}

TEST(CsvTextTest, FieldsThatWouldBreakARecordAreQuoted) {
    EXPECT_EQ(CsvText::record({"a,b", "say \"hi\"", "two\nlines", "cr\r"}),
              "\"a,b\",\"say \"\"hi\"\"\",\"two\nlines\",\"cr\r\"\r\n");
}
