#ifndef ZRM_TESTS_FAKE_COMPRESSION_H
#define ZRM_TESTS_FAKE_COMPRESSION_H

#include "monitor/GenerationReader.h"

#include <cstring>

#include <unistd.h>

/// While it lives, files whose names end in ".gz" are read as "GZ" and their contents behind it. A
/// byte 1 in the contents is damage.
class FakeCompression {
public:
    FakeCompression() { zrm::GenerationReader::setOpen(open); }
    ~FakeCompression() { zrm::GenerationReader::setOpen(nullptr); }
    FakeCompression(const FakeCompression&) = delete;
    FakeCompression& operator=(const FakeCompression&) = delete;

private:
    class Reader : public zrm::GenerationReader {
    public:
        explicit Reader(int descriptor) : m_descriptor(descriptor) {}
        std::ptrdiff_t read(char* buffer, std::size_t room) noexcept override {
            const ssize_t count = m_isDamaged ? -1 : ::read(m_descriptor, buffer, room);
            if (count <= 0) {
                return count;
            }
            const void* const damage = std::memchr(buffer, 1, static_cast<std::size_t>(count));
            m_isDamaged = damage != nullptr;
            if (!m_isDamaged) {
                return count;
            }
            return damage == buffer ? -1 : static_cast<const char*>(damage) - buffer;
        }

    private:
        int m_descriptor;
        bool m_isDamaged = false;
    };

    static std::unique_ptr<zrm::GenerationReader> open(int descriptor) {
        char head[2];
        if (::read(descriptor, head, sizeof head) != sizeof head ||
            std::memcmp(head, "GZ", 2) != 0) {
            return nullptr;
        }
        return std::make_unique<Reader>(descriptor);
    }
};

#endif
