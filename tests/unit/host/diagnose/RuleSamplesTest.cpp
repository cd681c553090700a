#include "host/diagnose/RuleSamples.h"

#include "host/config/ReadyFormats.h"
#include "host/config/ReadyRules.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

/// "LINE: TEXT" for each failure.
std::vector<std::string> failuresOf(const ReadyRules::Place& place) {
    const auto rule = ReadyRules::load(place);
    if (!rule) {
        return rule.error();
    }
    std::vector<std::string> texts;
    for (const SampleFailure& failure : RuleSamples::check(*rule, ReadyFormats({ZRM_FORMATS}))) {
        texts.push_back(std::to_string(failure.line) + ": " + failure.text);
    }
    return texts;
}

class RuleSamplesTest : public testing::Test {
protected:
    std::vector<std::string> failures(const std::string& text) {
        return failuresOf({"mine", directory.write("mine.toml", text)});
    }

    TemporaryDirectory directory;
};

TEST_F(RuleSamplesTest, EveryRuleHoldsItsSamples) {
    std::size_t rules = 0;
    for (const ReadyRules::Place& place : ReadyRules({ZRM_RULES}).list()) {
        if (place.path.starts_with(ZRM_RULES)) {
            EXPECT_THAT(failuresOf(place), IsEmpty()) << place.path;
            ++rules;
        }
    }
    EXPECT_GE(rules, 19u);
}

TEST_F(RuleSamplesTest, NamesSamplesThatAreNotWhatTheySay) {
    EXPECT_THAT(failures("[situation]\nwhen = [\"ENTRYSRC = 'app[1]'\", \"field.pid = 1\"]\n"
                         "[[sample]]\nentry = 'Nov 19 10:00:00 web1 app[1]: a'\n"
                         "[[sample]]\nentry = 'Nov 19 10:00:00 web1 app[2]: a'\n"
                         "[[sample]]\nentry = 'Nov 19 10:00:00 web1 app[1]: b'\nmiss = true\n"
                         "[[sample]]\nentry = 'Nov 19 10:00:00 web1 app[3]: b'\nmiss = true\n"
                         "[[sample]]\nentry = 'not such a line'\n"),
                ElementsAre("6: the entry does not meet the conditions",
                            "8: the entry meets the conditions, but must not",
                            "14: the entry does not fit the format"));
}

TEST_F(RuleSamplesTest, WantsSamplesOfBothKinds) {
    EXPECT_THAT(
        failures("[situation]\nwhen = \"ENTRYSRC = 'a'\"\n"),
        ElementsAre("0: there is no [[sample]]", "0: there is no [[sample]] with miss = true"));
}

TEST_F(RuleSamplesTest, DoesNotJudgeThresholds) {
    EXPECT_THAT(failures("[situation]\nwhen = \"ENTRYSRC = 'a'\"\nfrequency = '>= 5'\n"
                         "period = '1m'\n"
                         "[[sample]]\nentry = 'Nov 19 10:00:00 web1 a: a'\n"
                         "[[sample]]\nentry = 'Nov 19 10:00:00 web1 b: a'\nmiss = true\n"),
                IsEmpty());
}

TEST_F(RuleSamplesTest, NamesAFormatThatIsNotThere) {
    EXPECT_THAT(failures("format = 'none-such'\n[situation]\n[[sample]]\nentry = 'a'\n"
                         "[[sample]]\nentry = 'a'\nmiss = true\n")
                    .front(),
                testing::StartsWith("4: 'none-such' is not a ready format"));
}

} // namespace
