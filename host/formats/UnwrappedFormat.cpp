#include "host/formats/UnwrappedFormat.h"

#include "base/EntryFields.h"
#include "host/formats/FormatDescription.h"
#include "host/formats/TimePattern.h"

#include <optional>
#include <utility>

namespace zrm::host {

class UnwrappedFormat::UnwrappedReader final : public Reader {
public:
    explicit UnwrappedReader(const UnwrappedFormat& format)
        : m_unwrapper(format.m_kind), m_texts(format.m_texts),
          m_inner(format.m_inner ? format.m_inner->reader() : nullptr) {}

    bool read(std::string_view entry, EntryColumns& columns) override {
        m_reason = {};
        m_entry = {};
        if (!m_unwrapper.read(entry)) {
            m_reason = m_unwrapper.reason();
            return false;
        }
        m_entry = entry;
        if (!m_inner) {
            columns.type = m_unwrapper.stream();
            columns.description = m_unwrapper.text();
            m_texts.apply(columns);
        } else if (!m_inner->read(m_unwrapper.text(), columns)) {
            return false;
        }
        if (!columns.hasTime) {
            m_times.read(m_unwrapper.time(), columns);
        }
        if (!columns.hasTime) { // a time of day is not enough: the runtime writes the date
            m_reason = "the container runtime's time is not a time";
        }
        return columns.hasTime;
    }

    void readFields(std::string_view entry, EntryFields& fields) override {
        const bool isRead = entry.data() == m_entry.data() && entry.size() == m_entry.size();
        EntryColumns columns;
        if (!isRead && !read(entry, columns)) {
            return;
        }
        if (m_inner) {
            m_inner->readFields(m_unwrapper.text(), fields);
        }
        m_unwrapper.addFields(fields);
    }

    std::string_view reason() const noexcept override {
        return m_reason.empty() && m_inner ? m_inner->reason() : m_reason;
    }

private:
    Unwrapper m_unwrapper;
    const ColumnTexts& m_texts;
    const std::unique_ptr<Reader> m_inner;
    TimeMemo m_times{TimePattern::common()};
    std::string_view m_entry;  ///< that was read last; not its bytes, which may have changed
    std::string_view m_reason; ///< empty: the inner format's
};

Result<std::shared_ptr<const EntryFormat>>
UnwrappedFormat::make(const FormatDescription& description, Make makeInner) {
    const std::optional<Unwrapper::Kind> kind = Unwrapper::kindOf(description.unwrap);
    if (!kind) {
        return refused("'" + description.unwrap + "' is not a container runtime's format",
                       R"(write "docker" or "cri")", "unwrap");
    }
    std::shared_ptr<const EntryFormat> inner;
    if (description.type != "regex" || !description.patterns.empty()) {
        auto made = makeInner(description);
        if (!made) {
            return made;
        }
        inner = std::move(*made);
    }
    auto texts = ColumnTexts::make(description);
    if (!texts) {
        return tl::unexpected(std::move(texts.error()));
    }
    return std::shared_ptr<const EntryFormat>(
        new UnwrappedFormat(*kind, std::move(inner), std::move(*texts), description.definition()));
}

UnwrappedFormat::UnwrappedFormat(Unwrapper::Kind kind, std::shared_ptr<const EntryFormat> inner,
                                 ColumnTexts texts, std::string definition)
    : m_kind(kind), m_inner(std::move(inner)), m_texts(std::move(texts)),
      m_definition(std::move(definition)) {}

std::unique_ptr<EntryFormat::Reader> UnwrappedFormat::reader() const {
    return std::make_unique<UnwrappedReader>(*this);
}

} // namespace zrm::host
