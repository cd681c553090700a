#include "host/sources/CompressedGeneration.h"

#include "host/sources/GzipGeneration.h"
#include "host/sources/XzGeneration.h"

#include <algorithm>
#include <utility>

#include <archive.h>

namespace zrm::host {

namespace {

constexpr std::size_t blockSize = 65536; ///< of the compressed file

struct Close {
    void operator()(archive* file) const noexcept { archive_read_free(file); }
};
using Archive = std::unique_ptr<archive, Close>;

class CompressedGeneration : public GenerationReader {
public:
    /// `isAtEnd`: the contents are empty.
    CompressedGeneration(Archive file, bool isAtEnd)
        : m_file(std::move(file)), m_isAtEnd(isAtEnd) {}

    std::ptrdiff_t read(char* buffer, std::size_t room) noexcept override {
        // Block by block: archive_read_data forgets what it has read when the next block is
        // damaged.
        while (m_left == 0 && !m_isAtEnd) {
            la_int64_t offset = 0;
            const void* block = nullptr;
            const int result = archive_read_data_block(m_file.get(), &block, &m_left, &offset);
            if (result != ARCHIVE_OK && result != ARCHIVE_RETRY && result != ARCHIVE_EOF) {
                return -1;
            }
            m_block = static_cast<const char*>(block);
            m_isAtEnd = result == ARCHIVE_EOF;
            m_left = result == ARCHIVE_OK ? m_left : 0;
        }
        const std::size_t count = std::min(room, m_left);
        std::copy_n(m_block, count, buffer);
        m_block += count;
        m_left -= count;
        return static_cast<std::ptrdiff_t>(count);
    }

private:
    const Archive m_file;
    bool m_isAtEnd;
    const char* m_block = nullptr; ///< decompressed and not given yet; the archive's
    std::size_t m_left = 0;
};

} // namespace

std::unique_ptr<GenerationReader> openCompressedGeneration(int descriptor) {
    if (isXz(descriptor)) {
        return openXzGeneration(descriptor);
    }
    if (isGzip(descriptor)) {
        return openGzipGeneration(descriptor);
    }
    Archive file(archive_read_new());
    if (file == nullptr) {
        return nullptr;
    }
    // Anything but success means that a program would have to be run for it.
    for (const auto support :
         {archive_read_support_filter_bzip2, archive_read_support_filter_zstd,
          archive_read_support_format_raw, archive_read_support_format_empty}) {
        if (support(file.get()) != ARCHIVE_OK) {
            return nullptr;
        }
    }
    archive_entry* entry = nullptr;
    if (archive_read_open_fd(file.get(), descriptor, blockSize) != ARCHIVE_OK) {
        return nullptr;
    }
    const int header = archive_read_next_header(file.get(), &entry);
    const bool isCompressed = archive_filter_code(file.get(), 0) != ARCHIVE_FILTER_NONE;
    if (!isCompressed || (header != ARCHIVE_OK && header != ARCHIVE_EOF)) {
        return nullptr;
    }
    return std::make_unique<CompressedGeneration>(std::move(file), header == ARCHIVE_EOF);
}

} // namespace zrm::host
