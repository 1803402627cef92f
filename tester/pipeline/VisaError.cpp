#include "pipeline/VisaError.h"

#include "visa/KyVisaNames.h"

const char *VisaError::StatusCode(int status)
{
    return KyVisaStatusToString(status);
}
