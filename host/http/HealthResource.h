#ifndef ZRM_HOST_HEALTH_RESOURCE_H
#define ZRM_HOST_HEALTH_RESOURCE_H

#include "host/http/Resource.h"

/// `GET /healthz`: the process serves HTTP. Needs no token.
class HealthResource : public Resource {
public:
    void addRoutes(Router& router) override;
};

#endif
