// Writes the benchmark's syslog lines to standard output: about 108 bytes each, the time moving on
// by a second every thousand lines, every hundredth line a failed login.
//
//     bench_generate LINES

#include <array>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <string_view>

namespace {

constexpr long kLinesPerSecond = 1000;
constexpr long kLinesPerMatch = 100;

constexpr std::array<std::string_view, 4> kSources = {"app[1402]", "cron[77]", "nginx[901]",
                                                      "kernel"};

void writeLine(long number, const char* stamp) {
    if (number % kLinesPerMatch == kLinesPerMatch - 1) {
        std::printf("%s web1 sshd[2140]: Failed password for invalid user admin%07ld from "
                    "203.0.113.7 port 50122 ssh2\n",
                    stamp, number);
        return;
    }
    const std::string_view source = kSources[static_cast<std::size_t>(number) % kSources.size()];
    std::printf("%s web1 %.*s: request %07ld from 192.0.2.%ld answered with 200 after %ld ms, "
                "worker %ld done\n",
                stamp, static_cast<int>(source.size()), source.data(), number, number % 250,
                number % 97 + 100, number % 8);
}

} // namespace

int main(int argc, char** argv) {
    if (argc != 2) {
        std::fputs("usage: bench_generate LINES\n", stderr);
        return 2;
    }
    const long lines = std::strtol(argv[1], nullptr, 10);
    const std::time_t begin = std::time(nullptr) - lines / kLinesPerSecond;
    std::array<char, 32> stamp{};
    for (long number = 0; number < lines; ++number) {
        if (number % kLinesPerSecond == 0) {
            const std::time_t now = begin + number / kLinesPerSecond;
            std::tm parts{};
            localtime_r(&now, &parts);
            std::strftime(stamp.data(), stamp.size(), "%b %e %H:%M:%S", &parts);
        }
        writeLine(number, stamp.data());
    }
    return std::fflush(stdout) == 0 ? 0 : 1;
}
