#include "host/config/ConfigFile.h"
#include "host/config/SituationWarnings.h"

#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <optional>
#include <string>

#include <sys/stat.h>

using namespace zrm::host;

namespace {

using testing::AllOf;
using testing::ElementsAre;
using testing::EndsWith;
using testing::IsEmpty;
using testing::StartsWith;

class ConfigSecretsTest : public testing::Test {
protected:
    std::optional<std::string> warning(const std::string& option, mode_t mode) {
        const std::string path = directory.write(
            "zrm.toml", "[[sink]]\ntype = 'webhook'\nurl = 'http://127.0.0.1'\n" + option + '\n');
        chmod(path.c_str(), mode);
        const ConfigFile::Result result = ConfigFile::load(path);
        return warningOfSecrets(result.value(), path);
    }

    TemporaryDirectory directory;
};

TEST(ConfigFields, WarnsAboutConditionsOnFieldsOfLogsThatHaveNone) {
    const auto warnings = [](const std::string& tables, const std::string& log) {
        const ConfigFile::Result result =
            ConfigFile::parse(tables + "[[situation]]\nname = 'a'\nseverity = 'info'\n" + log +
                                  "when = [\"ENTRYSYS = 'h'\", \"field.user = 'root'\"]\n",
                              "zrm.toml");
        EXPECT_TRUE(result) << result.error().front();
        return warningsOfSituations(result.value(), "zrm.toml");
    };
    const std::string text = "[[log]]\npath = '/t/*'\nexclude = 'no.log'\ntype = 'text'\nformat = "
                             "'A,\"%s\",description'\n";
    const std::string syslog = "[[log]]\npath = '/s.log'\n";
    const std::string begin = "zrm.toml: situation 'a': field.user is in no entry: ";
    EXPECT_THAT(warnings(text + syslog, ""), IsEmpty());
    EXPECT_THAT(warnings(text + syslog, "log = '/s.log'\n"), IsEmpty());
    EXPECT_THAT(warnings(text, ""),
                ElementsAre(begin + "no [[log]] table has a type whose entries have fields"));
    const std::string command = "[[log]]\ntype = 'command'\ncommand = 'a'\n";
    EXPECT_THAT(warnings("[[log]]\ntype = 'journal'\n" + text, "log = 'journal'\n"), IsEmpty());
    EXPECT_THAT(warnings(command + "format = '(?P<user>.*)'\n", "log = 'a'\n"), IsEmpty());
    EXPECT_THAT(warnings(command, "log = 'a'\n"),
                ElementsAre(begin +
                            "entries of type \"command\", as the [[log]] at line 1 has them, "
                            "have no fields"));
    EXPECT_THAT(warnings(syslog + text, "log = '/t/a.log'\n"),
                ElementsAre(begin + "entries of type \"text\", as the [[log]] at line 3 has them, "
                                    "have no fields"));
    EXPECT_THAT(warnings(text, "log = '/t/no.log'\n"),
                ElementsAre(begin + "no [[log]] table names /t/no.log, and entries of other logs "
                                    "have no fields"));
}

TEST(ConfigTexts, WarnsAboutNamesInBracesThatAreNone) {
    const auto warnings = [](const std::string& text) {
        const ConfigFile::Result result =
            ConfigFile::parse("[[situation]]\nname = 'a'\ntext = '" + text + "'\n", "zrm.toml");
        EXPECT_TRUE(result) << result.error().front();
        return warningsOfSituations(result.value(), "zrm.toml");
    };
    EXPECT_THAT(warnings("{count} failed logins"), IsEmpty());
    EXPECT_THAT(warnings("see {wiki}"),
                ElementsAre(AllOf(
                    StartsWith("zrm.toml: situation 'a': the text is kept as it is written, since "
                               "it names nothing that its events have: {wiki}: 'wiki' is not a "
                               "name of this situation; the names are "),
                    EndsWith("write {{ for a brace"))));
}

TEST(ConfigTexts, RefusesUnknownNamesBesideKnownOnes) {
    const ConfigFile::Result result =
        ConfigFile::parse("[[situation]]\nname = 'a'\ntext = '{count} {wiki}'\n", "zrm.toml");
    ASSERT_FALSE(result);
    EXPECT_THAT(result.error(), ElementsAre(StartsWith(
                                    "zrm.toml:3: situation.text: {wiki}: 'wiki' is not a name")));
}

} // namespace

TEST_F(ConfigSecretsTest, WarnsAboutSecretsThatEveryUserCanRead) {
    const std::string path = directory.file("zrm.toml");
    const std::string expected =
        path +
        " contains secrets and every user can read it: move them into separate files (secret_file, "
        "headers_file), or remove the permissions of other users (chmod o= " +
        path + ')';
    for (const char* const secret :
         {"secret = 'key'", "headers = { authorization = 'Bearer a' }",
          "headers = { X-Api-Key = 'a' }", "headers = { X-One = '1', Private-Token = 'a' }"}) {
        EXPECT_EQ(warning(secret, 0644), expected) << secret;
        EXPECT_EQ(warning(secret, 0640), std::nullopt) << secret;
    }
}

TEST_F(ConfigSecretsTest, WarnsAboutNothingElse) {
    for (const char* const harmless :
         {"", "secret_file = '/etc/zrm/secret'", "headers = { X-Scope-OrgID = 'a' }"}) {
        EXPECT_EQ(warning(harmless, 0644), std::nullopt) << harmless;
    }
}

TEST(ConfigDebug, WarnsAboutADebugModeWithoutADebugLog) {
    const auto warning = [](const std::string& text) {
        const ConfigFile::Result result = ConfigFile::parse(text, "zrm.toml");
        return warningOfDebug(result.value(), "zrm.toml");
    };
    const std::string debug = "[[log]]\npath = '/a'\n[[log]]\npath = '/b'\ndebug = true\n";
    ASSERT_EQ(unsetenv("AGENT_DEBUG_LOG"), 0);
    EXPECT_EQ(warning(debug),
              "zrm.toml:3: log.debug: has no effect without a debug log; write debug_log = "
              "\"/var/lib/zrm/debug.log\" in [agent], or remove the key");
    EXPECT_EQ(warning("[[log]]\npath = '/a'\n"), std::nullopt);
    EXPECT_EQ(warning("[agent]\ndebug_log = '/d.log'\n" + debug), std::nullopt);
    ASSERT_EQ(setenv("AGENT_DEBUG_LOG", "/d.log", 1), 0);
    EXPECT_EQ(warning(debug), std::nullopt);
    ASSERT_EQ(unsetenv("AGENT_DEBUG_LOG"), 0);
}
