#include "host/http/TlsContext.h"

#include <utility>

#include <openssl/err.h>
#include <openssl/ssl.h>
#include <openssl/x509v3.h>

namespace zrm::host {

namespace {

/// Refused for the library's last failure, or the system's when a file cannot be read.
tl::unexpected<Problem> refusedByLibrary(const std::string& what, std::string cure = {}) {
    const unsigned long code = ERR_get_error();
    ERR_clear_error();
    if (ERR_GET_LIB(code) == ERR_LIB_SYS) {
        return refused(because(what, ERR_GET_REASON(code)), std::move(cure));
    }
    const char* const reason = ERR_reason_error_string(code);
    return refused(what + ": " + (reason == nullptr ? "unknown reason" : reason), std::move(cure));
}

/// For TLS 1.2: suites with forward secrecy that are not open to padding attacks. All suites of TLS
/// 1.3, which is used if the client supports it, are of this kind.
constexpr const char* suites = "ECDHE+AESGCM:ECDHE+CHACHA20";

/// Replaces the prompt on the terminal, for which the agent would wait.
int noPassphrase(char* /*text*/, int /*size*/, int /*isWriting*/, void* /*data*/) {
    return -1;
}

} // namespace

TlsContext::~TlsContext() {
    SSL_CTX_free(m_context);
}

Result<std::shared_ptr<const TlsContext>> TlsContext::load(const std::string& certificate,
                                                           const std::string& key) {
    ERR_clear_error();
    SSL_CTX* const context = SSL_CTX_new(TLS_server_method());
    if (context == nullptr) {
        return refusedByLibrary("TLS cannot be used");
    }
    const std::shared_ptr<const TlsContext> result(new TlsContext(context));
    SSL_CTX_set_min_proto_version(context, TLS1_2_VERSION);
    SSL_CTX_set_cipher_list(context, suites);
    SSL_CTX_set_options(context, SSL_OP_NO_RENEGOTIATION | SSL_OP_CIPHER_SERVER_PREFERENCE);
    SSL_CTX_set_default_passwd_cb(context, noPassphrase);
    SSL_CTX_set_session_cache_mode(context, SSL_SESS_CACHE_OFF);
    if (SSL_CTX_use_certificate_chain_file(context, certificate.c_str()) != 1) {
        return refusedByLibrary("cannot use the certificate " + certificate,
                                "it must be a PEM file");
    }
    if (SSL_CTX_use_PrivateKey_file(context, key.c_str(), SSL_FILETYPE_PEM) != 1) {
        return refusedByLibrary("cannot use the key " + key,
                                "it must be a PEM file without a passphrase");
    }
    if (SSL_CTX_check_private_key(context) != 1) {
        return refusedByLibrary("the key " + key + " does not belong to the certificate " +
                                certificate);
    }
    return result;
}

bool TlsContext::isFor(const std::string& host) const {
    X509* const certificate = SSL_CTX_get0_certificate(m_context);
    return X509_check_host(certificate, host.data(), host.size(), 0, nullptr) == 1 ||
           X509_check_ip_asc(certificate, host.c_str(), 0) == 1;
}

} // namespace zrm::host
