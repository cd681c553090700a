#include "host/sources/JournalLine.h"

namespace zrm::host {

std::string_view JournalLine::idOf(std::string_view cursor) noexcept {
    const std::size_t time = cursor.find(";t="); // and behind it a hash of the contents
    return time == cursor.npos ? cursor : cursor.substr(time + 1);
}

bool JournalLine::addField(std::string_view field) {
    if (field.size() > mostData - data.size()) {
        ++leftOut;
        return false;
    }
    data += field;
    ends.push_back(data.size());
    return true;
}

} // namespace zrm::host
