#include "host/config/ReadyFormats.h"

#include "host/config/ConfigFile.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include <sys/stat.h>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::AllOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::Pair;
using testing::SizeIs;

class ReadyFormatsTest : public testing::Test {
protected:
    void SetUp() override {
        std::filesystem::remove_all(m_directory);
        std::filesystem::create_directories(m_directory);
    }
    void TearDown() override { std::filesystem::remove_all(m_directory); }

    void write(const std::string& file, const std::string& text) const {
        std::ofstream(m_directory + '/' + file) << text;
    }
    ReadyFormats formats() const { return ReadyFormats({m_directory}); }
    Problem problemOf(const std::string& name) const {
        const auto ready = formats().find(name);
        EXPECT_FALSE(ready);
        return ready ? Problem{} : ready.error();
    }
    /// What is wrong with a configuration that has this [[log]] table; empty if nothing is.
    std::vector<std::string> problemsOf(const std::string& table) const {
        const auto config = parse(table);
        return config ? std::vector<std::string>{} : config.error();
    }
    ConfigFile::Result parse(const std::string& table) const {
        return ConfigFile::parse("[formats]\ndirectory = '" + m_directory + "'\n[[log]]\n" + table,
                                 "zrm.toml");
    }

    const std::string m_directory = testing::TempDir() + "ready_formats_test";
};

TEST_F(ReadyFormatsTest, ReadsAFormatWithItsSamples) {
    write("shop.toml", R"(
description = "The shop"
type = "json"
columns = { type = "lvl" }
[[sample]]
entry = '{"lvl":"x"}'
type = "x"
fields = { lvl = "x" }
[[sample]]
entry = 'x'
rejected = true
)");
    const auto ready = formats().find("shop");
    ASSERT_TRUE(ready) << ready.error().text();
    EXPECT_EQ(ready->name, "shop");
    EXPECT_EQ(ready->path, m_directory + "/shop.toml");
    EXPECT_EQ(ready->about, "The shop");
    EXPECT_EQ(ready->format.type, "json");
    EXPECT_THAT(ready->format.columns, ElementsAre(Pair("type", "lvl")));
    ASSERT_THAT(ready->samples, SizeIs(2));
    EXPECT_EQ(ready->samples[0].columns.at("type"), "x");
    EXPECT_EQ(ready->samples[0].columns.at("description"), "");
    EXPECT_THAT(ready->samples[0].fields, ElementsAre(Pair("lvl", "x")));
    EXPECT_EQ(ready->samples[0].line, 6U);
    EXPECT_TRUE(ready->samples[1].isRejected);
}

TEST_F(ReadyFormatsTest, AnUnknownNameIsAnsweredWithNamesLikeIt) {
    for (const char* const name : {"nginx-access", "nginx-error", "redis"}) {
        write(std::string(name) + ".toml", "type = 'json'");
    }
    EXPECT_EQ(problemOf("nginx-acess").text(),
              "'nginx-acess' is not a ready format; write a name such as 'nginx-access'");
    EXPECT_EQ(problemOf("nginx").cure, "write a name such as 'nginx-access', 'nginx-error'");
    EXPECT_EQ(problemOf("quite-different").cure, "write a name that 'zrmctl formats list' shows");
}

TEST_F(ReadyFormatsTest, NothingButANameIsLookedFor) {
    std::filesystem::create_directories(m_directory + "/inner");
    write("x.toml", "type = 'json'");
    for (const std::string name :
         {"../x", "inner/../x", "/etc/passwd", "", ".x", "X", "x y", "%d %s"}) {
        EXPECT_THAT(problemOf(name).what, HasSubstr("is not the name of a ready format")) << name;
    }
    EXPECT_THAT(problemOf(std::string(65, 'x')).what, HasSubstr("is not the name"));
    EXPECT_THAT(problemOf("x.toml").what, HasSubstr("'x.toml' is not a ready format"));
}

TEST_F(ReadyFormatsTest, TheFirstDirectoryWithTheNameCounts) {
    const std::string second = m_directory + "/second";
    std::filesystem::create_directories(second);
    write("a.toml", "type = 'json'\ndescription = 'mine'");
    write("second/a.toml", "type = 'json'\ndescription = 'other'");
    write("second/b.toml", "type = 'json'");
    write("second/c.txt", "type = 'json'");
    const ReadyFormats both({m_directory, second});
    EXPECT_EQ(both.find("a")->about, "mine");
    std::vector<std::string> names;
    for (const ReadyFormats::Place& place : both.list()) {
        if (place.path.starts_with(m_directory)) {
            names.push_back(place.path.substr(m_directory.size()));
        }
    }
    EXPECT_THAT(names, ElementsAre("/a.toml", "/second/b.toml"));
}

TEST_F(ReadyFormatsTest, SaysWhatIsWrongWithAFileAndWhere) {
    write("toml.toml", "type = 'json'\nx = [");
    EXPECT_THAT(problemOf("toml").what, AllOf(HasSubstr("the format 'toml' cannot be used: "),
                                              HasSubstr("/toml.toml:2: ")));
    write("type.toml", "type = 'accounting'");
    EXPECT_THAT(problemOf("type").what,
                HasSubstr("/type.toml:1: type: 'accounting' is not a type that formats have"));
    write("key.toml", "type = 'json'\nformt = 'x'");
    EXPECT_THAT(problemOf("key").what, HasSubstr("/key.toml:2: formt: unknown key"));
    write("sample.toml", "type = 'json'\n[[sample]]\ntype = 'x'\n");
    EXPECT_THAT(problemOf("sample").what, HasSubstr("/sample.toml:2: sample.entry: is missing"));
}

TEST_F(ReadyFormatsTest, RefusesFilesThatAreNoFormats) {
    ::mkfifo((m_directory + "/pipe.toml").c_str(), 0600);
    EXPECT_THAT(problemOf("pipe").what, HasSubstr("is not a regular file"));
    std::filesystem::create_directories(m_directory + "/folder.toml");
    EXPECT_THAT(problemOf("folder").what, HasSubstr("cannot be read"));
    std::filesystem::create_symlink("circle.toml", m_directory + "/circle.toml");
    EXPECT_THAT(problemOf("circle").what, HasSubstr("cannot be read"));
    write("large.toml", std::string(ReadyFiles::largestFile + 1, '\n'));
    EXPECT_THAT(problemOf("large").what, HasSubstr("make it a readable file of at most 256 KiB"));
    write("deep.toml", "type = " + std::string(100000, '['));
    EXPECT_THAT(problemOf("deep").what, HasSubstr("nested deeper"));
    write("samples.toml", [] {
        std::string text = "type = 'json'\n";
        for (int i = 0; i < 201; ++i) {
            text += "[[sample]]\nentry = 'x'\n";
        }
        return text;
    }());
    EXPECT_THAT(problemOf("samples").what, HasSubstr("sample: has 201 tables"));
}

TEST_F(ReadyFormatsTest, ListsAThousandFormats) {
    for (int i = 0; i < 1000; ++i) {
        write("f" + std::to_string(i) + ".toml", "type = 'json'");
    }
    EXPECT_GE(formats().list().size(), 1000U);
}

TEST_F(ReadyFormatsTest, ATableNamesAFormatWithOrWithoutItsType) {
    write("shop.toml", "type = 'json'\ncolumns = { type = 'lvl', source = 'src' }");
    const auto config =
        parse("path = '/a'\nformat = 'shop'\ncolumns = { source = 'who' }\ntimezone = 'UTC'\n");
    ASSERT_TRUE(config) << config.error().front();
    const LogConfig& log = config->logs.front();
    EXPECT_EQ(log.type, "json");
    ASSERT_TRUE(log.follow.format);
    EXPECT_THAT(log.follow.format->definition(), AllOf(HasSubstr("lvl"), HasSubstr("who")));
    EXPECT_THAT(log.follow.format->definition(), testing::Not(HasSubstr("src")));
}

TEST_F(ReadyFormatsTest, ATableHasTheNamesOfItsFormatsOrItsType) {
    write("shop.toml", "type = 'json'");
    write("cart.toml", "type = 'syslog'");
    write("desk.toml", "type = 'syslog'");
    const auto nameOf = [this](const std::string& keys) {
        const auto config = parse(keys);
        return config ? config->logs.front().formatName : config.error().front();
    };
    EXPECT_EQ(nameOf("path = '/a'\nformat = 'shop'\n"), "shop");
    EXPECT_EQ(nameOf("path = '/a'\nformat = ['cart', 'desk']\n"), "cart, desk");
    EXPECT_EQ(nameOf("type = 'command'\ncommand = 'a'\nformat = 'shop'\n"), "shop");
    EXPECT_EQ(nameOf("type = 'command'\ncommand = 'a'\n"), "command");
    EXPECT_EQ(nameOf("path = '/a'\n"), "syslog");
    EXPECT_EQ(nameOf("path = '/a'\ntype = 'regex'\nformat = '(?P<description>.*)'\n"), "regex");
}

TEST_F(ReadyFormatsTest, SaysWhatIsWrongWithTheNameInATable) {
    write("shop.toml", "type = 'json'");
    write("cart.toml", "type = 'json'");
    write("bad.toml", "type = 'json'\nx = 1");
    EXPECT_THAT(
        problemsOf("path = '/a'\nformat = 'shopp'\n"),
        ElementsAre("zrm.toml:5: log.format: 'shopp' is not a ready format; write a name such as "
                    "'shop'"));
    EXPECT_THAT(problemsOf("path = '/a'\nformat = 'bad'\n"),
                ElementsAre(AllOf(HasSubstr("zrm.toml:5: log.format: the format 'bad' cannot be "),
                                  HasSubstr("/bad.toml:2: x: unknown key"))));
    EXPECT_THAT(problemsOf("path = '/a'\nformat = ['shop', 'cart']\n"),
                ElementsAre(HasSubstr("'cart' cannot be joined with the others")));
    EXPECT_THAT(problemsOf("path = '/a'\nformat = []\n"),
                ElementsAre(HasSubstr("log.format: names 0 formats; write 1 to 64 names")));
    EXPECT_THAT(problemsOf("path = '/a'\ntype = 'syslog'\nformat = 'shop'\n"),
                ElementsAre(HasSubstr("is a format of type \"json\"; leave the type out")));
    EXPECT_THAT(problemsOf("path = '/a'\nformat = '(?P<time>\\S+)'\n"),
                ElementsAre(HasSubstr("is not the name of a ready format; write a name that "
                                      "'zrmctl formats list' shows, or say with type = ")));
}

TEST_F(ReadyFormatsTest, TheDirectoryIsAnAbsolutePath) {
    const auto config = ConfigFile::parse("[formats]\ndirectory = 'formats'\nx = 1\n", "zrm.toml");
    ASSERT_FALSE(config);
    EXPECT_THAT(config.error(),
                ElementsAre("zrm.toml:2: formats.directory: 'formats' is not an absolute path; "
                            "begin it with '/'",
                            HasSubstr("zrm.toml:3: formats.x: unknown key")));
}

} // namespace
