#include "host/framework/TraceControl.h"

#include "agent/ErrorText.h"
#include "agent/framework/trace.h"
#include "host/framework/TraceLevels.h"
#include "host/framework/TraceOutput.h"

#include <memory>
#include <mutex>

namespace {

constexpr const char* defaultLevels = "error";

/// Levels that were set. Never destroyed, since a thread may be reading them.
struct Setting {
    std::string text;
    TraceLevels levels;
    const Setting* earlier = nullptr;
};

constinit std::mutex g_mutex; ///< serialises configure()
std::atomic<const Setting*> g_setting{nullptr};

/// No anchor has learnt generation 0.
void bumpGeneration() {
    if (TRC1_Generation.fetch_add(1) + 1 == 0) {
        ++TRC1_Generation;
    }
}

} // namespace

std::string TraceControl::configure(const std::string& text) {
    auto setting = std::make_unique<Setting>();
    if (std::string error = setting->levels.parse(text); !error.empty()) {
        return error;
    }
    setting->text = text.empty() ? defaultLevels : text;
    const std::lock_guard guard(g_mutex);
    setting->earlier = g_setting.load();
    g_setting.store(setting.release());
    bumpGeneration();
    return {};
}

std::string TraceControl::levels() {
    const Setting* const setting = g_setting.load();
    return setting != nullptr ? setting->text : defaultLevels;
}

std::string TraceControl::openFile(const std::string& path) {
    const ErrorText error(TraceOutput::open(path.c_str()));
    return error.number() == 0 ? "" : "cannot open " + path + ": " + error.text();
}

unsigned TraceControl::levelOf(const char* unit) noexcept {
    const Setting* const setting = g_setting.load();
    return setting != nullptr ? setting->levels.levelOf(unit) : static_cast<unsigned>(TRC1_ERROR);
}
