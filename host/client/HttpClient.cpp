#include "host/client/HttpClient.h"

#include "host/client/BrokenPipeBlocked.h"
#include "host/client/NameLookup.h"

#include <algorithm>
#include <array>
#include <exception>
#include <new>
#include <utility>

#include <arpa/inet.h>
#include <curl/curl.h>
#include <fcntl.h>
#include <sys/select.h>
#include <sys/socket.h>
#include <unistd.h>

namespace zrm::host {

namespace {

using Clock = std::chrono::steady_clock;
using Outcome = HttpClientAnswer::Outcome;
using std::chrono::milliseconds;

constexpr std::size_t longestHead = 64 * 1024; ///< bytes, trailers and interim answers included
constexpr milliseconds longestPoll{1000};

/// With forward secrecy and authenticated encryption; TLS 1.3 has no others.
constexpr const char* ciphers = "ECDHE+AESGCM:ECDHE+CHACHA20:DHE+AESGCM:DHE+CHACHA20";

struct Meaning {
    CURLcode code;
    Outcome outcome;
};

constexpr std::array meanings = {
    Meaning{CURLE_COULDNT_CONNECT, Outcome::unreachable},
    Meaning{CURLE_OPERATION_TIMEDOUT, Outcome::late},
    Meaning{CURLE_PEER_FAILED_VERIFICATION, Outcome::untrusted},
    Meaning{CURLE_SSL_CONNECT_ERROR, Outcome::noTls},
    Meaning{CURLE_SSL_CACERT_BADFILE, Outcome::noAuthorities},
    Meaning{CURLE_SEND_ERROR, Outcome::sendFailed},
    Meaning{CURLE_RECV_ERROR, Outcome::brokenOff},
    Meaning{CURLE_GOT_NOTHING, Outcome::brokenOff},
    Meaning{CURLE_OK, Outcome::brokenOff}, // the connection ended within a head
    Meaning{CURLE_UNSUPPORTED_PROTOCOL, Outcome::notHttp},
    Meaning{CURLE_WEIRD_SERVER_REPLY, Outcome::notHttp},
    Meaning{CURLE_WRITE_ERROR, Outcome::notHttp},   // the head was refused
    Meaning{CURLE_OUT_OF_MEMORY, Outcome::notHttp}, // also for a line above 100 kB
};

/// The outcome of a request that did not get a complete head.
Outcome outcomeOf(CURLcode code) {
    const auto* const found = std::find_if(meanings.begin(), meanings.end(),
                                           [&](const Meaning& m) { return m.code == code; });
    return found == meanings.end() ? Outcome::failed : found->outcome;
}

/// The library's own preparations, once in the process; they are thread-safe.
bool isLibraryReady() {
    static const CURLcode result = curl_global_init(CURL_GLOBAL_DEFAULT);
    return result == CURLE_OK;
}

/// The pair of sockets with which the library wakes itself up would be inherited by children. No
/// child of this process is to have any descriptor beside its standard streams.
void keepFromChildren() {
    for (int fd = STDERR_FILENO + 1; fd < FD_SETSIZE; ++fd) {
        const int flags = fcntl(fd, F_GETFD);
        if (flags != -1 && (flags & FD_CLOEXEC) == 0) {
            fcntl(fd, F_SETFD, flags | FD_CLOEXEC);
        }
    }
}

curl_socket_t openSocket(void* /*client*/, curlsocktype /*purpose*/, curl_sockaddr* address) {
    return socket(address->family, address->socktype | SOCK_CLOEXEC, address->protocol);
}

bool isNumber(const std::string& host) {
    in6_addr address{};
    return inet_pton(AF_INET, host.c_str(), &address) == 1 ||
           inet_pton(AF_INET6, host.c_str(), &address) == 1;
}

/// The library's lists of texts.
class TextList {
public:
    void add(const std::string& text) {
        curl_slist* const longer = curl_slist_append(m_list.get(), text.c_str());
        if (longer == nullptr) {
            throw std::bad_alloc();
        }
        (void)m_list.release(); // it is the beginning of the longer one
        m_list.reset(longer);
    }
    curl_slist* get() const noexcept { return m_list.get(); }

private:
    std::unique_ptr<curl_slist, decltype(&curl_slist_free_all)> m_list{nullptr,
                                                                       &curl_slist_free_all};
};

} // namespace

class HttpClient::Implementation {
public:
    explicit Implementation(Options options)
        : m_options(std::move(options)), m_lookup(m_options.server.host, m_options.server.port) {}
    ~Implementation();
    Implementation(const Implementation&) = delete;
    Implementation& operator=(const Implementation&) = delete;

    HttpClientAnswer send(const HttpClientRequest& request, const std::stop_token& giveUp);

private:
    static std::size_t takeHead(char* data, std::size_t size, std::size_t count, void* self);
    static std::size_t takeBody(char* data, std::size_t size, std::size_t count, void* self);

    void prepare();
    bool connectionStands();
    bool lookUp(const std::stop_token& giveUp);
    void setServer();
    void setTls();
    void setRequest();
    CURLcode transfer(const std::stop_token& giveUp);
    bool isLate() const;
    void judge(CURLcode code);

    template <typename Value> void set(CURLoption option, Value value) {
        if (curl_easy_setopt(m_easy, option, value) == CURLE_OUT_OF_MEMORY) {
            throw std::bad_alloc();
        }
    }

    const Options m_options;
    NameLookup m_lookup;
    CURLM* m_multi = nullptr;
    CURL* m_easy = nullptr;
    TextList m_addresses; ///< of the server, when its name was last looked up

    // Of the request under way.
    const HttpClientRequest* m_request = nullptr;
    TextList m_headers;
    HttpClientAnswer m_answer;
    Clock::time_point m_begin;
    Clock::time_point m_lastHeard;
    std::size_t m_headSize = 0;
    std::exception_ptr m_exception; ///< thrown by the receiver
};

HttpClient::Implementation::~Implementation() {
    const BrokenPipeBlocked blocked; // ending TLS writes
    curl_easy_cleanup(m_easy);
    curl_multi_cleanup(m_multi);
}

void HttpClient::Implementation::prepare() {
    if (m_multi == nullptr) {
        m_multi = isLibraryReady() ? curl_multi_init() : nullptr;
        keepFromChildren();
    }
    if (m_easy == nullptr && m_multi != nullptr) {
        m_easy = curl_easy_init();
    }
    if (m_easy == nullptr) {
        throw std::bad_alloc();
    }
}

std::size_t HttpClient::Implementation::takeHead(char* data, std::size_t size, std::size_t count,
                                                 void* self) {
    auto& client = *static_cast<Implementation*>(self);
    const std::string_view line(data, size * count);
    client.m_lastHeard = Clock::now();
    client.m_headSize += line.size();
    if (client.m_headSize > longestHead) {
        return CURL_WRITEFUNC_ERROR;
    }
    long status = 0;
    curl_easy_getinfo(client.m_easy, CURLINFO_RESPONSE_CODE, &status);
    if ((line == "\r\n" || line == "\n") && status >= 200 && status <= 599) {
        client.m_answer.status = static_cast<int>(status);
    }
    return line.size();
}

std::size_t HttpClient::Implementation::takeBody(char* data, std::size_t size, std::size_t count,
                                                 void* self) {
    auto& client = *static_cast<Implementation*>(self);
    const std::string_view piece(data, size * count);
    client.m_lastHeard = Clock::now();
    bool isWanted = false;
    try {
        isWanted =
            client.m_request->receive && client.m_request->receive(client.m_answer.status, piece);
    } catch (...) { // must not pass through the library
        client.m_exception = std::current_exception();
    }
    return isWanted ? piece.size() : CURL_WRITEFUNC_ERROR;
}

/// True when the last request's connection can take the next one.
bool HttpClient::Implementation::connectionStands() {
    curl_socket_t kept = CURL_SOCKET_BAD;
    char byte = 0;
    return curl_easy_getinfo(m_easy, CURLINFO_ACTIVESOCKET, &kept) == CURLE_OK &&
           kept != CURL_SOCKET_BAD && recv(kept, &byte, 1, MSG_PEEK | MSG_DONTWAIT) == -1;
}

/// Finds the server's addresses where a connection has to be made. The library's own lookup of a
/// name cannot be ended, and leaves one more thread behind with each try.
bool HttpClient::Implementation::lookUp(const std::stop_token& giveUp) {
    const HttpUrl& server = m_options.server;
    if (isNumber(server.host) || connectionStands()) {
        return true;
    }
    const std::vector<SocketAddress> found =
        m_lookup.find(m_begin + m_request->limits.connect, giveUp);
    std::string texts;
    for (const SocketAddress& address : found) {
        const bool isSix = address.family() == AF_INET6;
        texts += (texts.empty() ? "" : ",") + std::string(isSix ? "[" : "") + address.text() +
                 (isSix ? "]" : "");
    }
    m_addresses = {};
    m_addresses.add(server.host + ':' + std::to_string(server.port) + ':' + texts);
    return !found.empty();
}

void HttpClient::Implementation::setServer() {
    const std::string url =
        (m_options.server.isSecure ? "https://" : "http://") + m_options.server.authority() + '/';
    set(CURLOPT_URL, url.c_str());
    set(CURLOPT_PROTOCOLS_STR, "http,https");
    set(CURLOPT_HTTP_VERSION, static_cast<long>(CURL_HTTP_VERSION_1_1));
    set(CURLOPT_FOLLOWLOCATION, 0L);
    set(CURLOPT_PROXY, ""); // not that of the environment
    set(CURLOPT_NOSIGNAL, 1L);
    set(CURLOPT_OPENSOCKETFUNCTION, &openSocket);
    set(CURLOPT_CONNECTTIMEOUT_MS, static_cast<long>(m_request->limits.connect.count()));
    set(CURLOPT_RESOLVE, m_addresses.get());
    set(CURLOPT_USERAGENT, m_options.userAgent.c_str());
}

void HttpClient::Implementation::setTls() {
    set(CURLOPT_SSL_VERIFYPEER, 1L);
    set(CURLOPT_SSL_VERIFYHOST, 2L);
    set(CURLOPT_SSLVERSION, static_cast<long>(CURL_SSLVERSION_TLSv1_2));
    set(CURLOPT_SSL_CIPHER_LIST, ciphers);
    set(CURLOPT_CA_CACHE_TIMEOUT, 0L); // a file that was exchanged holds for the next connection
    if (!m_options.caFile.empty()) {
        set(CURLOPT_CAINFO, m_options.caFile.c_str());
        set(CURLOPT_CAPATH, static_cast<const char*>(nullptr)); // the system's
    } else if (!m_options.authorities.empty()) {
        // Instead of the system's file of authorities, which its directory of them holds, too.
        std::string text = m_options.authorities;
        curl_blob blob{text.data(), text.size(), CURL_BLOB_COPY};
        set(CURLOPT_CAINFO_BLOB, &blob);
    }
}

void HttpClient::Implementation::setRequest() {
    m_headers = {};
    m_headers.add("Expect:"); // or the library waits for permission to send a large body
    for (const std::string& header : m_request->headers) {
        // The library takes a header without a value for one that is not to be sent.
        m_headers.add(header.ends_with(": ") ? header.substr(0, header.size() - 2) + ';' : header);
    }
    set(CURLOPT_HTTPHEADER, m_headers.get());
    set(CURLOPT_REQUEST_TARGET, m_request->target.c_str());
    if (m_request->body != nullptr) {
        set(CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(m_request->body->size()));
        set(CURLOPT_POSTFIELDS, m_request->body->c_str());
    }
    set(CURLOPT_CUSTOMREQUEST, m_request->method.c_str());
    set(CURLOPT_HEADERFUNCTION, &Implementation::takeHead);
    set(CURLOPT_HEADERDATA, static_cast<void*>(this));
    set(CURLOPT_WRITEFUNCTION, &Implementation::takeBody);
    set(CURLOPT_WRITEDATA, static_cast<void*>(this));
}

bool HttpClient::Implementation::isLate() const {
    const HttpLimits& limits = m_request->limits;
    const Clock::time_point now = Clock::now();
    constexpr milliseconds none{0};
    return (m_answer.status == 0 && now - m_begin > limits.head) ||
           (limits.whole != none && now - m_begin > limits.whole) ||
           (limits.silence != none && now - m_lastHeard > limits.silence);
}

CURLcode HttpClient::Implementation::transfer(const std::stop_token& giveUp) {
    const BrokenPipeBlocked blocked;
    const std::stop_callback wakeUp(giveUp, [this] { curl_multi_wakeup(m_multi); });
    CURLcode code = CURLE_FAILED_INIT;
    if (curl_multi_add_handle(m_multi, m_easy) != CURLM_OK) {
        return code;
    }
    const HttpLimits& limits = m_request->limits;
    const milliseconds slice =
        std::min(longestPoll, std::max(milliseconds(1), std::min(limits.head, limits.connect) / 4));
    int running = 1;
    while (curl_multi_perform(m_multi, &running) == CURLM_OK && running != 0) {
        if (giveUp.stop_requested() || isLate()) {
            code = CURLE_OPERATION_TIMEDOUT;
            break;
        }
        curl_multi_poll(m_multi, nullptr, 0, static_cast<int>(slice.count()), nullptr);
    }
    int left = 0;
    if (const CURLMsg* const message = curl_multi_info_read(m_multi, &left);
        message != nullptr && message->msg == CURLMSG_DONE) {
        code = message->data.result;
    }
    curl_header* retryAfter = nullptr;
    if (curl_easy_header(m_easy, "Retry-After", 0, CURLH_HEADER, -1, &retryAfter) == CURLHE_OK) {
        m_answer.retryAfter = retryAfter->value;
    }
    curl_multi_remove_handle(m_multi, m_easy);
    return code;
}

void HttpClient::Implementation::judge(CURLcode code) {
    if (m_answer.status != 0) {
        m_answer.outcome = code == CURLE_OK ? Outcome::whole : Outcome::partial;
        return;
    }
    m_answer.outcome = outcomeOf(code);
    m_answer.detail = curl_easy_strerror(code);
}

HttpClientAnswer HttpClient::Implementation::send(const HttpClientRequest& request,
                                                  const std::stop_token& giveUp) {
    m_request = &request;
    m_answer = {};
    m_headSize = 0;
    m_exception = nullptr;
    m_begin = m_lastHeard = Clock::now();
    prepare();
    const bool isKnown = lookUp(giveUp);
    if (!isKnown) {
        m_answer.outcome = Outcome::unknownName;
        m_answer.detail = m_lookup.error();
    } else if (!giveUp.stop_requested()) {
        curl_easy_reset(m_easy);
        setServer();
        setTls();
        setRequest();
        judge(transfer(giveUp));
    }
    if (m_exception != nullptr) {
        std::rethrow_exception(m_exception);
    }
    if (m_answer.status == 0 && giveUp.stop_requested()) {
        m_answer.outcome = Outcome::stopped;
    }
    return std::move(m_answer);
}

HttpClient::HttpClient(Options options)
    : m_implementation(std::make_unique<Implementation>(std::move(options))) {}

HttpClient::~HttpClient() = default;

HttpClientAnswer HttpClient::send(const HttpClientRequest& request, const std::stop_token& giveUp) {
    return m_implementation->send(request, giveUp);
}

} // namespace zrm::host
