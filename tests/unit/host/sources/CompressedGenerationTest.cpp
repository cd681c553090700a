#include "host/sources/CompressedGeneration.h"

#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <fstream>
#include <iterator>
#include <memory>
#include <random>
#include <string>
#include <vector>

#include <archive.h>
#include <archive_entry.h>
#include <fcntl.h>
#include <lzma.h>
#include <unistd.h>

using namespace zrm;
using namespace zrm::host;

namespace {

/// A file of which one compression has been made.
class CompressedFile {
public:
    CompressedFile(const std::string& path, int filter, const std::string& contents) {
        archive* const file = archive_write_new();
        archive_write_set_format_raw(file);
        archive_write_add_filter(file, filter);
        EXPECT_EQ(archive_write_open_filename(file, path.c_str()), ARCHIVE_OK);
        archive_entry* const entry = archive_entry_new();
        archive_entry_set_filetype(entry, AE_IFREG);
        EXPECT_EQ(archive_write_header(file, entry), ARCHIVE_OK);
        EXPECT_EQ(archive_write_data(file, contents.data(), contents.size()),
                  static_cast<la_ssize_t>(contents.size()));
        archive_entry_free(entry);
        EXPECT_EQ(archive_write_free(file), ARCHIVE_OK);
    }
};

class CompressedGenerationFixture {
protected:
    ~CompressedGenerationFixture() { close(descriptor); }

    std::unique_ptr<GenerationReader> open() {
        close(descriptor);
        descriptor = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
        return openCompressedGeneration(descriptor);
    }
    /// The contents as far as they can be read, in pieces of all sizes. `end` is what the last read
    /// returned.
    std::string readAll(GenerationReader& reader, std::ptrdiff_t& end) {
        std::string contents;
        std::vector<char> buffer(100'000);
        for (;;) {
            end = reader.read(buffer.data(), 1 + dice() % buffer.size());
            if (end <= 0) {
                return contents;
            }
            contents.append(buffer.data(), static_cast<std::size_t>(end));
        }
    }
    std::string bytes() const {
        std::ifstream stream(path, std::ios::binary);
        return {std::istreambuf_iterator<char>(stream), {}};
    }
    void write(const std::string& bytes) const {
        std::ofstream(path, std::ios::binary | std::ios::trunc) << bytes;
    }
    std::string lines(std::size_t count) {
        std::string lines;
        for (std::size_t number = 0; number < count; ++number) {
            lines += std::to_string(number) + ' ' + std::to_string(dice()) + '\n';
        }
        return lines;
    }

    TemporaryDirectory directory;
    std::string path = directory.file("app.log.1.gz");
    std::mt19937 dice{1};
    int descriptor = -1;
};

class CompressedGenerationTest : public CompressedGenerationFixture,
                                 public testing::TestWithParam<int> {};

class GzipGenerationTest : public CompressedGenerationFixture, public testing::Test {};

class XzGenerationTest : public CompressedGenerationFixture, public testing::Test {};

class ZstdGenerationTest : public CompressedGenerationFixture, public testing::Test {};

TEST_P(CompressedGenerationTest, GivesTheContents) {
    for (const std::size_t count : {std::size_t{1}, std::size_t{10'000}}) {
        const std::string contents = lines(count);
        CompressedFile(path, GetParam(), contents);
        const auto reader = open();
        ASSERT_NE(reader, nullptr);
        std::ptrdiff_t end = 1;
        EXPECT_TRUE(readAll(*reader, end) == contents);
        EXPECT_EQ(end, 0);
    }
}

TEST_P(CompressedGenerationTest, GivesWhatWasAppendedToACompressedFile) {
    const std::string first = lines(1000);
    const std::string second = lines(1000);
    CompressedFile(path, GetParam(), first);
    const std::string before = bytes();
    CompressedFile(path, GetParam(), second);
    write(before + bytes());
    const auto reader = open();
    ASSERT_NE(reader, nullptr);
    std::ptrdiff_t end = 1;
    EXPECT_TRUE(readAll(*reader, end) == first + second);
    EXPECT_EQ(end, 0);
}

TEST_P(CompressedGenerationTest, OfAFileThatIsCutOffItGivesTheBeginningAndFails) {
    const std::string contents = lines(10'000);
    CompressedFile(path, GetParam(), contents);
    const std::string whole = bytes();
    for (const std::size_t part : {whole.size() / 2, whole.size() - 1, std::size_t{3}}) {
        write(whole.substr(0, part));
        const auto reader = open();
        if (reader != nullptr) {
            std::ptrdiff_t end = 1;
            const std::string got = readAll(*reader, end);
            EXPECT_EQ(end, -1) << part;
            EXPECT_TRUE(contents.starts_with(got));
        }
    }
}

TEST_F(GzipGenerationTest, DamageShowsByTheEndAtTheLatest) {
    const std::string contents = lines(2000);
    CompressedFile(path, ARCHIVE_FILTER_GZIP, contents);
    const std::string whole = bytes();
    for (std::size_t at = 10; at < whole.size(); at += 97) {
        std::string damaged = whole;
        damaged[at] = static_cast<char>(damaged[at] ^ (1 << dice() % 8));
        write(damaged);
        const auto reader = open();
        ASSERT_NE(reader, nullptr);
        std::ptrdiff_t end = 1;
        const std::string got = readAll(*reader, end);
        EXPECT_TRUE(end == -1 || got == contents) << at;
    }
}

TEST_F(GzipGenerationTest, PaddingBehindTheContentsIsNoDamage) {
    const std::string contents = lines(10);
    CompressedFile(path, ARCHIVE_FILTER_GZIP, contents);
    write(bytes() + std::string(512, '\0'));
    const auto reader = open();
    std::ptrdiff_t end = 1;
    EXPECT_EQ(readAll(*reader, end), contents);
    EXPECT_EQ(end, 0);
}

TEST_P(CompressedGenerationTest, ALargeReadLosesNothingToTheDamageBehindIt) {
    std::string contents(2'500'000, '\0'); // several blocks, whatever the compression
    for (char& byte : contents) {
        byte = static_cast<char>(dice());
    }
    CompressedFile(path, GetParam(), contents);
    const std::string whole = bytes();
    write(whole.substr(0, whole.size() / 2));
    const auto reader = open();
    ASSERT_NE(reader, nullptr);
    std::string got(contents.size(), '\0');
    std::size_t total = 0;
    for (std::ptrdiff_t count = 1; count > 0;) {
        count = reader->read(got.data() + total, got.size() - total);
        total += count > 0 ? static_cast<std::size_t>(count) : 0;
    }
    EXPECT_GT(total, contents.size() / 4);
    EXPECT_TRUE(contents.starts_with(got.substr(0, total)));
}

TEST_P(CompressedGenerationTest, EmptyContentsAreNoDamage) {
    CompressedFile(path, GetParam(), "");
    const auto reader = open();
    ASSERT_NE(reader, nullptr);
    char buffer[10];
    EXPECT_EQ(reader->read(buffer, sizeof buffer), 0);
    EXPECT_EQ(reader->read(buffer, sizeof buffer), 0);
}

// ThreadSanitizer keeps up to four times what the program touches.
#if defined(__SANITIZE_THREAD__)
constexpr std::size_t memoryOfAByte = 5;
#else
constexpr std::size_t memoryOfAByte = 1;
#endif

/// Resident memory of this process, in bytes.
std::int64_t memory() {
    std::int64_t pages = 0;
    std::int64_t resident = 0;
    std::ifstream("/proc/self/statm") >> pages >> resident;
    return resident * sysconf(_SC_PAGESIZE);
}

TEST_P(CompressedGenerationTest, ReadsManyMegabytesInLittleMemory) {
    constexpr std::size_t limit = memoryOfAByte * (std::size_t{24} << 20);
    constexpr std::size_t size = 2 * limit;
    CompressedFile(path, GetParam(), std::string(size, 'x'));
    const std::int64_t before = memory();
    std::int64_t most = before;
    const auto reader = open();
    ASSERT_NE(reader, nullptr);
    std::vector<char> buffer(65536);
    std::size_t total = 0;
    for (std::ptrdiff_t count = 1; count > 0; most = std::max(most, memory())) {
        count = reader->read(buffer.data(), buffer.size());
        total += count > 0 ? static_cast<std::size_t>(count) : 0;
    }
    EXPECT_EQ(total, size);
    EXPECT_LT(most - before, static_cast<std::int64_t>(limit));
}

TEST_P(CompressedGenerationTest, WhatIsNotCompressedIsRefused) {
    for (const std::string& contents : {std::string(), std::string("a line\n"),
                                        std::string(100'000, 'x'), std::string("PK\3\4", 4)}) {
        write(contents);
        EXPECT_EQ(open(), nullptr);
    }
}

/// Two lines as they are, in one block. `checksum`: of the contents, empty if there is none.
std::string zstdFile(const std::string& contents, const std::string& checksum) {
    std::string file = "\x28\xb5\x2f\xfd";
    file += checksum.empty() ? '\x00' : '\x04';
    file += '\x58'; // the window
    file += static_cast<char>(1 | contents.size() << 3);
    return file + '\0' + '\0' + contents + checksum;
}

TEST_F(ZstdGenerationTest, DamageShowsOnlyIfThereIsAChecksum) {
    const std::string checksum = "\xe6\xa6\x0e\x40"; // as zstd makes it
    const auto contents = [this](const std::string& bytes) {
        write(bytes);
        std::ptrdiff_t end = -1;
        const auto reader = open();
        const std::string text = reader ? readAll(*reader, end) : "";
        return end == 0 ? text : "damaged";
    };
    EXPECT_EQ(contents(zstdFile("one\ntwo\n", checksum)), "one\ntwo\n");
    EXPECT_EQ(contents(zstdFile("one\ntwX\n", checksum)), "damaged");
    EXPECT_EQ(contents(zstdFile("one\ntwo\n", "")), "one\ntwo\n");
    EXPECT_EQ(contents(zstdFile("one\ntwX\n", "")), "one\ntwX\n");
    EXPECT_EQ(contents(zstdFile("one\ntwo\n", "").substr(0, 12)), "damaged") << "cut off";
}

/// A file that asks for a dictionary of 1 GiB.
TEST_F(XzGenerationTest, WhatTakesTooMuchMemoryIsRefused) {
    CompressedFile(path, ARCHIVE_FILTER_XZ, "a line\n");
    std::string file = bytes();
    constexpr std::size_t head = 12; // of the stream; the block's begins there
    const std::size_t length = (static_cast<unsigned char>(file[head]) + 1U) * 4;
    const std::size_t filter = file.find(std::string("\x21\x01", 2), head); // LZMA2, one property
    ASSERT_LT(filter, head + length);
    file[filter + 2] = 36; // 1 GiB
    const std::uint32_t sum =
        lzma_crc32(reinterpret_cast<const std::uint8_t*>(file.data()) + head, length - 4, 0);
    std::memcpy(file.data() + head + length - 4, &sum, sizeof sum); // little-endian, as xz
    write(file);
    errno = 0;
    EXPECT_EQ(open(), nullptr);
    EXPECT_EQ(errno, ENOMEM);
    file[filter + 2] = 26; // 32 MiB
    const std::uint32_t less =
        lzma_crc32(reinterpret_cast<const std::uint8_t*>(file.data()) + head, length - 4, 0);
    std::memcpy(file.data() + head + length - 4, &less, sizeof less);
    write(file);
    const auto reader = open();
    ASSERT_NE(reader, nullptr);
    std::ptrdiff_t end = 1;
    EXPECT_EQ(readAll(*reader, end), "a line\n");
}

INSTANTIATE_TEST_SUITE_P(Filters, CompressedGenerationTest,
                         testing::Values(ARCHIVE_FILTER_GZIP, ARCHIVE_FILTER_BZIP2,
                                         ARCHIVE_FILTER_XZ, ARCHIVE_FILTER_ZSTD));

} // namespace
