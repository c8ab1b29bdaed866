// The text of an event of Advanced SubStation Alpha, the form that the libraries give all text subtitles.
#pragma once

#include <string>
#include <string_view>

namespace av {

// Lines separated by "|", with the markup that the engine draws: "<i>", "</i>", "<b>", "</b>" and "{\anN}".
// Other tags, comments and drawings are left out. `event` begins with the eight fields before its text.
std::string textOfEvent(std::string_view event);

}  // namespace av
