#ifndef ZRM_FRAMEWORK_TRACE_SILENCE_H
#define ZRM_FRAMEWORK_TRACE_SILENCE_H

/// While it exists, nothing that the constructing thread traces is written; other threads trace as
/// usual and at the same cost. Used when entries are judged again, which does not belong in the
/// trace of monitoring.
class TRC1_Silence {
public:
    TRC1_Silence() noexcept;
    ~TRC1_Silence();
    TRC1_Silence(const TRC1_Silence&) = delete;
    TRC1_Silence& operator=(const TRC1_Silence&) = delete;

    /// Whether the calling thread has one. For the trace facility.
    static bool isOn() noexcept;
};

#endif
