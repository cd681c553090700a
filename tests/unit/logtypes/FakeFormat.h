#ifndef ZRM_TESTS_FAKE_FORMAT_H
#define ZRM_TESTS_FAKE_FORMAT_H

#include "base/EntryFields.h"
#include "logs/EntryFormat.h"

#include <memory>
#include <string>
#include <string_view>

/// A format of entries "HHMM system|source|type|class|description", on 5 October of a year that is
/// given if the entry begins with "Y", an hour ahead of UTC if it begins with "Z". Without the
/// digits it has no time. The field "all" is the entry.
class FakeFormat final : public zrm::EntryFormat {
public:
    explicit FakeFormat(std::size_t recordLength = 0, std::string definition = "fake")
        : m_recordLength(recordLength), m_definition(std::move(definition)) {}

    std::unique_ptr<Reader> reader() const override { return std::make_unique<FakeReader>(); }
    std::size_t recordLength() const noexcept override { return m_recordLength; }
    const std::string& definition() const noexcept override { return m_definition; }

private:
    class FakeReader final : public Reader {
    public:
        bool read(std::string_view entry, zrm::EntryColumns& columns) override {
            if (entry.starts_with("bad")) {
                return false;
            }
            readTime(entry, columns);
            for (std::string_view* const column :
                 {&columns.system, &columns.source, &columns.type, &columns.entryClass}) {
                *column = entry.substr(0, entry.find('|'));
                entry.remove_prefix(std::min(entry.size(), column->size() + 1));
            }
            columns.description = entry;
            return true;
        }
        void readFields(std::string_view entry, zrm::EntryFields& fields) override {
            fields.add("all", entry);
        }
        std::string_view reason() const noexcept override { return "it begins with bad"; }

    private:
        static void readTime(std::string_view& entry, zrm::EntryColumns& columns) {
            const std::size_t mark = entry.starts_with('Y') || entry.starts_with('Z') ? 1 : 0;
            if (entry.find_first_not_of("0123456789", mark) != mark + 4) {
                return;
            }
            columns.hasTime = true;
            columns.hasYear = mark != 0;
            columns.time = {mark != 0 ? 2004 : 1970, 10, 5, number(entry, mark),
                            number(entry, mark + 2), 0};
            if (entry.front() == 'Z') {
                columns.offset = 3600;
            }
            entry.remove_prefix(mark + 5);
        }
        static unsigned number(std::string_view text, std::size_t at) {
            return static_cast<unsigned>((text[at] - '0') * 10 + text[at + 1] - '0');
        }
    };

    const std::size_t m_recordLength;
    const std::string m_definition;
};

#endif
