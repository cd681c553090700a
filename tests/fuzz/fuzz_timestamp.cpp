#include "base/BrevanTime.h"
#include "tables/Timestamp.h"

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <cstring>

using namespace zrm;

// Any sixteen bytes may stand in a stamp: either the element joins the chain at a time that is not
// negative, or it stays alone. A time that was read back writes a stamp that is read as that time.

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    char stamp[16];
    std::memset(stamp, ' ', sizeof stamp);
    std::memcpy(stamp, data, std::min(size, sizeof stamp));

    Timestamp* head = nullptr;
    Timestamp* const first = new Timestamp(&head, stamp);
    if (head == nullptr) {
        if (first->eventTime() >= 0 || first->next() != first) {
            std::abort();
        }
        delete first;
        return 0;
    }
    if (head != first || first->eventTime() < 0) {
        std::abort();
    }
    const long time = static_cast<long>(first->eventTime());
    constexpr long year2900 = 29347920000;
    if (time >= year2900) { // its years need four digits
        delete head;
        return 0;
    }
    BrevanTime::generateTimestamp(time, stamp);
    Timestamp* const second = new Timestamp(&head, stamp);
    // An hour that exists twice a year is read as one of the two.
    if (head != second || std::labs(static_cast<long>(second->eventTime()) - time) > 7200) {
        std::abort();
    }
    head->countEvents(static_cast<long>(size));
    delete head;
    return 0;
}
