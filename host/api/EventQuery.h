#ifndef ZRM_HOST_EVENT_QUERY_H
#define ZRM_HOST_EVENT_QUERY_H

#include "host/base/Result.h"
#include "host/history/HistoryReader.h"
#include "host/http/QueryFields.h"
#include "host/http/RequestRefused.h"

#include <utility>

namespace zrm::host {

/// What the routes of the history have in common. Stateless.
class EventQuery {
public:
    /// The history, which must be on. Throws RequestRefused.
    static HistoryReader& history(HistoryReader* reader);

    /// What was read of the history. Throws RequestRefused where it could not be read.
    template <class T> static T valueOf(Result<T> read) {
        if (!read) {
            throw RequestRefused(503, "the history cannot be read: " + read.error().text(), "");
        }
        return std::move(*read);
    }

    /// Reads which events are wanted: situation, log and severity, each any number of times, of
    /// which one must hold, whether they are silenced, and the text that they must have.
    static void readKinds(QueryFields& query, EventFilter& filter);
};

} // namespace zrm::host

#endif
