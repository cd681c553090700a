#ifndef ZRM_HOST_EVENT_QUERY_H
#define ZRM_HOST_EVENT_QUERY_H

#include "host/history/HistoryReader.h"
#include "host/http/QueryFields.h"
#include "host/http/RequestRefused.h"

#include <string>

namespace zrm::host {

/// What the routes of the history have in common. Stateless.
class EventQuery {
public:
    /// The history, which must be on. Throws RequestRefused.
    static HistoryReader& history(HistoryReader* reader);

    /// Does what reads the history. What this says when it cannot be read is thrown as
    /// RequestRefused.
    template <typename Read> static auto reading(const Read& read) {
        try {
            return read();
        } catch (const HistoryError& error) {
            throw RequestRefused(503, std::string("the history cannot be read: ") + error.what(),
                                 "");
        }
    }

    /// Reads which events are wanted: situation, log and severity, each any number of times, of
    /// which one must hold, and the text that they must have.
    static void readKinds(QueryFields& query, EventFilter& filter);
};

} // namespace zrm::host

#endif
