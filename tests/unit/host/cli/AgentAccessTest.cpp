#include "host/cli/AgentAccess.h"

#include "host/cli/CliError.h"
#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <functional>

using namespace zrm::host;

namespace {

class AgentAccessTest : public testing::Test {
protected:
    void SetUp() override {
        unsetenv("ZRM_URL");
        unsetenv("ZRM_TOKEN");
        unsetenv("ZRM_CA_FILE");
        options.config = directory.file("zrm.toml");
        write("api-token", "secret-of-the-configuration\n");
        write("zrm.toml", "state_directory = \"" + directory.path().string() +
                              "\"\n[http]\nlisten = \"127.0.0.1:7186\"\n");
    }
    void TearDown() override {
        unsetenv("ZRM_URL");
        unsetenv("ZRM_TOKEN");
        unsetenv("ZRM_CA_FILE");
    }
    std::string write(const std::string& name, const std::string& text) const {
        return directory.write(name, text);
    }
    void expectError(CliStatus status, const std::string& text) const {
        try {
            AgentAccess::find(options);
            FAIL() << "no error";
        } catch (const CliError& error) {
            EXPECT_EQ(error.status(), status);
            EXPECT_EQ(std::string(error.what()), text);
        }
    }

    TemporaryDirectory directory;
    CommonOptions options;
};

} // namespace

TEST_F(AgentAccessTest, TheConfigurationNamesAddressAndToken) {
    const AgentAccess connection = AgentAccess::find(options);
    EXPECT_EQ(connection.url, "http://127.0.0.1:7186");
    EXPECT_EQ(connection.token, "secret-of-the-configuration");
    EXPECT_EQ(connection.tokenSource, directory.file("api-token"));
}

TEST_F(AgentAccessTest, ATokenFileOfTheConfigurationIsRead) {
    const std::string token = write("other", "secret-of-another-file");
    write("zrm.toml", "[http]\nlisten = \"[::1]:80\"\ntoken_file = \"" + token + "\"\n");
    const AgentAccess connection = AgentAccess::find(options);
    EXPECT_EQ(connection.url, "http://[::1]:80");
    EXPECT_EQ(connection.token, "secret-of-another-file");
}

TEST_F(AgentAccessTest, TheEnvironmentOverridesTheConfiguration) {
    setenv("ZRM_URL", "http://localhost:99/", 1);
    setenv("ZRM_TOKEN", "secret-of-the-environment\n", 1);
    options.config = directory.file("absent.toml"); // not needed
    const AgentAccess connection = AgentAccess::find(options);
    EXPECT_EQ(connection.url, "http://localhost:99");
    EXPECT_EQ(connection.token, "secret-of-the-environment");
    EXPECT_EQ(connection.tokenSource, "ZRM_TOKEN");
}

TEST_F(AgentAccessTest, OptionsOverrideTheEnvironment) {
    setenv("ZRM_URL", "http://localhost:99", 1);
    setenv("ZRM_TOKEN", "secret-of-the-environment", 1);
    options.url = "https://logs.example.org:7186";
    options.tokenFile = write("mine", "secret-of-mine");
    const AgentAccess connection = AgentAccess::find(options);
    EXPECT_EQ(connection.url, "https://logs.example.org:7186");
    EXPECT_EQ(connection.token, "secret-of-mine");
}

TEST_F(AgentAccessTest, FurtherCertificatesAreTrustedBesideTheConfiguredOne) {
    EXPECT_TRUE(AgentAccess::find(options).authorities.empty());
    options.caFile = "/of/the/option.pem";
    setenv("ZRM_CA_FILE", "/of/the/environment.pem", 1);
    using Files = std::vector<std::string>;
    EXPECT_EQ(AgentAccess::find(options).authorities, Files{"/of/the/option.pem"});
    options.caFile.clear();
    EXPECT_EQ(AgentAccess::find(options).authorities, Files{"/of/the/environment.pem"});
    write("zrm.toml", "state_directory = \"" + directory.path().string() +
                          "\"\n[http]\ncertificate = \"/a.pem\"\nkey = \"/a.key\"\n");
    EXPECT_EQ(AgentAccess::find(options).authorities, (Files{"/a.pem", "/of/the/environment.pem"}));
    options.url = "https://logs.example.org"; // not the configuration's agent
    EXPECT_EQ(AgentAccess::find(options).authorities, Files{"/of/the/environment.pem"});
}

TEST_F(AgentAccessTest, TheTokenIsSentUnencryptedOnlyToThisMachine) {
    options.url = "http://logs.example.org:7186";
    expectError(CliStatus::USAGE,
                "--url: the token would reach logs.example.org unencrypted; use https, "
                "or an SSH tunnel");
    setenv("ZRM_URL", "http://192.0.2.7", 1);
    options.url.clear();
    expectError(
        CliStatus::USAGE,
        "ZRM_URL: the token would reach 192.0.2.7 unencrypted; use https, or an SSH tunnel");
}

TEST_F(AgentAccessTest, ThePortIsOptional) {
    options.tokenFile = write("mine", "secret");
    for (const char* const url : {"http://[::1]", "http://localhost", "https://logs.example.org",
                                  "https://[2001:db8::1]"}) {
        options.url = url;
        EXPECT_EQ(AgentAccess::find(options).url, url);
    }
}

TEST_F(AgentAccessTest, InvalidAddressesAreRefused) {
    for (const char* const url :
         {"localhost:7186", "http://", "ftp://localhost", "http://a b:1", "https://", "https://a b",
          "https://a/path", "https://user@a", "http://localhost/path", "http://[::1"}) {
        options.url = url;
        expectError(CliStatus::USAGE, "--url: '" + std::string(url) +
                                          "' is not an address; write it as http://127.0.0.1:7186");
    }
}

TEST_F(AgentAccessTest, AMissingConfigurationIsReported) {
    options.config = directory.file("absent.toml");
    expectError(CliStatus::USAGE,
                options.config +
                    " does not exist: name the agent's configuration with --config, or "
                    "its address with --url");
}

TEST_F(AgentAccessTest, ErrorsInTheAgentsOwnKeysAreIgnored) {
    write("zrm.toml", "wrong = 1\n[[situation]]\n[history]\ndirectory = 5\n[http]\n"
                      "listen = '127.0.0.1:7000'\nlisen = ''\nkey = 'x'\n");
    write("token", "secret\n");
    options.tokenFile = directory.file("token");
    EXPECT_EQ(AgentAccess::find(options).url, "http://127.0.0.1:7000");
}

TEST_F(AgentAccessTest, EveryProblemOfAddressAndTokenIsReported) {
    write("zrm.toml", "state_directory = 5\n[http]\nlisten = 5\n");
    try {
        AgentAccess::find(options);
        FAIL() << "no error";
    } catch (const CliError& error) {
        EXPECT_EQ(error.status(), CliStatus::USAGE);
        const std::string text = error.what();
        EXPECT_NE(text.find("zrm.toml:1: state_directory: "), std::string::npos) << text;
        EXPECT_NE(text.find("\n" + options.config + ":3: http.listen"), std::string::npos) << text;
    }
}

TEST_F(AgentAccessTest, AConfigurationWithoutHttpHasNoAddress) {
    write("zrm.toml", "");
    expectError(
        CliStatus::USAGE,
        options.config +
            " turns HTTP off: give [http] a listen address, or give the address with --url");
}

TEST_F(AgentAccessTest, AnUnspecifiedPortIsNotAnAddress) {
    write("zrm.toml", "[http]\nlisten = \"127.0.0.1:0\"\n");
    expectError(CliStatus::USAGE,
                options.config +
                    " leaves the port open: give the address that the agent reported with --url");
}

TEST_F(AgentAccessTest, AMissingTokenIsReported) {
    options.tokenFile = directory.file("absent");
    expectError(CliStatus::FORBIDDEN,
                "cannot read the token " + options.tokenFile +
                    ": No such file or directory; the agent creates it when it starts with HTTP");
}

TEST_F(AgentAccessTest, AFileWithoutATokenIsReported) {
    options.tokenFile = write("two-lines", "one\ntwo\n");
    expectError(CliStatus::FORBIDDEN,
                options.tokenFile + " does not contain a token: one line of visible characters");
    options.tokenFile = write("blank", "\n");
    expectError(CliStatus::FORBIDDEN,
                options.tokenFile + " does not contain a token: one line of visible characters");
}
