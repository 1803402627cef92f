#include "kyvisa/core/StatusText.h"

#include "kyvisa/core/StatusTable.h"
#include "kyvisa/include/visa.h"

namespace kyvisa
{

const char *statusText(ViStatus status)
{
    switch (status) {
#define KYVISA_STATUS_CASE(name, text)                                                                                 \
    case name:                                                                                                         \
        return text;
        KYVISA_STATUS_TABLE(KYVISA_STATUS_CASE)
#undef KYVISA_STATUS_CASE
    default:
        return nullptr;
    }
}

const char *statusName(ViStatus status)
{
    switch (status) {
#define KYVISA_STATUS_CASE(name, text)                                                                                 \
    case name:                                                                                                         \
        return #name;
        KYVISA_STATUS_TABLE(KYVISA_STATUS_CASE)
#undef KYVISA_STATUS_CASE
    default:
        return nullptr;
    }
}

} // namespace kyvisa
