#ifndef ZRM_HOST_API_TOKEN_H
#define ZRM_HOST_API_TOKEN_H

#include <string>
#include <string_view>
#include <variant>

namespace zrm::host {

/// The secret that a client of the API presents. Immutable.
class ApiToken {
public:
    explicit ApiToken(std::string token);

    /// Reads the token from its file. A missing file is made, readable for the owner alone, with
    /// 32 random bytes in hexadecimal, and so is its directory. Gives what is wrong when there is
    /// no token in the end.
    static std::variant<ApiToken, std::string> load(const std::string& path);

    /// True when the text is the token. The time it takes does not tell how much of it is right.
    bool matches(std::string_view presented) const noexcept;

private:
    std::string m_token;
};

} // namespace zrm::host

#endif
