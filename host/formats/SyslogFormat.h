#ifndef ZRM_HOST_SYSLOG_FORMAT_H
#define ZRM_HOST_SYSLOG_FORMAT_H

#include "host/base/Result.h"
#include "host/formats/ColumnTexts.h"
#include "host/formats/FieldExtracts.h"
#include "logs/EntryFormat.h"

#include <memory>
#include <string>

namespace zrm::host {

struct FormatDescription;

/// Lines of system loggers in any form of SyslogForms, with fields that regular expressions read
/// from their messages beside those of SyslogFields. A line of another form is all description.
class SyslogFormat final : public EntryFormat {
public:
    static Result<std::shared_ptr<const EntryFormat>> make(const FormatDescription& description);

    std::unique_ptr<Reader> reader() const override;
    const std::string& definition() const noexcept override { return m_definition; }

private:
    class SyslogReader;

    SyslogFormat(FieldExtracts extracts, ColumnTexts texts, std::string definition);

    const FieldExtracts m_extracts;
    const ColumnTexts m_texts;
    const std::string m_definition;
};

} // namespace zrm::host

#endif
