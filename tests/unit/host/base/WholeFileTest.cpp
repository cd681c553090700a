#include "host/base/WholeFile.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <string>

#include <fcntl.h>
#include <unistd.h>

#include "support/Faults.h"
#include "support/TemporaryDirectory.h"

using namespace zrm::host;

namespace {

class WholeFileTest : public testing::Test {
public:
    ~WholeFileTest() override { ::close(fd); }

    Result<std::string, int> readFromBegin(std::size_t most) const {
        lseek(fd, 0, SEEK_SET);
        return WholeFile::read(fd, most);
    }

    TemporaryDirectory directory;
    const int fd = ::open(directory.file("file").c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600);
};

TEST_F(WholeFileTest, ReadsWhatWasWritten) {
    const std::string text = std::string(200'000, 'x') + std::string(1, '\0') + "end";
    ASSERT_TRUE(WholeFile::write(fd, text));
    EXPECT_EQ(readFromBegin(text.size()), text);
    ASSERT_TRUE(WholeFile::write(fd, ""));
    EXPECT_EQ(readFromBegin(text.size()), text);
}

TEST_F(WholeFileTest, ReadsNoMoreThanAllowed) {
    ASSERT_TRUE(WholeFile::write(fd, "12345"));
    EXPECT_EQ(readFromBegin(5), "12345");
    EXPECT_EQ(readFromBegin(4).error(), EFBIG);
}

TEST_F(WholeFileTest, GoesOnAfterAnInterruption) {
    {
        const Fault fault("write", EINTR, {.times = 2});
        ASSERT_TRUE(WholeFile::write(fd, "text"));
        EXPECT_EQ(fault.failed(), 2);
    }
    const Fault fault("read", EINTR);
    EXPECT_EQ(readFromBegin(100), "text");
    EXPECT_EQ(fault.failed(), 1);
}

TEST_F(WholeFileTest, SaysWhyItFailed) {
    {
        const Fault fault("write", ENOSPC);
        EXPECT_EQ(WholeFile::write(fd, "text").error(), ENOSPC);
    }
    ASSERT_TRUE(WholeFile::write(fd, "text"));
    const Fault fault("read", EIO);
    EXPECT_EQ(readFromBegin(100).error(), EIO);
}

TEST_F(WholeFileTest, IsNotWrittenBeforeItIsOnTheDisk) {
    int ends[2];
    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    EXPECT_EQ(WholeFile::write(ends[1], "text").error(), EINVAL); // a pipe cannot be synced
    ::close(ends[0]);
    ::close(ends[1]);
}

} // namespace
