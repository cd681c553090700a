#ifndef ZRM_HOST_EVENT_QUERY_H
#define ZRM_HOST_EVENT_QUERY_H

#include "host/history/EventFilter.h"
#include "host/http/QueryFields.h"

class HistoryReader;

/// What the routes of the history have in common. Stateless.
class EventQuery {
public:
    /// The history, which must be on. Throws RequestRefused.
    static HistoryReader& history(HistoryReader* reader);

    /// Reads which events are wanted: situation, log and severity, each any number of times, of
    /// which one must hold.
    static void readKinds(QueryFields& query, EventFilter& filter);
};

#endif
