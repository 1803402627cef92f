#pragma once

/**
 * Every status of the library with the sentence that viStatusDesc() answers, once. KYVISA_STATUS_TABLE(X) calls
 * X(name, text) for each; the numbers are those of visa.h.
 */
// clang-format off
#define KYVISA_STATUS_TABLE(X) \
    X(VI_SUCCESS, "Operation completed.") \
    X(VI_SUCCESS_DEV_NPRESENT, "Session opened but the device does not answer.") \
    X(VI_SUCCESS_EVENT_DIS, "Event was already disabled for at least one of the given mechanisms.") \
    X(VI_SUCCESS_EVENT_EN, "Event was already enabled for at least one of the given mechanisms.") \
    X(VI_SUCCESS_MAX_CNT, "Read ended because the requested byte count was reached.") \
    X(VI_SUCCESS_NCHAIN, "Handler return value: event handled, call no further handlers of this session.") \
    X(VI_SUCCESS_NESTED_EXCLUSIVE, "Lock/unlock done, session holds (or still holds) nested exclusive locks.") \
    X(VI_SUCCESS_NESTED_SHARED, "Lock/unlock done, session holds (or still holds) nested shared locks.") \
    X(VI_SUCCESS_QUEUE_EMPTY, "Discard succeeded but the queue was already empty.") \
    X(VI_SUCCESS_QUEUE_NEMPTY, "Event delivered, more matching events are still queued.") \
    X(VI_SUCCESS_SYNC, "Asynchronous operation was carried out synchronously.") \
    X(VI_SUCCESS_TERM_CHAR, "Read ended on the termination character.") \
    X(VI_SUCCESS_TRIG_MAPPED, "Trigger path is already mapped.") \
    X(VI_WARN_CONFIG_NLOADED, "Requested configuration missing or not loadable, defaults used.") \
    X(VI_WARN_EXT_FUNC_NIMPL, "Succeeded, but a lower driver lacks the extended function.") \
    X(VI_WARN_NSUP_ATTR_STATE, "Attribute state is valid but not supported here (ignored).") \
    X(VI_WARN_NSUP_BUF, "The given buffer is not supported.") \
    X(VI_WARN_NULL_OBJECT, "Object reference passed is null/uninitialised.") \
    X(VI_WARN_QUEUE_OVERFLOW, "Event delivered, but the queue had overflowed and events were lost (also: USB interrupt data larger than the configured size).") \
    X(VI_WARN_UNKNOWN_STATUS, "Status code cannot be translated to text.") \
    X(VI_ERROR_ABORT, "Operation was aborted (viTerminate).") \
    X(VI_ERROR_ALLOC, "Insufficient system resources.") \
    X(VI_ERROR_ASRL_FRAMING, "Serial framing error.") \
    X(VI_ERROR_ASRL_OVERRUN, "Serial overrun: a character was lost.") \
    X(VI_ERROR_ASRL_PARITY, "Serial parity error.") \
    X(VI_ERROR_ATTR_READONLY, "Attribute cannot be set.") \
    X(VI_ERROR_BERR, "Bus error during transfer.") \
    X(VI_ERROR_CLOSING_FAILED, "Structures of the object could not be released.") \
    X(VI_ERROR_CONN_LOST, "The I/O connection of the session was lost.") \
    X(VI_ERROR_FILE_ACCESS, "File could not be opened.") \
    X(VI_ERROR_FILE_IO, "File access failed.") \
    X(VI_ERROR_HNDLR_NINSTALLED, "No handler installed for the event (or it was not installed).") \
    X(VI_ERROR_INP_PROT_VIOL, "Device reported an input protocol error.") \
    X(VI_ERROR_INTF_NUM_NCONFIG, "Interface type valid but the interface number is not configured.") \
    X(VI_ERROR_INTR_PENDING, "An earlier interrupt is still pending.") \
    X(VI_ERROR_INV_ACCESS_KEY, "Requested key is not the valid access key of the resource (or is too long).") \
    X(VI_ERROR_INV_ACC_MODE, "Access mode invalid.") \
    X(VI_ERROR_INV_CONTEXT, "Event context invalid.") \
    X(VI_ERROR_INV_DEGREE, "Termination degree invalid.") \
    X(VI_ERROR_INV_EVENT, "Event type not supported by the resource.") \
    X(VI_ERROR_INV_EXPR, "Search expression is invalid.") \
    X(VI_ERROR_INV_FMT, "Format specifier invalid.") \
    X(VI_ERROR_INV_HNDLR_REF, "Handler reference invalid or no installed handler matches.") \
    X(VI_ERROR_INV_JOB_ID, "Job identifier invalid.") \
    X(VI_ERROR_INV_LENGTH, "Length invalid.") \
    X(VI_ERROR_INV_LINE, "Line value invalid.") \
    X(VI_ERROR_INV_LOCK_TYPE, "Lock type not supported by the resource.") \
    X(VI_ERROR_INV_MASK, "Buffer mask invalid.") \
    X(VI_ERROR_INV_MECH, "Mechanism value invalid.") \
    X(VI_ERROR_INV_MODE, "Mode value invalid.") \
    X(VI_ERROR_INV_OBJECT, "Session or object reference invalid (same value as VI_ERROR_INV_SESSION).") \
    X(VI_ERROR_INV_OFFSET, "Offset invalid.") \
    X(VI_ERROR_INV_PARAMETER, "Value of some parameter invalid.") \
    X(VI_ERROR_INV_PROT, "Protocol invalid (also: secure connection requested but not available).") \
    X(VI_ERROR_INV_RSRC_NAME, "Resource string cannot be parsed.") \
    X(VI_ERROR_INV_SETUP, "Setup invalid: attributes inconsistent or configuration corrupt.") \
    X(VI_ERROR_INV_SIZE, "Window or buffer size invalid.") \
    X(VI_ERROR_INV_SPACE, "Address space invalid.") \
    X(VI_ERROR_INV_WIDTH, "Access width invalid.") \
    X(VI_ERROR_IN_PROGRESS, "Another asynchronous operation is in progress.") \
    X(VI_ERROR_IO, "I/O error during transfer.") \
    X(VI_ERROR_LIBRARY_NFOUND, "A required code library was not found or loaded.") \
    X(VI_ERROR_LINE_IN_USE, "Trigger line is in use.") \
    X(VI_ERROR_LINE_NRESERVED, "Trigger line was used without being reserved.") \
    X(VI_ERROR_MEM_NSHARED, "Device exports no memory.") \
    X(VI_ERROR_NCIC, "Interface is not controller in charge.") \
    X(VI_ERROR_NENABLED, "Session is not enabled for the event type.") \
    X(VI_ERROR_NIMPL_OPER, "Operation not implemented.") \
    X(VI_ERROR_NLISTENERS, "No listener on the bus (NRFD and NDAC unasserted).") \
    X(VI_ERROR_NPERMISSION, "Access denied (device or credentials refused).") \
    X(VI_ERROR_NSUP_ALIGN_OFFSET, "Offset not aligned for the access width.") \
    X(VI_ERROR_NSUP_ATTR, "Attribute not defined for this session, event or find list.") \
    X(VI_ERROR_NSUP_ATTR_STATE, "Attribute value invalid or not supported.") \
    X(VI_ERROR_NSUP_FMT, "Format specifier not supported.") \
    X(VI_ERROR_NSUP_INTR, "Interface cannot generate the interrupt requested.") \
    X(VI_ERROR_NSUP_LINE, "Line not supported by the hardware.") \
    X(VI_ERROR_NSUP_MECH, "Mechanism not supported for the event type.") \
    X(VI_ERROR_NSUP_MODE, "Mode not supported by this implementation.") \
    X(VI_ERROR_NSUP_OFFSET, "Offset not reachable with this hardware (or value does not fit 32 bits).") \
    X(VI_ERROR_NSUP_OPER, "Session does not support this operation.") \
    X(VI_ERROR_NSUP_VAR_WIDTH, "Source and destination widths differ and that is not supported.") \
    X(VI_ERROR_NSUP_WIDTH, "Access width not supported by the hardware.") \
    X(VI_ERROR_NSYS_CNTLR, "Interface is not system controller.") \
    X(VI_ERROR_OUTP_PROT_VIOL, "Device reported an output protocol error.") \
    X(VI_ERROR_QUEUE_ERROR, "Operation could not be queued.") \
    X(VI_ERROR_RAW_RD_PROT_VIOL, "Raw read protocol violated during transfer.") \
    X(VI_ERROR_RAW_WR_PROT_VIOL, "Raw write protocol violated during transfer.") \
    X(VI_ERROR_RESP_PENDING, "An earlier response is still pending (multiple query).") \
    X(VI_ERROR_RSRC_BUSY, "Resource is valid but cannot be accessed now.") \
    X(VI_ERROR_RSRC_LOCKED, "Resource is locked by another session for this kind of access, or the lock type is incompatible.") \
    X(VI_ERROR_RSRC_NFOUND, "No matching resource / resource not present / no more matches.") \
    X(VI_ERROR_SESN_NLOCKED, "Session holds no lock on the resource.") \
    X(VI_ERROR_SRQ_NOCCURRED, "No service request received for the session.") \
    X(VI_ERROR_SYSTEM_ERROR, "Unknown system error / VISA system failed to initialise.") \
    X(VI_ERROR_TMO, "Time-out expired before completion.") \
    X(VI_ERROR_TRIG_NMAPPED, "Trigger path not mapped.") \
    X(VI_ERROR_USER_BUF, "User buffer invalid or not accessible for the size given.") \
    X(VI_ERROR_WINDOW_MAPPED, "Session already has a mapped window.") \
    X(VI_ERROR_WINDOW_NMAPPED, "Session has no mapped window.")
// clang-format on
