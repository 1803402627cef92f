/*
 * visatype.h - the data types of the VISA C interface (VPP-4.3.2).
 *
 * Every integer type has exactly the width in its name; handles, statuses and attribute identifiers are 32 bits wide.
 * ViAttrState, ViBusAddress and ViBusSize are 64 bits wide on a 64-bit platform and 32 bits elsewhere.
 * ViP<Type> is a pointer to one value, ViA<Type> a pointer to the first element of an array.
 */
#ifndef KYVISA_VISATYPE_H
#define KYVISA_VISATYPE_H

#include <stdarg.h>
#include <stdint.h>

#if UINTPTR_MAX > 0xFFFFFFFFu
#define VI_ENV_64_BIT
#endif

/* Marks an operation that the shared library exports. */
#if defined(__GNUC__)
#define KYVISA_API __attribute__((visibility("default")))
#else
#define KYVISA_API
#endif

/* Calling convention and pointer size macros of the standard's header; none is needed on Linux. */
#define _VI_FUNC
#define _VI_FUNCC
#define _VI_FUNCH

#define VI_NULL  (0)
#define VI_TRUE  (1)
#define VI_FALSE (0)

typedef uint64_t ViUInt64, *ViPUInt64, *ViAUInt64;
typedef int64_t ViInt64, *ViPInt64, *ViAInt64;
typedef uint32_t ViUInt32, *ViPUInt32, *ViAUInt32;
typedef int32_t ViInt32, *ViPInt32, *ViAInt32;
typedef uint16_t ViUInt16, *ViPUInt16, *ViAUInt16;
typedef int16_t ViInt16, *ViPInt16, *ViAInt16;
typedef uint8_t ViUInt8, *ViPUInt8, *ViAUInt8;
typedef int8_t ViInt8, *ViPInt8, *ViAInt8;
typedef char ViChar, *ViPChar, *ViAChar;
typedef unsigned char ViByte, *ViPByte, *ViAByte;
typedef float ViReal32, *ViPReal32, *ViAReal32;
typedef double ViReal64, *ViPReal64, *ViAReal64;
typedef void *ViAddr, **ViPAddr, **ViAAddr;

typedef ViUInt16 ViBoolean, *ViPBoolean, *ViABoolean;
typedef ViInt32 ViStatus, *ViPStatus, *ViAStatus;
typedef ViUInt32 ViVersion, *ViPVersion, *ViAVersion;
typedef ViUInt32 ViObject, *ViPObject, *ViAObject;
typedef ViUInt32 ViSession, *ViPSession, *ViASession;
typedef ViUInt32 ViEvent, *ViPEvent, *ViAEvent;
typedef ViUInt32 ViFindList, *ViPFindList, *ViAFindList;
typedef ViUInt32 ViAttr, *ViPAttr, *ViAAttr;
typedef ViUInt32 ViEventType, *ViPEventType, *ViAEventType;
typedef ViUInt32 ViEventFilter, *ViPEventFilter, *ViAEventFilter;
typedef ViUInt32 ViJobId, *ViPJobId, *ViAJobId;
typedef ViUInt32 ViAccessMode, *ViPAccessMode, *ViAAccessMode;
typedef ViUInt64 ViBusAddress64, *ViPBusAddress64, *ViABusAddress64;
typedef ViUInt64 ViBusSize64, *ViPBusSize64, *ViABusSize64;

#if defined(VI_ENV_64_BIT)
typedef ViUInt64 ViBusAddress, *ViPBusAddress, *ViABusAddress;
typedef ViUInt64 ViBusSize, *ViPBusSize, *ViABusSize;
typedef ViUInt64 ViAttrState;
#else
typedef ViUInt32 ViBusAddress, *ViPBusAddress, *ViABusAddress;
typedef ViUInt32 ViBusSize, *ViPBusSize, *ViABusSize;
typedef ViUInt32 ViAttrState;
#endif
typedef void *ViPAttrState;

typedef ViByte *ViBuf;
typedef ViByte *ViPBuf;
typedef ViBuf *ViABuf;
typedef const ViByte *ViConstBuf;

typedef ViChar *ViString;
typedef ViChar *ViPString;
typedef ViString *ViAString;
typedef const ViChar *ViConstString;

typedef ViString ViRsrc;
typedef ViString ViPRsrc;
typedef ViString *ViARsrc;
typedef ViConstString ViConstRsrc;

typedef ViString ViKeyId;
typedef ViConstString ViConstKeyId;

typedef va_list ViVAList;

/*
 * An event handler. It runs on a thread of the library (for VI_EVENT_EXCEPTION: on the thread whose operation failed).
 * The context is valid until the handler returns; the library closes it. VI_SUCCESS_NCHAIN stops the session's other
 * handlers.
 */
typedef ViStatus (*ViHndlr)(ViSession vi, ViEventType eventType, ViEvent context, ViAddr userHandle);

#endif /* KYVISA_VISATYPE_H */
