#include "base/EntryFields.h"
#include "host/formats/FormatDescription.h"
#include "host/formats/WtmpFormat.h"
#include "require.h"

#include <cstdint>
#include <cstring>
#include <memory>
#include <string_view>

using namespace zrm;
using namespace zrm::host;

// Any bytes are read as a record, or refused with a reason. Nothing outside them is read, and all
// texts are in them or in memory of the reader.

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const auto format = *WtmpFormat::make({});
    static const auto reader = format->reader();
    // On the heap and of the exact size, where a step outside is found.
    const std::unique_ptr<char[]> bytes(new char[size]);
    std::memcpy(bytes.get(), data, size);
    const std::string_view record(bytes.get(), size);
    EntryColumns columns;
    EntryFields fields;
    const bool isRead = reader->read(record, columns);
    reader->readFields(record, fields);
    require(isRead == reader->reason().empty());
    require(isRead == !fields.all().empty());
    std::size_t length = columns.source.size() + columns.type.size() + columns.description.size();
    for (const auto& [name, value] : fields.all()) {
        length += value.size();
    }
    require(length < 1000);
    return 0;
}
