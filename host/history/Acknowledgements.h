#ifndef ZRM_HOST_ACKNOWLEDGEMENTS_H
#define ZRM_HOST_ACKNOWLEDGEMENTS_H

#include "host/base/Result.h"

#include <cstddef>
#include <cstdint>
#include <string>

namespace zrm::host {

/// Somebody has taken on an episode.
struct Acknowledgement {
    static constexpr std::size_t longestText = 1024; ///< bytes of each text

    std::int64_t time = 0; ///< milliseconds since 1970, UTC
    std::string who;       ///< empty: nobody
    std::string note;      ///< for others to read; may be empty
    bool operator==(const Acknowledgement&) const = default;
};

/// What came of a request to acknowledge an episode, or to withdraw that.
enum class AcknowledgementChange {
    DONE,
    UNKNOWN,  ///< there is no such episode
    RESOLVED, ///< it is over
    TAKEN,    ///< somebody has acknowledged it before
    NOT_TAKEN ///< nobody has
};

/// Acknowledges episodes. Any thread.
class Acknowledgements {
public:
    virtual ~Acknowledgements() = default;

    /// Acknowledges an open episode that nobody has acknowledged. What is done is stored when this
    /// returns; refused if it cannot be.
    virtual Result<AcknowledgementChange> acknowledge(std::uint64_t episode,
                                                      const Acknowledgement& by) = 0;

    /// Withdraws the acknowledgement of an open episode.
    virtual Result<AcknowledgementChange> withdraw(std::uint64_t episode) = 0;
};

} // namespace zrm::host

#endif
