#ifndef ZRM_HOST_LOGFMT_FORMAT_H
#define ZRM_HOST_LOGFMT_FORMAT_H

#include "host/base/Result.h"
#include "host/formats/FieldColumns.h"
#include "logs/EntryFormat.h"

#include <memory>
#include <string>

namespace zrm::host {

struct FormatDescription;

/// Entries that are pairs such as `time=2026-11-19T10:00:00Z level=info msg="ready" port=8080`, in
/// any order. The pairs are the fields; which of them fill columns is as in JSON entries. Without a
/// description, that is the whole entry. An entry that does not begin with a pair does not fit.
class LogfmtFormat final : public EntryFormat {
public:
    static Result<std::shared_ptr<const EntryFormat>> make(const FormatDescription& description);

    std::unique_ptr<Reader> reader() const override;
    const std::string& definition() const noexcept override { return m_definition; }

private:
    class LogfmtReader;

    LogfmtFormat(FieldColumns columns, std::string definition);

    const FieldColumns m_columns;
    const std::string m_definition;
};

} // namespace zrm::host

#endif
