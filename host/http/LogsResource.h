#ifndef ZRM_HOST_LOGS_RESOURCE_H
#define ZRM_HOST_LOGS_RESOURCE_H

#include "host/http/Resource.h"

/// `GET /api/v1/logs`: the monitored logs as they are now.
class LogsResource : public Resource {
public:
    void addRoutes(Router& router) override;
};

#endif
