#include "host/base/Result.h"

#include "base/ErrorText.h"

#include <utility>

namespace zrm::host {

std::string Problem::text() const {
    return cure.empty() ? what : what + "; " + cure;
}

tl::unexpected<Problem> refused(std::string what, std::string cure, std::string field) {
    return tl::unexpected(Problem{std::move(what), std::move(cure), std::move(field)});
}

std::string because(const std::string& what, int number) {
    const ErrorText error(number);
    return what + ": " + error.text();
}

} // namespace zrm::host
