// What the judgement of groups costs: entries that raise no event, of many different values.
#include "host/situations/EpisodeJudge.h"
#include "host/situations/GroupKey.h"

#include <array>
#include <charconv>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <fstream>
#include <random>
#include <string>
#include <string_view>
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

/// "10.B.C.D", different for each number below 2^24.
std::string_view address(std::size_t number, std::array<char, 16>& room) {
    char* end = room.data();
    *end++ = '1';
    *end++ = '0';
    for (const int bits : {16, 8, 0}) {
        *end++ = '.';
        end = std::to_chars(end, room.end(), number >> bits & 0xff).ptr;
    }
    return {room.data(), end};
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
    std::mt19937 random(1);
    std::vector<std::uint32_t> order(entries);
    for (std::uint32_t& group : order) {
        group = static_cast<std::uint32_t>(random() % groups);
    }
    const std::size_t before = resident();
    const double begin = cpuSeconds();
    EpisodeJudge judge(rules);
    std::vector<EndedEpisode> ended;
    std::string key;
    std::array<char, 16> room{};
    for (std::size_t entry = 0; entry < entries; ++entry) {
        // 20,000 entries a second.
        const auto time = 1'800'000'000 + static_cast<std::int64_t>(entry / 20'000);
        key.clear();
        GroupKey::append(key, address(order[entry], room));
        judge.judge({time, key, {}, "/var/log/auth.log"}, ended);
    }
    const double seconds = cpuSeconds() - begin;
    std::printf("%.2f million entries per CPU second, %zu bytes per group\n",
                static_cast<double>(entries) / seconds / 1e6,
                (resident() - before) / judge.groups());
    return 0;
}
