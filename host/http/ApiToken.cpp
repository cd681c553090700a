#include "host/http/ApiToken.h"

#include "base/TraceScope.h"
#include "host/base/WholeFile.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstddef>
#include <cstdio>
#include <memory>
#include <optional>
#include <utility>

#include <stdlib.h>
#include <sys/stat.h>
#include <unistd.h>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"ApiToken.cpp"};

constexpr std::size_t randomBytes = 32;
constexpr std::size_t shortestToken = 32;
constexpr std::size_t longestToken = 1024;

struct CloseStream {
    void operator()(std::FILE* stream) const { std::fclose(stream); }
};
using Stream = std::unique_ptr<std::FILE, CloseStream>;

/// A new random token; none when the system has no random bytes.
std::optional<std::string> newToken() {
    const Stream random(std::fopen("/dev/urandom", "re"));
    std::array<unsigned char, randomBytes> bytes{};
    if (random == nullptr ||
        std::fread(bytes.data(), 1, bytes.size(), random.get()) != bytes.size()) {
        return std::nullopt;
    }
    std::string token;
    for (const unsigned char byte : bytes) {
        constexpr const char* digits = "0123456789abcdef";
        token += digits[byte >> 4];
        token += digits[byte & 0x0f];
    }
    return token;
}

/// Creates the file atomically with its contents; a file that has appeared meanwhile is left as it
/// is.
Result<void> make(const std::string& path) {
    const std::string directory = path.substr(0, path.rfind('/'));
    if (!directory.empty() && mkdir(directory.c_str(), 0750) == -1 && errno != EEXIST) {
        return refused(because("cannot create the directory " + directory, errno));
    }
    const std::optional<std::string> token = newToken();
    if (!token) {
        return refused("cannot read /dev/urandom");
    }
    std::string temporary = path + ".XXXXXX";
    const int fd = mkstemp(temporary.data()); // readable only by the owner
    if (fd == -1) {
        return refused(because("cannot create a file in " + directory, errno));
    }
    Result<void> made;
    if (const auto written = WholeFile::write(fd, *token + '\n'); !written) {
        made = refused(because("cannot write " + temporary, written.error()));
    } else if (link(temporary.c_str(), path.c_str()) == -1 && errno != EEXIST) {
        made = refused(because("cannot create " + path, errno));
    }
    close(fd);
    unlink(temporary.c_str());
    return made;
}

} // namespace

ApiToken::ApiToken(std::string token) : m_token(std::move(token)) {}

Result<ApiToken> ApiToken::load(const std::string& path) {
    TraceScope trace(anchor);
    struct stat status {};
    if (stat(path.c_str(), &status) == 0 && !S_ISREG(status.st_mode)) {
        return refused(path +
                       " is not a file that can contain a token"); // opening a pipe would block
    }
    Stream stream(std::fopen(path.c_str(), "re"));
    if (stream == nullptr && errno == ENOENT) {
        if (const Result<void> made = make(path); !made) {
            return tl::unexpected(made.error());
        }
        trace.detail()("New token in %s.", path.c_str());
        stream.reset(std::fopen(path.c_str(), "re"));
    }
    if (stream == nullptr || fstat(fileno(stream.get()), &status) == -1) {
        return refused(because("cannot read " + path, errno));
    }
    if ((status.st_mode & S_IRWXO) != 0) {
        return refused(path +
                       " is accessible to every user: remove the permissions of other users "
                       "(chmod o= " +
                       path + ") or remove it to have a new one created");
    }
    char text[longestToken + 2];
    std::string token(text, std::fread(text, 1, sizeof text, stream.get()));
    token.erase(token.find_last_not_of(" \t\r\n") + 1);
    const bool isPrintable =
        std::all_of(token.begin(), token.end(), [](char c) { return c > 0x20 && c < 0x7f; });
    if (token.size() < shortestToken || token.size() > longestToken || !isPrintable) {
        return refused(path +
                       " does not contain a token of 32 to 1024 visible characters: remove it to "
                       "have a new one created");
    }
    return ApiToken(std::move(token));
}

bool ApiToken::matches(std::string_view presented) const noexcept {
    unsigned difference = presented.size() == m_token.size() ? 0 : 1;
    for (std::size_t at = 0; at < m_token.size(); ++at) {
        const char given = at < presented.size() ? presented[at] : '\0';
        difference |= static_cast<unsigned>(given ^ m_token[at]) & 0xffu;
    }
    return difference == 0;
}

} // namespace zrm::host
