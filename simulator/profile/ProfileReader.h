#pragma once

#include "simulator/profile/JsonText.h"
#include "simulator/profile/Profile.h"

#include <string_view>

namespace simulator
{

/// Reads a profile and checks all of it: what it returns works. Throws ProfileError.
Profile readProfile(std::string_view text);

} // namespace simulator
