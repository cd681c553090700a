#include "host/framework/TraceLevels.h"

#include <gtest/gtest.h>

#include "support/ReasonOf.h"

using namespace zrm::host;

namespace {

/// The level of one unit after parsing a valid text.
unsigned level(std::string_view text, std::string_view unit = "ValidLog.cpp") {
    TraceLevels levels;
    EXPECT_EQ(reasonOf(levels.parse(text)), "") << text;
    return levels.levelOf(unit);
}

std::string wrong(std::string_view text) {
    TraceLevels levels;
    std::string error = reasonOf(levels.parse(text));
    EXPECT_EQ(levels.levelOf("ValidLog.cpp"), 0x80u) << "the level is as before: " << text;
    return error;
}

TEST(TraceLevels, DefaultsToErrors) {
    EXPECT_EQ(TraceLevels().levelOf("ValidLog.cpp"), 0x80u);
    EXPECT_EQ(level(""), 0x80u);
    EXPECT_EQ(level(" , ,"), 0x80u);
}

TEST(TraceLevels, KnowsTheClasses) {
    EXPECT_EQ(level("error"), 0x80u);
    EXPECT_EQ(level("flow"), 0x40u);
    EXPECT_EQ(level("detail"), 0x10u);
    EXPECT_EQ(level("fine"), 0x01u);
    EXPECT_EQ(level("all"), 0xD1u);
    EXPECT_EQ(level("none"), 0u);
    EXPECT_EQ(level("145"), 0x91u);
    EXPECT_EQ(level("0x91"), 0x91u);
    EXPECT_EQ(level("0XfF"), 0xFFu);
    EXPECT_EQ(level("0"), 0u);
}

TEST(TraceLevels, AddsUpClasses) {
    EXPECT_EQ(level("error,flow"), 0xC0u);
    EXPECT_EQ(level(" error , fine "), 0x81u);
    EXPECT_EQ(level("error+detail,0x01"), 0x91u);
    EXPECT_EQ(level("none,detail"), 0x10u);
}

TEST(TraceLevels, AUnitMayHaveItsOwnLevel) {
    EXPECT_EQ(level("ValidLog=fine"), 0x01u);
    EXPECT_EQ(level("ValidLog.cpp=fine+flow"), 0x41u);
    EXPECT_EQ(level("error,ValidLog=none"), 0u);
    EXPECT_EQ(level("flow,LogBase=fine"), 0x40u);
    EXPECT_EQ(level("LogBase=fine"), 0x80u) << "the others keep the errors";
    EXPECT_EQ(level("ValidLog=fine,ValidLog=detail"), 0x10u) << "the last word applies";
    EXPECT_EQ(level("ValidLog=fine,ValidLog.cpp=detail"), 0x10u);
    EXPECT_EQ(level("ValidLog.cpp=fine,ValidLog=detail"), 0x10u);
    EXPECT_EQ(level(" ValidLog = fine + 0x80 "), 0x81u);
    EXPECT_EQ(level("validlog=fine"), 0x80u) << "names are exact";
    EXPECT_EQ(level("ValidLog.h=fine"), 0x80u);
    EXPECT_EQ(level("zrm.main=fine", "zrm.main.cpp"), 0x01u);
    EXPECT_EQ(level("plain=fine", "plain"), 0x01u) << "a unit without an ending";
}

TEST(TraceLevels, AClassCoversAllItsSourceFiles) {
    EXPECT_EQ(level("UserLogFile=detail", "UserLogFile.cpp"), 0x10u);
    EXPECT_EQ(level("UserLogFile=detail", "UserLogFileReport.cpp"), 0x10u);
    EXPECT_EQ(level("UserLogFile=detail", "UserLogFileTime.cpp"), 0x10u);
    EXPECT_EQ(level("zrm_rmlogent=detail", "zrm_rmlogent_report.cpp"), 0x10u);
    EXPECT_EQ(level("UserLogFile.cpp=detail", "UserLogFileReport.cpp"), 0x80u) << "a file alone";
    EXPECT_EQ(level("LogFile=detail", "UserLogFile.cpp"), 0x80u);
    EXPECT_EQ(level("StringParse=detail", "StringParser.cpp"), 0x80u) << "not a class";
    EXPECT_EQ(level("UTF=detail", "UTF8Conv.cpp"), 0x80u);
    // The longer name is more specific, wherever it is.
    for (const char* text :
         {"UserLogFile=detail,UserLogFileReport=fine", "UserLogFileReport=fine,UserLogFile=detail",
          "UserLogFileReport.cpp=fine,UserLogFile=detail"}) {
        EXPECT_EQ(level(text, "UserLogFileReport.cpp"), 0x01u) << text;
        EXPECT_EQ(level(text, "UserLogFileTime.cpp"), 0x10u) << text;
    }
}

TEST(TraceLevels, NamesTheWrongWord) {
    const std::string classes = " is not a trace class; the classes are error, flow, detail, fine, "
                                "all, none, or a number from 0 to 255";
    EXPECT_EQ(wrong("detial"), "\"detial\" in \"detial\"" + classes);
    EXPECT_EQ(wrong("fine,ValidLog=error+Fine"), "\"Fine\" in \"ValidLog=error+Fine\"" + classes);
    EXPECT_EQ(wrong("ValidLog="), "\"\" in \"ValidLog=\"" + classes);
    EXPECT_EQ(wrong("error+"), "\"\" in \"error+\"" + classes);
    EXPECT_EQ(wrong("+error"), "\"\" in \"+error\"" + classes);
    EXPECT_EQ(wrong("ValidLog=fine++flow"), "\"\" in \"ValidLog=fine++flow\"" + classes);
    EXPECT_EQ(wrong("256"), "\"256\" in \"256\"" + classes);
    EXPECT_EQ(wrong("-1"), "\"-1\" in \"-1\"" + classes);
    EXPECT_EQ(wrong("0x"), "\"0x\" in \"0x\"" + classes);
    EXPECT_EQ(wrong("0x1g"), "\"0x1g\" in \"0x1g\"" + classes);
    EXPECT_EQ(wrong("a=b=fine"), "\"b=fine\" in \"a=b=fine\"" + classes);
    EXPECT_EQ(wrong("a b=fine"), "\"a b\" is not the name of a source file");
    EXPECT_EQ(wrong("a\n1 forged=fine"), "\"a\n1 forged\" is not the name of a source file");
    EXPECT_EQ(wrong("fine, =fine"), "no unit is named before '=' in \"=fine\"");
}

} // namespace
