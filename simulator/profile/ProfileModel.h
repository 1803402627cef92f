#pragma once

namespace simulator
{

class Instrument;
struct InstrumentOptions;
struct Profile;

/// What a profile says about the instrument as a whole; the rest of @p options stays.
void applyProfile(const Profile &profile, InstrumentOptions &options);

/// Adds the profile's settings and commands to an instrument that was made with those options. A command of the same header gives way.
void installProfile(const Profile &profile, Instrument &instrument);

} // namespace simulator
