#ifndef ZRM_TESTS_ACCOUNTING_RECORDS_H
#define ZRM_TESTS_ACCOUNTING_RECORDS_H

#include "logtypes/AdminLogFile.h"

#include <cstdint>
#include <cstring>
#include <string>

using namespace zrm;

/// The fields of one accounting record; texts longer than their field are cut.
struct AccountingRecord {
    std::string user = {};
    std::string id = {};
    std::string line = {};
    std::int16_t pid = 0;
    std::int16_t type = 7;
    std::int16_t termination = 0;
    std::int16_t exit = 0;
    std::int64_t time = 0;

    /// The 40 bytes of the record in the file, assembled byte by byte.
    std::string bytes() const {
        return field(user, 8) + field(id, 4) + field(line, 12) + number(pid, 2) + number(type, 2) +
               number(termination, 2) + number(exit, 2) + number(time, 8);
    }

private:
    static std::string field(std::string text, std::size_t width) {
        text.resize(width, '\0');
        return text;
    }
    static std::string number(std::int64_t value, int width) {
        std::string text;
        for (int i = 0; i < width; ++i) {
            text += static_cast<char>(value >> (8 * i));
        }
        return text;
    }
};

#endif
