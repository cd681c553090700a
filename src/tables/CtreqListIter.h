#ifndef ZRM_CTREQ_LIST_ITER_H
#define ZRM_CTREQ_LIST_ITER_H

#include "framework/LinkedList.h"

namespace zrm {

/// Walks a table manager's open requests. Use it only while holding the manager's lock.
class CtreqListIter : public LinkedListIter {
public:
    using LinkedListIter::LinkedListIter;
};

} // namespace zrm

#endif
