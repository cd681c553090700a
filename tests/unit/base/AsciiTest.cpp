#include "base/Ascii.h"

#include <gtest/gtest.h>

#include <string>

using namespace zrm;

namespace {

TEST(Ascii, IsKnownWhereverAnotherByteStands) {
    for (std::size_t size = 0; size < 80; ++size) {
        std::string text(size, 'a');
        EXPECT_TRUE(isAscii(text)) << size;
        for (std::size_t position = 0; position < size; ++position) {
            text[position] = '\x80';
            EXPECT_FALSE(isAscii(text)) << size << " bytes, the one at " << position;
            text[position] = '\x7f';
        }
    }
}

} // namespace
