#include "logtypes/EntryStamp.h"

#include "base/BrevanTime.h"
#include "logs/EntryClock.h"
#include "logs/FollowSettings.h"
#include "logs/zrm_rmlogent_data.h"
#include "logtypes/SyslogForms.h"

#include <ctime>

namespace zrm {

bool EntryStamp::write(const EntryColumns& entry, const std::vector<ZoneOffset>& zone,
                       const char* newest, char* out) {
    CivilTime civil = entry.time;
    if (!entry.hasYear) {
        char now[sizeof zrm_rmlogent_data_t::entrytime];
        if (newest == nullptr) {
            BrevanTime::generateCurrentTimestamp(now);
        }
        civil.year =
            SyslogForms::yearOf(civil, ZoneTime::ofStamp(newest == nullptr ? now : newest));
    }
    std::int64_t seconds = civil.seconds();
    EntryMoment moment;
    if (entry.offset) {
        seconds -= *entry.offset;
        moment = {EntryMoment::Kind::instant, seconds};
        seconds = ZoneTime::toLocal(seconds);
    } else if (!zone.empty()) {
        moment = {EntryMoment::Kind::zoned, seconds};
        seconds = ZoneTime::toLocal(ZoneTime::toUtc(seconds, zone));
    }
    if (!ZoneTime::writeStamp(seconds, out)) {
        return false;
    }
    lastEntryMoment = moment;
    return true;
}

void EntryStamp::writePresent(char* out) {
    lastEntryMoment = {EntryMoment::Kind::instant, std::time(nullptr)};
    BrevanTime::generateCurrentTimestamp(out);
}

} // namespace zrm
