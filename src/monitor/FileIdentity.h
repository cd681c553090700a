#ifndef ZRM_FILE_IDENTITY_H
#define ZRM_FILE_IDENTITY_H

#include <sys/types.h>

namespace zrm {

/// Which file it is, whatever its name at present.
struct FileIdentity {
    dev_t device;
    ino_t inode;

    bool operator==(const FileIdentity&) const = default;
};

} // namespace zrm

#endif
