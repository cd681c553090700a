#include "base/EntryFields.h"
#include "host/formats/FormatDescription.h"
#include "host/formats/JsonFormat.h"
#include "require.h"

#include <cstdint>
#include <cstring>
#include <memory>
#include <string_view>

using namespace zrm;
using namespace zrm::host;

// Any entry is read or refused with a reason; its fields keep to their bounds, and those of the
// entry read last and those of an entry that is read anew are the same.

namespace {

/// A copy of the exact size, where a step outside is found.
struct Copy {
    explicit Copy(std::string_view text) : bytes(new char[text.size()]), size(text.size()) {
        std::memcpy(bytes.get(), text.data(), size);
    }
    std::string_view text() const { return {bytes.get(), size}; }

    const std::unique_ptr<char[]> bytes;
    const std::size_t size;
};

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const auto format = *JsonFormat::make({});
    static const auto reader = format->reader();
    if (size == 0) {
        return 0;
    }
    const Copy entry({reinterpret_cast<const char*>(data), size});
    EntryColumns columns;
    const bool isRead = reader->read(entry.text(), columns);
    if (!isRead) {
        require(!reader->reason().empty());
    }

    EntryFields fields;
    reader->readFields(entry.text(), fields);
    require(fields.all().size() <= EntryFields::most);
    std::size_t bytes = 0;
    for (const auto& [name, value] : fields.all()) {
        require(!name.empty() && name.size() <= EntryFields::longestName);
        bytes += value.size();
    }
    require(bytes <= 2 * EntryFields::room || bytes <= size);

    // On a reader that has seen another entry.
    const auto other = format->reader();
    EntryColumns ignored;
    other->read("{\"a\":\"\\n\",\"b\":{\"c\":1}}", ignored);
    EntryFields again;
    other->readFields(entry.text(), again);
    require(again.all().size() == fields.all().size());
    for (std::size_t i = 0; i < fields.all().size(); ++i) {
        require(again.all()[i].name == fields.all()[i].name);
        require(again.all()[i].value == fields.all()[i].value);
    }
    return 0;
}
