#ifndef ZRM_HOST_CREDENTIALS_H
#define ZRM_HOST_CREDENTIALS_H

#include "host/base/Result.h"
#include "host/base/WatchedFile.h"
#include "host/http/ApiToken.h"
#include "host/http/TlsContext.h"

#include <memory>
#include <optional>
#include <string>

namespace zrm::host {

/// The API token and the certificate with its key, reread when their files change. While a changed
/// file cannot be used, what was read last stays in use. One thread.
class Credentials {
public:
    /// Paths; certificate and key are empty without TLS.
    Credentials(std::string token, std::string certificate, std::string key);

    /// Reads everything for the first time.
    Result<void> load();

    /// The result of checking the files.
    struct Change {
        bool isNew = false; ///< token() or tls() has changed
        /// Why a changed file is not used, once for each change.
        std::optional<Problem> problem = std::nullopt;
    };
    /// Rereads the files that have changed. Called about once a second.
    Change refresh();

    /// After load.
    const ApiToken& token() const { return *m_token; }
    /// Null without TLS.
    const std::shared_ptr<const TlsContext>& tls() const noexcept { return m_tls; }

private:
    Result<void> loadToken();
    Result<void> loadTls();
    void refreshTls(Change& change);

    WatchedFile m_tokenFile;
    WatchedFile m_certificateFile;
    WatchedFile m_keyFile;
    std::optional<ApiToken> m_token;
    std::shared_ptr<const TlsContext> m_tls;
    bool m_isTriedAgain = false; ///< certificate and key may be replaced one after the other
};

} // namespace zrm::host

#endif
