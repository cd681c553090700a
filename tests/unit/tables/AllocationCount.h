#ifndef ZRM_TESTS_ALLOCATION_COUNT_H
#define ZRM_TESTS_ALLOCATION_COUNT_H

/// Number of allocations by operator new that the calling thread has made.
long allocationCount() noexcept;

#endif
