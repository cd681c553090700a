// Logs that the framework configures besides the log configuration.

#include "LogManagerFixture.h"

#include "AgentDoubles.h"
#include "logs/FollowSettings.h"
#include "logs/FurtherLogs.h"

#include <gmock/gmock.h>

#include <cstdlib>
#include <utility>

#include <unistd.h>

using namespace zrm;

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;

class LogManagerFurtherTest : public LogManagerFixture {
protected:
    ~LogManagerFurtherTest() override {
        manager.reset();
        FurtherLogs::publish(nullptr);
    }

    static FurtherLog followed(const std::string& name, const FollowSettings& settings = {}) {
        return {name, 'S', 'N', "", std::make_shared<const FollowSettings>(settings)};
    }
    static void publish(FurtherLogs::List logs) {
        FurtherLogs::publish(std::make_shared<const FurtherLogs::List>(std::move(logs)));
    }
    LogFile* object(const std::string& name) { return manager->findLogObject(name.c_str()); }
};

TEST_F(LogManagerFurtherTest, FollowsThemAfterTheLogsOfTheConfiguration) {
    configure(a + "\n");
    FurtherLog text = followed(c);
    text.type = 'U';
    text.debugMode = 'Y';
    text.procedure = "%s";
    publish({followed(b), text});
    start();
    EXPECT_THAT(logs(), ElementsAre(a, b, c));
    EXPECT_THAT(AgentDoubles::created(),
                ElementsAre("S " + a + " ", "S " + b + " ", "U " + c + " %s"));
    EXPECT_EQ(object(a)->followSettings(), nullptr);
    ASSERT_NE(object(b)->followSettings(), nullptr);
    EXPECT_EQ(object(c)->debugMode(), 'Y');
}

TEST_F(LogManagerFurtherTest, AFileNeedNotExistYet) {
    const std::string later = directory.file("later.log");
    publish({followed(later)});
    start();
    EXPECT_THAT(logs(), ElementsAre(later));
}

TEST_F(LogManagerFurtherTest, RunsOnThemAloneWithoutALogConfiguration) {
    configureSyslog("*.info " + c + "\n");
    setenv("ZRM_CONFIG_FILE", directory.file("absent.conf").c_str(), 1);
    publish({followed(b)});
    start();
    EXPECT_THAT(logs(), ElementsAre(b));
}

TEST_F(LogManagerFurtherTest, WaitsForLogsWhereThereAreNoneYet) {
    configureSyslog("*.info " + c + "\n");
    configure("# no log\n");
    publish({});
    start();
    EXPECT_THAT(logs(), IsEmpty());
    EXPECT_THAT(messages(), Contains("Waiting for logs to appear."));
    EXPECT_THAT(messages(), Not(Contains("Agent has no work to do.  Exiting...")));
    publish({followed(b)});
    refresh();
    EXPECT_THAT(logs(), ElementsAre(b));
    publish({});
    refresh();
    EXPECT_THAT(logs(), IsEmpty());
}

TEST_F(LogManagerFurtherTest, ARefreshKeepsWhatIsConfiguredAsBefore) {
    publish({followed(a), followed(b)});
    start();
    LogFile* const first = object(a);
    FollowSettings settings;
    settings.start = FollowSettings::Start::beginning;
    FurtherLog debugged = followed(a);
    debugged.debugMode = 'Y';
    publish({debugged, followed(b, settings)});
    refresh();
    EXPECT_EQ(object(a), first);
    EXPECT_EQ(first->debugMode(), 'Y');
    EXPECT_EQ(AgentDoubles::created().size(), 3U);
    EXPECT_EQ(AgentDoubles::living(), 2);
    EXPECT_EQ(*object(b)->followSettings(), settings);
}

TEST_F(LogManagerFurtherTest, ARefreshWithoutANewListChangesNothing) {
    publish({followed(a)});
    start();
    refresh();
    EXPECT_THAT(messages(), Contains("Continuing to monitor existing log files."));
    EXPECT_EQ(AgentDoubles::created().size(), 1U);
}

TEST_F(LogManagerFurtherTest, AChangedListLeavesTheLogsOfTheConfigurationAlone) {
    configure(a + "\n" + b + "\n");
    start();
    LogFile* const first = object(a);
    LogFile* const second = object(b);
    second->askToStop(); // as if it had failed: only a changed configuration restarts it
    ASSERT_EQ(unlink(a.c_str()), 0);
    publish({followed(c)});
    refresh();
    EXPECT_THAT(logs(), ElementsAre(a, b, c));
    EXPECT_EQ(object(a), first);
    EXPECT_EQ(object(b), second);
    EXPECT_EQ(second->monitorStatus(), MONITOR_STOPPED);
}

TEST_F(LogManagerFurtherTest, AChangedConfigurationLeavesThemAlone) {
    configure(a + "\n");
    publish({followed(c)});
    start();
    LogFile* const kept = object(c);
    configure(b + "\n");
    refresh();
    EXPECT_EQ(object(c), kept);
    EXPECT_EQ(object(a), nullptr);
    EXPECT_NE(object(b), nullptr);
    EXPECT_EQ(AgentDoubles::living(), 2);
}

TEST_F(LogManagerFurtherTest, AFileInBothListsBelongsToTheConfiguration) {
    configure(a + "\n");
    publish({followed(a), followed(b)});
    start();
    EXPECT_THAT(logs(), ElementsAre(a, b));
    EXPECT_EQ(object(a)->followSettings(), nullptr);
    EXPECT_TRUE(FurtherLogs::isLeftOut(a));
    EXPECT_FALSE(FurtherLogs::isLeftOut(b));
    // It changes hands both ways.
    configure(b + "\n");
    refresh();
    EXPECT_EQ(AgentDoubles::living(), 2);
    ASSERT_NE(object(a), nullptr);
    EXPECT_NE(object(a)->followSettings(), nullptr);
    EXPECT_EQ(object(b)->followSettings(), nullptr);
    EXPECT_FALSE(FurtherLogs::isLeftOut(a));
    EXPECT_TRUE(FurtherLogs::isLeftOut(b));
}

TEST_F(LogManagerFurtherTest, AnEmptiedConfigurationGivesItsLogsUp) {
    configure(a + "\n" + b + "\n");
    publish({followed(a)});
    start();
    configure("# moved\n");
    refresh();
    EXPECT_THAT(logs(), ElementsAre(a));
    EXPECT_NE(object(a)->followSettings(), nullptr);
    EXPECT_EQ(AgentDoubles::living(), 1);
}

TEST_F(LogManagerFurtherTest, AChangedLogEndsBeforeItsSuccessorBegins) {
    trace.setLevel(TRC1_DETAIL | TRC1_ERROR);
    publish({followed(a)});
    start();
    FollowSettings settings;
    settings.resume = false;
    publish({followed(a, settings)});
    refresh();
    const std::vector<std::string> order =
        messagesThatBegin({"Thread for log file", "Thread successfully started"});
    EXPECT_THAT(order, ElementsAre("Thread for log file " + a + " terminating.",
                                   "Thread successfully started for log file " + a + "."));
}

TEST_F(LogManagerFurtherTest, PassesOverANameThatIsNoPath) {
    publish({followed("relative.log"), followed(a)});
    start();
    EXPECT_THAT(logs(), ElementsAre(a));
}

} // namespace
