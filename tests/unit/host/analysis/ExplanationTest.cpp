#include "host/analysis/Explanation.h"

#include "host/base/JsonWriter.h"

#include <gtest/gtest.h>

#include <string>

using namespace zrm::host;

namespace {

std::string jsonOf(const Explanation& explanation) {
    return JsonWriter::text([&](JsonWriter& json) { explanation.write(json); });
}

TEST(Explanation, IsAnObjectWithEveryMember) {
    Explanation explanation;
    explanation.decision = "Would not be raised.";
    explanation.reason = "the line does not fit";
    EXPECT_EQ(jsonOf(explanation),
              R"({"line":null,"event":null,"row":null,"reason":"the line does not fit",)"
              R"("conditions":[],"matches":false,"window":null,"raised":false,)"
              R"("decision":"Would not be raised."})");
    explanation = {.line = "a \"line\"",
                   .event = 17,
                   .row = R"({"ENTRYSRC":"sshd"})",
                   .reason = "",
                   .conditions = {{"ENTRYSRC = 'sshd'", "sshd", true, ""},
                                  {"SAMPLENO = 1", 5, false, "SAMPLENO 5 is not 1"}},
                   .matches = true,
                   .window = Explanation::Window{">= 5", "60s", std::nullopt},
                   .isRaised = true,
                   .decision = "Would be raised."};
    EXPECT_EQ(jsonOf(explanation),
              R"({"line":"a \"line\"","event":17,"row":{"ENTRYSRC":"sshd"},"reason":null,)"
              R"("conditions":[{"condition":"ENTRYSRC = 'sshd'","value":"sshd","holds":true},)"
              R"({"condition":"SAMPLENO = 1","value":5,"holds":false}],"matches":true,)"
              R"("window":{"frequency":">= 5","period":"60s","count":null},"raised":true,)"
              R"("decision":"Would be raised."})");
}

} // namespace
