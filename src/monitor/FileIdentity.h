#ifndef ZRM_FILE_IDENTITY_H
#define ZRM_FILE_IDENTITY_H

#include <sys/types.h>

namespace zrm {

/// Identifies a file independently of its current name.
struct FileIdentity {
    dev_t device;
    ino_t inode;

    bool operator==(const FileIdentity&) const = default;
};

} // namespace zrm

#endif
