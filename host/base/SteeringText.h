#ifndef ZRM_HOST_STEERING_TEXT_H
#define ZRM_HOST_STEERING_TEXT_H

#include <string>

namespace zrm::host {

/// Characters that steer how text is shown (Utf8::isSteering), made visible. Any thread.
namespace SteeringText {

/// Appends a character by its number: \u202e.
void appendEscape(std::string& text, char32_t character);

/// A JSON document, in valid UTF-8, with all such characters of its strings escaped; line ends
/// between its values stay.
std::string escapedInJson(std::string document);

} // namespace SteeringText

} // namespace zrm::host

#endif
