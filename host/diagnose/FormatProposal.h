#ifndef ZRM_HOST_FORMAT_PROPOSAL_H
#define ZRM_HOST_FORMAT_PROPOSAL_H

#include "host/formats/FormatDescription.h"

#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

/// A format of type "regex" made from the shape of lines: where their time is, which word is a
/// level, which one names a logger; what stands in brackets and between separators becomes fields.
/// The most frequent shapes give a pattern each. None if the lines have nothing in common but that
/// they are lines.
std::optional<FormatDescription> proposeFormat(const std::vector<std::string>& lines);

} // namespace zrm::host

#endif
