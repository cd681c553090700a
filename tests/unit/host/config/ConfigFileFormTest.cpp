// Files that cannot be read, are cut off, or are not what TOML allows.
#include "host/config/ConfigFile.h"

#include "ConfigText.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>
#include <string>
#include <vector>

#include <sys/stat.h>

using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

std::string repeated(const std::string& text, int times) {
    std::string all;
    for (int i = 0; i < times; ++i) {
        all += text;
    }
    return all;
}

TEST(ConfigFileForm, DeeplyNestedTextIsRefused) {
    constexpr int deep = 200'000;
    const std::string name = repeated("a.", deep) + "a";
    for (const std::string& text :
         {name + " = 1\n", "[" + name + "]\n", "[[" + name + "]]\n", "x = {" + name + " = 1}\n",
          repeated("'a' . ", deep) + "a = 1\n", "x = " + repeated("[", deep) + "\n",
          "x = " + repeated("{a=", deep) + "\n", "x = \"\"\"a\"\"\"\"\"\n" + name + " = 1\n",
          "x = '''a''''\n" + name + " = 1\n", "x = \"\\\"\"\n" + name + " = 1\n",
          "x = '\\'\n" + name + " = 1\n", "# \"\n" + name + " = 1\n"}) {
        const std::vector<std::string> problems = problemsOf(text);
        ASSERT_EQ(problems.size(), 1u) << text.substr(0, 40);
        EXPECT_THAT(problems[0],
                    testing::MatchesRegex("zrm.toml:[12]: names or brackets are nested "
                                          "deeper than 32; write at most 32 levels"))
            << text.substr(0, 40);
    }
}

TEST(ConfigFileForm, BracketsInStringsAndCommentsDoNotNest) {
    const std::string brackets = repeated("[{.", 100);
    const HostConfig config =
        accepted("# " + brackets + "\n[[situation]]\nname = \"\\\"" + repeated("[.", 50) +
                 "\"\ntext = '''" + brackets + "\n''" + brackets + "'''''\n");
    EXPECT_EQ(config.situations.at(0).name, "\"" + repeated("[.", 50));
    EXPECT_EQ(config.situations.at(0).text, brackets + "\n''" + brackets + "''");
}

TEST(ConfigFileForm, NamesOnlyTheFirstOfManyProblems) {
    const std::vector<std::string> problems = problemsOf(repeated("[[situation]]\n", 1000));
    ASSERT_EQ(problems.size(), 101u);
    EXPECT_EQ(problems[99], "zrm.toml:100: situation.name: is missing; give the situation a name");
    EXPECT_EQ(problems[100], "zrm.toml: 900 more problems; correct those above first");
}

TEST(ConfigFileForm, AReloadRefusesATruncatedFile) {
    const TemporaryDirectory directory;
    const auto reloaded = [&](const std::string& text) {
        const std::string path = directory.write("zrm.toml", text);
        const ConfigFile::Result result = ConfigFile::reload(path);
        return result ? "" : result.error().front().substr(path.size());
    };
    const std::string whole = "[[situation]]\nname = 'a'\n";
    EXPECT_EQ(reloaded(whole), "");
    EXPECT_EQ(reloaded("# nothing\n"), "");
    for (const char* const text : {"", "\n", " \r\n\t"}) {
        EXPECT_EQ(reloaded(text), ": is empty; write the configuration into it again");
    }
    for (const char* const rest : {"severity = 'major'", "# cut o"}) {
        EXPECT_EQ(reloaded(whole + rest),
                  ":3: the file ends within this line; write the rest of it, or end the line");
    }
}

TEST(ConfigFileForm, APipeIsNotRead) {
    const TemporaryDirectory directory;
    const std::string path = directory.file("zrm.toml");
    ASSERT_EQ(mkfifo(path.c_str(), 0600), 0);
    const ConfigFile::Result result = ConfigFile::load(path);
    ASSERT_FALSE(result);
    EXPECT_THAT(result.error(),
                ElementsAre(path + ": is not a regular file; make it a file that the agent may "
                                   "read, of at most 4 MiB"));
}

TEST(ConfigFileForm, NamesThePlaceOfASyntaxError) {
    const std::vector<std::string> problems = problemsOf("[agent]\nlog_config = /etc/logs.conf\n");
    ASSERT_EQ(problems.size(), 1u);
    EXPECT_THAT(problems[0], testing::MatchesRegex("zrm.toml:2: .*; correct the TOML here"));
}

TEST(ConfigFileForm, LoadsFiles) {
    const TemporaryDirectory directory;
    const std::string path = directory.write("zrm.toml", "state_directory = \"/srv\"\n");
    const ConfigFile::Result result = ConfigFile::load(path);
    ASSERT_TRUE(result);
    EXPECT_EQ(result->stateDirectory, "/srv");
}

TEST(ConfigFileForm, ReportsWhyAFileCannotBeRead) {
    const TemporaryDirectory directory;
    const auto problemsOf = [](const std::string& path) { return ConfigFile::load(path).error(); };
    const std::string cure = "; make it a file that the agent may read, of at most 4 MiB";
    const std::string missing = directory.file("missing.toml");
    EXPECT_THAT(problemsOf(missing),
                ElementsAre(missing + ": cannot be read: No such file or directory" + cure));
    const std::string folder = directory.path();
    EXPECT_THAT(problemsOf(folder),
                ElementsAre(folder + ": cannot be read: Is a directory" + cure));
    const std::string huge = directory.write("huge.toml", std::string(5 << 20, '\n'));
    EXPECT_THAT(problemsOf(huge), ElementsAre(huge + ": cannot be read: File too large" + cure));
}

/// The blocks of a page that are indented as code and have a table of a configuration file.
std::vector<std::string> examples(const std::string& page) {
    std::ifstream stream(page);
    std::vector<std::string> blocks = {""};
    for (std::string line; std::getline(stream, line);) {
        if (line.starts_with("    ")) {
            blocks.back() += line.substr(4) + "\n";
        } else if (!line.empty()) {
            blocks.emplace_back();
        } else if (!blocks.back().empty()) {
            blocks.back() += "\n";
        }
    }
    std::erase_if(blocks, [](const std::string& block) {
        return !block.starts_with("[[") && block.find("\n[[") == std::string::npos;
    });
    return blocks;
}

TEST(ConfigFileForm, TheExamplesOfTheDocumentationAreAccepted) {
    const std::vector<std::string> blocks = examples(ZRM_DOCS "/configuration.md");
    EXPECT_GE(blocks.size(), 10u);
    for (const std::string& block : blocks) {
        EXPECT_THAT(problemsOf(block + "\n[formats]\ndirectory = '" ZRM_FORMATS "'\n"), IsEmpty())
            << block;
    }
}

} // namespace
