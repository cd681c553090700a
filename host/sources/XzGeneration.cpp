#include "host/sources/XzGeneration.h"

#include <array>
#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <cstring>

#include <lzma.h>
#include <unistd.h>

namespace zrm::host {

namespace {

constexpr std::size_t blockSize = 65536; ///< of the compressed file
constexpr std::array<char, 6> magic = {'\xfd', '7', 'z', 'X', 'Z', '\0'};

/// libarchive sets no limit on the memory of its decompression.
class XzGeneration : public GenerationReader {
public:
    explicit XzGeneration(int descriptor) : m_descriptor(descriptor) {}
    ~XzGeneration() override { lzma_end(&m_stream); }

    /// Reads the head, which says how much memory it takes. False with errno if it is refused.
    bool begin() noexcept {
        m_result = lzma_stream_decoder(&m_stream, mostMemory, LZMA_CONCATENATED);
        std::uint8_t nothing = 0;
        if (m_result == LZMA_OK) {
            decode(&nothing, 0);
        }
        return !hasFailed();
    }

    std::ptrdiff_t read(char* buffer, std::size_t room) noexcept override {
        std::size_t count = 0;
        while (count == 0 && m_result != LZMA_STREAM_END && !hasFailed()) {
            count = decode(reinterpret_cast<std::uint8_t*>(buffer), room);
        }
        return count == 0 && hasFailed() ? -1 : static_cast<std::ptrdiff_t>(count);
    }

private:
    /// Returns how many bytes were made of what comes next.
    std::size_t decode(std::uint8_t* out, std::size_t room) noexcept {
        if (m_stream.avail_in == 0 && !m_isAtEnd) {
            const ssize_t count = ::read(m_descriptor, m_block.data(), m_block.size());
            if (count < 0) {
                m_result = errno == EINTR ? m_result : LZMA_PROG_ERROR;
                return 0;
            }
            m_isAtEnd = count == 0;
            m_stream.next_in = m_block.data();
            m_stream.avail_in = static_cast<std::size_t>(count);
        }
        m_stream.next_out = out;
        m_stream.avail_out = room;
        m_result = lzma_code(&m_stream, m_isAtEnd ? LZMA_FINISH : LZMA_RUN);
        if (m_result == LZMA_BUF_ERROR && !m_isAtEnd) {
            m_result = LZMA_OK; // there was no room, or no input
        }
        return room - m_stream.avail_out;
    }

    bool hasFailed() const noexcept {
        const bool isTooLarge = m_result == LZMA_MEMLIMIT_ERROR || m_result == LZMA_MEM_ERROR;
        errno = isTooLarge ? ENOMEM : EIO;
        return m_result != LZMA_OK && m_result != LZMA_STREAM_END;
    }

    const int m_descriptor;
    lzma_stream m_stream = LZMA_STREAM_INIT;
    lzma_ret m_result = LZMA_OK; ///< of the last call
    bool m_isAtEnd = false;      ///< of the compressed file
    std::array<std::uint8_t, blockSize> m_block;
};

} // namespace

bool isXz(int descriptor) noexcept {
    std::array<char, magic.size()> head;
    return ::pread(descriptor, head.data(), head.size(), 0) == static_cast<ssize_t>(head.size()) &&
           head == magic;
}

std::unique_ptr<GenerationReader> openXzGeneration(int descriptor) {
    auto reader = std::make_unique<XzGeneration>(descriptor);
    if (!reader->begin()) {
        const int number = errno;
        reader.reset();
        errno = number;
        return nullptr;
    }
    return reader;
}

} // namespace zrm::host
