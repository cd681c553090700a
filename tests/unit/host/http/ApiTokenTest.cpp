#include "host/http/ApiToken.h"

#include "support/Faults.h"
#include "support/ReasonOf.h"
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

const std::string secret = "0123456789abcdef0123456789abcdef";

class ApiTokenTest : public testing::Test {
protected:
    static std::string problem(const std::string& path) { return reasonOf(ApiToken::load(path)); }
    std::string content() const {
        std::ifstream stream(path);
        return {std::istreambuf_iterator<char>(stream), {}};
    }
    mode_t mode(const std::string& of) const {
        struct stat status {};
        EXPECT_EQ(stat(of.c_str(), &status), 0);
        return status.st_mode & 0777u;
    }
    std::string withContent(const std::string& text, mode_t mode = 0600) const {
        directory.write("api-token", text);
        chmod(path.c_str(), mode);
        return path;
    }

    TemporaryDirectory directory;
    std::string path = directory.file("api-token");
};

TEST_F(ApiTokenTest, CreatesTheFileForTheOwnerOnly) {
    EXPECT_EQ(problem(path), "");
    EXPECT_EQ(mode(path), 0600u);
    EXPECT_THAT(content(), testing::MatchesRegex("[0-9a-f]+\n"));
    EXPECT_EQ(content().size(), 65u);
    const std::string first = content();
    EXPECT_EQ(problem(path), "");
    EXPECT_EQ(content(), first) << "the token is kept";
    EXPECT_EQ(std::distance(std::filesystem::directory_iterator(directory.path()), {}), 1)
        << "nothing else is left behind";
}

TEST_F(ApiTokenTest, EveryTokenIsDifferent) {
    problem(path);
    const std::string first = content();
    std::filesystem::remove(path);
    problem(path);
    EXPECT_NE(content(), first);
}

TEST_F(ApiTokenTest, CreatesTheDirectory) {
    const std::string inside = directory.file("state/api-token");
    EXPECT_EQ(problem(inside), "");
    EXPECT_EQ(mode(inside), 0600u);
    EXPECT_EQ(mode(directory.file("state")) & 0007u, 0u);
}

TEST_F(ApiTokenTest, AcceptsAnOperatorsOwnToken) {
    const auto loaded = ApiToken::load(withContent(secret + "\r\n", 0640));
    ASSERT_TRUE(loaded);
    EXPECT_TRUE(loaded->matches(secret));
}

TEST_F(ApiTokenTest, RefusesAFileThatEveryoneCanRead) {
    EXPECT_EQ(problem(withContent(secret, 0644)),
              path +
                  " is accessible to every user: remove the permissions of other users (chmod o= " +
                  path + ") or remove it to have a new one created");
}

TEST_F(ApiTokenTest, RefusesTextsThatAreNotTokens) {
    const std::string expected = path + " does not contain a token of 32 to 1024 visible "
                                        "characters: remove it to have a new one created";
    for (const std::string& text :
         {std::string(), std::string("\n"), secret.substr(1), secret + " " + secret,
          std::string(1025, 'x'), std::string(5000, 'x'), secret + "\x01"}) {
        EXPECT_EQ(problem(withContent(text)), expected);
    }
    EXPECT_EQ(problem(withContent(std::string(1024, 'x'))), "");
}

TEST_F(ApiTokenTest, RefusesWhatIsNotAFile) {
    const std::string itself = directory.path();
    EXPECT_EQ(problem(itself), itself + " is not a file that can contain a token");
    ASSERT_EQ(mkfifo(path.c_str(), 0600), 0);
    EXPECT_EQ(problem(path), path + " is not a file that can contain a token")
        << "it does not wait for the pipe";
}

TEST_F(ApiTokenTest, CreatesNothingThroughALink) {
    const std::string target = directory.file("target");
    std::filesystem::create_symlink(target, path);
    EXPECT_FALSE(ApiToken::load(path));
    EXPECT_FALSE(std::filesystem::exists(target));
}

TEST_F(ApiTokenTest, ReportsWhyThereIsNoToken) {
    const std::string deep = directory.file("no/such/api-token");
    EXPECT_EQ(problem(deep), "cannot create the directory " + directory.file("no/such") +
                                 ": No such file or directory");
    directory.write("file", "");
    EXPECT_EQ(problem(directory.file("file/api-token")),
              "cannot read " + directory.file("file/api-token") + ": Not a directory");
    EXPECT_EQ(problem("/proc/api-token"),
              "cannot create a file in /proc: No such file or directory");
    {
        Fault fault("fopen", EACCES);
        EXPECT_EQ(problem(path), "cannot read " + path + ": Permission denied");
    }
    {
        Fault fault("fopen", EMFILE, {.skip = 1});
        EXPECT_EQ(problem(path), "cannot read /dev/urandom");
    }
    {
        Fault fault("write", ENOSPC);
        EXPECT_THAT(problem(path), testing::MatchesRegex("cannot write " + path +
                                                         "\\.......: No space left on device"));
        std::filesystem::remove(directory.file("file"));
        EXPECT_TRUE(std::filesystem::is_empty(directory.path())) << "no partial token is left";
    }
}

TEST(ApiToken, MatchesOnlyTheWholeToken) {
    const ApiToken token(secret);
    EXPECT_TRUE(token.matches(secret));
    for (const std::string& wrong :
         {std::string(), secret.substr(1), secret + "0", "1" + secret.substr(1),
          secret.substr(0, 31) + "0", std::string(32, '\0')}) {
        EXPECT_FALSE(token.matches(wrong)) << wrong;
    }
}

} // namespace
