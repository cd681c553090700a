#ifndef ZRM_ENTRY_STAMP_H
#define ZRM_ENTRY_STAMP_H

#include "logs/EntryFormat.h"

#include <vector>

namespace zrm {

struct ZoneOffset;

/// Writes ENTRYTIME, in local time, from what an entry of a followed log says of its time.
namespace EntryStamp {

/// Writes the 16 characters and sets lastEntryMoment. `zone` is that of FollowSettings. `newest`,
/// 16 characters, decides the year of a time without one; null: the clock does. Returns false, and
/// writes nothing, for a time that ENTRYTIME cannot show.
bool write(const EntryColumns& entry, const std::vector<ZoneOffset>& zone, const char* newest,
           char* out);

/// Writes the present time, as that of an entry that says none.
void writePresent(char* out);

} // namespace EntryStamp

} // namespace zrm

#endif
