#include "kyvisa/core/Object.h"

#include "kyvisa/include/visa.h"

namespace kyvisa
{

ViStatus Object::dispose(ObjectPointer object)
{
    if (!object->inherited())
        return object->close();
    object->abandon();
    // Its destructor would wait for threads that are not in this process, so it never runs.
    new ObjectPointer(std::move(object));
    return VI_SUCCESS;
}

} // namespace kyvisa
