#ifndef ZRM_HOST_STANDARD_STREAMS_H
#define ZRM_HOST_STANDARD_STREAMS_H

namespace zrm::host {

/// The descriptors 0, 1 and 2, which a program may be started without. Stateless.
class StandardStreams {
public:
    /// Opens those that are closed on a file that can neither be written nor says anything. The
    /// next files that are opened would get their numbers otherwise: events and messages would be
    /// written into logs and databases. Before the program opens anything.
    static void fill() noexcept;
};

} // namespace zrm::host

#endif
