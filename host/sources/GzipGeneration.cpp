#include "host/sources/GzipGeneration.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <climits>
#include <cstddef>

#include <unistd.h>
#include <zlib.h>

namespace zrm::host {

namespace {

constexpr std::size_t blockSize = 65536; ///< of the compressed file
constexpr std::array<unsigned char, 2> magic = {0x1f, 0x8b};
constexpr int onlyGzip = 16; ///< added to the bits of the window

/// libarchive passes over the checksum of the contents.
class GzipGeneration : public GenerationReader {
public:
    explicit GzipGeneration(int descriptor) : m_descriptor(descriptor) {}
    ~GzipGeneration() override { inflateEnd(&m_stream); }

    bool begin() noexcept { return inflateInit2(&m_stream, MAX_WBITS + onlyGzip) == Z_OK; }

    std::ptrdiff_t read(char* buffer, std::size_t room) noexcept override {
        const auto wanted = static_cast<uInt>(std::min<std::size_t>(room, INT_MAX));
        m_stream.next_out = reinterpret_cast<Bytef*>(buffer);
        m_stream.avail_out = wanted;
        while (m_stream.avail_out == wanted && !m_isOver && m_error == 0) {
            decode();
        }
        if (m_stream.avail_out == wanted && m_error != 0) {
            errno = m_error;
            return -1;
        }
        return static_cast<std::ptrdiff_t>(wanted - m_stream.avail_out);
    }

private:
    void decode() noexcept {
        if (m_stream.avail_in == 0 && !m_isAtEnd) {
            fill();
        }
        if (m_isBehindMember && !beginMember()) {
            return;
        }
        const int result = inflate(&m_stream, Z_NO_FLUSH);
        if (result == Z_STREAM_END) {
            m_isBehindMember = true;
        } else if (result == Z_MEM_ERROR) {
            m_error = ENOMEM;
        } else if (result == Z_BUF_ERROR ? m_isAtEnd : result != Z_OK) {
            m_error = EIO;
        }
    }

    void fill() noexcept {
        const ssize_t count = ::read(m_descriptor, m_block.data(), m_block.size());
        if (count < 0) {
            m_error = errno == EINTR ? 0 : EIO;
            return;
        }
        m_isAtEnd = count == 0;
        m_stream.next_in = m_block.data();
        m_stream.avail_in = static_cast<uInt>(count);
    }

    /// A file may have several members one after another. Anything else behind one is padding.
    bool beginMember() noexcept {
        if (m_stream.avail_in == 0) {
            m_isOver = m_isAtEnd;
            return false;
        }
        m_isOver = *m_stream.next_in != magic[0];
        m_isBehindMember = false;
        return !m_isOver && inflateReset(&m_stream) == Z_OK;
    }

    const int m_descriptor;
    z_stream m_stream{};
    int m_error = 0;               ///< errno
    bool m_isAtEnd = false;        ///< of the compressed file
    bool m_isBehindMember = false; ///< its checksum fits
    bool m_isOver = false;
    std::array<Bytef, blockSize> m_block;
};

} // namespace

bool isGzip(int descriptor) noexcept {
    std::array<unsigned char, magic.size()> head;
    return ::pread(descriptor, head.data(), head.size(), 0) == static_cast<ssize_t>(head.size()) &&
           head == magic;
}

std::unique_ptr<GenerationReader> openGzipGeneration(int descriptor) {
    auto reader = std::make_unique<GzipGeneration>(descriptor);
    if (!reader->begin()) {
        reader.reset();
        errno = ENOMEM;
        return nullptr;
    }
    return reader;
}

} // namespace zrm::host
