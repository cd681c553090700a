#ifndef ZRM_HOST_CONSOLE_RESOURCE_H
#define ZRM_HOST_CONSOLE_RESOURCE_H

#include "host/http/Router.h"

#include <string_view>

namespace zrm::host {

/// A file of the console, embedded in the program. What it refers to lives as long as the process.
struct ConsoleFile {
    std::string_view name; ///< below /console/, for example views/logs.js
    std::string_view content;

    /// The file with this name; null when there is none.
    static const ConsoleFile* find(std::string_view name);
};

/// The web console: `GET /` is its page, `GET /console/FILE` are the files that the page uses. They
/// contain nothing about this machine and need no token; the page asks the user for it.
class ConsoleResource : public Resource {
public:
    void addRoutes(Router& router) override;
};

} // namespace zrm::host

#endif
