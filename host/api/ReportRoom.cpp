#include "host/api/ReportRoom.h"

#include "host/http/RequestRefused.h"

#include <semaphore>

namespace zrm::host {

namespace {

std::counting_semaphore<ReportRoom::mostReports> room{ReportRoom::mostReports};

} // namespace

ReportRoom::ReportRoom() {
    if (!room.try_acquire()) {
        throw RequestRefused(503, "four reports are already running: try again", "");
    }
}

ReportRoom::~ReportRoom() {
    room.release();
}

} // namespace zrm::host
