#include "framework/agent_calls.h"

#include "host/framework/NodeType.h"
#include "support/Faults.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <string>

#include <unistd.h>

using namespace zrm::host;

namespace {

class LocalHost : public testing::Test {
protected:
    LocalHost() {
        unsetenv("CTREQ_NODETYPE");
        NodeType::set("");
    }
    ~LocalHost() override {
        unsetenv("CTREQ_NODETYPE");
        NodeType::set("");
    }
    static std::string determine(int size = 65) {
        std::string buffer(80, '#');
        DetermineLocalHost(buffer.data(), size);
        EXPECT_EQ(buffer.substr(static_cast<std::size_t>(size)),
                  std::string(80 - static_cast<std::size_t>(size), '#'));
        return buffer.c_str();
    }
    static std::string shortName() {
        char name[256] = "";
        gethostname(name, sizeof name - 1);
        return std::string(name).substr(0, std::strcspn(name, "."));
    }
};

TEST_F(LocalHost, IsTheShortHostNameAndTheNodeType) {
    EXPECT_EQ(determine(), shortName() + ":ZRM");
    NodeType::set("RM2");
    EXPECT_EQ(determine(), shortName() + ":RM2");
}

TEST_F(LocalHost, TakesTheNodeTypeOfTheEnvironmentUnlessOneWasSet) {
    setenv("CTREQ_NODETYPE", "KX", 1);
    EXPECT_EQ(determine(), shortName() + ":KX");
    NodeType::set("ZRM");
    EXPECT_EQ(determine(), shortName() + ":ZRM");
    NodeType::set("");
    setenv("CTREQ_NODETYPE", "", 1);
    EXPECT_EQ(determine(), shortName() + ":ZRM");
}

TEST_F(LocalHost, IsUnknownWhereTheSystemHasNoName) {
    Fault fault("gethostname", EFAULT);
    EXPECT_EQ(determine(), "unknown:ZRM");
    EXPECT_EQ(fault.failed(), 1);
}

TEST_F(LocalHost, CutsTheHostNameAndKeepsTheNodeType) {
    Fault fault("gethostname", EFAULT, {.times = -1});
    EXPECT_EQ(determine(12), "unknown:ZRM");
    EXPECT_EQ(determine(9), "unkn:ZRM");
    EXPECT_EQ(determine(5), ":ZRM");
    EXPECT_EQ(determine(3), ":Z");
    EXPECT_EQ(determine(1), "");
    char untouched = '#';
    DetermineLocalHost(&untouched, 0);
    EXPECT_EQ(untouched, '#');
}

TEST_F(LocalHost, KeepsANodeTypeOfThirtyOneBytes) {
    NodeType::set(std::string(40, 'n').c_str());
    EXPECT_EQ(NodeType::get(), std::string(31, 'n'));
}

} // namespace
