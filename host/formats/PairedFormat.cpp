#include "host/formats/PairedFormat.h"

#include "host/formats/KeyValuePairs.h"

namespace zrm::host {

class PairedFormat::PairedReader final : public Reader {
public:
    explicit PairedReader(std::unique_ptr<Reader> inner) : m_inner(std::move(inner)) {}

    bool read(std::string_view entry, EntryColumns& columns) override {
        m_entry = {};
        if (!m_inner->read(entry, columns)) {
            return false;
        }
        m_entry = entry;
        m_description = columns.description;
        return true;
    }

    void readFields(std::string_view entry, EntryFields& fields) override {
        EntryColumns columns;
        const bool isLast = m_entry.data() == entry.data() && m_entry.size() == entry.size();
        if (!isLast && !read(entry, columns)) {
            return;
        }
        m_inner->readFields(entry, fields);
        KeyValuePairs::addTo(fields, m_description);
    }

    std::string_view reason() const noexcept override { return m_inner->reason(); }

private:
    const std::unique_ptr<Reader> m_inner;
    std::string_view m_entry;       ///< that was read last
    std::string_view m_description; ///< its description
};

std::unique_ptr<EntryFormat::Reader> PairedFormat::reader() const {
    return std::make_unique<PairedReader>(m_inner->reader());
}

} // namespace zrm::host
