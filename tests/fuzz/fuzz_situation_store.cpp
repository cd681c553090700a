#include "host/situations/SituationStore.h"

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <string>

#include <unistd.h>

using namespace zrm::host;

// Any file of situations gives what it holds, which is the same when it is saved and read again, or
// is moved aside whole with a message.

namespace {

namespace fs = std::filesystem;

/// A directory in memory where there is one: what is saved is synced each time.
const fs::path& directory() {
    static const auto* const made = [] {
        std::string name = (fs::exists("/dev/shm") ? "/dev/shm" : "/tmp");
        name += "/zrm-fuzz-XXXXXX";
        if (mkdtemp(name.data()) == nullptr) {
            std::abort();
        }
        auto* const path = new fs::path(name);
        std::atexit([] { fs::remove_all(directory()); });
        return path;
    }();
    return *made;
}

void write(const fs::path& path, const std::uint8_t* data, std::size_t size) {
    std::FILE* const file = std::fopen(path.c_str(), "w");
    if (file == nullptr || std::fwrite(data, 1, size, file) != size || std::fclose(file) != 0) {
        std::abort();
    }
}

bool areSame(const SituationStore::Content& left, const SituationStore::Content& right) {
    if (left.stoppedFiles != right.stoppedFiles || left.made.size() != right.made.size()) {
        return false;
    }
    for (std::size_t i = 0; i < left.made.size(); ++i) {
        if (left.made[i].config != right.made[i].config ||
            left.made[i].isStopped != right.made[i].isStopped ||
            left.made[i].problem != right.made[i].problem) {
            return false;
        }
    }
    return true;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const fs::path path = directory() / "situations.json";
    write(path, data, size);
    SituationStore store(path);
    const SituationStore::Content content = store.load();
    if (!content.message.empty()) {
        if (fs::exists(path) || !content.made.empty() || !content.stoppedFiles.empty()) {
            std::abort();
        }
        for (const fs::directory_entry& aside : fs::directory_iterator(directory())) {
            if (aside.file_size() != size) {
                std::abort();
            }
            fs::remove(aside);
        }
    }
    if (!store.save(content)) {
        std::abort();
    }
    SituationStore again(path);
    const SituationStore::Content loaded = again.load();
    if (!areSame(loaded, content) || !loaded.message.empty()) {
        std::abort();
    }
    return 0;
}
