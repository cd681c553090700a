#include "host/diagnose/FormatSamples.h"

#include "host/config/ReadyFormats.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

ReadyFormat logfmt() {
    ReadyFormat ready;
    ready.format.type = "logfmt";
    ReadyFormat::Sample sample;
    sample.entry = "time=2026-11-19T10:00:00.5-03:30 level=info msg=started";
    sample.time = "2026-11-19T10:00:00-03:30";
    sample.columns = {{"type", "info"}, {"description", "started"}, {"source", ""}};
    sample.fields = {{"level", "info"}};
    sample.line = 7;
    ready.samples.push_back(sample);
    return ready;
}

std::vector<std::string> failuresOf(const ReadyFormat& ready) {
    std::vector<std::string> texts;
    for (const SampleFailure& failure : FormatSamples::check(ready)) {
        texts.push_back(std::to_string(failure.line) + ": " + failure.text);
    }
    return texts;
}

TEST(FormatSamples, ASampleThatGivesWhatItMustIsRight) {
    EXPECT_THAT(failuresOf(logfmt()), IsEmpty());
}

TEST(FormatSamples, SaysWhatDiffers) {
    ReadyFormat ready = logfmt();
    ready.samples[0].time = "2026-11-19T10:00:00";
    ready.samples[0].columns["description"] = "stopped";
    ready.samples[0].fields = {{"level", "warn"}, {"port", "1"}};
    EXPECT_THAT(failuresOf(ready),
                ElementsAre("7: time is \"2026-11-19T10:00:00-03:30\", not \"2026-11-19T10:00:00\"",
                            "7: description is \"started\", not \"stopped\"",
                            "7: field level is \"info\", not \"warn\"",
                            "7: field port is missing"));
}

TEST(FormatSamples, TimesWithoutAYearAndEntriesWithoutATime) {
    ReadyFormat ready = logfmt();
    ready.samples[0].entry = "time=\"Nov 19 10:00:00\" level=info msg=started";
    ready.samples[0].time = "--11-19T10:00:00";
    EXPECT_THAT(failuresOf(ready), IsEmpty());
    ready.samples[0].entry = "level=info msg=started";
    EXPECT_THAT(failuresOf(ready), ElementsAre(HasSubstr("time is \"\"")));
}

TEST(FormatSamples, AnEntryFitsOrIsRejectedAsTheSampleSays) {
    ReadyFormat ready = logfmt();
    ready.samples[0].isRejected = true;
    EXPECT_THAT(failuresOf(ready), ElementsAre("7: the entry fits, but must not"));
    ready.samples[0].entry = "started";
    EXPECT_THAT(failuresOf(ready), IsEmpty());
    ready.samples[0].isRejected = false;
    EXPECT_THAT(failuresOf(ready),
                ElementsAre("7: the entry does not fit: it does not begin with a pair such as "
                            "level=info"));
}

TEST(FormatSamples, TheLinesOfASampleMakeOneEntry) {
    ReadyFormat ready = logfmt();
    ready.samples[0].entry += "\n  and more";
    EXPECT_THAT(failuresOf(ready), ElementsAre("7: the line \"  and more\" begins another entry"));
    ready.format.lines.indented = true;
    EXPECT_THAT(failuresOf(ready), IsEmpty());
    ready.format.lines.indented = false;
    ready.format.lines.continues = "^(?:time| )";
    EXPECT_THAT(failuresOf(ready), ElementsAre(HasSubstr("does not begin an entry")));
}

TEST(FormatSamples, AFormatThatCannotBeMadeOrHasNoSamplesFails) {
    ReadyFormat ready = logfmt();
    ready.format.columns = {{"when", "ts"}};
    EXPECT_THAT(failuresOf(ready),
                ElementsAre(HasSubstr("0: columns.when: 'when' is not a column")));
    ready = logfmt();
    ready.format.lines.starts = "(";
    EXPECT_THAT(failuresOf(ready), ElementsAre(HasSubstr("0: entry.starts: ")));
    ready = logfmt();
    ready.samples.clear();
    EXPECT_THAT(failuresOf(ready), ElementsAre("0: there is no [[sample]]"));
}

/// The formats of the package.
TEST(FormatSamples, EveryReadyFormatGivesWhatItsSamplesSay) {
    const ReadyFormats formats({ZRM_FORMATS});
    std::size_t count = 0;
    for (const ReadyFormats::Place& place : formats.list()) {
        if (!place.path.starts_with(ZRM_FORMATS)) {
            continue;
        }
        ++count;
        const auto ready = ReadyFormats::load(place);
        if (!ready) {
            ADD_FAILURE() << ready.error().front();
            continue;
        }
        EXPECT_FALSE(ready->about.empty()) << place.path;
        EXPECT_GE(ready->samples.size(), 2U) << place.path;
        for (const SampleFailure& failure : FormatSamples::check(*ready)) {
            ADD_FAILURE() << place.path << ':' << failure.line << ": " << failure.text;
        }
    }
    EXPECT_GE(count, 90U);
}

} // namespace
