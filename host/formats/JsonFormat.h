#ifndef ZRM_HOST_JSON_FORMAT_H
#define ZRM_HOST_JSON_FORMAT_H

#include "host/base/Result.h"
#include "host/formats/FieldColumns.h"
#include "logs/EntryFormat.h"

#include <memory>
#include <string>

namespace zrm::host {

struct FormatDescription;

/// Entries that are JSON objects, one each. Their members are the fields, nested ones with dots in
/// their names. Without a description, that is the whole entry. Of members with the same name the
/// first counts.
///
/// Where `values` says nothing of the type, the numbers 10 to 60 of a field "level" are TRACE to
/// FATAL, and those of a field "PRIORITY", or of "level" beside "short_message", are the severities
/// of syslog.
class JsonFormat final : public EntryFormat {
public:
    static Result<std::shared_ptr<const EntryFormat>> make(const FormatDescription& description);

    std::unique_ptr<Reader> reader() const override;
    const std::string& definition() const noexcept override { return m_definition; }

private:
    class JsonReader;

    JsonFormat(FieldColumns columns, std::string definition);

    const FieldColumns m_columns;
    const std::string m_definition;
};

} // namespace zrm::host

#endif
