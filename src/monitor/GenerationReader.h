#ifndef ZRM_GENERATION_READER_H
#define ZRM_GENERATION_READER_H

#include <atomic>
#include <cstddef>
#include <memory>

namespace zrm {

/// Reads the contents of a compressed generation of a log, from its beginning on. Plain files need
/// no reader. The framework decides which compressions can be read. One thread.
class GenerationReader {
public:
    static constexpr std::size_t mostMemory = 128 * 1024 * 1024; ///< bytes

    /// Makes a reader of a regular file whose descriptor is at the beginning. The descriptor stays
    /// the caller's and outlives the reader. Null if the contents cannot be read, with errno ENOMEM
    /// if that takes more than `mostMemory`.
    using Open = std::unique_ptr<GenerationReader> (*)(int descriptor);

    GenerationReader() = default;
    GenerationReader(const GenerationReader&) = delete;
    GenerationReader& operator=(const GenerationReader&) = delete;
    virtual ~GenerationReader() = default;

    /// Reads at most `room` bytes of the contents. Returns 0 at the end, and -1 if the file is
    /// damaged or cannot be read, with errno as above; no call follows then.
    virtual std::ptrdiff_t read(char* buffer, std::size_t room) noexcept = 0;

    /// Call it while no log has a thread. Without it, compressed generations are not read.
    static void setOpen(Open open) noexcept { m_open = open; }
    static Open open() noexcept { return m_open; }

private:
    static inline std::atomic<Open> m_open{nullptr};
};

} // namespace zrm

#endif
