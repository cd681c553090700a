#include "host/sources/CompressedGeneration.h"

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
        if (m_isAtEnd) {
            return 0;
        }
        la_ssize_t count = ARCHIVE_RETRY;
        while (count == ARCHIVE_RETRY) {
            count = archive_read_data(m_file.get(), buffer, room);
        }
        return count < 0 ? -1 : static_cast<std::ptrdiff_t>(count);
    }

private:
    const Archive m_file;
    const bool m_isAtEnd;
};

} // namespace

std::unique_ptr<GenerationReader> openCompressedGeneration(int descriptor) {
    Archive file(archive_read_new());
    if (file == nullptr) {
        return nullptr;
    }
    // Anything but success means that a program would have to be run for it.
    for (const auto support :
         {archive_read_support_filter_gzip, archive_read_support_filter_bzip2,
          archive_read_support_filter_xz, archive_read_support_filter_zstd,
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
