#ifndef ZRM_FUZZ_REQUIRE_H
#define ZRM_FUZZ_REQUIRE_H

#include <cstdlib>

/// Ends the program, which is a finding, if something does not hold that must hold for any input.
inline void require(bool holds) {
    if (!holds) {
        std::abort();
    }
}

#endif
