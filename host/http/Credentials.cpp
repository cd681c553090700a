#include "host/http/Credentials.h"

#include <utility>

namespace zrm::host {

Credentials::Credentials(std::string token, std::string certificate, std::string key)
    : m_tokenFile(std::move(token)), m_certificateFile(std::move(certificate)),
      m_keyFile(std::move(key)) {}

Result<void> Credentials::load() {
    return loadToken().and_then([this] { return loadTls(); });
}

Result<void> Credentials::loadToken() {
    return ApiToken::load(m_tokenFile.path()).map([this](ApiToken&& token) {
        m_token.emplace(std::move(token));
    });
}

Result<void> Credentials::loadTls() {
    if (m_certificateFile.path().empty()) {
        return {};
    }
    return TlsContext::load(m_certificateFile.path(), m_keyFile.path())
        .map([this](std::shared_ptr<const TlsContext>&& tls) { m_tls = std::move(tls); });
}

Credentials::Change Credentials::refresh() {
    Change change;
    if (m_tokenFile.hasChanged()) {
        const Result<void> loaded = loadToken();
        change.isNew = loaded.has_value();
        if (!loaded) {
            change.problem = Problem{"the previous token stays in use: " + loaded.error().text()};
        }
    }
    refreshTls(change);
    return change;
}

/// Certificate and key are two files, which do not match while only one has been replaced. So a
/// problem counts only if it is still there at the next check.
void Credentials::refreshTls(Change& change) {
    const bool isCertificateNew = m_certificateFile.hasChanged();
    const bool isKeyNew = m_keyFile.hasChanged();
    const bool isSecondTry = std::exchange(m_isTriedAgain, false);
    if (!isCertificateNew && !isKeyNew && !isSecondTry) {
        return;
    }
    const Result<void> loaded = loadTls();
    if (loaded) {
        change.isNew = true;
    } else if (isCertificateNew || isKeyNew) {
        m_isTriedAgain = true;
    } else {
        change.problem = Problem{"the previous certificate stays in use: " + loaded.error().text()};
    }
}

} // namespace zrm::host
