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

/// The part of the situations that survives the process: those created through the API, and which
/// ones are stopped. One file with a version number, always written as a whole: to a temporary file
/// that is synced and renamed, so that a crash leaves either the old or the new one. One thread at
/// a time.
class SituationStore {
public:
    struct Made {
        SituationConfig config;
        bool isStopped = false;
        std::string problem = {}; ///< set by load: why it cannot run; empty: it can
    };
    struct Content {
        std::vector<Made> made;                ///< created through the API
        std::vector<std::string> stoppedFiles; ///< names of stopped situations of the file
        std::string message = {};              ///< set by load: a message for the operator, if any
    };

    /// An empty path: nothing is saved.
    explicit SituationStore(std::string path) : m_path(std::move(path)) {}

    /// Reads the file; empty content when there is none. An invalid file is moved aside. If that or
    /// reading fails, nothing is saved until the next start, so that nothing is lost; the content's
    /// message then says what happened.
    Content load();

    /// Replaces the file; on failure the old one stays.
    Result<void> save(const Content& content);

private:
    std::string moveAside(const std::string& reason);
    Result<void> replace(std::string_view text) const;

    const std::string m_path;
    std::optional<Problem> m_blocked; ///< why nothing may be saved
};

} // namespace zrm::host

#endif
