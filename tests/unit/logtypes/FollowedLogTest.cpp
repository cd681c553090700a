// A log of a [[log]] table with its thread: what two monitors, one after the other, make of it.

#include "LogTypeTest.h"
#include "host/events/PositionBook.h"
#include "host/framework/EventRoomControl.h"
#include "logs/FollowSettings.h"
#include "logs/FurtherLogs.h"
#include "logs/ValidLog.h"
#include "logtypes/SysLogFile.h"

#include <gmock/gmock.h>

#include <cerrno>
#include <memory>
#include <string>
#include <vector>

using namespace zrm::host;

namespace {

using testing::ContainsRegex;
using testing::ElementsAre;

class FollowedLogTest : public LogTypeTest {
protected:
    FollowedLogTest() {
        PositionBook::makeCurrent(PositionBook::unkept());
        m_settings.start = FollowSettings::Start::beginning;
    }
    ~FollowedLogTest() override { EventRoomControl::setFull(false); }

    std::unique_ptr<SysLogFile> start() {
        const ValidLog log(
            FurtherLog{m_path, 'S', 'N', "", std::make_shared<const FollowSettings>(m_settings)});
        return std::make_unique<SysLogFile>(log, nullptr);
    }
    static std::vector<std::string> descriptions() {
        std::vector<std::string> texts;
        for (const zrm_rmlogent_data_t& row : EventRecorder::rows()) {
            texts.push_back(columnText(row.entrydesc));
        }
        return texts;
    }

    const std::string m_path = directory.write("app.log", "");
    FollowSettings m_settings;
};

TEST_F(FollowedLogTest, WhatWasJudgedBeforeAWaitForRoomIsNotJudgedAgainAfterARefresh) {
    directory.append("app.log", "one\ntwo\nthree\n");
    EventRecorder::onRow([](std::size_t rows) { EventRoomControl::setFull(rows == 2); });
    const std::uint64_t waits = EventRoomControl::waits().count;
    auto log = start();
    ASSERT_TRUE(waitUntil([&] { return EventRoomControl::waits().count > waits; }));
    log.reset();
    EventRecorder::onRow(nullptr);
    EventRoomControl::setFull(false);
    log = start();
    ASSERT_TRUE(waitUntil([] { return descriptions().back() == "three"; }));
    EXPECT_THAT(descriptions(), ElementsAre("one", "two", "three"));
}

TEST_F(FollowedLogTest, AFailureIsTracedOnceAndSoIsItsEnd) {
    const ShortSelect shortSelect;
    const Fault fault("open", EACCES);
    const auto log = start();
    EXPECT_TRUE(waitUntil([&] { return trace.messages().size() >= 2; }));
    directory.append("app.log", "2006-10-05T12:00:00 web1 app: one\n");
    EXPECT_EQ(EventRecorder::waitForRows(1).size(), 1U);
    EXPECT_THAT(
        trace.messages(),
        ElementsAre(ContainsRegex("Error while following file .*: open failed and is tried"),
                    ContainsRegex("File .* is read again.")));
}

} // namespace
