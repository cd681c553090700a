#ifndef ZRM_TEST_JOURNAL_H
#define ZRM_TEST_JOURNAL_H

#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <cstdio>
#include <map>
#include <string>
#include <vector>

/// Real journal files, written by the program that receives journals of other machines.
class TestJournal {
public:
    static constexpr std::uint64_t firstTime = 1'763'000'000'000'000; ///< 2025-11-13 02:13:20 UTC

    using Fields = std::map<std::string, std::string>;

    /// One entry, a second after the last one.
    void add(const std::string& message, Fields fields = {}) {
        fields.try_emplace("_BOOT_ID", "0123456789abcdef0123456789abcdef");
        fields.try_emplace("_HOSTNAME", "web1");
        const std::uint64_t elapsed = m_entries++ * 1'000'000;
        m_pending += "__REALTIME_TIMESTAMP=" + std::to_string(firstTime + elapsed) +
                     "\n__MONOTONIC_TIMESTAMP=" + std::to_string(1 + elapsed) + '\n';
        fields["MESSAGE"] = message;
        for (const auto& [name, value] : fields) {
            m_pending += name + '\n';
            for (unsigned shift = 0; shift < 64; shift += 8) {
                m_pending += static_cast<char>(value.size() >> shift & 0xffU);
            }
            m_pending += value + '\n';
        }
        m_pending += '\n';
    }

    /// Appends the entries added since the last call to this file of the journal.
    void write(const std::string& file = "a.journal") {
        const std::string command =
            "/lib/systemd/systemd-journal-remote -o '" + path(file) + "' - >/dev/null 2>&1";
        std::FILE* const pipe = popen(command.c_str(), "w");
        ASSERT_NE(pipe, nullptr);
        ASSERT_EQ(std::fwrite(m_pending.data(), 1, m_pending.size(), pipe), m_pending.size());
        ASSERT_EQ(pclose(pipe), 0) << "systemd-journal-remote failed";
        m_pending.clear();
    }

    std::string path(const std::string& file) const { return directory.file(file.c_str()); }

    TemporaryDirectory directory;

private:
    std::uint64_t m_entries = 0;
    std::string m_pending;
};

#endif
