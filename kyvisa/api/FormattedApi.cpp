#include "kyvisa/api/Entry.h"

using namespace kyvisa;
using namespace kyvisa::api;

ViStatus viPrintf(ViSession vi, ViConstString, ...)
{
    return unimplemented(vi, "viPrintf");
}

ViStatus viVPrintf(ViSession vi, ViConstString, ViVAList)
{
    return unimplemented(vi, "viVPrintf");
}

ViStatus viSPrintf(ViSession vi, ViPBuf, ViConstString, ...)
{
    return unimplemented(vi, "viSPrintf");
}

ViStatus viVSPrintf(ViSession vi, ViPBuf, ViConstString, ViVAList)
{
    return unimplemented(vi, "viVSPrintf");
}

ViStatus viScanf(ViSession vi, ViConstString, ...)
{
    return unimplemented(vi, "viScanf");
}

ViStatus viVScanf(ViSession vi, ViConstString, ViVAList)
{
    return unimplemented(vi, "viVScanf");
}

ViStatus viSScanf(ViSession vi, ViConstBuf, ViConstString, ...)
{
    return unimplemented(vi, "viSScanf");
}

ViStatus viVSScanf(ViSession vi, ViConstBuf, ViConstString, ViVAList)
{
    return unimplemented(vi, "viVSScanf");
}

ViStatus viQueryf(ViSession vi, ViConstString, ViConstString, ...)
{
    return unimplemented(vi, "viQueryf");
}

ViStatus viVQueryf(ViSession vi, ViConstString, ViConstString, ViVAList)
{
    return unimplemented(vi, "viVQueryf");
}
