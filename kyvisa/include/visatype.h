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

#define KYVISA_TYPE(Name, Type)                                                                                        \
    typedef Type Vi##Name;                                                                                             \
    typedef Type *ViP##Name;                                                                                           \
    typedef Type *ViA##Name

KYVISA_TYPE(UInt64, uint64_t);
KYVISA_TYPE(Int64, int64_t);
KYVISA_TYPE(UInt32, uint32_t);
KYVISA_TYPE(Int32, int32_t);
KYVISA_TYPE(UInt16, uint16_t);
KYVISA_TYPE(Int16, int16_t);
KYVISA_TYPE(UInt8, uint8_t);
KYVISA_TYPE(Int8, int8_t);
KYVISA_TYPE(Char, char);
KYVISA_TYPE(Byte, unsigned char);
KYVISA_TYPE(Real32, float);
KYVISA_TYPE(Real64, double);
KYVISA_TYPE(Addr, void *);

KYVISA_TYPE(Boolean, ViUInt16);
KYVISA_TYPE(Status, ViInt32);
KYVISA_TYPE(Version, ViUInt32);
KYVISA_TYPE(Object, ViUInt32);
KYVISA_TYPE(Session, ViUInt32);
KYVISA_TYPE(Event, ViUInt32);
KYVISA_TYPE(FindList, ViUInt32);
KYVISA_TYPE(Attr, ViUInt32);
KYVISA_TYPE(EventType, ViUInt32);
KYVISA_TYPE(EventFilter, ViUInt32);
KYVISA_TYPE(JobId, ViUInt32);
KYVISA_TYPE(AccessMode, ViUInt32);
KYVISA_TYPE(BusAddress64, ViUInt64);
KYVISA_TYPE(BusSize64, ViUInt64);

#if defined(VI_ENV_64_BIT)
KYVISA_TYPE(BusAddress, ViUInt64);
KYVISA_TYPE(BusSize, ViUInt64);
typedef ViUInt64 ViAttrState;
#else
KYVISA_TYPE(BusAddress, ViUInt32);
KYVISA_TYPE(BusSize, ViUInt32);
typedef ViUInt32 ViAttrState;
#endif
typedef void *ViPAttrState;

#undef KYVISA_TYPE

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
