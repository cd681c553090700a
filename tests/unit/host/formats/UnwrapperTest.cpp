#include "host/formats/Unwrapper.h"

#include "base/EntryFields.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::HasSubstr;

class UnwrapperTest : public testing::Test {
protected:
    /// What is in the entry, or why it is refused.
    static std::string read(Unwrapper& unwrapper, std::string_view entry) {
        return unwrapper.read(entry) ? std::string(unwrapper.text())
                                     : "refused: " + std::string(unwrapper.reason());
    }
    std::string docker(std::string_view entry) { return read(m_docker, entry); }
    std::string cri(std::string_view entry) { return read(m_cri, entry); }
    static std::string fieldsOf(const Unwrapper& unwrapper) {
        EntryFields fields;
        unwrapper.addFields(fields);
        std::string text;
        for (const auto& [name, value] : fields.all()) {
            text += std::string(name) + "=" + std::string(value) + ";";
        }
        return text;
    }

    Unwrapper m_docker{Unwrapper::Kind::docker};
    Unwrapper m_cri{Unwrapper::Kind::cri};
};

TEST_F(UnwrapperTest, TakesALineOfDockerApart) {
    EXPECT_EQ(docker(R"({"log":"hello\n","stream":"stdout","time":"2026-11-19T10:00:00.5Z"})"),
              "hello");
    EXPECT_EQ(m_docker.time(), "2026-11-19T10:00:00.5Z");
    EXPECT_EQ(m_docker.stream(), "stdout");
    EXPECT_FALSE(m_docker.isUnfinished());
    EXPECT_EQ(fieldsOf(m_docker), "stream=stdout;");
}

TEST_F(UnwrapperTest, TheKeysOfDockerComeInAnyOrder) {
    EXPECT_EQ(
        docker(
            R"( {"time":"t", "x":[{"log":"no"}], "stream":"stderr","log":"a \"b\" \u00e4\\\n"} )"),
        "a \"b\" \xc3\xa4\\");
    EXPECT_EQ(m_docker.time(), "t");
    EXPECT_EQ(m_docker.stream(), "stderr");
}

TEST_F(UnwrapperTest, WhatElseDockerSaysAreFields) {
    EXPECT_EQ(docker(R"({"attrs":{"tag":"web\"1","com.example.env":"live","n":1},"log":"x\n",)"
                     R"("stream":"stdout","time":"t"})"),
              "x");
    EXPECT_EQ(fieldsOf(m_docker), "stream=stdout;attrs.tag=web\"1;attrs.com.example.env=live;");
    EXPECT_EQ(docker(R"({"log":"y\n","stream":"stdout","time":"t","attrs":"odd"})"), "y");
    EXPECT_EQ(fieldsOf(m_docker), "stream=stdout;");
}

TEST_F(UnwrapperTest, JoinsWhatDockerHasCut) {
    EXPECT_EQ(docker("{\"log\":\"first, \",\"stream\":\"stdout\",\"time\":\"1\"}\n"
                     "{\"log\":\"second\\n\",\"stream\":\"stdout\",\"time\":\"2\"}"),
              "first, second");
    EXPECT_EQ(m_docker.time(), "1");
    EXPECT_FALSE(m_docker.isUnfinished());
    EXPECT_EQ(docker(R"({"log":"first, ","stream":"stdout","time":"1"})"), "first, ");
    EXPECT_TRUE(m_docker.isUnfinished());
}

TEST_F(UnwrapperTest, LinesOfAnEntryStayLines) {
    EXPECT_EQ(docker("{\"log\":\"Error\\n\",\"stream\":\"stderr\",\"time\":\"1\"}\r\n"
                     "{\"log\":\"\\tat a\\r\\n\",\"stream\":\"stderr\",\"time\":\"2\"}"),
              "Error\n\tat a");
    EXPECT_EQ(cri("2026-11-19T10:00:00Z stderr F Error\n"
                  "2026-11-19T10:00:01Z stderr P \tat \n"
                  "2026-11-19T10:00:01Z stderr F a"),
              "Error\n\tat a");
    EXPECT_EQ(m_cri.time(), "2026-11-19T10:00:00Z");
}

TEST_F(UnwrapperTest, RefusesWhatIsNoLineOfDocker) {
    EXPECT_EQ(docker("hello"),
              "refused: it is not a JSON object, as the lines of Docker's json-file are");
    EXPECT_THAT(docker("[1]"), HasSubstr("not a JSON object"));
    EXPECT_THAT(docker(""), HasSubstr("not a JSON object"));
    EXPECT_EQ(docker(R"({"stream":"stdout","time":"t"})"),
              "refused: it has no \"log\", as the lines of Docker's json-file have");
    EXPECT_THAT(docker(R"({"log":1})"), HasSubstr("is not a JSON string"));
    EXPECT_THAT(docker(R"({"log":"a\n"} x)"), HasSubstr("not a JSON object"));
    EXPECT_THAT(docker(R"({"log":"a\n"} {"b":1})"), HasSubstr("something follows"));
    EXPECT_THAT(docker(R"({"log":"a\n","time":)"), HasSubstr("refused: "));
    EXPECT_THAT(docker("{\"log\":\"\xff\\n\"}"), HasSubstr("refused: "));
    EXPECT_THAT(docker(R"({"log":"a\q\n"})"), HasSubstr("refused: "));
    EXPECT_EQ(docker("{\"log\":\"a\\n\"}\nb").substr(0, 9), "refused: ") << "the second line";
}

TEST_F(UnwrapperTest, NestingCostsNeitherStackNorAnswer) {
    const std::string deep = std::string(10'000, '[') + std::string(10'000, ']');
    EXPECT_THAT(docker(R"({"x":)" + deep + R"(,"log":"a\n"})"), HasSubstr("a"));
    EXPECT_THAT(docker(R"({"attrs":)" + std::string(30'000, '{')), HasSubstr("refused: "));
}

TEST_F(UnwrapperTest, TakesALineOfCriApart) {
    EXPECT_EQ(cri("2026-11-19T10:00:00.123456789Z stdout F two  words "), "two  words ");
    EXPECT_EQ(m_cri.time(), "2026-11-19T10:00:00.123456789Z");
    EXPECT_EQ(m_cri.stream(), "stdout");
    EXPECT_EQ(fieldsOf(m_cri), "stream=stdout;");
    EXPECT_EQ(cri("2026-11-19T10:00:00+01:00 stderr F:tag=x text"), "text");
    EXPECT_EQ(cri("2026-11-19T10:00:00Z stdout F "), "");
    EXPECT_EQ(cri("2026-11-19T10:00:00Z stdout F"), "");
    EXPECT_EQ(cri("2026-11-19T10:00:00Z stdout P part"), "part");
    EXPECT_TRUE(m_cri.isUnfinished());
}

TEST_F(UnwrapperTest, RefusesWhatIsNoLineOfCri) {
    for (const char* const line :
         {"", "text", "2026-11-19T10:00:00Z", "2026-11-19T10:00:00Z out F x",
          "2026-11-19T10:00:00Z stdout X x", " stdout F x", "2026-11-19T10:00:00Z  stdout F x"}) {
        EXPECT_THAT(cri(line), HasSubstr("refused: it is not a line of a container")) << line;
    }
}

TEST_F(UnwrapperTest, KnowsItsNames) {
    EXPECT_EQ(Unwrapper::kindOf("docker"), Unwrapper::Kind::docker);
    EXPECT_EQ(Unwrapper::kindOf("cri"), Unwrapper::Kind::cri);
    EXPECT_EQ(Unwrapper::kindOf("podman"), std::nullopt);
}

} // namespace
