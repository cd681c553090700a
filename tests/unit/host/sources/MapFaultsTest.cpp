#include "host/sources/MapFaults.h"

#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <csignal>
#include <cstdlib>
#include <string>

#include <fcntl.h>
#include <sys/mman.h>
#include <unistd.h>

using namespace zrm::host;

namespace {

TEST(MapFaultsDeathTest, AFaultElsewhereEndsTheProcess) {
    const TemporaryDirectory directory;
    const std::string file = directory.write("map", std::string(8192, 'x'));
    const int fd = open(file.c_str(), O_RDWR);
    auto* const bytes =
        static_cast<volatile char*>(mmap(nullptr, 8192, PROT_READ, MAP_SHARED, fd, 0));
    ASSERT_EQ(ftruncate(fd, 0), 0);
    const auto tolerated = [bytes] {
        const MapFaults faults;
        return bytes[0];
    };
    EXPECT_EQ(tolerated(), 0);
    EXPECT_EXIT(std::exit(bytes[4096]), testing::KilledBySignal(SIGBUS), "");
    close(fd);
}

} // namespace
