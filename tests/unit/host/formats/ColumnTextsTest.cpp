#include "host/formats/ColumnTexts.h"
#include "host/formats/FormatDescription.h"

#include <gtest/gtest.h>

using namespace zrm;
using namespace zrm::host;

TEST(ColumnTexts, ExchangesTextsAndFillsEmptyColumns) {
    FormatDescription description;
    description.values["type"] = {{"I", "INFO"}, {"W", "WARNING"}, {"-", ""}};
    description.defaults = {{"type", "none"}, {"source", "nginx"}};
    const auto texts = ColumnTexts::make(description);
    ASSERT_TRUE(texts) << texts.error().text();

    EntryColumns columns;
    columns.type = "W";
    columns.source = "";
    texts->apply(columns);
    EXPECT_EQ(columns.type, "WARNING");
    EXPECT_EQ(columns.source, "nginx");
    EXPECT_EQ(columns.system, "");

    columns.type = "-";
    columns.source = "own";
    texts->apply(columns);
    EXPECT_EQ(columns.type, "none");
    EXPECT_EQ(columns.source, "own");

    columns.type = "WX";
    texts->apply(columns);
    EXPECT_EQ(columns.type, "WX");

    EXPECT_TRUE(texts->exchanges(EntryColumn::type));
    EXPECT_FALSE(texts->exchanges(EntryColumn::source));
}

TEST(ColumnTexts, NamesTheKeyThatIsNotAColumn) {
    FormatDescription description;
    description.defaults = {{"sauce", "nginx"}};
    const auto defaults = ColumnTexts::make(description);
    ASSERT_FALSE(defaults);
    EXPECT_EQ(defaults.error().field, "defaults.sauce");
    EXPECT_EQ(defaults.error().what, "'sauce' is not a column");

    description.defaults.clear();
    description.values["time"] = {{"a", "b"}};
    const auto values = ColumnTexts::make(description);
    ASSERT_FALSE(values);
    EXPECT_EQ(values.error().field, "values.time");
}

TEST(FormatDescription, IsDefinedByAllThatDecidesWhatIsRead) {
    FormatDescription one;
    one.type = "json";
    one.columns = {{"time", "ts"}};
    FormatDescription other = one;
    EXPECT_EQ(one.definition(), other.definition());
    other.values["type"] = {{"I", "INFO"}};
    EXPECT_NE(one.definition(), other.definition());
    other = one;
    other.extracts.push_back({"sshd", {"(?P<user>.*)"}});
    EXPECT_NE(one.definition(), other.definition());
    other = one;
    other.unwrap = "cri";
    EXPECT_NE(one.definition(), other.definition());
}
