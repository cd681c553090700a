#ifndef ZRM_HOST_TLS_CONTEXT_H
#define ZRM_HOST_TLS_CONTEXT_H

#include "host/base/Result.h"

#include <memory>
#include <string>

struct ssl_ctx_st;

namespace zrm::host {

/// A certificate and its key, for connections under TLS. Immutable, so any thread.
class TlsContext {
public:
    /// Reads both files (PEM; the certificate's chain may follow it). Refused when they
    /// cannot be used.
    static Result<std::shared_ptr<const TlsContext>> load(const std::string& certificate,
                                                          const std::string& key);

    ~TlsContext();
    TlsContext(const TlsContext&) = delete;
    TlsContext& operator=(const TlsContext&) = delete;

    /// True when the certificate is valid for this host name or address.
    bool isFor(const std::string& host) const;

    ssl_ctx_st* handle() const noexcept { return m_context; }

private:
    explicit TlsContext(ssl_ctx_st* context) : m_context(context) {}

    ssl_ctx_st* const m_context;
};

} // namespace zrm::host

#endif
