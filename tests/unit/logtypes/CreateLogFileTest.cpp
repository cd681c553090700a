#include "logtypes/createLogFile.h"

#include "SyslogTest.h"
#include "logtypes/AdminLogFile.h"
#include "logtypes/ErrLogFile.h"
#include "logtypes/UserLogFile.h"

#include <gmock/gmock.h>

#include <chrono>
#include <thread>

using namespace zrm;

namespace {

class CreateLogFile : public SyslogTest {
protected:
    /// Creates the object of a line with these fields, whose monitor ends immediately. Returns
    /// true if it has the type.
    template <typename Kind> bool makes(const std::string& fields) {
        const FakeUname aix("AIX");
        const auto line = validLog(m_path, fields);
        const Fault noFile("open", EACCES);
        const Fault noDescriptor("open", EACCES);
        const Fault noPipe("pipe", EMFILE);
        const std::unique_ptr<LogFile> log(createLogFile(*line, nullptr));
        return dynamic_cast<Kind*>(log.get()) != nullptr && log->type() == line->type();
    }
};

TEST_F(CreateLogFile, KnowsTheTypesOfLogs) {
    for (int letter = 1; letter < 128; ++letter) {
        const char type = static_cast<char>(letter);
        const bool isKind = std::string_view("USAEFJC").find(type) != std::string_view::npos;
        EXPECT_EQ(isKnownLogType(type), isKind) << type;
    }
}

TEST_F(CreateLogFile, CreatesARunningObjectOfTheLinesTypeOnTheChain) {
    const Fault fault("open", EACCES); // its monitor ends immediately
    const std::unique_ptr<LogFile> log(createLogFile(*m_line, m_log.get()));
    EXPECT_NE(dynamic_cast<SysLogFile*>(log.get()), nullptr);
    EXPECT_EQ(m_log->next(), log.get());
    EXPECT_NE(log->monitorStatus(), MONITOR_NOT_STARTED);
}

TEST_F(CreateLogFile, CreatesEachTypeByItsLetter) {
    EXPECT_TRUE(makes<SysLogFile>(" ;N ;S"));
    EXPECT_TRUE(makes<UserLogFile>(" ;N ;U ;%s DESCRIPTION"));
    EXPECT_TRUE(makes<AdminLogFile>(" ;N ;A"));
    EXPECT_TRUE(makes<ErrLogFile>(" ;N ;E ;errpt -c"));
}

TEST_F(CreateLogFile, EachTypeThatTailsAFileWaitsASecondBetweenChecks) {
    for (const char* fields : {" ;N ;S", " ;N ;U ;A , \"%s\" , description", " ;N ;A"}) {
        const ShortSelect select;
        const auto line = validLog(m_path, fields);
        const std::unique_ptr<LogFile> log(createLogFile(*line, nullptr));
        // More than one, because the call may change its argument.
        const Fault looks("select", 0, {.times = 0});
        for (int tries = 0; tries < 5000 && looks.calls() < 4; ++tries) {
            std::this_thread::sleep_for(std::chrono::milliseconds(2));
        }
        EXPECT_GE(looks.calls(), 4) << fields;
        EXPECT_EQ(select.requested(), 1'000'000) << fields;
    }
}

TEST_F(CreateLogFile, ReturnsNullWhenMemoryRunsOut) {
    const Fault fault("new", ENOMEM);
    EXPECT_EQ(createLogFile(*m_line, m_log.get()), nullptr);
    EXPECT_EQ(m_log->next(), m_log.get());
}

} // namespace
