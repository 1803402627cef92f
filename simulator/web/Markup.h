#pragma once

#include <string>
#include <string_view>

namespace simulator
{

/// @p text as the content or the quoted attribute value of an HTML or XML element. Whatever it holds, the document stays well-formed: markup is
/// escaped, and what is no UTF-8 or no character of XML 1.0 becomes U+FFFD.
std::string markup(std::string_view text);

} // namespace simulator
