#pragma once

#include <string_view>

namespace simulator
{

// What the pages need besides themselves, served as files of their own: no page holds style or script.
extern const std::string_view PageStyle;  ///< CSS
extern const std::string_view PageScript; ///< brings the main part of a page up to date while somebody looks at it
extern const std::string_view PageIcon;   ///< SVG

} // namespace simulator
