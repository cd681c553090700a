#ifndef ZRM_TESTS_TEST_REQUEST_H
#define ZRM_TESTS_TEST_REQUEST_H

#include "framework/ctreq.h"
#include "host/framework/Request.h"

#include <cstdint>
#include <deque>
#include <functional>
#include <string>
#include <vector>

using namespace zrm::host;

// A double of the framework's request class. It honours the contract, lets a test set every
// condition byte by byte and every status, and records the agent's calls. It replaces the host's
// requests at link time.

/// What a test sets for one request, and what is recorded about it. Outlives the request.
class TestRequest : public RequestDetail {
public:
    explicit TestRequest(SampleType type, std::string requestName = "alpha");

    /// A condition with these bytes as its value; `length` defaults to their number.
    TestRequest& raw(const std::string& column, int op, int dataType, const std::string& bytes,
                     int length = -32768);
    /// A condition on an integer column, with a value of eight bytes.
    TestRequest& number(const std::string& column, int op, std::int64_t value);
    /// A condition on a character column.
    TestRequest& text(const std::string& column, int op, const std::string& value);

    struct Filter {
        std::string column;
        std::string bytes;
        SEL1_FILTERINFO info;
    };
    std::deque<Filter> filters; ///< published one at a time, in this order

    // Results of the framework's operations.
    std::function<bool(const char* row)> accepts; ///< conditions; without it every row passes
    std::deque<unsigned> insertStatus;            ///< of the next insertions; then 0
    unsigned dispatchStatus = 0;
    std::int64_t earlierPeriod = 0; ///< for which the opener counts entries itself
    int comparison = 0;             ///< result of both IsException operations

    // What was recorded.
    std::vector<std::string> calls;      ///< in order; TestCalls holds those of all requests
    std::vector<std::string> dispatched; ///< the rows of all dispatches
    std::vector<std::string> earlier;    ///< rows that the opener was given to count
    std::vector<unsigned> stopped;       ///< reasons
    int stops = 0;
    int fetched = 0; ///< conditions that were fetched
};

/// What is common to all requests.
class TestCalls {
public:
    /// The calls to all requests, in order, as "NAME CALL".
    static std::vector<std::string>& all();
    /// The status with which the framework refuses to register a table; 0: it does not.
    static unsigned& registrationStatus();
};

#endif
