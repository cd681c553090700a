#ifndef ZRM_HOST_REPORT_ROOM_H
#define ZRM_HOST_REPORT_ROOM_H

namespace zrm::host {

/// The place of one running report while it exists: each may keep a disk and a processor busy. Any
/// thread.
class ReportRoom {
public:
    static constexpr int mostReports = 4;

    /// Throws RequestRefused with status 503 when every place is taken.
    ReportRoom();
    ~ReportRoom();
    ReportRoom(const ReportRoom&) = delete;
    ReportRoom& operator=(const ReportRoom&) = delete;
};

} // namespace zrm::host

#endif
