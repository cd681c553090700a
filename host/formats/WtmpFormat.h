#ifndef ZRM_HOST_WTMP_FORMAT_H
#define ZRM_HOST_WTMP_FORMAT_H

#include "host/base/Result.h"
#include "logs/EntryFormat.h"

#include <memory>
#include <string>

namespace zrm::host {

struct FormatDescription;

/// The system's own login records (utmpx), as in /var/log/wtmp and /var/log/btmp. The columns are
/// those of the login accounting log: source is the line, type what happened, and the description
/// has the rest. Host and address, among others, are fields.
class WtmpFormat final : public EntryFormat {
public:
    static Result<std::shared_ptr<const EntryFormat>> make(const FormatDescription& description);

    std::unique_ptr<Reader> reader() const override;
    std::size_t recordLength() const noexcept override;
    const std::string& definition() const noexcept override { return m_definition; }

private:
    explicit WtmpFormat(const FormatDescription& description);

    const std::string m_definition;
};

} // namespace zrm::host

#endif
