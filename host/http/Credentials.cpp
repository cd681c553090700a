#include "host/http/Credentials.h"

#include <utility>
#include <variant>

namespace zrm::host {

Credentials::Credentials(std::string token, std::string certificate, std::string key)
    : m_tokenFile(std::move(token)), m_certificateFile(std::move(certificate)),
      m_keyFile(std::move(key)) {}

std::string Credentials::load() {
    std::string problem = loadToken();
    return problem.empty() ? loadTls() : problem;
}

std::string Credentials::loadToken() {
    auto loaded = ApiToken::load(m_tokenFile.path());
    if (std::string* const problem = std::get_if<std::string>(&loaded)) {
        return std::move(*problem);
    }
    m_token.emplace(std::get<ApiToken>(std::move(loaded)));
    return "";
}

std::string Credentials::loadTls() {
    if (m_certificateFile.path().empty()) {
        return "";
    }
    auto loaded = TlsContext::load(m_certificateFile.path(), m_keyFile.path());
    if (std::string* const problem = std::get_if<std::string>(&loaded)) {
        return std::move(*problem);
    }
    m_tls = std::get<std::shared_ptr<const TlsContext>>(std::move(loaded));
    return "";
}

Credentials::Change Credentials::refresh() {
    Change change;
    if (m_tokenFile.hasChanged()) {
        const std::string problem = loadToken();
        change.isNew = problem.empty();
        change.problem = problem.empty() ? "" : "the previous token stays in use: " + problem;
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
    const std::string problem = loadTls();
    if (problem.empty()) {
        change.isNew = true;
    } else if (isCertificateNew || isKeyNew) {
        m_isTriedAgain = true;
    } else {
        change.problem = "the previous certificate stays in use: " + problem;
    }
}

} // namespace zrm::host
