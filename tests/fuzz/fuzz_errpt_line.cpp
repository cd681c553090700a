// Lines of the error log's command: the fields go into a row on the heap, where a step past it is
// found.

#include "logs/zrm_rmlogent_data.h"
#include "logtypes/ErrLogFile.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>

using namespace zrm;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    constexpr std::size_t longestLine = 255;
    const std::string line(reinterpret_cast<const char*>(data), std::min(size, longestLine));
    char stamp[16];
    const char* position = ErrLogFile::formatEntryTime(stamp, line.c_str());
    if (position == nullptr) {
        return 0;
    }
    const auto row = std::make_unique<zrm_rmlogent_data_t>();
    const char* const end = reinterpret_cast<const char*>(row.get() + 1);
    position = ErrLogFile::extractNextField(row->entrytype, position, sizeof row->entrytype, end);
    position = ErrLogFile::extractNextField(row->entryclass, position, sizeof row->entryclass, end);
    position = ErrLogFile::extractNextField(row->entrysrc, position, sizeof row->entrysrc, end);
    ErrLogFile::formatDescription(row->entrydesc, line.c_str(), position, sizeof row->entrydesc, 0);
    ErrLogFile::formatDescription(row->uentrydesc, line.c_str(), position, sizeof row->uentrydesc,
                                  1);
    return 0;
}
