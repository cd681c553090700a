#include "logs/LogManagerUtil.h"

#include "framework/trace.h"
#include "support/Faults.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <cstdint>
#include <cstring>
#include <string>
#include <vector>

#include <fcntl.h>
#include <sys/stat.h>
#include <utime.h>

#include <unistd.h>

using namespace zrm;

namespace {

using testing::ElementsAre;

class LogManagerUtilTest : public testing::Test {
protected:
    TemporaryDirectory directory;
    RecordingTrace trace{TRC1_ERROR};

    /// All records of a file with this content; the reader is closed afterwards.
    std::vector<std::string> records(const std::string& content) {
        const std::string path = directory.write("records", content);
        std::vector<std::string> all;
        while (const char* record = LogManagerUtil::getNextRec(path.c_str())) {
            all.emplace_back(record);
        }
        return all;
    }
};

TEST_F(LogManagerUtilTest, ReturnsTheModificationTimeOfARegularFile) {
    const std::string path = directory.write("file", "");
    const utimbuf times{1000, 1234567890};
    ASSERT_EQ(utime(path.c_str(), &times), 0);
    EXPECT_EQ(LogManagerUtil::fileLastModified(path.c_str()), 1234567890);
    EXPECT_THAT(trace.messages(), ElementsAre());
}

TEST_F(LogManagerUtilTest, AMissingFileHasNoModificationTime) {
    const std::string path = directory.file("missing");
    EXPECT_EQ(LogManagerUtil::fileLastModified(path.c_str()), 0);
    EXPECT_THAT(trace.messages(), ElementsAre("stat() command failed for " + path +
                                              " errno = 2; No such file or directory."));
}

TEST_F(LogManagerUtilTest, ADirectoryHasNoModificationTime) {
    const std::string path = directory.path();
    EXPECT_EQ(LogManagerUtil::fileLastModified(path.c_str()), 0);
    EXPECT_THAT(trace.messages(), ElementsAre("The file " + path + " is not a regular file."));
}

TEST_F(LogManagerUtilTest, CommentsBlankLinesAndOverlongLinesAreNotRecords) {
    EXPECT_THAT(records("# comment\n\n   \t \n" + std::string(1024, 'x') + "\n#\n" +
                        std::string(5000, 'y') + "\n"),
                ElementsAre());
    EXPECT_THAT(trace.messages(), ElementsAre());
}

TEST_F(LogManagerUtilTest, RecordsLoseLeadingWhiteSpaceAndNewline) {
    EXPECT_THAT(records("   /var/log/x\n\t\v\f\r /y  \n"), ElementsAre("/var/log/x", "/y  "));
}

TEST_F(LogManagerUtilTest, ACommentBeginsInTheFirstColumn) {
    EXPECT_THAT(records("#/a\n  # x\n/b # y\n"), ElementsAre("# x", "/b # y"));
}

TEST_F(LogManagerUtilTest, TheLongestLineHas1022CharactersAndANewline) {
    const std::string longest(1022, 'a');
    EXPECT_THAT(records(longest + "\n" + longest + "b\n/next\n"), ElementsAre(longest, "/next"));
}

TEST_F(LogManagerUtilTest, ALineOfThreePiecesIsDroppedWhole) {
    EXPECT_THAT(records("/a\n" + std::string(2500, 'x') + "\n/b\n"), ElementsAre("/a", "/b"));
}

TEST_F(LogManagerUtilTest, TheTailOfAnOverlongCommentIsARecord) {
    EXPECT_THAT(records("#" + std::string(1022, 'c') + "/tail\n/b\n"), ElementsAre("/tail", "/b"));
}

TEST_F(LogManagerUtilTest, APieceThatBeginsLikeACommentTakesTheNextLineWithIt) {
    EXPECT_THAT(records(std::string(1023, 'x') + "# not a comment\n/lost\n/kept\n"),
                ElementsAre("/kept"));
}

TEST_F(LogManagerUtilTest, ALastLineWithoutNewlineIsNotARecord) {
    EXPECT_THAT(records("/a\n/b"), ElementsAre("/a"));
    EXPECT_THAT(records("/c\n"), ElementsAre("/c"));
}

TEST_F(LogManagerUtilTest, ALineThatBeginsWithNulIsDroppedWithTheNextLine) {
    EXPECT_THAT(records(std::string("\0x\n/lost\n/kept\n", 15)), ElementsAre("/kept"));
}

TEST_F(LogManagerUtilTest, AnOpenFileIsReadToItsEndWhateverPathIsGiven) {
    const std::string first = directory.write("first", "/a\n/b\n");
    const std::string second = directory.write("second", "/c\n");
    EXPECT_STREQ(LogManagerUtil::getNextRec(first.c_str()), "/a");
    EXPECT_STREQ(LogManagerUtil::getNextRec(second.c_str()), "/b");
    EXPECT_EQ(LogManagerUtil::getNextRec(second.c_str()), nullptr);
    EXPECT_STREQ(LogManagerUtil::getNextRec(second.c_str()), "/c");
    EXPECT_EQ(LogManagerUtil::getNextRec(second.c_str()), nullptr);
}

TEST_F(LogManagerUtilTest, AFileThatCannotBeOpenedHasNoRecords) {
    const std::string path = directory.file("missing");
    EXPECT_EQ(LogManagerUtil::getNextRec(path.c_str()), nullptr);
    EXPECT_THAT(trace.messages(), ElementsAre("Error opening file " + path + "; errno = 2"));
}

TEST_F(LogManagerUtilTest, WithoutABufferTheFileIsClosedAgain) {
    const std::string path = directory.write("file", "/a\n");
    {
        Fault fault("new", ENOMEM);
        Fault closed("fclose", EIO, {.times = 0});
        EXPECT_EQ(LogManagerUtil::getNextRec(path.c_str()), nullptr);
        EXPECT_EQ(closed.calls(), 1);
    }
    EXPECT_THAT(trace.messages(),
                ElementsAre("Memory allocation for 1024 bytes failed; errno = 12"));
    EXPECT_STREQ(LogManagerUtil::getNextRec(path.c_str()), "/a");
    EXPECT_EQ(LogManagerUtil::getNextRec(path.c_str()), nullptr);
}

TEST_F(LogManagerUtilTest, AReadErrorEndsTheFile) {
    const std::string path = directory.path();
    EXPECT_EQ(LogManagerUtil::getNextRec(path.c_str()), nullptr);
    EXPECT_THAT(trace.messages(),
                ElementsAre("Error while reading " + path + "; errno = 21: Is a directory"));
    EXPECT_THAT(records("/a\n"), ElementsAre("/a"));
}

TEST_F(LogManagerUtilTest, StreamsAreNotInheritedAndKeepTheirMode) {
    const std::string path = directory.file("stream");
    std::FILE* stream = LogManagerUtil::openStream(path.c_str(), "a");
    ASSERT_NE(stream, nullptr);
    EXPECT_EQ(fcntl(fileno(stream), F_GETFD, 0) & FD_CLOEXEC, FD_CLOEXEC);
    EXPECT_EQ(fcntl(fileno(stream), F_GETFL, 0) & O_APPEND, O_APPEND);
    std::fclose(stream);
    stream = LogManagerUtil::openStream(path.c_str(), "r");
    ASSERT_NE(stream, nullptr);
    EXPECT_EQ(std::fputc('x', stream), EOF);
    std::fclose(stream);
}

TEST_F(LogManagerUtilTest, AFileToWriteIsAccessibleToOwnerAndGroupOnly) {
    const mode_t before = umask(0);
    const std::string path = directory.file("stream");
    std::FILE* const stream = LogManagerUtil::openStream(path.c_str(), "a");
    umask(before);
    ASSERT_NE(stream, nullptr);
    std::fclose(stream);
    struct stat status {};
    ASSERT_EQ(stat(path.c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 0777, 0640u);
}

TEST_F(LogManagerUtilTest, AFileToWriteIsNotOpenedThroughALink) {
    const std::string path = directory.file("stream");
    const std::string target = directory.file("target");
    ASSERT_EQ(symlink(target.c_str(), path.c_str()), 0);
    EXPECT_EQ(LogManagerUtil::openStream(path.c_str(), "a"), nullptr);
    EXPECT_EQ(errno, ELOOP);
    EXPECT_NE(access(target.c_str(), F_OK), 0);
    directory.write("target", "line\n");
    std::FILE* const stream = LogManagerUtil::openStream(path.c_str(), "r");
    ASSERT_NE(stream, nullptr) << "a file to read may be a link";
    std::fclose(stream);
}

TEST_F(LogManagerUtilTest, AStreamThatCannotBeCreatedLeavesNoDescriptor) {
    const std::string path = directory.write("file", "");
    Fault fault("fdopen", ENOMEM);
    Fault closed("close", EIO, {.times = 0});
    EXPECT_EQ(LogManagerUtil::openStream(path.c_str(), "r"), nullptr);
    EXPECT_EQ(errno, ENOMEM);
    EXPECT_EQ(closed.calls(), 1);
}

TEST_F(LogManagerUtilTest, TheHexadecimalDumpIsAlwaysEmpty) {
    char out[9];
    std::memset(out, 'x', sizeof out);
    const unsigned word = 0xDEADBEEF;
    EXPECT_EQ(LogManagerUtil::xtoa(out, &word, sizeof word), out);
    EXPECT_STREQ(out, LogManagerUtil::handleDump);
    EXPECT_STREQ(out, "");
    out[0] = 'x';
    EXPECT_STREQ(LogManagerUtil::xtoa(out, &word, 0), "");
}

TEST_F(LogManagerUtilTest, TheHexadecimalDumpIsAnOperationThatReturnsItsBuffer) {
    trace.setLevel(TRC1_FLOW);
    char out[9];
    const unsigned word = 0xDEADBEEF;
    LogManagerUtil::xtoa(out, &word, sizeof word);
    EXPECT_THAT(trace.events(),
                ElementsAre("LogManagerUtil.cpp entry",
                            "LogManagerUtil.cpp exit " +
                                std::to_string(reinterpret_cast<std::intptr_t>(out))));
}

} // namespace
