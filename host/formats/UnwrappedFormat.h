#ifndef ZRM_HOST_UNWRAPPED_FORMAT_H
#define ZRM_HOST_UNWRAPPED_FORMAT_H

#include "host/base/Result.h"
#include "host/formats/ColumnTexts.h"
#include "host/formats/Unwrapper.h"
#include "logs/EntryFormat.h"

#include <memory>
#include <string>

namespace zrm::host {

struct FormatDescription;

/// Entries that a container runtime has wrapped. What is in them is taken apart by another format;
/// if that finds no time, the runtime's counts. The stream is the field "stream". Without another
/// format, the text is the description and the stream is the type.
class UnwrappedFormat final : public EntryFormat {
public:
    using Make = Result<std::shared_ptr<const EntryFormat>> (*)(const FormatDescription&);

    /// `makeInner` makes the other format. A description of type "regex" without an expression has
    /// none.
    static Result<std::shared_ptr<const EntryFormat>> make(const FormatDescription& description,
                                                           Make makeInner);

    std::unique_ptr<Reader> reader() const override;
    const std::string& definition() const noexcept override { return m_definition; }

private:
    class UnwrappedReader;

    UnwrappedFormat(Unwrapper::Kind kind, std::shared_ptr<const EntryFormat> inner,
                    ColumnTexts texts, std::string definition);

    const Unwrapper::Kind m_kind;
    const std::shared_ptr<const EntryFormat> m_inner; ///< null: the text is the description
    const ColumnTexts m_texts;                        ///< without another format
    const std::string m_definition;
};

} // namespace zrm::host

#endif
