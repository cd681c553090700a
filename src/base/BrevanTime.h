#ifndef ZRM_BREVAN_TIME_H
#define ZRM_BREVAN_TIME_H

namespace zrm {

/// The 16-character time stamp CYYMMDDhhmmss000 in local time. The first three characters are the
/// years since 1900.
class BrevanTime {
public:
    /// Writes the 16 characters for `time` (seconds since the epoch) without a terminator. Safe on
    /// any thread.
    static void generateTimestamp(long time, char* out);
    /// Does the same for the current time. Looks up the time zone once per second and thread.
    static void generateCurrentTimestamp(char* out);
    /// Whether every time stamp is to be made by generateTimestamp, since the flow of operations is
    /// traced; otherwise callers may keep the parts that repeat. Any thread.
    static bool isFlowTraced() noexcept;
};

} // namespace zrm

#endif
