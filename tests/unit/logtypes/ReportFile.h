#ifndef ZRM_TESTS_REPORT_FILE_H
#define ZRM_TESTS_REPORT_FILE_H

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <iostream>
#include <random>
#include <string>
#include <vector>

/// Makes files of a given size out of lines of random lengths, and reads them forwards.
class ReportFileGenerator {
public:
    ReportFileGenerator() : m_seed(std::random_device{}()), m_random(m_seed) {
        std::cout << "report files: seed " << m_seed << '\n';
    }
    std::uint64_t seed() const { return m_seed; }

    /// Exactly `size` bytes; the longest line has `longest` characters besides its newline.
    std::string content(std::size_t size, std::size_t longest, bool endsWithNewline) {
        std::string content;
        int number = 0;
        while (content.size() < size) {
            std::string line = std::to_string(++number) + ":";
            const std::size_t length = 1 + m_random() % longest;
            line.resize(std::max(length, line.size()), static_cast<char>('a' + m_random() % 26));
            content += line.substr(0, longest) + "\n";
        }
        content.resize(size);
        if (endsWithNewline) {
            content.back() = '\n';
        } else if (content.back() == '\n') {
            content.back() = 'z';
        }
        return content;
    }

    /// The lines of a file, the last one first, without empty ones, which match no format.
    static std::vector<std::string> newestFirst(const std::string& content) {
        std::vector<std::string> lines;
        for (std::size_t begin = 0; begin < content.size();) {
            const std::size_t end = std::min(content.find('\n', begin), content.size());
            // A line of a single character is a blank line too.
            if (end - begin + (end < content.size() ? 1 : 0) > 1) {
                lines.insert(lines.begin(), content.substr(begin, end - begin));
            }
            begin = end + 1;
        }
        return lines;
    }

private:
    std::uint64_t m_seed;
    std::mt19937_64 m_random;
};

#endif
