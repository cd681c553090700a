#include "host/sinks/SinkFactory.h"

#include "SinkTest.h"
#include "host/config/SinkTypes.h"

#include <gtest/gtest.h>

#include <string>

using namespace zrm::host;

namespace {

TEST(SinkFactory, CreatesEveryTypeUnderItsName) {
    for (const SinkType& type : SinkTypes::all()) {
        const std::string name(type.name);
        std::string keys = "type = '" + name + "'\nname = 'the " + name + "'\n";
        for (const SinkOption& option : type.options) {
            if (option.need == SinkOption::REQUIRED) {
                keys += std::string(option.name) + " = '" + std::string(option.value) + "'\n";
            }
        }
        const SinkConfig config = sinkConfig(keys);
        const std::unique_ptr<Sink> sink = SinkFactory::make(config);
        ASSERT_NE(sink, nullptr) << type.name;
        EXPECT_EQ(sink->name(), "the " + name);
    }
}

} // namespace
