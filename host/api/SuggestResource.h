#ifndef ZRM_HOST_SUGGEST_RESOURCE_H
#define ZRM_HOST_SUGGEST_RESOURCE_H

#include "host/config/ReadyFormats.h"
#include "host/http/Message.h"
#include "host/http/Router.h"

#include <string>
#include <vector>

namespace zrm::host {

/// `POST /api/v1/suggest`: which ready format fits lines, or what a format for them could be.
class SuggestResource : public Resource {
public:
    /// Formats are looked for in these directories, and in the usual ones.
    explicit SuggestResource(std::vector<std::string> directories);

    void addRoutes(Router& router) override;

private:
    HttpAnswer suggest(const HttpRequest& request) const;

    const ReadyFormats m_formats;
};

} // namespace zrm::host

#endif
