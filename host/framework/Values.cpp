// The host's implementation of values.h.
#include "framework/values.h"

#include "host/framework/ColumnText.h"
#include "host/framework/HandleTable.h"

#include <cstring>

using namespace zrm::host;

void AGF_CopyUnpad(char* destination, const char* source, int length) {
    const std::size_t width = length > 0 ? static_cast<std::size_t>(length) : 0;
    const std::string_view text = ColumnText::unpadded(source, width);
    std::memcpy(destination, text.data(), text.size());
    destination[text.size()] = '\0';
}

void RSC1_Drop(unsigned handle) {
    HandleTable::unpin(handle);
}
