#pragma once

#include "simulator/profile/Profile.h"

#include <stdexcept>
#include <string>

namespace simulator
{

/// Says which profile cannot be had, where in it the reason is, and what: "psu.json:12:5: ...".
class ProfileFileError : public std::runtime_error
{
public:
    using std::runtime_error::runtime_error;
};

/**
 * Loads a profile. A name without a slash and without ".json" is one of those that come with the program, which are looked for in
 * ../share/kyvisa/profiles beside the folder of the program file: installed programs and those of a build folder find them alike. Everything
 * else is the path of a file.
 *
 * Throws ProfileFileError.
 */
Profile loadProfile(const std::string &nameOrPath);

} // namespace simulator
