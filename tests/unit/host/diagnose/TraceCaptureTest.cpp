#include "host/framework/TraceCapture.h"

#include "base/TraceScope.h"
#include "host/framework/TraceControl.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>

#include <fstream>
#include <thread>

using namespace zrm;
using namespace zrm::host;

namespace {

TRC1_Anchor anchor{"TraceCaptureTest.cpp"};

void speak(const char* text) {
    TraceScope trace(anchor);
    trace.error()("error %s", text);
    trace.detail()("detail %s", text);
}

/// The trace goes to a file while a test runs.
class TraceCaptureTest : public testing::Test {
protected:
    TraceCaptureTest() { TraceControl::openFile(m_path); }
    ~TraceCaptureTest() override {
        TraceControl::configure("error");
        TraceControl::openFile("");
    }
    std::string traced() const {
        std::ifstream stream(m_path);
        return {std::istreambuf_iterator<char>(stream), {}};
    }

    TemporaryDirectory m_directory;
    std::string m_path = m_directory.file("trace");
};

TEST_F(TraceCaptureTest, CollectsTheErrorsOfItsThreadAndWritesNone) {
    TraceCapture capture;
    speak("one");
    speak("two");
    EXPECT_EQ(capture.take(), "error one error two");
    EXPECT_EQ(capture.take(), "");
    EXPECT_EQ(traced(), "");
}

TEST_F(TraceCaptureTest, CollectsOnlyErrorsWhateverTheLevels) {
    for (const char* levels : {"none", "all", "TraceCaptureTest=detail"}) {
        TraceControl::configure(levels);
        TraceCapture capture;
        speak(levels);
        EXPECT_EQ(capture.take(), std::string("error ") + levels);
    }
}

TEST_F(TraceCaptureTest, OtherThreadsTraceAsUsual) {
    const TraceCapture capture;
    std::thread other([] { speak("other"); });
    other.join();
    EXPECT_THAT(traced(), testing::HasSubstr("error other"));
    EXPECT_THAT(traced(), testing::Not(testing::HasSubstr("detail")));
}

TEST_F(TraceCaptureTest, TheLevelsApplyAgainAfterwards) {
    TraceControl::configure("none");
    {
        const TraceCapture capture;
        speak("captured");
    }
    speak("after");
    EXPECT_EQ(traced(), "");
    TraceControl::configure("error");
    speak("later");
    EXPECT_THAT(traced(), testing::HasSubstr("error later"));
}

TEST_F(TraceCaptureTest, ASilentThreadWritesNothing) {
    TraceControl::configure("all");
    {
        const TraceSilence silence;
        speak("silent");
        const TraceSilence inner;
        TraceScope(anchor).always()("always");
    }
    EXPECT_EQ(traced(), "");
    speak("after");
    EXPECT_THAT(traced(), testing::HasSubstr("error after"));
}

TEST_F(TraceCaptureTest, OtherThreadsTraceWhileOneIsSilent) {
    TraceControl::configure("error");
    const TraceSilence silence;
    std::thread other([] { speak("other"); });
    other.join();
    EXPECT_THAT(traced(), testing::HasSubstr("error other"));
}

TEST_F(TraceCaptureTest, ACaptureCollectsTheErrorsOfASilentThread) {
    const TraceSilence silence;
    TraceCapture capture;
    speak("one");
    EXPECT_EQ(capture.take(), "error one");
}

TEST_F(TraceCaptureTest, ThreadsCaptureTheirOwn) {
    TraceControl::configure("none");
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([i] {
            const std::string name = std::to_string(i);
            for (int turn = 0; turn < 500; ++turn) {
                TraceCapture capture;
                speak(name.c_str());
                ASSERT_EQ(capture.take(), "error " + name);
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(traced(), "");
}

} // namespace
