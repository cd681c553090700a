#ifndef ZRM_TESTS_TEST_JOIN_H
#define ZRM_TESTS_TEST_JOIN_H

#include "logs/LineJoin.h"

#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <utility>

/// Joins lines as a function says.
class TestJoin final : public zrm::LineJoin {
public:
    using Continues = std::function<bool(std::string_view before, std::string_view line)>;

    explicit TestJoin(Continues continues, const Limits& limits = {})
        : LineJoin(limits), m_continues(std::move(continues)) {}

    /// A line that begins with a blank continues the one before it.
    static std::shared_ptr<const TestJoin> indented(const Limits& limits = {}) {
        return std::make_shared<TestJoin>(
            [](std::string_view, std::string_view line) { return line.starts_with(' '); }, limits);
    }

    const std::string& definition() const noexcept override { return m_definition; }

protected:
    bool continues(std::string_view before, std::string_view line) const override {
        return m_continues(before, line);
    }

private:
    const Continues m_continues;
    const std::string m_definition = "test";
};

#endif
