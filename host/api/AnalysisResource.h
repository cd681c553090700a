#ifndef ZRM_HOST_ANALYSIS_RESOURCE_H
#define ZRM_HOST_ANALYSIS_RESOURCE_H

#include "host/analysis/Explanation.h"
#include "host/analysis/LogTail.h"
#include "host/config/HostConfig.h"
#include "host/http/Message.h"
#include "host/http/Router.h"
#include "host/situations/SituationSet.h"

#include <atomic>
#include <semaphore>
#include <string>
#include <vector>

class TableManager;

namespace zrm::host {

class HistoryReader;
class JsonFields;
class LogWatch;

/// `POST /api/v1/explain` and `POST /api/v1/backtest`.
class AnalysisResource : public Resource {
public:
    /// All must outlive the object. The history is null when it is off.
    AnalysisResource(SituationSet& situations, TableManager& entries, const LogWatch& watch,
                     HistoryReader* history)
        : m_situations(situations), m_entries(entries), m_watch(watch), m_history(history) {}

    void addRoutes(Router& router) override;

    /// Makes running requests end soon. Any thread.
    void cancel() noexcept { m_isCancelled = true; }

private:
    struct Subject {
        SituationConfig situation;
        bool isStopped = false;
    };

    struct Explained {
        std::vector<Explanation> explanations;
        Reach reach;     ///< of the log they are about
        std::string log; ///< its path
    };

    HttpAnswer explain(const HttpRequest& request);
    HttpAnswer backtest(const HttpRequest& request);
    static HttpAnswer fields(const HttpRequest& request);
    Subject subject(JsonFields& fields, const std::string& otherwise = "");
    Explained explainLine(JsonFields& fields);
    Explained explainLast(JsonFields& fields);
    Explained explainEvent(JsonFields& fields);

    SituationSet& m_situations;
    TableManager& m_entries;
    const LogWatch& m_watch;
    HistoryReader* const m_history;
    std::counting_semaphore<2> m_room{2}; ///< for concurrent backtests
    std::atomic<bool> m_isCancelled{false};
};

} // namespace zrm::host

#endif
