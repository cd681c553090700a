// What the judgement of groups costs: entries that raise no event, of many different values.
#include "host/situations/EpisodeJudge.h"
#include "host/situations/GroupKey.h"

#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <fstream>
#include <random>
#include <string>
#include <vector>

#include <unistd.h>

namespace {

using namespace zrm::host;

/// Resident memory of this process in bytes.
std::size_t resident() {
    std::ifstream statm("/proc/self/statm");
    std::size_t total = 0;
    std::size_t pages = 0;
    statm >> total >> pages;
    return pages * static_cast<std::size_t>(sysconf(_SC_PAGESIZE));
}

double cpuSeconds() {
    return static_cast<double>(std::clock()) / CLOCKS_PER_SEC;
}

} // namespace

/// bench_judge [ENTRIES [GROUPS]]
int main(int argc, char** argv) {
    const std::size_t entries = argc > 1 ? std::strtoul(argv[1], nullptr, 10) : 1'000'000;
    const std::size_t groups = argc > 2 ? std::strtoul(argv[2], nullptr, 10) : 100'000;
    JudgementConfig rules;
    rules.groupBy = {"ip"};
    rules.maxGroups = groups;
    rules.frequency = 1'000'000;
    rules.period = 60;
    rules.resolveAfter = 900;
    std::vector<std::string> keys(groups);
    for (std::size_t group = 0; group < groups; ++group) {
        GroupKey::append(keys[group], "10." + std::to_string(group / 65'536) + '.' +
                                          std::to_string(group / 256 % 256) + '.' +
                                          std::to_string(group % 256));
    }
    std::mt19937 random(1);
    std::vector<std::uint32_t> order(entries);
    for (std::uint32_t& group : order) {
        group = static_cast<std::uint32_t>(random() % groups);
    }
    const std::size_t before = resident();
    const double begin = cpuSeconds();
    EpisodeJudge judge(rules);
    std::vector<EndedEpisode> ended;
    for (std::size_t entry = 0; entry < entries; ++entry) {
        // 20,000 entries a second.
        const auto time = 1'800'000'000 + static_cast<std::int64_t>(entry / 20'000);
        judge.judge({time, keys[order[entry]], {}, "/var/log/auth.log"}, ended);
    }
    const double seconds = cpuSeconds() - begin;
    std::printf("%.2f million entries per CPU second, %zu bytes per group\n",
                static_cast<double>(entries) / seconds / 1e6,
                (resident() - before) / judge.groups());
    return 0;
}
