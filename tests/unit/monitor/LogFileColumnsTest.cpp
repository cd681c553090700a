#include "TestLog.h"

#include "base/ProcessValues.h"
#include "support/TimeZone.h"

#include <gtest/gtest.h>

#include <cstring>
#include <filesystem>
#include <string>

using namespace zrm;

namespace {

class CommonColumns : public MonitoredFile {
protected:
    zrm_rmlogent_data_t filled(const std::string& name) {
        std::filesystem::create_directories(
            std::filesystem::path(m_directory.file(name)).parent_path());
        m_directory.write(name, "");
        const TestLog log(*validLog(m_directory.file(name)));
        zrm_rmlogent_data_t row;
        std::memset(&row, ' ', sizeof row);
        log.fillCommonColumns(&row);
        return row;
    }
};

TEST_F(CommonColumns, TakeTheNameInUTF8InBothForms) {
    const TimeZone zone("UTC0");
    const FakeClock clock(1160031789);
    const auto row = filled("gr\xC3\xBC\xC3\x9F");
    EXPECT_EQ(columnText(row.originnode), "web1:ZRM");
    EXPECT_EQ(columnText(row.ulogpath), m_directory.path().string() + "/");
    EXPECT_EQ(columnText(row.logpath), m_directory.path().string() + "/");
    EXPECT_EQ(columnText(row.logname), "gr\xC3\xBC\xC3\x9F");
    EXPECT_EQ(columnText(row.ulogname), "gr\xC3\xBC\xC3\x9F");
    EXPECT_EQ(columnText(row.timestamp), "1061005070309000");
    EXPECT_EQ(row.freqthresh, 0);
    EXPECT_EQ(row.periodthrs, 0);
    EXPECT_EQ(row.sampleno, 0);
    EXPECT_EQ(row.rowno, 0);
    EXPECT_EQ(columnText(row.entrytime), "");
    EXPECT_EQ(columnText(row.uentrydesc), "");
}

TEST_F(CommonColumns, AreCutAtTheirWidths) {
    const std::string deep(200, 'd');
    const std::string name(200, 'n');
    const auto row = filled(deep + "/" + deep + "/" + deep + "/" + deep + "/" + name);
    const std::string path =
        m_directory.path().string() + "/" + deep + "/" + deep + "/" + deep + "/" + deep + "/";
    EXPECT_EQ(columnText(row.logpath), path.substr(0, 256));
    EXPECT_EQ(columnText(row.ulogpath), path.substr(0, 768));
    EXPECT_EQ(columnText(row.logname), name.substr(0, 128));
    EXPECT_EQ(columnText(row.ulogname), name);
    EXPECT_EQ(columnText(row.entrytime), ""); // after LOGNAME
    EXPECT_EQ(columnText(row.uentrysrc), ""); // after ULOGNAME
}

TEST_F(CommonColumns, HoldAFullSystemNameOrNone) {
    char full[65];
    std::memset(full, 'x', 64);
    full[64] = '\0';
    gSystemName = full;
    EXPECT_EQ(columnText(filled("a").originnode), std::string(64, 'x'));
    EXPECT_EQ(columnText(filled("a").logpath).front(), '/');
    gSystemName = nullptr;
    EXPECT_EQ(columnText(filled("a").originnode), "");
}

} // namespace
