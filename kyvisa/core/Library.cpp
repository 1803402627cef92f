#include "kyvisa/core/Library.h"

#include "kyvisa/os/ForkEpoch.h"

namespace kyvisa
{
namespace
{

// The forking thread holds both locks across fork(), so the child finds both tables whole.
void beforeFork()
{
    Library::instance().handles.lockForFork();
    Library::instance().locks.lockForFork();
}

void afterForkInParent()
{
    Library::instance().locks.unlockAfterFork();
    Library::instance().handles.unlockInParent();
}

void afterForkInChild()
{
    Library::instance().locks.forgetAll();
    Library::instance().locks.unlockAfterFork();
    Library::instance().handles.unlockInChild();
}

} // namespace

Library::Library()
{
    os::watchForks(beforeFork, afterForkInParent, afterForkInChild);
}

Library &Library::instance()
{
    static Library *const library = new Library;
    return *library;
}

} // namespace kyvisa
