#ifndef ZRM_HOST_EVENT_JSON_H
#define ZRM_HOST_EVENT_JSON_H

#include "host/events/Event.h"
#include "host/framework/RowLayout.h"

#include <string>

namespace zrm::host {

/// Writes events as JSON objects: {"id", "situation", "severity", "raised", "row"}. Immutable, so
/// any thread.
class EventJson {
public:
    explicit EventJson(RowLayout layout);

    /// Appends one event's object, without a newline.
    void append(std::string& text, const Event& event) const;

    /// Appends the whole path of the event's log: the directory and the name, as UTF-8; the
    /// columns that keep their own code page serve where the UTF-8 ones are empty.
    void appendLog(std::string& text, const Event& event) const;

private:
    RowLayout m_layout;
};

} // namespace zrm::host

#endif
