#include "host/framework/TraceControl.h"

#include "framework/trace.h"
#include "host/framework/TraceLevels.h"
#include "host/framework/TraceOutput.h"

#include <atomic>
#include <memory>
#include <mutex>
#include <thread>

namespace zrm::host {

namespace {

constexpr const char* defaultLevels = "error";

/// Levels set by configure.
struct Setting {
    std::string text;
    TraceLevels levels;
    std::unique_ptr<Setting> earlier; ///< earlier settings that a thread may still be reading
};

/// How often to check for a moment at which no thread reads the levels. Reading takes nanoseconds.
constexpr int mostLooks = 1000;

constinit std::mutex g_mutex; ///< serialises changes, and guards the texts
std::atomic<Setting*> g_setting{nullptr};
std::atomic<int> g_readers{0};

/// Protects the setting that the calling thread reads. Neither locks nor allocates, so a child
/// between fork and exec may read, too.
class Reader {
public:
    Reader() noexcept { ++g_readers; }
    ~Reader() { --g_readers; }
    Reader(const Reader&) = delete;
    Reader& operator=(const Reader&) = delete;
    const Setting* setting() const noexcept { return g_setting.load(); }
};

/// Frees the settings before this one, which is in force: threads that start reading now read this
/// one. If threads keep reading, the next change frees them.
void freeEarlier(Setting& current) {
    for (int look = 0; look < mostLooks; ++look) {
        if (g_readers.load() == 0) {
            while (current.earlier != nullptr) {
                current.earlier = std::move(current.earlier->earlier);
            }
            return;
        }
        std::this_thread::yield();
    }
}

/// No anchor has cached generation 0.
void bumpGeneration() {
    if (TRC1_Generation.fetch_add(1) + 1 == 0) {
        ++TRC1_Generation;
    }
}

} // namespace

Result<void> TraceControl::configure(const std::string& text) {
    auto setting = std::make_unique<Setting>();
    if (const Result<void> parsed = setting->levels.parse(text); !parsed) {
        return parsed;
    }
    setting->text = text.empty() ? defaultLevels : text;
    const std::lock_guard guard(g_mutex);
    setting->earlier.reset(g_setting.load());
    Setting& current = *setting.release();
    g_setting.store(&current);
    bumpGeneration();
    freeEarlier(current);
    return {};
}

std::string TraceControl::levels() {
    const std::lock_guard guard(g_mutex);
    const Setting* const setting = g_setting.load();
    return setting != nullptr ? setting->text : defaultLevels;
}

Result<void> TraceControl::openFile(const std::string& path) {
    const int error = TraceOutput::open(path.c_str());
    if (error == ELOOP) {
        return refused(path + " is a symbolic link, which is not followed", "name the file itself");
    }
    return error == 0 ? Result<void>() : refused(because("cannot open " + path, error));
}

unsigned TraceControl::levelOf(const char* unit) noexcept {
    const Reader reader;
    const Setting* const setting = reader.setting();
    return setting != nullptr ? setting->levels.levelOf(unit) : static_cast<unsigned>(TRC1_ERROR);
}

} // namespace zrm::host
