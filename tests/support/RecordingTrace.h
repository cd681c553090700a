#ifndef ZRM_TESTS_RECORDING_TRACE_H
#define ZRM_TESTS_RECORDING_TRACE_H

#include "framework/trace.h"

#include <string>
#include <vector>

/// Stands in for the host's trace facility and keeps every record. While an object lives, the
/// trace level of every unit is the one given, so that a test which turns a single class on sees
/// exactly the messages of that class (and those written whatever the level): this is how the
/// tests compare a message's class. In a death test's child every record also goes to standard
/// error, where EXPECT_EXIT can match it.
class RecordingTrace {
public:
    explicit RecordingTrace(unsigned level);
    ~RecordingTrace();
    RecordingTrace(const RecordingTrace&) = delete;
    RecordingTrace& operator=(const RecordingTrace&) = delete;

    void setLevel(unsigned level);
    /// The texts recorded so far, in order.
    std::vector<std::string> messages() const;
    /// The texts that forked children of this process recorded before their exec, in order. Wait
    /// for a child's end, or for what its command does, before asking.
    std::vector<std::string> childMessages() const;
    /// The entry and exit events, as "unit entry", "unit exit" or "unit exit VALUE".
    std::vector<std::string> events() const;
    /// Number of records with exactly this text.
    int count(const std::string& text) const;
    bool contains(const std::string& text) const { return count(text) > 0; }
    /// Waits until a record has exactly this text; false after the time limit.
    bool waitFor(const std::string& text, int seconds = 10) const;
    /// Forgets what was recorded.
    void clear();
};

#endif
