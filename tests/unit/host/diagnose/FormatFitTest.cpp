#include "host/diagnose/FormatFit.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

using namespace zrm;
using namespace zrm::host;

namespace {

FormatDescription logfmt() {
    FormatDescription description;
    description.type = "logfmt";
    return description;
}

FormatFit fitOf(const FormatDescription& format, const std::vector<std::string>& lines) {
    return FormatFit::of(format, lines).value();
}

TEST(FormatFit, CountsWhatFitsAndWhatIsKnownOfIt) {
    FormatDescription format = logfmt();
    format.defaults = {{"source", "app"}};
    const FormatFit fit = fitOf(format, {"time=2026-11-19T10:00:00Z level=info msg=a", "text",
                                         "level=info logger=db msg=b", "port=1"});
    EXPECT_EQ(fit.lines, 4U);
    EXPECT_EQ(fit.fitting, 3U);
    EXPECT_EQ(fit.entries, 3U);
    EXPECT_EQ(fit.withTime, 1U);
    EXPECT_EQ(fit.withType, 2U);
    EXPECT_EQ(fit.withSource, 1U) << "a default is not the log's own";
    EXPECT_DOUBLE_EQ(fit.share(), 0.75);
}

TEST(FormatFit, OfFormatsThatReadTheSameTheOneThatKnowsMoreIsBetter) {
    const std::vector<std::string> lines = {"time=2026-11-19T10:00:00Z level=info msg=a"};
    FormatDescription poor = logfmt();
    poor.columns = {{"time", ""}, {"type", ""}};
    EXPECT_GT(fitOf(logfmt(), lines).score(), fitOf(poor, lines).score());
    EXPECT_EQ(fitOf(logfmt(), {}).score(), 0);
    EXPECT_EQ(fitOf(logfmt(), {}).share(), 0);
}

TEST(FormatFit, LinesOfATraceBelongToTheirEntry) {
    FormatDescription format = logfmt();
    format.lines.starts = "^time=";
    const FormatFit fit =
        fitOf(format, {"time=2026-11-19T10:00:00Z level=info msg=a", "\tat x", "Caused by: y",
                       "\tat y", "", "time=2026-11-19T10:00:01Z level=info msg=b"});
    EXPECT_EQ(fit.fitting, 6U);
    EXPECT_EQ(fit.entries, 2U);
}

TEST(FormatFit, AJoinThatTakesInEverythingIsNoEvidence) {
    FormatDescription format = logfmt();
    format.lines.starts = "^time=";
    std::vector<std::string> lines(20, "something else");
    lines.insert(lines.begin(), "time=2026-11-19T10:00:00Z level=info msg=a");
    EXPECT_EQ(fitOf(format, lines).fitting, 1U);
}

TEST(FormatFit, EntriesAreAsLongAsTheJoinAllows) {
    FormatDescription format = logfmt();
    format.lines.indented = true;
    format.lines.limits.lines = 2;
    EXPECT_EQ(fitOf(format, {"a=b", " 1", " 2", "c=d"}).entries, 2U);
}

TEST(FormatFit, ALineOfASystemLoggerHasATimeOrAHost) {
    FormatDescription format;
    format.type = "syslog";
    EXPECT_EQ(fitOf(format, {"Nov 19 10:00:00 web1 app: text", "text",
                             "2026-11-19T10:00:00.123Z [info]: started"})
                  .fitting,
              1U);
}

TEST(FormatFit, ALevelIsNoHost) {
    FormatDescription format;
    format.type = "syslog";
    EXPECT_EQ(
        fitOf(format, {"2026-11-19T10:00:00Z INFO shop: text",
                       "Nov 19 10:00:00 Installed: shop-1.0", "2026-11-19T10:00:00Z E! [shop] text",
                       "2026-11-19T10:00:00Z fe80::1%eth0 shop: text"})
            .fitting,
        1U);
}

TEST(FormatFit, TheNameOfTheProgramIsWorthLessThanASourceOfItsOwn) {
    const std::vector<std::string> lines = {"time=2026-11-19T10:00:00Z level=info msg=a"};
    FormatDescription named = logfmt();
    named.defaults["source"] = "shop";
    const double plain = fitOf(logfmt(), lines).score();
    const double own =
        fitOf(logfmt(), {"time=2026-11-19T10:00:00Z level=info logger=shop msg=a"}).score();
    EXPECT_GT(fitOf(named, lines).score(), plain);
    EXPECT_LT(fitOf(named, lines).score(), own);
}

TEST(FormatFit, SaysWhyAFormatCannotBeMade) {
    FormatDescription format = logfmt();
    format.timeFormat = "never";
    EXPECT_EQ(FormatFit::of(format, {}).error().field, "time_format");
    format = logfmt();
    format.lines.continues = "(";
    EXPECT_EQ(FormatFit::of(format, {}).error().field, "entry.continues");
}

} // namespace
