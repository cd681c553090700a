#include "base/EntryFields.h"
#include "host/formats/KeyValuePairs.h"
#include "require.h"

#include <cstdint>
#include <cstring>
#include <memory>
#include <string>
#include <string_view>

using namespace zrm;
using namespace zrm::host;

// Keys and values of any text lie within it, and an unescaped value is not longer than the value.

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::unique_ptr<char[]> bytes(new char[size]); // a step outside is found
    std::memcpy(bytes.get(), data, size);
    const std::string_view text(bytes.get(), size);
    KeyValuePairs pairs(text);
    std::size_t count = 0;
    for (KeyValuePairs::Pair pair; pairs.next(pair); ++count) {
        require(!pair.key.empty() && pair.key.size() <= EntryFields::longestName);
        require(pair.key.data() >= text.data());
        require(pair.value.data() + pair.value.size() <= text.data() + text.size());
        std::string plain;
        KeyValuePairs::unescape(pair.value, plain);
        require(plain.size() <= pair.value.size());
    }
    require(count > 0 || !KeyValuePairs::begin(text));
    EntryFields fields;
    KeyValuePairs::addTo(fields, text);
    require(fields.all().size() <= count && fields.all().size() <= EntryFields::most);
    return 0;
}
