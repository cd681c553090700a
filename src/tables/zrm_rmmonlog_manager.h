#ifndef ZRM_RMMONLOG_MANAGER_H
#define ZRM_RMMONLOG_MANAGER_H

#include "agent/framework/TableManager.h"

/// Creates and registers the Monitored Logs table's manager. Returns 0 or a framework status.
unsigned zrm_rmmonlog_init();

#endif
