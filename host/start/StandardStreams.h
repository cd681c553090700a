#ifndef ZRM_HOST_STANDARD_STREAMS_H
#define ZRM_HOST_STANDARD_STREAMS_H

namespace zrm::host {

/// The descriptors 0, 1 and 2, which may be closed when a program starts. Stateless.
class StandardStreams {
public:
    /// Opens closed ones on a file that is empty and cannot be written. Otherwise the next files
    /// opened would get their numbers, and events and messages would be written into logs and
    /// databases. Call before the program opens anything.
    static void fill() noexcept;
};

} // namespace zrm::host

#endif
