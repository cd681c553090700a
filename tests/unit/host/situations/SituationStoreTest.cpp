#include "host/situations/SituationStore.h"

#include "host/config/SituationValidator.h"
#include "support/Faults.h"
#include "support/ReasonOf.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>

#include <sys/stat.h>

using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::EndsWith;
using testing::HasSubstr;
using testing::IsEmpty;

SituationConfig situation(const std::string& name) {
    SituationText text;
    text.name = name;
    text.text = "'; DROP TABLE x; -- <b> \" \\ \xe2\x82\xac";
    text.severity = "major";
    text.log = "/var/log/a b.log";
    text.when = {"ENTRYSRC = 'it''s'", "ENTRYDESC matches '[\"\\\\]'"};
    text.frequency = ">= 2";
    text.period = "1h";
    text.runbook = "https://wiki.example.org/a#b";
    text.labels = {{"team", "web \xe2\x82\xac"}};
    const auto [config, problems] = SituationValidator::check(text);
    EXPECT_THAT(problems, IsEmpty());
    return config;
}

SituationStore::Content content() {
    return {{{situation("a"), false}, {situation("b/c"), true}}, {"filed"}};
}

class SituationStoreTest : public testing::Test {
protected:
    std::string text() const {
        std::ifstream stream(file);
        return {std::istreambuf_iterator<char>(stream), {}};
    }
    std::vector<std::string> names() const {
        std::vector<std::string> names;
        for (const auto& entry : std::filesystem::directory_iterator(directory.path())) {
            names.push_back(entry.path().filename());
        }
        return names;
    }

    /// Reads the file; what is said about it is in `message`.
    SituationStore::Content load(SituationStore&& store) { return load(store); }
    SituationStore::Content load(SituationStore& store) {
        SituationStore::Content content = store.load();
        message = content.message;
        return content;
    }

    RecordingTrace trace{TRC1_ERROR};
    TemporaryDirectory directory;
    const std::string file = directory.file("situations.json");
    SituationStore store{file};
    std::string message;
};

TEST_F(SituationStoreTest, LoadsWhatWasSaved) {
    EXPECT_EQ(reasonOf(store.save(content())), "");
    const SituationStore::Content loaded = load(SituationStore(file));
    EXPECT_EQ(message, "");
    ASSERT_EQ(loaded.made.size(), 2u);
    EXPECT_EQ(loaded.made[0].config, situation("a"));
    EXPECT_EQ(loaded.made[1].config, situation("b/c"));
    EXPECT_FALSE(loaded.made[0].isStopped);
    EXPECT_TRUE(loaded.made[1].isStopped);
    EXPECT_EQ(loaded.made[0].problem, "");
    EXPECT_THAT(loaded.stoppedFiles, ElementsAre("filed"));
    EXPECT_THAT(names(), ElementsAre("situations.json")) << "no temporary file is left";
    struct stat status {};
    stat(file.c_str(), &status);
    EXPECT_EQ(status.st_mode & S_IRWXO, 0u);
}

TEST_F(SituationStoreTest, AFileOfAnyDepthIsMovedAside) {
    constexpr std::size_t deep = 300'000;
    const std::string nested = std::string(deep, '[') + std::string(deep, ']');
    for (const std::string& content :
         {"{\"version\": " + nested + "}",
          "{\"version\": 1, \"situations\": " + nested + ", \"stopped\": []}", nested}) {
        std::ofstream(file) << content;
        message.clear();
        EXPECT_THAT(load(SituationStore(file)).made, IsEmpty());
        EXPECT_THAT(message, HasSubstr(file + " cannot be used (it is nested too deeply)"));
    }
}

TEST_F(SituationStoreTest, DoesNotWaitForAPipeInItsPlace) {
    ASSERT_EQ(mkfifo(file.c_str(), 0600), 0);
    EXPECT_THAT(load(store).made, IsEmpty());
    EXPECT_THAT(message, HasSubstr("cannot be used"));
}

TEST_F(SituationStoreTest, TooLargeRegularExpressionsAreKeptAndDoNotRun) {
    ASSERT_EQ(reasonOf(store.save(content())), "");
    std::string stored = text();
    const std::string small = R"([\"\\\\])";
    for (std::size_t at = 0; (at = stored.find(small, at)) != std::string::npos;) {
        stored.replace(at, small.size(), R"(\\pL{400})");
    }
    std::ofstream(file) << stored;
    const SituationStore::Content loaded = load(SituationStore(file));
    ASSERT_EQ(loaded.made.size(), 2u);
    EXPECT_THAT(loaded.made[0].problem, HasSubstr("'\\pL{400}' is too large a regular expression"));
    EXPECT_EQ(loaded.made[0].config.when.at(1), "ENTRYDESC matches '\\pL{400}'");
}

TEST_F(SituationStoreTest, KeepsTextsWithBracesFromBeforeTheyHadAMeaning) {
    std::ofstream(file)
        << R"({"version":1,"situations":[{"name":"a","text":"see {wiki}","when":[],)"
        << R"("stopped":false}],"stopped":[]})";
    const SituationStore::Content loaded = load(store);
    EXPECT_EQ(message, "");
    ASSERT_EQ(loaded.made.size(), 1u);
    EXPECT_EQ(loaded.made[0].problem, "");
    EXPECT_EQ(loaded.made[0].config.text, "see {wiki}");
}

TEST_F(SituationStoreTest, IsEmptyWithoutAFile) {
    EXPECT_THAT(load(store).made, IsEmpty());
    EXPECT_EQ(message, "");
    EXPECT_THAT(names(), IsEmpty());
}

TEST_F(SituationStoreTest, SavesNothingWithoutAPath) {
    SituationStore nothing("");
    EXPECT_EQ(reasonOf(nothing.save(content())), "");
    EXPECT_THAT(load(nothing).made, IsEmpty());
}

TEST_F(SituationStoreTest, CreatesItsDirectory) {
    SituationStore deeper(directory.file("state") + "/situations.json");
    EXPECT_EQ(reasonOf(deeper.save(content())), "");
    EXPECT_EQ(load(deeper).made.size(), 2u);
    SituationStore tooDeep(directory.file("no") + "/such/situations.json");
    EXPECT_THAT(reasonOf(tooDeep.save(content())),
                HasSubstr("cannot create the directory " + directory.file("no") + "/such: "));
}

TEST_F(SituationStoreTest, AFailedSaveLeavesTheFileAsItWas) {
    ASSERT_EQ(reasonOf(store.save(content())), "");
    const std::string before = text();
    for (const char* const call : {"open", "write", "close"}) {
        trace.clear();
        const Fault fault(call, ENOSPC);
        const std::string problem = reasonOf(store.save({}));
        EXPECT_EQ(fault.failed(), 1) << call;
        EXPECT_THAT(problem, EndsWith(": No space left on device")) << call;
        EXPECT_THAT(trace.messages(),
                    ElementsAre("The situations cannot be saved: " + problem + "."));
        EXPECT_EQ(text(), before) << call;
        EXPECT_THAT(names(), ElementsAre("situations.json")) << call;
    }
    EXPECT_EQ(reasonOf(store.save({})), "");
    EXPECT_NE(text(), before);
}

TEST_F(SituationStoreTest, WritesNeitherToALinkNorToAPipeInItsPlace) {
    const std::string target = directory.write("target", "other");
    for (const std::string& place : {file, file + ".new"}) {
        std::filesystem::create_symlink(target, place);
        EXPECT_EQ(reasonOf(store.save(content())), "") << place;
        EXPECT_THAT(names(), testing::UnorderedElementsAre("situations.json", "target")) << place;
        EXPECT_FALSE(std::filesystem::is_symlink(file));
        std::filesystem::remove(file);
    }
    EXPECT_EQ(std::filesystem::file_size(target), 5u);
    ASSERT_EQ(mkfifo((file + ".new").c_str(), 0600), 0); // opening it would wait for a reader
    EXPECT_EQ(reasonOf(store.save(content())), "");
    EXPECT_TRUE(std::filesystem::is_regular_file(file));
}

TEST_F(SituationStoreTest, ReportsThatTheFileCannotBeReplaced) {
    std::filesystem::create_directory(file);
    directory.write("situations.json/inside", "x");
    SituationStore fresh(file);
    EXPECT_THAT(reasonOf(fresh.save(content())), HasSubstr("cannot replace " + file + ": "));
    EXPECT_THAT(names(), ElementsAre("situations.json"));
}

TEST_F(SituationStoreTest, MovesAnUnusableFileAside) {
    const std::pair<const char*, const char*> bad[] = {
        {"", "it is damaged"},
        {"{\"version\":1,", "it is damaged"},
        {"null", "it is damaged"},
        {"[1]", "it is damaged"},
        {R"({"version":1})", "it is damaged"},
        {R"({"version":1,"situations":{},"stopped":5})", "it is damaged"},
        {R"({"version":1,"situations":[{"name":5}],"stopped":[]})", "it is damaged"},
        {R"({"version":1,"situations":[{"name":"a","when":[]}],"stopped":[]})", "it is damaged"},
        {R"({"version":7,"situations":[],"stopped":[]})", "its version is 7, this agent's is 1"},
        {R"({"version":1,"situations":[{"name":"a","when":[],"stopped":false},)"
         R"({"name":"a","when":[],"stopped":false}],"stopped":[]})",
         "a name appears twice"},
    };
    for (const auto& [written, reason] : bad) {
        for (const std::string& name : names()) {
            std::filesystem::remove(directory.file(name));
        }
        directory.write("situations.json", written);
        SituationStore fresh(file);
        EXPECT_THAT(load(fresh).made, IsEmpty()) << written;
        EXPECT_THAT(message, HasSubstr(file + " cannot be used (" + reason + ") and was moved to " +
                                       file + ".bad-"))
            << written;
        ASSERT_EQ(names().size(), 1u);
        EXPECT_THAT(names()[0], HasSubstr("situations.json.bad-"));
        EXPECT_EQ(reasonOf(fresh.save(content())), "") << "a new file is created";
    }
}

TEST_F(SituationStoreTest, DoesNotOverwriteWhatItCouldNotRead) {
    ASSERT_EQ(reasonOf(store.save(content())), "");
    const std::string before = text();
    SituationStore fresh(file);
    {
        const Fault fault("open", EACCES);
        load(fresh);
    }
    EXPECT_EQ(message, "cannot read " + file +
                           ": Permission denied; situations cannot be changed through the API "
                           "until the next start");
    EXPECT_EQ(reasonOf(fresh.save({})), "cannot read " + file + ": Permission denied");
    EXPECT_EQ(text(), before);
    SituationStore torn(file);
    {
        const Fault fault("read", EIO);
        load(torn);
    }
    EXPECT_THAT(message, HasSubstr("cannot read " + file));
    EXPECT_NE(reasonOf(torn.save({})), "");
    EXPECT_EQ(text(), before);
}

TEST_F(SituationStoreTest, ReportsWhyASituationCannotRun) {
    directory.write("situations.json",
                    R"({"version":1,"situations":[{"name":"a","when":["GONE = 'x'"],)"
                    R"("frequency":">= 5","stopped":true}],"stopped":[]})");
    const auto loaded = load(store);
    EXPECT_EQ(message, "");
    ASSERT_EQ(loaded.made.size(), 1u);
    EXPECT_EQ(loaded.made[0].config.name, "a");
    EXPECT_THAT(loaded.made[0].config.when, ElementsAre("GONE = 'x'"));
    EXPECT_THAT(loaded.made[0].problem, HasSubstr("when[0]: in \"GONE = 'x'\": 'GONE' is no"));
    EXPECT_THAT(loaded.made[0].problem, HasSubstr("; frequency: has no period"));
}

} // namespace
