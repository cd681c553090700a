#ifndef ZRM_FOLLOWED_ENTRY_H
#define ZRM_FOLLOWED_ENTRY_H

#include "base/EntryFields.h"
#include "framework/LogEntry.h"
#include "logs/FollowSettings.h"
#include "monitor/FileFollower.h"
#include "monitor/LogFile.h"

namespace zrm {

/// The entry that a followed log's thread judges. Asks the follower for its text and the log for
/// its fields when they are wanted. Log's thread only.
class FollowedEntry final : public LogEntry {
public:
    /// Log and follower outlive the object. `hasText`: entries are lines.
    FollowedEntry(const LogFile& log, const FileFollower& follower, bool hasText)
        : m_log(log), m_follower(follower), m_hasText(hasText) {}

    /// The follower has given the next entry.
    void begin() noexcept { m_hasFields = false; }

    std::string_view text() const override {
        return m_hasText ? m_follower.text() : std::string_view();
    }
    bool isCut() const override { return m_follower.isTextCut(); }
    const EntryFields& fields() override {
        if (!m_hasFields) {
            m_fields.clear();
            m_log.readFields(m_follower.text(), m_fields);
            m_hasFields = true;
        }
        return m_fields;
    }
    const EntryKeep& keep() const override { return m_log.followSettings()->keep; }

private:
    const LogFile& m_log;
    const FileFollower& m_follower;
    const bool m_hasText; ///< false: a record
    EntryFields m_fields;
    bool m_hasFields = false;
};

} // namespace zrm

#endif
