#ifndef ZRM_TESTS_REPORT_FIXTURE_H
#define ZRM_TESTS_REPORT_FIXTURE_H

#include "tables/zrm_rmlogent_manager.h"

#include "base/ProcessValues.h"

#include "TestLogs.h"
#include "TestRequest.h"
#include "support/RecordingTrace.h"

#include <gtest/gtest.h>

#include <cstddef>
#include <cstring>
#include <memory>
#include <numeric>
#include <string>
#include <vector>

using namespace zrm;
using namespace zrm::host;

inline constexpr int equal = 1;
inline constexpr int greaterOrEqual = 3;
inline constexpr int lessOrEqual = 4;
inline const std::string startStamp = "1261120070000000";
inline const std::string endStamp = "1261120080000000";
inline const std::string noName = "A valid file name was not found.  Request terminating.";
inline const std::string noWindow = "Report start and/or end time missing. Terminating request.";

/// One report on Log Entries, and the log that it reads.
class Report : public testing::Test {
protected:
    Report() { gMaxRows = 1000; }
    ~Report() override { gMaxRows = 1000; }

    void name(const std::string& path, const std::string& file) {
        m_test.text("LOGPATH", equal, path).text("LOGNAME", equal, file);
    }
    void window() {
        m_test.text("ENTRYTIME", greaterOrEqual, startStamp)
            .text("ENTRYTIME", lessOrEqual, endStamp);
    }
    /// A report on the whole log.
    void nameAndWindow() {
        name("/var/adm/", "messages");
        window();
    }
    /// Takes one sample and returns its messages.
    std::vector<std::string> sample(unsigned traceClass) {
        if (!m_request) {
            m_request.reset(m_manager.CreateCtreq(&m_test, nullptr));
        }
        RecordingTrace trace(traceClass);
        m_request->TakeSample();
        return trace.messages();
    }
    /// The numbers of the rows that the sample collected.
    std::vector<int> rows() const {
        std::vector<int> numbers;
        for (unsigned i = 0; i < m_request->count; ++i) {
            zrm_rmlogent_data_t row;
            std::memcpy(&row, m_request->rows() + std::size_t{i} * sizeof row, sizeof row);
            numbers.push_back(row.rowno);
        }
        return numbers;
    }
    static std::vector<int> upTo(int count) {
        std::vector<int> numbers(static_cast<std::size_t>(count));
        std::iota(numbers.begin(), numbers.end(), 0);
        return numbers;
    }

    TestLogs m_logs;
    TestLog& m_log = m_logs.add("/var/adm/messages");
    zrm_rmlogent_manager m_manager{"ZRM", "RMLOGENT"};
    TestRequest m_test{SAMPLE_REPORT, "report"};
    std::unique_ptr<ctreq> m_request;
};

#endif
