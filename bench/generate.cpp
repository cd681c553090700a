// Writes the benchmark's data to standard output. The time moves on by a second every thousand
// lines and ends now; every hundredth line is one that a situation looks for.
//
//     bench_generate syslog LINES        lines of the system logger, about 110 bytes each
//     bench_generate user LINES          lines of an application, about 112 bytes each
//     bench_generate access LINES        lines of a web server, about 200 bytes each
//     bench_generate json LINES          JSON objects of 12 fields, about 300 bytes each
//     bench_generate accounting RECORDS  login records of 40 bytes

#include <array>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <string_view>

namespace {

constexpr long perSecond = 1000;
constexpr long perMatch = 100;
constexpr long customers = 99991; // a prime number, so that all take turns, far from each other

constexpr std::array<std::string_view, 4> sources = {"app[1402]", "cron[77]", "nginx[901]",
                                                     "kernel"};

void writeSyslogLine(long number, const char* stamp) {
    if (number % perMatch == perMatch - 1) {
        std::printf("%s web1 sshd[2140]: Failed password for invalid user admin%07ld from "
                    "203.0.113.7 port 50122 ssh2\n",
                    stamp, number);
        return;
    }
    const std::string_view source = sources[static_cast<std::size_t>(number) % sources.size()];
    std::printf("%s web1 %.*s: request %07ld from 192.0.2.%ld answered with 200 after %ld ms, "
                "worker %ld done\n",
                stamp, static_cast<int>(source.size()), source.data(), number, number % 250,
                number % 97 + 100, number % 8);
}

void writeUserLine(long number, const char* stamp) {
    const bool fails = number % perMatch == perMatch - 1;
    std::printf("%s %s order %07ld of customer %06ld %s after %ld ms on worker %ld, attempt 1, "
                "queue main\n",
                stamp, fails ? "ERROR" : "INFO", number, number * 40503 % customers,
                fails ? "payment refused" : "payment accepted", number % 97 + 100, number % 8);
}

void writeAccessLine(long number, const char* stamp) {
    const bool fails = number % perMatch == perMatch - 1;
    std::printf("192.0.2.%ld - - [%s] \"GET /shop/item/%07ld?from=list HTTP/1.1\" %d %ld "
                "\"https://www.example.org/shop\" \"Mozilla/5.0 (X11; Linux x86_64; rv:132.0) "
                "Gecko/20100101 Firefox/132.0\"\n",
                number % 250, stamp, number, fails ? 503 : 200, number % 40000);
}

void writeJsonLine(long number, const char* stamp) {
    const bool fails = number % perMatch == perMatch - 1;
    std::printf(
        "{\"ts\":\"%s.%03ldZ\",\"level\":\"%s\",\"logger\":\"http.server\",\"msg\":\"request "
        "completed and answer sent\",\"method\":\"GET\",\"path\":\"/api/v1/orders/%07ld/items\","
        "\"status\":%d,\"bytes\":%ld,\"duration\":0.0%04ld,\"remote\":\"192.0.2.%ld\",\"request\":"
        "\"5f2a8f4e-9f2b-4a4e-b6c6-%012ld\",\"http\":{\"version\":1.1}}\n",
        stamp, number % perSecond, fails ? "error" : "info", number, fails ? 503 : 200,
        number % 40000, number % 9973, number % 250, number);
}

/// The agent's layout: user, id, line, pid, type, termination, exit, time.
void writeRecord(long number, std::time_t now) {
    struct {
        char user[8];
        char id[4];
        char line[12];
        std::int16_t numbers[4];
        std::int64_t time;
    } record{};
    static_assert(sizeof record == 40);
    std::snprintf(record.user, sizeof record.user, "user%ld", number % 100);
    std::snprintf(record.line, sizeof record.line, "pts/%ld", number % 40);
    record.numbers[0] = static_cast<std::int16_t>(1000 + number % 30000);
    record.numbers[1] = static_cast<std::int16_t>(7 + number % 2);
    record.time = now;
    std::fwrite(&record, sizeof record, 1, stdout);
}

struct Kind {
    std::string_view name;
    const char* stamp; ///< null: records
    void (*writeLine)(long number, const char* stamp);
};

constexpr Kind kinds[] = {
    {"syslog", "%b %e %H:%M:%S", writeSyslogLine},
    {"user", "%Y-%m-%d %H:%M:%S", writeUserLine},
    {"access", "%d/%b/%Y:%H:%M:%S %z", writeAccessLine},
    {"json", "%Y-%m-%dT%H:%M:%S", writeJsonLine},
    {"accounting", nullptr, nullptr},
};

void write(const Kind& kind, long count) {
    const std::time_t begin = std::time(nullptr) - count / perSecond;
    std::array<char, 64> stamp{};
    for (long number = 0; number < count; ++number) {
        const std::time_t now = begin + number / perSecond;
        if (kind.stamp == nullptr) {
            writeRecord(number, now);
            continue;
        }
        if (number % perSecond == 0) {
            std::tm parts{};
            localtime_r(&now, &parts);
            std::strftime(stamp.data(), stamp.size(), kind.stamp, &parts);
        }
        kind.writeLine(number, stamp.data());
    }
}

} // namespace

int main(int argc, char** argv) {
    for (const Kind& kind : kinds) {
        if (argc == 3 && kind.name == argv[1]) {
            write(kind, std::strtol(argv[2], nullptr, 10));
            return std::fflush(stdout) == 0 ? 0 : 1;
        }
    }
    std::fputs("usage: bench_generate syslog|user|access|json|accounting COUNT\n", stderr);
    return 2;
}
