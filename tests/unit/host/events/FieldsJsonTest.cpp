#include "host/events/FieldsJson.h"

#include "base/EntryFields.h"

#include <gtest/gtest.h>

#include <string>

using namespace zrm;
using namespace zrm::host;

namespace {

class FieldsJsonTest : public testing::Test {
protected:
    FieldsJsonTest() {
        fields.add("user", "root");
        fields.add("text", "a\xc3\xa4\xc3\xa4");
        fields.add("user", "again");
        fields.add("pid", "7");
    }

    EntryFields fields;
};

TEST_F(FieldsJsonTest, HasTheFieldsThatWereAskedForInTheOrderOfTheEntry) {
    EXPECT_EQ(FieldsJson::of(fields, {"pid", "absent", "user"}).text,
              R"({"user":"root","pid":"7"})");
    EXPECT_EQ(FieldsJson::of(fields, {"absent"}).text, "");
    EXPECT_EQ(FieldsJson::of(fields, {}).text, "");
    EXPECT_EQ(FieldsJson::of(fields, {"*"}).text,
              "{\"user\":\"root\",\"text\":\"a\xc3\xa4\xc3\xa4\",\"pid\":\"7\"}");
    EXPECT_FALSE(FieldsJson::of(fields, {"*"}).isCut);
}

TEST_F(FieldsJsonTest, CutsAtACharacterAndLeavesOutTheRest) {
    const FieldsJson cut = FieldsJson::of(fields, {"*"}, 16);
    EXPECT_EQ(cut.text, "{\"user\":\"root\",\"text\":\"a\xc3\xa4\"}");
    EXPECT_TRUE(cut.isCut);
    EXPECT_FALSE(FieldsJson::of(fields, {"*"}, 21).isCut); // all of it
    EXPECT_TRUE(FieldsJson::of(fields, {"*"}, 20).isCut);
}

TEST_F(FieldsJsonTest, ANameWithoutRoomForAByteOfItsValueIsLeftOut) {
    EXPECT_EQ(FieldsJson::of(fields, {"*"}, 12).text, R"({"user":"root"})");
    EXPECT_EQ(FieldsJson::of(fields, {"*"}, 3).text, "");
    EXPECT_TRUE(FieldsJson::of(fields, {"*"}, 3).isCut);
    fields.clear();
    fields.add("user", "");
    EXPECT_EQ(FieldsJson::of(fields, {"*"}, 4).text, R"({"user":""})");
}

TEST_F(FieldsJsonTest, SaysThatAnEntryHasMoreFieldsThanItCanHave) {
    fields.noteLeftOut();
    EXPECT_TRUE(FieldsJson::of(fields, {"*"}).isCut);
    EXPECT_FALSE(FieldsJson::of(fields, {"pid"}).isCut);
}

} // namespace
