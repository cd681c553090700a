#ifndef ZRM_HOST_MESSAGE_FORMAT_H
#define ZRM_HOST_MESSAGE_FORMAT_H

#include "host/base/Result.h"
#include "host/formats/ColumnTexts.h"
#include "host/formats/FieldExtracts.h"
#include "logs/EntryFormat.h"

#include <memory>
#include <string>
#include <string_view>

namespace zrm {
class EntryFields;
}

namespace zrm::host {

struct FormatDescription;

/// What is read from the messages of a journal: fields, and with the format of a program's lines
/// also type and description. What the journal itself says of an entry stays: its time, system,
/// source and class, and its own fields before those of the message. Not changed after it was made;
/// any thread.
class MessageFormat {
public:
    /// The type "journal", for which extracts, pairs, defaults and values count, or "syslog", for
    /// which the same do, or that of a format of lines.
    static Result<std::shared_ptr<const MessageFormat>> make(const FormatDescription& description);

    /// All that decides what is read, as a text.
    const std::string& definition() const noexcept { return m_definition; }

    /// Allocates nothing per entry once it has read some. One thread.
    class Reader {
    public:
        /// The format outlives the reader.
        explicit Reader(const MessageFormat& format);

        /// Changes the columns of an entry, of which the description is the whole message. A
        /// message that does not fit stays as it is.
        void read(EntryColumns& columns);
        /// Adds the fields of the entry whose columns were read last. Names and values are views
        /// into the message, or into memory of `fields` or of the reader.
        void readFields(std::string_view source, std::string_view message, EntryFields& fields);

    private:
        const MessageFormat& m_format;
        const std::unique_ptr<EntryFormat::Reader> m_lines; ///< null: messages are no such lines
        FieldExtracts::Workspace m_workspace;
        bool m_fits = false;
    };

private:
    MessageFormat(const FormatDescription& description, FieldExtracts extracts, ColumnTexts texts,
                  std::shared_ptr<const EntryFormat> lines);

    const FieldExtracts m_extracts;
    const ColumnTexts m_texts;
    const bool m_hasPairs;
    const std::shared_ptr<const EntryFormat> m_lines;
    const std::string m_definition;
};

} // namespace zrm::host

#endif
