#pragma once

#include "kyvisa/core/HandleTable.h"
#include "kyvisa/core/ResourceLocks.h"

namespace kyvisa
{

/**
 * What the process has once: the handles and the locks. Made by the first call, never destroyed, because threads of the
 * library may still be on their way when the process ends.
 */
class Library
{
public:
    static Library &instance();

    HandleTable handles;
    LockRegistry locks;

private:
    Library();
};

} // namespace kyvisa
