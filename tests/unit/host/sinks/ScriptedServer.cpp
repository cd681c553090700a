#include "ScriptedServer.h"

#include "LocalSocket.h"

#include <algorithm>
#include <cctype>
#include <utility>

#include <sys/socket.h>
#include <unistd.h>

namespace {

/// Reads until the condition holds; false when the connection ended before.
template <typename Condition> bool readUntil(int socket, std::string& text, Condition holds) {
    char buffer[4096];
    while (!holds()) {
        const ssize_t count = recv(socket, buffer, sizeof buffer, 0);
        if (count <= 0) {
            return false;
        }
        text.append(buffer, static_cast<std::size_t>(count));
    }
    return true;
}

bool readRequest(int socket, ScriptedServer::Request& request) {
    std::string text;
    std::size_t end = 0;
    if (!readUntil(socket, text, [&] {
            end = text.find("\r\n\r\n");
            return end != std::string::npos;
        })) {
        return false;
    }
    const std::size_t firstLine = text.find("\r\n");
    request.line = text.substr(0, firstLine);
    request.headers = text.substr(firstLine + 2, end - firstLine);
    std::transform(request.headers.begin(), request.headers.end(), request.headers.begin(),
                   [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
    const std::string length = request.header("content-length");
    const std::size_t size = length.empty() ? 0 : std::stoul(length);
    text.erase(0, end + 4);
    if (!readUntil(socket, text, [&] { return text.size() >= size; })) {
        return false;
    }
    request.body = std::move(text);
    return true;
}

} // namespace

std::string ScriptedServer::Request::header(const std::string& name) const {
    const std::size_t at = ("\r\n" + headers).find("\r\n" + name + ": ");
    if (at == std::string::npos) {
        return "";
    }
    const std::size_t begin = at + name.size() + 2;
    return headers.substr(begin, headers.find("\r\n", begin) - begin);
}

ScriptedServer::ScriptedServer(Script script) : m_script(std::move(script)) {
    m_listener = localSocket(SOCK_STREAM, m_port);
    listen(m_listener, 16);
    m_acceptor = std::jthread([this] { accept(); });
}

ScriptedServer::~ScriptedServer() {
    {
        const std::lock_guard guard(m_mutex);
        m_ending = true;
        for (const int socket : m_sockets) {
            shutdown(socket, SHUT_RDWR);
        }
    }
    shutdown(m_listener, SHUT_RDWR);
    m_acceptor.join();
    m_threads.clear();
    close(m_listener);
    for (const int socket : m_sockets) {
        close(socket);
    }
}

void ScriptedServer::accept() {
    for (int number = 1;; ++number) {
        const int socket = ::accept(m_listener, nullptr, nullptr);
        const std::lock_guard guard(m_mutex);
        if (socket == -1 || m_ending) {
            close(socket);
            return;
        }
        m_sockets.push_back(socket);
        m_threads.emplace_back([this, socket, number] { serve(socket, number); });
    }
}

void ScriptedServer::serve(int socket, int number) {
    Request request;
    request.connection = number;
    while (readRequest(socket, request)) {
        Reply reply;
        {
            const std::lock_guard guard(m_mutex);
            m_requests.push_back(request);
            reply = m_script(request);
        }
        send(socket, reply.bytes.data(), reply.bytes.size(), MSG_NOSIGNAL);
        while (!reply.endless.empty()) {
            std::this_thread::sleep_for(reply.pause);
            if (send(socket, reply.endless.data(), reply.endless.size(), MSG_NOSIGNAL) <= 0) {
                return;
            }
        }
        if (reply.then == Reply::CLOSE) {
            shutdown(socket, SHUT_RDWR);
        }
        if (reply.then != Reply::KEEP) {
            return;
        }
    }
}

ScriptedServer::Reply ScriptedServer::status(int status, const std::string& body,
                                             const std::string& headers) {
    return {"HTTP/1.1 " + std::to_string(status) + " Text\r\nContent-Length: " +
                std::to_string(body.size()) + "\r\n" + headers + "\r\n" + body,
            Reply::KEEP};
}

std::string ScriptedServer::url(const std::string& path) const {
    return "http://127.0.0.1:" + std::to_string(m_port) + path;
}

std::vector<ScriptedServer::Request> ScriptedServer::requests() const {
    const std::lock_guard guard(m_mutex);
    return m_requests;
}

std::vector<std::string> ScriptedServer::bodies() const {
    std::vector<std::string> bodies;
    for (const Request& request : requests()) {
        bodies.push_back(request.body);
    }
    return bodies;
}
