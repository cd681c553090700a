#ifndef PROGRAM_TEST_H
#define PROGRAM_TEST_H

#include "TestAgent.h"
#include "host/cli/CliError.h"
#include "host/cli/Program.h"
#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <functional>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

/// zrmctl, run in this process, and an agent that answers it as a test wants.
class ProgramTest : public testing::Test {
protected:
    void SetUp() override {
        setenv("ZRM_TOKEN", "the-token", 1);
        answerBy([](const HttpRequest&) { return HttpAnswer{200, "text/plain", ""}; });
        for (const char* const method : {"GET", "POST", "PUT", "DELETE"}) {
            agent.routes().add(method, "/*", [this](const HttpRequest& request) {
                const std::lock_guard guard(mutex);
                return answer(request);
            });
        }
        agent.begin();
    }
    void TearDown() override { unsetenv("ZRM_TOKEN"); }

    /// The handler runs in the server's threads, one call at a time.
    void answerBy(std::function<HttpAnswer(const HttpRequest&)> handler) {
        const std::lock_guard guard(mutex);
        answer = std::move(handler);
    }
    void answerWith(const std::string& body) {
        answerBy([=](const HttpRequest&) { return HttpAnswer::json(body); });
    }
    /// What the handler has recorded.
    std::string copy(const std::string& text) {
        const std::lock_guard guard(mutex);
        return text;
    }
    /// Runs zrmctl; its output and errors are kept.
    CliStatus run(std::vector<std::string> arguments) {
        if (arguments.front() != "--url") {
            arguments.insert(arguments.begin(), {"--url", agent.connection().url});
        }
        arguments.insert(arguments.begin(), "zrmctl");
        std::vector<const char*> words;
        for (const std::string& argument : arguments) {
            words.push_back(argument.c_str());
        }
        testing::internal::CaptureStdout();
        testing::internal::CaptureStderr();
        const CliStatus status = Program().run(static_cast<int>(words.size()), words.data());
        output = testing::internal::GetCapturedStdout();
        errors = testing::internal::GetCapturedStderr();
        return status;
    }

    TemporaryDirectory directory;
    std::mutex mutex;
    std::function<HttpAnswer(const HttpRequest&)> answer;
    TestAgent agent; // ends first: its threads call the handler
    std::string output;
    std::string errors;
};

#endif
