#ifndef ZRM_HOST_API_TOKEN_H
#define ZRM_HOST_API_TOKEN_H

#include "host/base/Result.h"

#include <string>
#include <string_view>

namespace zrm::host {

/// The secret that a client of the API presents. Immutable.
class ApiToken {
public:
    explicit ApiToken(std::string token);

    /// Reads the token from its file. If the file is missing, creates it and its directory,
    /// readable only by the owner, with 32 random bytes in hexadecimal. Refused when there is no
    /// token in the end.
    static Result<ApiToken> load(const std::string& path);

    /// True when the text is the token. The time taken does not reveal how much of it is right.
    bool matches(std::string_view presented) const noexcept;

private:
    std::string m_token;
};

} // namespace zrm::host

#endif
