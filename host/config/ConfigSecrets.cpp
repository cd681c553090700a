#include "host/config/ConfigSecrets.h"

#include "host/config/HeaderName.h"

#include <algorithm>

#include <sys/stat.h>

namespace zrm::host {

namespace {

bool holdsSecret(const SinkConfig& sink) {
    const SinkConfig::Texts headers = sink.texts("headers");
    return !sink.text("secret").empty() ||
           std::any_of(headers.begin(), headers.end(),
                       [](const auto& header) { return isSecretHeader(header.first); });
}

} // namespace

std::string warningOfSecrets(const HostConfig& config, const std::string& path) {
    struct stat status {};
    if (stat(path.c_str(), &status) != 0 || (status.st_mode & S_IROTH) == 0 ||
        std::none_of(config.sinks.begin(), config.sinks.end(), holdsSecret)) {
        return "";
    }
    return path +
           " contains secrets and every user can read it: move them into separate files "
           "(secret_file, headers_file), or remove the permissions of other users (chmod o= " +
           path + ')';
}

} // namespace zrm::host
