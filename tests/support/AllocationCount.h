#ifndef ZRM_TESTS_ALLOCATION_COUNT_H
#define ZRM_TESTS_ALLOCATION_COUNT_H

/// Number of allocations that the calling thread has made with new, of any form but the aligned.
long allocationCount() noexcept;

#endif
