#include "logtypes/createLogFile.h"

#include "SyslogTest.h"

namespace {

class CreateLogFile : public SyslogTest {};

TEST_F(CreateLogFile, KnowsTheKindsOfLogs) {
    for (int letter = 1; letter < 128; ++letter) {
        const char type = static_cast<char>(letter);
        const bool isKind = std::string_view("USAE").find(type) != std::string_view::npos;
        EXPECT_EQ(isKnownLogType(type), isKind) << type;
    }
}

TEST_F(CreateLogFile, MakesARunningObjectOfTheLinesKindOnTheChain) {
    const Fault fault("fopen", EACCES); // its monitor ends at once
    const std::unique_ptr<LogFile> log(createLogFile(*m_line, m_log.get()));
    EXPECT_NE(dynamic_cast<SysLogFile*>(log.get()), nullptr);
    EXPECT_EQ(m_log->next(), log.get());
    EXPECT_NE(log->monitorStatus(), MONITOR_NOT_STARTED);
}

TEST_F(CreateLogFile, GivesNothingWhenMemoryRunsOut) {
    const Fault fault("new", ENOMEM);
    EXPECT_EQ(createLogFile(*m_line, m_log.get()), nullptr);
    EXPECT_EQ(m_log->next(), m_log.get());
}

} // namespace
