#ifndef ZRM_HOST_SCHEMA_H
#define ZRM_HOST_SCHEMA_H

#include "host/history/Database.h"

#include <stdexcept>

namespace zrm::host {

/// The file was written by a later version of this program.
class SchemaTooNew : public std::runtime_error {
    using std::runtime_error::runtime_error;
};

/// The tables of a history. Their version is stored as the file's user_version.
namespace Schema {

/// The version that this program writes.
extern const int version;

/// Upgrades a new or older file to this version, one version at a time. Each step is a transaction,
/// so a failure leaves a complete older version. Throws DatabaseError or SchemaTooNew.
void bringUpToDate(Database& database);

} // namespace Schema

} // namespace zrm::host

#endif
