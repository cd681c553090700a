#include "base/EntryFields.h"
#include "framework/LogEntry.h"
#include "host/formats/FormatDescription.h"
#include "require.h"

#include <cstdint>
#include <cstring>
#include <memory>
#include <string_view>

using namespace zrm;
using namespace zrm::host;

// Any entry is taken apart or refused with a reason, as Docker's ("D" before it) or as Kubernetes'.
// What is in it has at most as many bytes.

namespace {

struct Format {
    explicit Format(const char* runtime) {
        FormatDescription description;
        description.type = "regex";
        description.unwrap = runtime;
        format = *makeFormat(description);
        reader = format->reader();
    }
    std::shared_ptr<const EntryFormat> format;
    std::unique_ptr<EntryFormat::Reader> reader;
};

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const Format docker("docker");
    static const Format cri("cri");
    if (size == 0 || size > EntryKeep::longestText) {
        return 0;
    }
    EntryFormat::Reader& reader = *(data[0] == 'D' ? docker : cri).reader;
    // On the heap and of the exact size, where a step outside is found.
    const std::unique_ptr<char[]> memory(new char[size]);
    std::memcpy(memory.get(), data + 1, size - 1);
    const std::string_view entry(memory.get(), size - 1);
    EntryColumns columns;
    if (!reader.read(entry, columns)) {
        require(!reader.reason().empty());
        return 0;
    }
    require(columns.hasTime);
    require(columns.description.size() <= entry.size());
    EntryFields fields;
    reader.readFields(entry, fields);
    require(fields.find("stream") != nullptr);
    return 0;
}
