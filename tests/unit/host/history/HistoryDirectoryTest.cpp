#include "host/history/HistoryDirectory.h"

#include "support/Faults.h"
#include "support/ReasonOf.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>
#include <vector>

#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

using namespace zrm::host;

namespace {

constexpr const char* cure = "; make it a directory that the agent may write, or set "
                             "history.directory to one";

class HistoryDirectoryTest : public testing::Test {
protected:
    static std::string problemOf(const std::string& path) {
        return reasonOf(HistoryDirectory::open(path));
    }
    static std::unique_ptr<HistoryDirectory> opened(const std::string& path) {
        return HistoryDirectory::open(path).value();
    }

    RecordingTrace trace{TRC1_ERROR};
    TemporaryDirectory directory;
    std::string path = directory.file("state");
};

TEST_F(HistoryDirectoryTest, CreatesWhatIsMissingForItsOwnerAndGroupOnly) {
    const auto place = opened(path);
    EXPECT_EQ(place->file(), path + "/history.db");
    struct stat status {};
    ASSERT_EQ(stat(path.c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 0007, 0u);
    ASSERT_EQ(stat(place->file().c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 0137, 0u);
    EXPECT_EQ(place->bytes(), 0u);
}

TEST_F(HistoryDirectoryTest, ReportsWhatCannotBeCreatedAndWhatToDo) {
    EXPECT_EQ(problemOf(path + "/below"),
              "cannot create the directory " + path + "/below: No such file or directory" + cure);
    std::ofstream(directory.file("plain")) << "not a directory";
    EXPECT_EQ(problemOf(directory.file("plain")),
              "cannot open " + directory.file("plain") + "/history.lock: Not a directory" + cure);
    {
        Fault fault("open", EROFS);
        EXPECT_EQ(problemOf(path),
                  "cannot open " + path + "/history.lock: Read-only file system" + cure);
    }
    {
        Fault fault("fcntl", ENOLCK);
        EXPECT_EQ(problemOf(path),
                  "cannot lock " + path + "/history.lock: No locks available" + cure);
    }
    Fault fault("open", EACCES, {.skip = 1});
    EXPECT_EQ(problemOf(path), "cannot open " + path + "/history.db: Permission denied" + cure);
}

TEST_F(HistoryDirectoryTest, OpensOnlyRegularFilesOfItsOwn) {
    std::filesystem::create_directory(path);
    for (const char* const name : {"/history.lock", "/history.db"}) {
        const std::string place = path + name;
        std::filesystem::remove(place); // of the previous round
        std::filesystem::create_symlink(directory.file("target"), place);
        EXPECT_EQ(problemOf(path),
                  place + " is a symbolic link, which the history does not follow" + cure);
        EXPECT_FALSE(std::filesystem::exists(directory.file("target")));
        std::filesystem::remove(place);
        ASSERT_EQ(mkfifo(place.c_str(), 0600), 0); // opening it must not wait
        EXPECT_EQ(problemOf(path), place + " is not a regular file" + cure);
        std::filesystem::remove(place);
    }
    EXPECT_NE(opened(path), nullptr);
}

TEST_F(HistoryDirectoryTest, BelongsToOneProcessAtATime) {
    auto place = opened(path);
    const auto inChild = [&] {
        const pid_t child = fork();
        if (child == 0) {
            const bool isTaken = problemOf(path) == path + " is in use by another agent; give each "
                                                           "its own history.directory";
            _exit(isTaken ? 1 : 0);
        }
        int status = 0;
        waitpid(child, &status, 0);
        return WEXITSTATUS(status);
    };
    EXPECT_EQ(inChild(), 1);
    place.reset();
    EXPECT_EQ(inChild(), 0);
}

TEST_F(HistoryDirectoryTest, CountsTheBytesOfAllItsFiles) {
    const auto place = opened(path);
    std::ofstream(place->file()) << "12345";
    std::ofstream(place->file() + "-wal") << "123";
    std::ofstream(place->file() + "-shm") << "1";
    EXPECT_EQ(place->bytes(), 9u);
}

TEST_F(HistoryDirectoryTest, RecordsWhichIdsMayHaveBeenUsed) {
    auto place = opened(path);
    EXPECT_EQ(place->reservedIds(), 0u);
    place->reserveIds(123'456);
    place->reserveIds(7);
    EXPECT_EQ(place->reservedIds(), 7u);
    place.reset();
    place = opened(path);
    EXPECT_EQ(place->reservedIds(), 7u);
    for (const char* const content : {"", "7\n", "0000000000000000000x\n", "99999999999999999999\n",
                                      "-0000000000000000007\n"}) {
        std::ofstream(path + "/history.lock") << content;
        EXPECT_EQ(place->reservedIds(), 0u) << content;
    }
}

TEST_F(HistoryDirectoryTest, CreatesRemovedFilesAgainAndLocksThem) {
    const auto place = opened(path);
    std::filesystem::remove_all(path);
    EXPECT_EQ(reasonOf(place->restore()), "");
    EXPECT_TRUE(std::filesystem::exists(place->file()));
    const pid_t child = fork();
    if (child == 0) {
        _exit(problemOf(path).find("in use by another agent") != std::string::npos ? 1 : 0);
    }
    int status = 0;
    waitpid(child, &status, 0);
    EXPECT_EQ(WEXITSTATUS(status), 1);
}

TEST_F(HistoryDirectoryTest, MovesACorruptFileAsideAndReportsIt) {
    const auto place = opened(path);
    std::vector<std::string> told;
    for (int number = 0; number < 3; ++number) { // within the same second, or nearly
        std::ofstream(place->file()) << "rubbish" << number;
        std::ofstream(place->file() + "-wal") << "more";
        std::ofstream(place->file() + "-shm") << "index";
        testing::internal::CaptureStderr();
        EXPECT_EQ(reasonOf(place->moveAside("file is not a database")), "");
        told.push_back(testing::internal::GetCapturedStderr());
        EXPECT_EQ(place->bytes(), 0u);
        EXPECT_TRUE(std::filesystem::exists(place->file()));
    }
    EXPECT_THAT(told,
                testing::Each(testing::MatchesRegex(
                    "zrmagent: the history " + place->file() +
                    " is corrupt \\(file is not a database\\); it is kept as " + place->file() +
                    "\\.corrupt-[0-9]{8}T[0-9]{6}Z(-[0-9])?, and a new one begins\n")));
    int kept = 0;
    int logs = 0;
    for (const auto& entry : std::filesystem::directory_iterator(path)) {
        const std::string name = entry.path().filename();
        kept += name.starts_with("history.db.corrupt-") && !name.ends_with("-wal") ? 1 : 0;
        logs += name.starts_with("history.db.corrupt-") && name.ends_with("-wal") ? 1 : 0;
    }
    EXPECT_EQ(kept, 3);
    EXPECT_EQ(logs, 3);
}

TEST_F(HistoryDirectoryTest, ReportsWhyAFileCannotBeMovedAside) {
    const auto place = opened(path);
    std::filesystem::remove(place->file());
    EXPECT_EQ(reasonOf(place->moveAside("why")),
              "cannot move " + place->file() + " aside: No such file or directory");
}

} // namespace
