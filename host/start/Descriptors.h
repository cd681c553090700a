#ifndef ZRM_HOST_DESCRIPTORS_H
#define ZRM_HOST_DESCRIPTORS_H

#include <cstdint>

namespace zrm::host {

/// The descriptors 0, 1 and 2, which may be closed when a program starts. Stateless.
class StandardStreams {
public:
    /// Opens closed ones on a file that is empty and cannot be written. Otherwise the next files
    /// opened would get their numbers, and events and messages would be written into logs and
    /// databases. Call before the program opens anything.
    static void fill() noexcept;
};

/// The process's descriptors: one for each log, plus those of HTTP, the history and the sinks.
class Descriptors {
public:
    /// Raises the process's soft limit as far as the system allows and is sensible. Called once, at
    /// the start.
    static void raiseLimit();

    /// Logs how many logs could not be opened because descriptors ran out, once that number has
    /// stopped growing. Called about once a second, by one thread.
    void tick();

private:
    std::uint64_t m_seen = 0; ///< count at the last call
    std::uint64_t m_told = 0;
};

} // namespace zrm::host

#endif
