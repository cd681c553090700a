#ifndef ZRM_HOST_STEERING_TEXT_H
#define ZRM_HOST_STEERING_TEXT_H

#include <cstddef>
#include <string>
#include <string_view>

namespace zrm::host {

/// Characters that steer how text is shown (Utf8::isSteering), made visible. Any thread.
namespace SteeringText {

/// Appends a character by its number: \u202e.
void appendEscape(std::string& text, char32_t character);

/// A JSON document, in valid UTF-8, with all such characters of its strings escaped; line ends
/// between its values stay.
std::string escapedInJson(std::string document);

/// Copies a text with escapes in the place of what steers a terminal, line ends and tabs excepted,
/// as much of it as there is room for, and returns the number of bytes. Neither allocates nor
/// throws.
std::size_t copyVisible(std::string_view text, char* out, std::size_t room) noexcept;

} // namespace SteeringText

} // namespace zrm::host

#endif
