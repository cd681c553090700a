#ifndef ZRM_HOST_PAIRED_FORMAT_H
#define ZRM_HOST_PAIRED_FORMAT_H

#include "logs/EntryFormat.h"

#include <memory>
#include <string>

namespace zrm::host {

/// Another format whose descriptions hold pairs such as `port=8080 user="anna"`: these are fields,
/// too, behind those of the other format.
class PairedFormat final : public EntryFormat {
public:
    explicit PairedFormat(std::shared_ptr<const EntryFormat> inner)
        : m_inner(std::move(inner)), m_definition("pairs of " + m_inner->definition()) {}

    std::unique_ptr<Reader> reader() const override;
    std::size_t recordLength() const noexcept override { return m_inner->recordLength(); }
    const std::string& definition() const noexcept override { return m_definition; }

private:
    class PairedReader;

    const std::shared_ptr<const EntryFormat> m_inner;
    const std::string m_definition;
};

} // namespace zrm::host

#endif
