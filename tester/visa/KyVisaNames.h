#pragma once

#include <cstdint>

/*
 * The names of VISA codes, as log lines and status displays show them.
 *
 * Each lookup answers a text that lives as long as the program, or the fallback named beside it. They never allocate,
 * never fail and may be called from any thread, the VISA library's callback threads included.
 */

const char *KyVisaRenModeToString(std::uint16_t mode);   ///< of viGpibControlREN; "Unknown Mode"
const char *KyVisaAtnModeToString(std::uint16_t mode);   ///< of viGpibControlATN; "Unknown Mode"
const char *KyVisaEventToString(std::uint32_t type);     ///< "Unknown Event"
const char *KyVisaAttrToString(std::uint32_t attribute); ///< "Unknown Attribute"
const char *KyVisaStatusToString(std::int32_t status);   ///< "Unknown Status"
const char *KyVisaLockToString(std::uint32_t lockType);  ///< "Unknown Lock-Status"
