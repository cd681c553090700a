#ifndef ZRM_HOST_RULES_RESOURCE_H
#define ZRM_HOST_RULES_RESOURCE_H

#include "host/config/ReadyRules.h"
#include "host/http/Message.h"
#include "host/http/Router.h"

#include <string>
#include <vector>

namespace zrm::host {

class SituationSet;

/// `GET /api/v1/rules`: the ready situations, and which situations use them.
class RulesResource : public Resource {
public:
    /// Rules are looked for in these directories, and in the usual ones. The situations outlive the
    /// object.
    RulesResource(std::vector<std::string> directories, const SituationSet& situations);

    void addRoutes(Router& router) override;

private:
    HttpAnswer list(const HttpRequest& request) const;

    const ReadyRules m_rules;
    const SituationSet& m_situations;
};

} // namespace zrm::host

#endif
