#include "host/http/Credentials.h"

#include "support/ReasonOf.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <string>

#include <sys/stat.h>

using namespace zrm::host;

namespace {

const std::string first(32, 'a');
const std::string second(40, 'b');

class CredentialsTest : public testing::Test {
protected:
    void SetUp() override { writeToken(first); }
    void writeToken(const std::string& text) const {
        directory.write("token", text);
        chmod(token.c_str(), 0600);
    }
    /// Creates a certificate for this name, and its key.
    void makePair(const std::string& name) const {
        const std::string command =
            "openssl req -x509 -newkey ec -pkeyopt ec_paramgen_curve:prime256v1 -nodes -subj /CN=" +
            name + " -addext subjectAltName=DNS:" + name + " -days 2 -keyout " + key +
            ".new -out " + certificate + ".new >/dev/null 2>&1";
        ASSERT_EQ(std::system(command.c_str()), 0);
    }
    void take(const std::string& path) const { std::filesystem::rename(path + ".new", path); }
    /// The result of up to three checks, until one notices a change.
    static Credentials::Change look(Credentials& credentials) {
        Credentials::Change change;
        for (int count = 0; count < 3 && !change.isNew && !change.problem; ++count) {
            change = credentials.refresh();
        }
        return change;
    }
    static void expectNothingNew(Credentials& credentials) {
        for (int count = 0; count < 3; ++count) {
            const Credentials::Change change = credentials.refresh();
            EXPECT_FALSE(change.isNew);
            EXPECT_FALSE(change.problem);
        }
    }

    RecordingTrace trace{0};
    TemporaryDirectory directory;
    std::string token = directory.file("token");
    std::string certificate = directory.file("agent.pem");
    std::string key = directory.file("agent.key");
};

TEST_F(CredentialsTest, LoadsAChangedToken) {
    Credentials credentials(token, "", "");
    EXPECT_EQ(reasonOf(credentials.load()), "");
    EXPECT_TRUE(credentials.token().matches(first));
    EXPECT_EQ(credentials.tls(), nullptr);
    expectNothingNew(credentials);
    writeToken(second);
    EXPECT_TRUE(look(credentials).isNew);
    EXPECT_TRUE(credentials.token().matches(second));
    EXPECT_FALSE(credentials.token().matches(first));
    expectNothingNew(credentials);
}

TEST_F(CredentialsTest, ATokenThatCannotBeUsedIsReportedOnce) {
    Credentials credentials(token, "", "");
    EXPECT_EQ(reasonOf(credentials.load()), "");
    writeToken("short");
    EXPECT_THAT(look(credentials).problem.value().text(),
                testing::StartsWith("the previous token stays in use: " + token));
    EXPECT_TRUE(credentials.token().matches(first));
    expectNothingNew(credentials);
    std::filesystem::remove(token);
    expectNothingNew(credentials);
}

TEST_F(CredentialsTest, LoadsAChangedCertificate) {
    makePair("one.example");
    take(certificate);
    take(key);
    Credentials credentials(token, certificate, key);
    EXPECT_EQ(reasonOf(credentials.load()), "");
    const auto before = credentials.tls();
    EXPECT_TRUE(before->isFor("one.example"));
    makePair("two.example");
    take(certificate);
    credentials.refresh();
    credentials.refresh(); // nothing is reported between the two files
    take(key);
    EXPECT_TRUE(look(credentials).isNew);
    EXPECT_TRUE(credentials.tls()->isFor("two.example"));
    EXPECT_TRUE(before->isFor("one.example")) << "it stays valid for the connections that use it";
}

TEST_F(CredentialsTest, ABrokenCertificateIsReportedOnceAndThePreviousOneStays) {
    makePair("one.example");
    take(certificate);
    take(key);
    Credentials credentials(token, certificate, key);
    EXPECT_EQ(reasonOf(credentials.load()), "");
    directory.write("agent.pem", "nonsense");
    EXPECT_THAT(
        look(credentials).problem.value().text(),
        testing::StartsWith("the previous certificate stays in use: cannot use the certificate " +
                            certificate));
    EXPECT_TRUE(credentials.tls()->isFor("one.example"));
    expectNothingNew(credentials);
    makePair("two.example");
    take(certificate);
    take(key);
    EXPECT_TRUE(look(credentials).isNew);
    EXPECT_TRUE(credentials.tls()->isFor("two.example"));
}

TEST_F(CredentialsTest, WithoutAUsableFileThereIsAProblemAtOnce) {
    EXPECT_THAT(reasonOf(Credentials(token, certificate, key).load()),
                testing::StartsWith("cannot use the certificate"));
    writeToken("short");
    EXPECT_THAT(reasonOf(Credentials(token, "", "").load()),
                testing::StartsWith(token + " does not contain a token"));
}

} // namespace
