#ifndef ZRM_HOST_SITUATION_STORE_H
#define ZRM_HOST_SITUATION_STORE_H

#include "host/base/Result.h"
#include "host/config/HostConfig.h"

#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace zrm::host {

/// What of the situations outlives the process: those made through the API, and which of all are
/// stopped. One file, of a version that it names, written as a whole: to a temporary beside it that
/// is synced and renamed, so that it is the old or the new one whenever the process or the machine
/// ends. One thread at a time.
class SituationStore {
public:
    struct Made {
        SituationConfig config;
        bool isStopped = false;
        std::string problem = {}; ///< found by load: why it cannot run; empty: it can
    };
    struct Content {
        std::vector<Made> made;                ///< through the API
        std::vector<std::string> stoppedFiles; ///< names of situations of the file
        std::string message = {}; ///< found by load: what is to be said about it, if anything
    };

    /// An empty path: nothing is kept.
    explicit SituationStore(std::string path) : m_path(std::move(path)) {}

    /// Reads the file; nothing when there is none. One that is not what it should be is moved
    /// aside. Where that, or reading, fails, nothing is saved until the next start, so that nothing
    /// is lost; the content's message then says what happened.
    Content load();

    /// Replaces the file, which stays as it was when that fails.
    Result<void> save(const Content& content);

private:
    std::string moveAside(const std::string& reason);
    Result<void> replace(std::string_view text) const;

    const std::string m_path;
    std::optional<Problem> m_blocked; ///< why nothing may be saved
};

} // namespace zrm::host

#endif
