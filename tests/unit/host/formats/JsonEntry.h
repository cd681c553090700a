#ifndef ZRM_TEST_JSON_ENTRY_H
#define ZRM_TEST_JSON_ENTRY_H

#include "base/EntryFields.h"
#include "host/formats/FormatDescription.h"
#include "host/formats/JsonFormat.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

/// Reads entries by a format, each from memory of exactly its size.
class JsonEntry {
public:
    explicit JsonEntry(const zrm::host::FormatDescription& description = {}) {
        auto format = zrm::host::JsonFormat::make(description);
        EXPECT_TRUE(format) << format.error().text();
        m_format = std::move(*format);
        m_reader = m_format->reader();
    }

    bool read(std::string_view text) {
        m_text.assign(text.begin(), text.end());
        columns = {};
        fields.clear();
        const bool isRead = m_reader->read({m_text.data(), m_text.size()}, columns);
        if (isRead) {
            m_reader->readFields({m_text.data(), m_text.size()}, fields);
        }
        return isRead;
    }
    std::string reasonOf(std::string_view text) {
        return read(text) ? "read" : std::string(m_reader->reason());
    }
    std::string field(std::string_view name) const {
        const std::string_view* const value = fields.find(name);
        return value == nullptr ? "(none)" : std::string(*value);
    }
    zrm::EntryFormat::Reader& reader() { return *m_reader; }

    zrm::EntryColumns columns;
    zrm::EntryFields fields;

private:
    std::shared_ptr<const zrm::EntryFormat> m_format;
    std::unique_ptr<zrm::EntryFormat::Reader> m_reader;
    std::vector<char> m_text;
};

inline std::string timeOf(const zrm::EntryColumns& columns) {
    if (!columns.hasTime) {
        return "none";
    }
    const std::int64_t seconds = columns.time.seconds() - columns.offset.value_or(0);
    return std::to_string(seconds) + (columns.offset ? " UTC" : " local");
}

inline zrm::host::FormatDescription withColumns(std::map<std::string, std::string> columns) {
    zrm::host::FormatDescription description;
    description.columns = std::move(columns);
    return description;
}

#endif
