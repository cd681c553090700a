#ifndef ZRM_HOST_STEERING_TEXT_H
#define ZRM_HOST_STEERING_TEXT_H

#include <cstddef>
#include <string>
#include <string_view>

namespace zrm::host {

/// Makes characters that control how text is shown (Utf8::isSteering) visible. Any thread.
namespace SteeringText {

/// Appends a character as an escape: \u202e.
void appendEscape(std::string& text, char32_t character);

/// A JSON document in valid UTF-8 with all such characters in its strings escaped; line ends
/// between values stay.
std::string escapedInJson(std::string document);

/// Copies a text, as much as fits, with terminal controls other than line ends and tabs escaped,
/// and returns the number of bytes written. Neither allocates nor throws.
std::size_t copyVisible(std::string_view text, char* out, std::size_t room) noexcept;

} // namespace SteeringText

} // namespace zrm::host

#endif
