#include "host/cli/CsvText.h"

namespace zrm::host {

std::string CsvText::record(const std::vector<std::string>& fields) {
    std::string text;
    for (const std::string& field : fields) {
        if (&field != &fields.front()) {
            text += ',';
        }
        if (field.find_first_of(",\"\r\n") == std::string::npos) {
            text += field;
            continue;
        }
        text += '"';
        for (const char c : field) {
            text += c == '"' ? "\"\"" : std::string(1, c);
        }
        text += '"';
    }
    return text + "\r\n";
}

} // namespace zrm::host
