#ifndef ZRM_HOST_SILENCE_JSON_H
#define ZRM_HOST_SILENCE_JSON_H

#include "host/silences/Silence.h"

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace zrm::host {

class JsonWriter;

/// Silences as JSON. Stateless.
namespace SilenceJson {

/// An object with the members of a silence, and its state at a time.
void write(JsonWriter& json, const Silence& silence, std::int64_t now);

/// {"situation", "log", "severity", "node", "group": {..}}, each if it is given; {"all": true} if
/// none is.
std::string match(const SilenceMatch& match);

/// What match has written; none for any other text.
std::optional<SilenceMatch> parseMatch(std::string_view text);

} // namespace SilenceJson

} // namespace zrm::host

#endif
