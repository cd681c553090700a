#include "host/sinks/SinkFactory.h"

#include "host/config/SinkTypes.h"

#include <gtest/gtest.h>

#include <string>

namespace {

TEST(SinkFactory, MakesEveryTypeUnderItsName) {
    for (const SinkType& type : SinkTypes::all()) {
        SinkConfig config;
        config.type = type.name;
        config.name = "the " + config.type;
        for (const SinkOption& option : type.options) {
            config.options.emplace(option.name, std::string(option.value));
        }
        const std::unique_ptr<Sink> sink = SinkFactory::make(config);
        ASSERT_NE(sink, nullptr) << type.name;
        EXPECT_EQ(sink->name(), config.name);
    }
}

} // namespace
