/*
 * visa.h - the VISA C interface of libkyvisa (VPP-4.3 / VPP-4.3.2, revision 7.2).
 *
 * A program opens the default resource manager, opens a session on a resource string, talks, and closes both:
 *
 *     ViSession rm, vi;
 *     viOpenDefaultRM(&rm);
 *     viOpen(rm, "TCPIP::localhost::hislip0", VI_NULL, 2000, &vi);
 *     viWrite(vi, (ViConstBuf)"*IDN?\n", 6, VI_NULL);
 *     viRead(vi, buffer, sizeof buffer, &count);
 *     viClose(vi);
 *     viClose(rm);
 *
 * Errors     Every operation answers a ViStatus: 0 success, positive completion codes and warnings, negative errors.
 * Time-outs  Milliseconds. Each blocking call has one deadline: VI_ATTR_TMO_VALUE, or the call's own time-out argument.
 * Threads    Any thread may call any operation. One session used by two threads is serialised; two sessions never wait for
 *            each other. viClose and viTerminate from another thread wake a blocked call.
 * Ownership  Texts and buffers belong to the caller. Event contexts handed out by viWaitOnEvent, find lists and sessions are
 *            released with viClose.
 */
#ifndef KYVISA_VISA_H
#define KYVISA_VISA_H

#include <visatype.h>

#if defined(__cplusplus)
extern "C" {
#endif

/* ---- Version of the standard, packed: bits 31..20 major, 19..8 minor, 7..0 sub-minor ---------------------------- */

#define VI_SPEC_VERSION (0x00700200UL)

/* ---- Attributes ------------------------------------------------------------------------------------------------ */

#define VI_ATTR_RSRC_CLASS                  (0xBFFF0001UL)
#define VI_ATTR_RSRC_NAME                   (0xBFFF0002UL)
#define VI_ATTR_RSRC_IMPL_VERSION           (0x3FFF0003UL)
#define VI_ATTR_RSRC_LOCK_STATE             (0x3FFF0004UL)
#define VI_ATTR_MAX_QUEUE_LENGTH            (0x3FFF0005UL)
#define VI_ATTR_USER_DATA_32                (0x3FFF0007UL)
#define VI_ATTR_FDC_CHNL                    (0x3FFF000DUL)
#define VI_ATTR_FDC_MODE                    (0x3FFF000FUL)
#define VI_ATTR_FDC_GEN_SIGNAL_EN           (0x3FFF0011UL)
#define VI_ATTR_FDC_USE_PAIR                (0x3FFF0013UL)
#define VI_ATTR_SEND_END_EN                 (0x3FFF0016UL)
#define VI_ATTR_TERMCHAR                    (0x3FFF0018UL)
#define VI_ATTR_TMO_VALUE                   (0x3FFF001AUL)
#define VI_ATTR_GPIB_READDR_EN              (0x3FFF001BUL)
#define VI_ATTR_IO_PROT                     (0x3FFF001CUL)
#define VI_ATTR_DMA_ALLOW_EN                (0x3FFF001EUL)
#define VI_ATTR_ASRL_BAUD                   (0x3FFF0021UL)
#define VI_ATTR_ASRL_DATA_BITS              (0x3FFF0022UL)
#define VI_ATTR_ASRL_PARITY                 (0x3FFF0023UL)
#define VI_ATTR_ASRL_STOP_BITS              (0x3FFF0024UL)
#define VI_ATTR_ASRL_FLOW_CNTRL             (0x3FFF0025UL)
#define VI_ATTR_RD_BUF_OPER_MODE            (0x3FFF002AUL)
#define VI_ATTR_RD_BUF_SIZE                 (0x3FFF002BUL)
#define VI_ATTR_WR_BUF_OPER_MODE            (0x3FFF002DUL)
#define VI_ATTR_WR_BUF_SIZE                 (0x3FFF002EUL)
#define VI_ATTR_SUPPRESS_END_EN             (0x3FFF0036UL)
#define VI_ATTR_TERMCHAR_EN                 (0x3FFF0038UL)
#define VI_ATTR_DEST_ACCESS_PRIV            (0x3FFF0039UL)
#define VI_ATTR_DEST_BYTE_ORDER             (0x3FFF003AUL)
#define VI_ATTR_SRC_ACCESS_PRIV             (0x3FFF003CUL)
#define VI_ATTR_SRC_BYTE_ORDER              (0x3FFF003DUL)
#define VI_ATTR_SRC_INCREMENT               (0x3FFF0040UL)
#define VI_ATTR_DEST_INCREMENT              (0x3FFF0041UL)
#define VI_ATTR_WIN_ACCESS_PRIV             (0x3FFF0045UL)
#define VI_ATTR_WIN_BYTE_ORDER              (0x3FFF0047UL)
#define VI_ATTR_GPIB_ATN_STATE              (0x3FFF0057UL)
#define VI_ATTR_GPIB_ADDR_STATE             (0x3FFF005CUL)
#define VI_ATTR_GPIB_CIC_STATE              (0x3FFF005EUL)
#define VI_ATTR_GPIB_NDAC_STATE             (0x3FFF0062UL)
#define VI_ATTR_GPIB_SRQ_STATE              (0x3FFF0067UL)
#define VI_ATTR_GPIB_SYS_CNTRL_STATE        (0x3FFF0068UL)
#define VI_ATTR_GPIB_HS488_CBL_LEN          (0x3FFF0069UL)
#define VI_ATTR_CMDR_LA                     (0x3FFF006BUL)
#define VI_ATTR_VXI_DEV_CLASS               (0x3FFF006CUL)
#define VI_ATTR_MAINFRAME_LA                (0x3FFF0070UL)
#define VI_ATTR_MANF_NAME                   (0xBFFF0072UL)
#define VI_ATTR_MODEL_NAME                  (0xBFFF0077UL)
#define VI_ATTR_VXI_VME_INTR_STATUS         (0x3FFF008BUL)
#define VI_ATTR_VXI_TRIG_STATUS             (0x3FFF008DUL)
#define VI_ATTR_VXI_VME_SYSFAIL_STATE       (0x3FFF0094UL)
#define VI_ATTR_WIN_BASE_ADDR_32            (0x3FFF0098UL)
#define VI_ATTR_WIN_SIZE_32                 (0x3FFF009AUL)
#define VI_ATTR_ASRL_AVAIL_NUM              (0x3FFF00ACUL)
#define VI_ATTR_MEM_BASE_32                 (0x3FFF00ADUL)
#define VI_ATTR_ASRL_CTS_STATE              (0x3FFF00AEUL)
#define VI_ATTR_ASRL_DCD_STATE              (0x3FFF00AFUL)
#define VI_ATTR_ASRL_DSR_STATE              (0x3FFF00B1UL)
#define VI_ATTR_ASRL_DTR_STATE              (0x3FFF00B2UL)
#define VI_ATTR_ASRL_END_IN                 (0x3FFF00B3UL)
#define VI_ATTR_ASRL_END_OUT                (0x3FFF00B4UL)
#define VI_ATTR_ASRL_REPLACE_CHAR           (0x3FFF00BEUL)
#define VI_ATTR_ASRL_RI_STATE               (0x3FFF00BFUL)
#define VI_ATTR_ASRL_RTS_STATE              (0x3FFF00C0UL)
#define VI_ATTR_ASRL_XON_CHAR               (0x3FFF00C1UL)
#define VI_ATTR_ASRL_XOFF_CHAR              (0x3FFF00C2UL)
#define VI_ATTR_WIN_ACCESS                  (0x3FFF00C3UL)
#define VI_ATTR_RM_SESSION                  (0x3FFF00C4UL)
#define VI_ATTR_VXI_LA                      (0x3FFF00D5UL)
#define VI_ATTR_MANF_ID                     (0x3FFF00D9UL)
#define VI_ATTR_MEM_SIZE_32                 (0x3FFF00DDUL)
#define VI_ATTR_MEM_SPACE                   (0x3FFF00DEUL)
#define VI_ATTR_MODEL_CODE                  (0x3FFF00DFUL)
#define VI_ATTR_SLOT                        (0x3FFF00E8UL)
#define VI_ATTR_INTF_INST_NAME              (0xBFFF00E9UL)
#define VI_ATTR_IMMEDIATE_SERV              (0x3FFF0100UL)
#define VI_ATTR_INTF_PARENT_NUM             (0x3FFF0101UL)
#define VI_ATTR_RSRC_SPEC_VERSION           (0x3FFF0170UL)
#define VI_ATTR_INTF_TYPE                   (0x3FFF0171UL)
#define VI_ATTR_GPIB_PRIMARY_ADDR           (0x3FFF0172UL)
#define VI_ATTR_GPIB_SECONDARY_ADDR         (0x3FFF0173UL)
#define VI_ATTR_RSRC_MANF_NAME              (0xBFFF0174UL)
#define VI_ATTR_RSRC_MANF_ID                (0x3FFF0175UL)
#define VI_ATTR_INTF_NUM                    (0x3FFF0176UL)
#define VI_ATTR_TRIG_ID                     (0x3FFF0177UL)
#define VI_ATTR_GPIB_REN_STATE              (0x3FFF0181UL)
#define VI_ATTR_GPIB_UNADDR_EN              (0x3FFF0184UL)
#define VI_ATTR_DEV_STATUS_BYTE             (0x3FFF0189UL)
#define VI_ATTR_FILE_APPEND_EN              (0x3FFF0192UL)
#define VI_ATTR_VXI_TRIG_SUPPORT            (0x3FFF0194UL)
#define VI_ATTR_TCPIP_ADDR                  (0xBFFF0195UL)
#define VI_ATTR_TCPIP_HOSTNAME              (0xBFFF0196UL)
#define VI_ATTR_TCPIP_PORT                  (0x3FFF0197UL)
#define VI_ATTR_TCPIP_DEVICE_NAME           (0xBFFF0199UL)
#define VI_ATTR_TCPIP_NODELAY               (0x3FFF019AUL)
#define VI_ATTR_TCPIP_KEEPALIVE             (0x3FFF019BUL)
#define VI_ATTR_4882_COMPLIANT              (0x3FFF019FUL)
#define VI_ATTR_USB_SERIAL_NUM              (0xBFFF01A0UL)
#define VI_ATTR_USB_INTFC_NUM               (0x3FFF01A1UL)
#define VI_ATTR_USB_PROTOCOL                (0x3FFF01A7UL)
#define VI_ATTR_USB_MAX_INTR_SIZE           (0x3FFF01AFUL)
#define VI_ATTR_PXI_DEV_NUM                 (0x3FFF0201UL)
#define VI_ATTR_PXI_FUNC_NUM                (0x3FFF0202UL)
#define VI_ATTR_PXI_BUS_NUM                 (0x3FFF0205UL)
#define VI_ATTR_PXI_CHASSIS                 (0x3FFF0206UL)
#define VI_ATTR_PXI_SLOTPATH                (0xBFFF0207UL)
#define VI_ATTR_PXI_SLOT_LBUS_LEFT          (0x3FFF0208UL)
#define VI_ATTR_PXI_SLOT_LBUS_RIGHT         (0x3FFF0209UL)
#define VI_ATTR_PXI_TRIG_BUS                (0x3FFF020AUL)
#define VI_ATTR_PXI_STAR_TRIG_BUS           (0x3FFF020BUL)
#define VI_ATTR_PXI_STAR_TRIG_LINE          (0x3FFF020CUL)
#define VI_ATTR_PXI_SRC_TRIG_BUS            (0x3FFF020DUL)
#define VI_ATTR_PXI_DEST_TRIG_BUS           (0x3FFF020EUL)
#define VI_ATTR_PXI_MEM_TYPE_BAR0           (0x3FFF0211UL)
#define VI_ATTR_PXI_MEM_TYPE_BAR1           (0x3FFF0212UL)
#define VI_ATTR_PXI_MEM_TYPE_BAR2           (0x3FFF0213UL)
#define VI_ATTR_PXI_MEM_TYPE_BAR3           (0x3FFF0214UL)
#define VI_ATTR_PXI_MEM_TYPE_BAR4           (0x3FFF0215UL)
#define VI_ATTR_PXI_MEM_TYPE_BAR5           (0x3FFF0216UL)
#define VI_ATTR_PXI_MEM_BASE_BAR0_32        (0x3FFF0221UL)
#define VI_ATTR_PXI_MEM_BASE_BAR1_32        (0x3FFF0222UL)
#define VI_ATTR_PXI_MEM_BASE_BAR2_32        (0x3FFF0223UL)
#define VI_ATTR_PXI_MEM_BASE_BAR3_32        (0x3FFF0224UL)
#define VI_ATTR_PXI_MEM_BASE_BAR4_32        (0x3FFF0225UL)
#define VI_ATTR_PXI_MEM_BASE_BAR5_32        (0x3FFF0226UL)
#define VI_ATTR_PXI_MEM_BASE_BAR0_64        (0x3FFF0228UL)
#define VI_ATTR_PXI_MEM_BASE_BAR1_64        (0x3FFF0229UL)
#define VI_ATTR_PXI_MEM_BASE_BAR2_64        (0x3FFF022AUL)
#define VI_ATTR_PXI_MEM_BASE_BAR3_64        (0x3FFF022BUL)
#define VI_ATTR_PXI_MEM_BASE_BAR4_64        (0x3FFF022CUL)
#define VI_ATTR_PXI_MEM_BASE_BAR5_64        (0x3FFF022DUL)
#define VI_ATTR_PXI_MEM_SIZE_BAR0_32        (0x3FFF0231UL)
#define VI_ATTR_PXI_MEM_SIZE_BAR1_32        (0x3FFF0232UL)
#define VI_ATTR_PXI_MEM_SIZE_BAR2_32        (0x3FFF0233UL)
#define VI_ATTR_PXI_MEM_SIZE_BAR3_32        (0x3FFF0234UL)
#define VI_ATTR_PXI_MEM_SIZE_BAR4_32        (0x3FFF0235UL)
#define VI_ATTR_PXI_MEM_SIZE_BAR5_32        (0x3FFF0236UL)
#define VI_ATTR_PXI_MEM_SIZE_BAR0_64        (0x3FFF0238UL)
#define VI_ATTR_PXI_MEM_SIZE_BAR1_64        (0x3FFF0239UL)
#define VI_ATTR_PXI_MEM_SIZE_BAR2_64        (0x3FFF023AUL)
#define VI_ATTR_PXI_MEM_SIZE_BAR3_64        (0x3FFF023BUL)
#define VI_ATTR_PXI_MEM_SIZE_BAR4_64        (0x3FFF023CUL)
#define VI_ATTR_PXI_MEM_SIZE_BAR5_64        (0x3FFF023DUL)
#define VI_ATTR_PXI_IS_EXPRESS              (0x3FFF0240UL)
#define VI_ATTR_PXI_SLOT_LWIDTH             (0x3FFF0241UL)
#define VI_ATTR_PXI_MAX_LWIDTH              (0x3FFF0242UL)
#define VI_ATTR_PXI_ACTUAL_LWIDTH           (0x3FFF0243UL)
#define VI_ATTR_PXI_DSTAR_BUS               (0x3FFF0244UL)
#define VI_ATTR_PXI_DSTAR_SET               (0x3FFF0245UL)
#define VI_ATTR_PXI_ALLOW_WRITE_COMBINE     (0x3FFF0246UL)
#define VI_ATTR_TCPIP_HISLIP_OVERLAP_EN     (0x3FFF0300UL)
#define VI_ATTR_TCPIP_HISLIP_VERSION        (0x3FFF0301UL)
#define VI_ATTR_TCPIP_HISLIP_MAX_MESSAGE_KB (0x3FFF0302UL)
#define VI_ATTR_TCPIP_IS_HISLIP             (0x3FFF0303UL)
#define VI_ATTR_JOB_ID                      (0x3FFF4006UL)
#define VI_ATTR_EVENT_TYPE                  (0x3FFF4010UL)
#define VI_ATTR_SIGP_STATUS_ID              (0x3FFF4011UL)
#define VI_ATTR_RECV_TRIG_ID                (0x3FFF4012UL)
#define VI_ATTR_INTR_STATUS_ID              (0x3FFF4023UL)
#define VI_ATTR_STATUS                      (0x3FFF4025UL)
#define VI_ATTR_RET_COUNT_32                (0x3FFF4026UL)
#define VI_ATTR_BUFFER                      (0x3FFF4027UL)
#define VI_ATTR_RECV_INTR_LEVEL             (0x3FFF4041UL)
#define VI_ATTR_OPER_NAME                   (0xBFFF4042UL)
#define VI_ATTR_GPIB_RECV_CIC_STATE         (0x3FFF4193UL)
#define VI_ATTR_RECV_TCPIP_ADDR             (0xBFFF4198UL)
#define VI_ATTR_USB_RECV_INTR_SIZE          (0x3FFF41B0UL)
#define VI_ATTR_USB_RECV_INTR_DATA          (0xBFFF41B1UL)
#define VI_ATTR_PXI_RECV_INTR_SEQ           (0x3FFF4240UL)
#define VI_ATTR_PXI_RECV_INTR_DATA          (0x3FFF4241UL)
#define VI_ATTR_USER_DATA_64                (0x3FFF000AUL)
#define VI_ATTR_RET_COUNT_64                (0x3FFF4028UL)
#define VI_ATTR_WIN_BASE_ADDR_64            (0x3FFF009BUL)
#define VI_ATTR_WIN_SIZE_64                 (0x3FFF009CUL)
#define VI_ATTR_MEM_BASE_64                 (0x3FFF00D0UL)
#define VI_ATTR_MEM_SIZE_64                 (0x3FFF00D1UL)
#define VI_KY_ATTR_TCPIP_FIND_RSRC_TMO      (0x0FAF0001UL)
#define VI_KY_ATTR_TCPIP_FIND_RSRC_MODE     (0x0FAF0002UL)
#define VI_KY_ATTR_LXI_MANF                 (0x8FAF0003UL)
#define VI_KY_ATTR_LXI_MODEL                (0x8FAF0004UL)
#define VI_KY_ATTR_LXI_SERIAL               (0x8FAF0005UL)
#define VI_KY_ATTR_LXI_VERSION              (0x8FAF0006UL)
#define VI_KY_ATTR_LXI_DESCRIPTION          (0x8FAF0007UL)
#define VI_KY_ATTR_LXI_HOSTNAME             (0x8FAF0008UL)

/* The unsuffixed names follow the width of ViBusAddress, ViBusSize and ViAddr: 64 bits on a 64-bit platform. */
#if defined(VI_ENV_64_BIT)
#define VI_ATTR_USER_DATA         VI_ATTR_USER_DATA_64
#define VI_ATTR_RET_COUNT         VI_ATTR_RET_COUNT_64
#define VI_ATTR_WIN_BASE_ADDR     VI_ATTR_WIN_BASE_ADDR_64
#define VI_ATTR_WIN_SIZE          VI_ATTR_WIN_SIZE_64
#define VI_ATTR_MEM_BASE          VI_ATTR_MEM_BASE_64
#define VI_ATTR_MEM_SIZE          VI_ATTR_MEM_SIZE_64
#define VI_ATTR_PXI_MEM_BASE_BAR0 VI_ATTR_PXI_MEM_BASE_BAR0_64
#define VI_ATTR_PXI_MEM_BASE_BAR1 VI_ATTR_PXI_MEM_BASE_BAR1_64
#define VI_ATTR_PXI_MEM_BASE_BAR2 VI_ATTR_PXI_MEM_BASE_BAR2_64
#define VI_ATTR_PXI_MEM_BASE_BAR3 VI_ATTR_PXI_MEM_BASE_BAR3_64
#define VI_ATTR_PXI_MEM_BASE_BAR4 VI_ATTR_PXI_MEM_BASE_BAR4_64
#define VI_ATTR_PXI_MEM_BASE_BAR5 VI_ATTR_PXI_MEM_BASE_BAR5_64
#define VI_ATTR_PXI_MEM_SIZE_BAR0 VI_ATTR_PXI_MEM_SIZE_BAR0_64
#define VI_ATTR_PXI_MEM_SIZE_BAR1 VI_ATTR_PXI_MEM_SIZE_BAR1_64
#define VI_ATTR_PXI_MEM_SIZE_BAR2 VI_ATTR_PXI_MEM_SIZE_BAR2_64
#define VI_ATTR_PXI_MEM_SIZE_BAR3 VI_ATTR_PXI_MEM_SIZE_BAR3_64
#define VI_ATTR_PXI_MEM_SIZE_BAR4 VI_ATTR_PXI_MEM_SIZE_BAR4_64
#define VI_ATTR_PXI_MEM_SIZE_BAR5 VI_ATTR_PXI_MEM_SIZE_BAR5_64
#else
#define VI_ATTR_USER_DATA         VI_ATTR_USER_DATA_32
#define VI_ATTR_RET_COUNT         VI_ATTR_RET_COUNT_32
#define VI_ATTR_WIN_BASE_ADDR     VI_ATTR_WIN_BASE_ADDR_32
#define VI_ATTR_WIN_SIZE          VI_ATTR_WIN_SIZE_32
#define VI_ATTR_MEM_BASE          VI_ATTR_MEM_BASE_32
#define VI_ATTR_MEM_SIZE          VI_ATTR_MEM_SIZE_32
#define VI_ATTR_PXI_MEM_BASE_BAR0 VI_ATTR_PXI_MEM_BASE_BAR0_32
#define VI_ATTR_PXI_MEM_BASE_BAR1 VI_ATTR_PXI_MEM_BASE_BAR1_32
#define VI_ATTR_PXI_MEM_BASE_BAR2 VI_ATTR_PXI_MEM_BASE_BAR2_32
#define VI_ATTR_PXI_MEM_BASE_BAR3 VI_ATTR_PXI_MEM_BASE_BAR3_32
#define VI_ATTR_PXI_MEM_BASE_BAR4 VI_ATTR_PXI_MEM_BASE_BAR4_32
#define VI_ATTR_PXI_MEM_BASE_BAR5 VI_ATTR_PXI_MEM_BASE_BAR5_32
#define VI_ATTR_PXI_MEM_SIZE_BAR0 VI_ATTR_PXI_MEM_SIZE_BAR0_32
#define VI_ATTR_PXI_MEM_SIZE_BAR1 VI_ATTR_PXI_MEM_SIZE_BAR1_32
#define VI_ATTR_PXI_MEM_SIZE_BAR2 VI_ATTR_PXI_MEM_SIZE_BAR2_32
#define VI_ATTR_PXI_MEM_SIZE_BAR3 VI_ATTR_PXI_MEM_SIZE_BAR3_32
#define VI_ATTR_PXI_MEM_SIZE_BAR4 VI_ATTR_PXI_MEM_SIZE_BAR4_32
#define VI_ATTR_PXI_MEM_SIZE_BAR5 VI_ATTR_PXI_MEM_SIZE_BAR5_32
#endif

/* ---- Event types ----------------------------------------------------------------------------------------------- */

#define VI_EVENT_IO_COMPLETION    (0x3FFF2009UL)
#define VI_EVENT_TRIG             (0xBFFF200AUL)
#define VI_EVENT_SERVICE_REQ      (0x3FFF200BUL)
#define VI_EVENT_CLEAR            (0x3FFF200DUL)
#define VI_EVENT_EXCEPTION        (0xBFFF200EUL)
#define VI_EVENT_GPIB_CIC         (0x3FFF2012UL)
#define VI_EVENT_GPIB_TALK        (0x3FFF2013UL)
#define VI_EVENT_GPIB_LISTEN      (0x3FFF2014UL)
#define VI_EVENT_VXI_VME_SYSFAIL  (0x3FFF201DUL)
#define VI_EVENT_VXI_VME_SYSRESET (0x3FFF201EUL)
#define VI_EVENT_VXI_SIGP         (0x3FFF2020UL)
#define VI_EVENT_VXI_VME_INTR     (0xBFFF2021UL)
#define VI_EVENT_PXI_INTR         (0x3FFF2022UL)
#define VI_EVENT_TCPIP_CONNECT    (0x3FFF2036UL)
#define VI_EVENT_USB_INTR         (0x3FFF2037UL)
#define VI_ALL_ENABLED_EVENTS     (0x3FFF7FFFUL)

/* ---- Completion, warning and error codes (a ViStatus is a signed 32-bit value) ------------------------------------
 */

#define VI_SUCCESS                  (0L)
#define VI_SUCCESS_DEV_NPRESENT     (0x3FFF007DL)
#define VI_SUCCESS_EVENT_DIS        (0x3FFF0003L)
#define VI_SUCCESS_EVENT_EN         (0x3FFF0002L)
#define VI_SUCCESS_MAX_CNT          (0x3FFF0006L)
#define VI_SUCCESS_NCHAIN           (0x3FFF0098L)
#define VI_SUCCESS_NESTED_EXCLUSIVE (0x3FFF009AL)
#define VI_SUCCESS_NESTED_SHARED    (0x3FFF0099L)
#define VI_SUCCESS_QUEUE_EMPTY      (0x3FFF0004L)
#define VI_SUCCESS_QUEUE_NEMPTY     (0x3FFF0080L)
#define VI_SUCCESS_SYNC             (0x3FFF009BL)
#define VI_SUCCESS_TERM_CHAR        (0x3FFF0005L)
#define VI_SUCCESS_TRIG_MAPPED      (0x3FFF007EL)
#define VI_WARN_CONFIG_NLOADED      (0x3FFF0077L)
#define VI_WARN_EXT_FUNC_NIMPL      (0x3FFF00A9L)
#define VI_WARN_NSUP_ATTR_STATE     (0x3FFF0084L)
#define VI_WARN_NSUP_BUF            (0x3FFF0088L)
#define VI_WARN_NULL_OBJECT         (0x3FFF0082L)
#define VI_WARN_QUEUE_OVERFLOW      (0x3FFF000CL)
#define VI_WARN_UNKNOWN_STATUS      (0x3FFF0085L)
#define VI_ERROR_ABORT              ((ViStatus)0xBFFF0030UL)
#define VI_ERROR_ALLOC              ((ViStatus)0xBFFF003CUL)
#define VI_ERROR_ASRL_FRAMING       ((ViStatus)0xBFFF006BUL)
#define VI_ERROR_ASRL_OVERRUN       ((ViStatus)0xBFFF006CUL)
#define VI_ERROR_ASRL_PARITY        ((ViStatus)0xBFFF006AUL)
#define VI_ERROR_ATTR_READONLY      ((ViStatus)0xBFFF001FUL)
#define VI_ERROR_BERR               ((ViStatus)0xBFFF0038UL)
#define VI_ERROR_CLOSING_FAILED     ((ViStatus)0xBFFF0016UL)
#define VI_ERROR_CONN_LOST          ((ViStatus)0xBFFF00A6UL)
#define VI_ERROR_FILE_ACCESS        ((ViStatus)0xBFFF00A1UL)
#define VI_ERROR_FILE_IO            ((ViStatus)0xBFFF00A2UL)
#define VI_ERROR_HNDLR_NINSTALLED   ((ViStatus)0xBFFF0028UL)
#define VI_ERROR_INP_PROT_VIOL      ((ViStatus)0xBFFF0037UL)
#define VI_ERROR_INTF_NUM_NCONFIG   ((ViStatus)0xBFFF00A5UL)
#define VI_ERROR_INTR_PENDING       ((ViStatus)0xBFFF0068UL)
#define VI_ERROR_INV_ACCESS_KEY     ((ViStatus)0xBFFF0021UL)
#define VI_ERROR_INV_ACC_MODE       ((ViStatus)0xBFFF0013UL)
#define VI_ERROR_INV_CONTEXT        ((ViStatus)0xBFFF002AUL)
#define VI_ERROR_INV_DEGREE         ((ViStatus)0xBFFF001BUL)
#define VI_ERROR_INV_EVENT          ((ViStatus)0xBFFF0026UL)
#define VI_ERROR_INV_EXPR           ((ViStatus)0xBFFF0010UL)
#define VI_ERROR_INV_FMT            ((ViStatus)0xBFFF003FUL)
#define VI_ERROR_INV_HNDLR_REF      ((ViStatus)0xBFFF0029UL)
#define VI_ERROR_INV_JOB_ID         ((ViStatus)0xBFFF001CUL)
#define VI_ERROR_INV_LENGTH         ((ViStatus)0xBFFF0083UL)
#define VI_ERROR_INV_LINE           ((ViStatus)0xBFFF00A0UL)
#define VI_ERROR_INV_LOCK_TYPE      ((ViStatus)0xBFFF0020UL)
#define VI_ERROR_INV_MASK           ((ViStatus)0xBFFF003DUL)
#define VI_ERROR_INV_MECH           ((ViStatus)0xBFFF0027UL)
#define VI_ERROR_INV_MODE           ((ViStatus)0xBFFF0091UL)
#define VI_ERROR_INV_OBJECT         ((ViStatus)0xBFFF000EUL)
#define VI_ERROR_INV_OFFSET         ((ViStatus)0xBFFF0051UL)
#define VI_ERROR_INV_PARAMETER      ((ViStatus)0xBFFF0078UL)
#define VI_ERROR_INV_PROT           ((ViStatus)0xBFFF0079UL)
#define VI_ERROR_INV_RSRC_NAME      ((ViStatus)0xBFFF0012UL)
#define VI_ERROR_INV_SETUP          ((ViStatus)0xBFFF003AUL)
#define VI_ERROR_INV_SIZE           ((ViStatus)0xBFFF007BUL)
#define VI_ERROR_INV_SPACE          ((ViStatus)0xBFFF004EUL)
#define VI_ERROR_INV_WIDTH          ((ViStatus)0xBFFF0052UL)
#define VI_ERROR_IN_PROGRESS        ((ViStatus)0xBFFF0039UL)
#define VI_ERROR_IO                 ((ViStatus)0xBFFF003EUL)
#define VI_ERROR_LIBRARY_NFOUND     ((ViStatus)0xBFFF009EUL)
#define VI_ERROR_LINE_IN_USE        ((ViStatus)0xBFFF0042UL)
#define VI_ERROR_LINE_NRESERVED     ((ViStatus)0xBFFF0043UL)
#define VI_ERROR_MEM_NSHARED        ((ViStatus)0xBFFF009DUL)
#define VI_ERROR_NCIC               ((ViStatus)0xBFFF0060UL)
#define VI_ERROR_NENABLED           ((ViStatus)0xBFFF002FUL)
#define VI_ERROR_NIMPL_OPER         ((ViStatus)0xBFFF0081UL)
#define VI_ERROR_NLISTENERS         ((ViStatus)0xBFFF005FUL)
#define VI_ERROR_NPERMISSION        ((ViStatus)0xBFFF00A8UL)
#define VI_ERROR_NSUP_ALIGN_OFFSET  ((ViStatus)0xBFFF0070UL)
#define VI_ERROR_NSUP_ATTR          ((ViStatus)0xBFFF001DUL)
#define VI_ERROR_NSUP_ATTR_STATE    ((ViStatus)0xBFFF001EUL)
#define VI_ERROR_NSUP_FMT           ((ViStatus)0xBFFF0041UL)
#define VI_ERROR_NSUP_INTR          ((ViStatus)0xBFFF009FUL)
#define VI_ERROR_NSUP_LINE          ((ViStatus)0xBFFF00A3UL)
#define VI_ERROR_NSUP_MECH          ((ViStatus)0xBFFF00A4UL)
#define VI_ERROR_NSUP_MODE          ((ViStatus)0xBFFF0046UL)
#define VI_ERROR_NSUP_OFFSET        ((ViStatus)0xBFFF0054UL)
#define VI_ERROR_NSUP_OPER          ((ViStatus)0xBFFF0067UL)
#define VI_ERROR_NSUP_VAR_WIDTH     ((ViStatus)0xBFFF0055UL)
#define VI_ERROR_NSUP_WIDTH         ((ViStatus)0xBFFF0076UL)
#define VI_ERROR_NSYS_CNTLR         ((ViStatus)0xBFFF0061UL)
#define VI_ERROR_OUTP_PROT_VIOL     ((ViStatus)0xBFFF0036UL)
#define VI_ERROR_QUEUE_ERROR        ((ViStatus)0xBFFF003BUL)
#define VI_ERROR_RAW_RD_PROT_VIOL   ((ViStatus)0xBFFF0035UL)
#define VI_ERROR_RAW_WR_PROT_VIOL   ((ViStatus)0xBFFF0034UL)
#define VI_ERROR_RESP_PENDING       ((ViStatus)0xBFFF0059UL)
#define VI_ERROR_RSRC_BUSY          ((ViStatus)0xBFFF0072UL)
#define VI_ERROR_RSRC_LOCKED        ((ViStatus)0xBFFF000FUL)
#define VI_ERROR_RSRC_NFOUND        ((ViStatus)0xBFFF0011UL)
#define VI_ERROR_SESN_NLOCKED       ((ViStatus)0xBFFF009CUL)
#define VI_ERROR_SRQ_NOCCURRED      ((ViStatus)0xBFFF004AUL)
#define VI_ERROR_SYSTEM_ERROR       ((ViStatus)0xBFFF0000UL)
#define VI_ERROR_TMO                ((ViStatus)0xBFFF0015UL)
#define VI_ERROR_TRIG_NMAPPED       ((ViStatus)0xBFFF006EUL)
#define VI_ERROR_USER_BUF           ((ViStatus)0xBFFF0071UL)
#define VI_ERROR_WINDOW_MAPPED      ((ViStatus)0xBFFF0080UL)
#define VI_ERROR_WINDOW_NMAPPED     ((ViStatus)0xBFFF0057UL)
#define VI_ERROR_INV_SESSION        VI_ERROR_INV_OBJECT

/* ---- General ----------------------------------------------------------------------------------------------------- */

#define VI_FIND_BUFLEN (256)

/* ---- Event mechanism --------------------------------------------------------------------------------------------- */

#define VI_QUEUE         (1)
#define VI_HNDLR         (2)
#define VI_SUSPEND_HNDLR (4)
#define VI_ALL_MECH      (65535)

/* ---- Event handler ----------------------------------------------------------------------------------------------- */

#define VI_ANY_HNDLR (0)

/* ---- Lock type / lock state / access mode ------------------------------------------------------------------------ */

#define VI_NO_LOCK        (0)
#define VI_EXCLUSIVE_LOCK (1)
#define VI_SHARED_LOCK    (2)
#define VI_LOAD_CONFIG    (4)

/* ---- Time-out ---------------------------------------------------------------------------------------------------- */

#define VI_TMO_IMMEDIATE (0)
#define VI_TMO_INFINITE  (0xFFFFFFFFUL)
#define VI_INFINITE      VI_TMO_INFINITE /* its old name */

/* ---- Interface type ---------------------------------------------------------------------------------------------- */

#define VI_INTF_GPIB     (1)
#define VI_INTF_VXI      (2)
#define VI_INTF_GPIB_VXI (3)
#define VI_INTF_ASRL     (4)
#define VI_INTF_PXI      (5)
#define VI_INTF_TCPIP    (6)
#define VI_INTF_USB      (7)

/* ---- I/O protocol ------------------------------------------------------------------------------------------------ */

#define VI_PROT_NORMAL        (1)
#define VI_PROT_FDC           (2)
#define VI_PROT_HS488         (3)
#define VI_PROT_4882_STRS     (4)
#define VI_PROT_USBTMC_VENDOR (5)
#define VI_NORMAL             (1)
#define VI_FDC                (2)
#define VI_HS488              (3)
#define VI_ASRL488            (4)

/* ---- Trigger protocol -------------------------------------------------------------------------------------------- */

#define VI_TRIG_PROT_DEFAULT   (0)
#define VI_TRIG_PROT_ON        (1)
#define VI_TRIG_PROT_OFF       (2)
#define VI_TRIG_PROT_SYNC      (5)
#define VI_TRIG_PROT_RESERVE   (6)
#define VI_TRIG_PROT_UNRESERVE (7)

/* ---- Trigger id -------------------------------------------------------------------------------------------------- */

#define VI_TRIG_ALL         (-2)
#define VI_TRIG_SW          (-1)
#define VI_TRIG_TTL0        (0)
#define VI_TRIG_TTL1        (1)
#define VI_TRIG_TTL2        (2)
#define VI_TRIG_TTL3        (3)
#define VI_TRIG_TTL4        (4)
#define VI_TRIG_TTL5        (5)
#define VI_TRIG_TTL6        (6)
#define VI_TRIG_TTL7        (7)
#define VI_TRIG_TTL8        (32)
#define VI_TRIG_TTL9        (33)
#define VI_TRIG_TTL10       (34)
#define VI_TRIG_TTL11       (35)
#define VI_TRIG_ECL0        (8)
#define VI_TRIG_ECL1        (9)
#define VI_TRIG_ECL2        (10)
#define VI_TRIG_ECL3        (11)
#define VI_TRIG_ECL4        (12)
#define VI_TRIG_ECL5        (13)
#define VI_TRIG_STAR_SLOT1  (14)
#define VI_TRIG_STAR_SLOT2  (15)
#define VI_TRIG_STAR_SLOT3  (16)
#define VI_TRIG_STAR_SLOT4  (17)
#define VI_TRIG_STAR_SLOT5  (18)
#define VI_TRIG_STAR_SLOT6  (19)
#define VI_TRIG_STAR_SLOT7  (20)
#define VI_TRIG_STAR_SLOT8  (21)
#define VI_TRIG_STAR_SLOT9  (22)
#define VI_TRIG_STAR_SLOT10 (23)
#define VI_TRIG_STAR_SLOT11 (24)
#define VI_TRIG_STAR_SLOT12 (25)
#define VI_TRIG_STAR_INSTR  (26)
#define VI_TRIG_PANEL_IN    (27)
#define VI_TRIG_PANEL_OUT   (28)
#define VI_TRIG_STAR_VXI0   (29)
#define VI_TRIG_STAR_VXI1   (30)
#define VI_TRIG_STAR_VXI2   (31)

/* ---- Buffer mask ------------------------------------------------------------------------------------------------- */

#define VI_READ_BUF             (1)
#define VI_WRITE_BUF            (2)
#define VI_READ_BUF_DISCARD     (4)
#define VI_WRITE_BUF_DISCARD    (8)
#define VI_IO_IN_BUF            (16)
#define VI_IO_OUT_BUF           (32)
#define VI_IO_IN_BUF_DISCARD    (64)
#define VI_IO_OUT_BUF_DISCARD   (128)
#define VI_ASRL_IN_BUF          (16)
#define VI_ASRL_OUT_BUF         (32)
#define VI_ASRL_IN_BUF_DISCARD  (64)
#define VI_ASRL_OUT_BUF_DISCARD (128)

/* ---- Formatted I/O buffer mode ----------------------------------------------------------------------------------- */

#define VI_FLUSH_ON_ACCESS (1)
#define VI_FLUSH_WHEN_FULL (2)
#define VI_FLUSH_DISABLE   (3)

/* ---- GPIB REN mode ----------------------------------------------------------------------------------------------- */

#define VI_GPIB_REN_DEASSERT           (0)
#define VI_GPIB_REN_ASSERT             (1)
#define VI_GPIB_REN_DEASSERT_GTL       (2)
#define VI_GPIB_REN_ASSERT_ADDRESS     (3)
#define VI_GPIB_REN_ASSERT_LLO         (4)
#define VI_GPIB_REN_ASSERT_ADDRESS_LLO (5)
#define VI_GPIB_REN_ADDRESS_GTL        (6)

/* ---- GPIB ATN mode ----------------------------------------------------------------------------------------------- */

#define VI_GPIB_ATN_DEASSERT           (0)
#define VI_GPIB_ATN_ASSERT             (1)
#define VI_GPIB_ATN_DEASSERT_HANDSHAKE (2)
#define VI_GPIB_ATN_ASSERT_IMMEDIATE   (3)

/* ---- GPIB other -------------------------------------------------------------------------------------------------- */

#define VI_NO_SEC_ADDR         (65535)
#define VI_GPIB_HS488_DISABLED (0)
#define VI_GPIB_HS488_NIMPL    (-1)
#define VI_GPIB_UNADDRESSED    (0)
#define VI_GPIB_TALKER         (1)
#define VI_GPIB_LISTENER       (2)

/* ---- Line state -------------------------------------------------------------------------------------------------- */

#define VI_STATE_ASSERTED   (1)
#define VI_STATE_UNASSERTED (0)
#define VI_STATE_UNKNOWN    (-1)

/* ---- ASRL parity ------------------------------------------------------------------------------------------------- */

#define VI_ASRL_PAR_NONE  (0)
#define VI_ASRL_PAR_ODD   (1)
#define VI_ASRL_PAR_EVEN  (2)
#define VI_ASRL_PAR_MARK  (3)
#define VI_ASRL_PAR_SPACE (4)

/* ---- ASRL stop bits ---------------------------------------------------------------------------------------------- */

#define VI_ASRL_STOP_ONE  (10)
#define VI_ASRL_STOP_ONE5 (15)
#define VI_ASRL_STOP_TWO  (20)

/* ---- ASRL flow control (bit mask) -------------------------------------------------------------------------------- */

#define VI_ASRL_FLOW_NONE     (0)
#define VI_ASRL_FLOW_XON_XOFF (1)
#define VI_ASRL_FLOW_RTS_CTS  (2)
#define VI_ASRL_FLOW_DTR_DSR  (4)

/* ---- ASRL end mode ----------------------------------------------------------------------------------------------- */

#define VI_ASRL_END_NONE     (0)
#define VI_ASRL_END_LAST_BIT (1)
#define VI_ASRL_END_TERMCHAR (2)
#define VI_ASRL_END_BREAK    (3)

/* ---- Unknown values ---------------------------------------------------------------------------------------------- */

#define VI_UNKNOWN_LA      (-1)
#define VI_UNKNOWN_SLOT    (-1)
#define VI_UNKNOWN_LEVEL   (-1)
#define VI_UNKNOWN_CHASSIS (-1)
#define VI_UNKNOWN_TRIG    (-1)
#define VI_TRIG_UNKNOWN    (-1)

/* ---- Address space ----------------------------------------------------------------------------------------------- */

#define VI_LOCAL_SPACE     (0)
#define VI_A16_SPACE       (1)
#define VI_A24_SPACE       (2)
#define VI_A32_SPACE       (3)
#define VI_A64_SPACE       (4)
#define VI_PXI_ALLOC_SPACE (9)
#define VI_PXI_CFG_SPACE   (10)
#define VI_PXI_BAR0_SPACE  (11)
#define VI_PXI_BAR1_SPACE  (12)
#define VI_PXI_BAR2_SPACE  (13)
#define VI_PXI_BAR3_SPACE  (14)
#define VI_PXI_BAR4_SPACE  (15)
#define VI_PXI_BAR5_SPACE  (16)
#define VI_OPAQUE_SPACE    (65535)

/* ---- Access width ------------------------------------------------------------------------------------------------ */

#define VI_WIDTH_8  (1)
#define VI_WIDTH_16 (2)
#define VI_WIDTH_32 (4)
#define VI_WIDTH_64 (8)

/* ---- Byte order -------------------------------------------------------------------------------------------------- */

#define VI_BIG_ENDIAN    (0)
#define VI_LITTLE_ENDIAN (1)

/* ---- Access privilege -------------------------------------------------------------------------------------------- */

#define VI_DATA_PRIV  (0)
#define VI_DATA_NPRIV (1)
#define VI_PROG_PRIV  (2)
#define VI_PROG_NPRIV (3)
#define VI_BLCK_PRIV  (4)
#define VI_BLCK_NPRIV (5)
#define VI_D64_PRIV   (6)
#define VI_D64_NPRIV  (7)
#define VI_D64_2EVME  (8)
#define VI_D64_SST160 (9)
#define VI_D64_SST267 (10)
#define VI_D64_SST320 (11)

/* ---- Window access ----------------------------------------------------------------------------------------------- */

#define VI_NMAPPED    (1)
#define VI_USE_OPERS  (2)
#define VI_DEREF_ADDR (3)

/* ---- FDC mode ---------------------------------------------------------------------------------------------------- */

#define VI_FDC_NORMAL (1)
#define VI_FDC_STREAM (2)

/* ---- VXI class --------------------------------------------------------------------------------------------------- */

#define VI_VXI_CLASS_MEMORY   (0)
#define VI_VXI_CLASS_EXTENDED (1)
#define VI_VXI_CLASS_MESSAGE  (2)
#define VI_VXI_CLASS_REGISTER (3)
#define VI_VXI_CLASS_OTHER    (4)

/* ---- VXI command mode -------------------------------------------------------------------------------------------- */

#define VI_VXI_CMD16        (512)
#define VI_VXI_CMD16_RESP16 (514)
#define VI_VXI_RESP16       (2)
#define VI_VXI_CMD32        (1024)
#define VI_VXI_CMD32_RESP16 (1026)
#define VI_VXI_CMD32_RESP32 (1028)
#define VI_VXI_RESP32       (4)

/* ---- Interrupt/utility signal ------------------------------------------------------------------------------------ */

#define VI_ASSERT_SIGNAL         (-1)
#define VI_ASSERT_USE_ASSIGNED   (0)
#define VI_ASSERT_IRQ1           (1)
#define VI_ASSERT_IRQ2           (2)
#define VI_ASSERT_IRQ3           (3)
#define VI_ASSERT_IRQ4           (4)
#define VI_ASSERT_IRQ5           (5)
#define VI_ASSERT_IRQ6           (6)
#define VI_ASSERT_IRQ7           (7)
#define VI_UTIL_ASSERT_SYSRESET  (1)
#define VI_UTIL_ASSERT_SYSFAIL   (2)
#define VI_UTIL_DEASSERT_SYSFAIL (3)

/* ---- PXI --------------------------------------------------------------------------------------------------------- */

#define VI_PXI_ADDR_NONE            (0)
#define VI_PXI_ADDR_MEM             (1)
#define VI_PXI_ADDR_IO              (2)
#define VI_PXI_ADDR_CFG             (3)
#define VI_PXI_LBUS_STAR_TRIG_BUS_0 (1000)
#define VI_PXI_LBUS_STAR_TRIG_BUS_1 (1001)
#define VI_PXI_LBUS_STAR_TRIG_BUS_2 (1002)
#define VI_PXI_LBUS_STAR_TRIG_BUS_3 (1003)
#define VI_PXI_LBUS_STAR_TRIG_BUS_4 (1004)
#define VI_PXI_LBUS_STAR_TRIG_BUS_5 (1005)
#define VI_PXI_LBUS_STAR_TRIG_BUS_6 (1006)
#define VI_PXI_LBUS_STAR_TRIG_BUS_7 (1007)
#define VI_PXI_LBUS_STAR_TRIG_BUS_8 (1008)
#define VI_PXI_LBUS_STAR_TRIG_BUS_9 (1009)
#define VI_PXI_STAR_TRIG_CONTROLLER (1413)

/* ---- Operations ------------------------------------------------------------------------------------------------- */

KYVISA_API ViStatus viGetDefaultRM(ViPSession sesn);
KYVISA_API ViStatus viOpenDefaultRM(ViPSession sesn);
KYVISA_API ViStatus viFindRsrc(ViSession sesn, ViConstString expr, ViPFindList findList, ViPUInt32 retCnt,
                               ViChar desc[]);
KYVISA_API ViStatus viFindNext(ViFindList findList, ViChar desc[]);
KYVISA_API ViStatus viParseRsrc(ViSession sesn, ViConstRsrc rsrcName, ViPUInt16 intfType, ViPUInt16 intfNum);
KYVISA_API ViStatus viParseRsrcEx(ViSession sesn, ViConstRsrc rsrcName, ViPUInt16 intfType, ViPUInt16 intfNum,
                                  ViChar rsrcClass[], ViChar expandedUnaliasedName[], ViChar aliasIfExists[]);
KYVISA_API ViStatus viOpen(ViSession sesn, ViConstRsrc name, ViAccessMode mode, ViUInt32 timeout, ViPSession vi);
KYVISA_API ViStatus viClose(ViObject vi);
KYVISA_API ViStatus viGetAttribute(ViObject vi, ViAttr attrName, void *attrValue);
KYVISA_API ViStatus viSetAttribute(ViObject vi, ViAttr attrName, ViAttrState attrValue);
KYVISA_API ViStatus viStatusDesc(ViObject vi, ViStatus status, ViChar desc[]);
KYVISA_API ViStatus viTerminate(ViObject vi, ViUInt16 degree, ViJobId jobId);
KYVISA_API ViStatus viLock(ViSession vi, ViAccessMode lockType, ViUInt32 timeout, ViConstKeyId requestedKey,
                           ViChar accessKey[]);
KYVISA_API ViStatus viUnlock(ViSession vi);
KYVISA_API ViStatus viEnableEvent(ViSession vi, ViEventType eventType, ViUInt16 mechanism, ViEventFilter context);
KYVISA_API ViStatus viDisableEvent(ViSession vi, ViEventType eventType, ViUInt16 mechanism);
KYVISA_API ViStatus viDiscardEvents(ViSession vi, ViEventType eventType, ViUInt16 mechanism);
KYVISA_API ViStatus viWaitOnEvent(ViSession vi, ViEventType inEventType, ViUInt32 timeout, ViPEventType outEventType,
                                  ViPEvent outContext);
KYVISA_API ViStatus viInstallHandler(ViSession vi, ViEventType eventType, ViHndlr handler, ViAddr userHandle);
KYVISA_API ViStatus viUninstallHandler(ViSession vi, ViEventType eventType, ViHndlr handler, ViAddr userHandle);
KYVISA_API ViStatus viRead(ViSession vi, ViPBuf buf, ViUInt32 cnt, ViPUInt32 retCnt);
KYVISA_API ViStatus viReadAsync(ViSession vi, ViPBuf buf, ViUInt32 cnt, ViPJobId jobId);
KYVISA_API ViStatus viReadToFile(ViSession vi, ViConstString filename, ViUInt32 cnt, ViPUInt32 retCnt);
KYVISA_API ViStatus viWrite(ViSession vi, ViConstBuf buf, ViUInt32 cnt, ViPUInt32 retCnt);
KYVISA_API ViStatus viWriteAsync(ViSession vi, ViConstBuf buf, ViUInt32 cnt, ViPJobId jobId);
KYVISA_API ViStatus viWriteFromFile(ViSession vi, ViConstString filename, ViUInt32 cnt, ViPUInt32 retCnt);
KYVISA_API ViStatus viAssertTrigger(ViSession vi, ViUInt16 protocol);
KYVISA_API ViStatus viReadSTB(ViSession vi, ViPUInt16 status);
KYVISA_API ViStatus viClear(ViSession vi);
KYVISA_API ViStatus viSetBuf(ViSession vi, ViUInt16 mask, ViUInt32 size);
KYVISA_API ViStatus viFlush(ViSession vi, ViUInt16 mask);
KYVISA_API ViStatus viBufWrite(ViSession vi, ViConstBuf buf, ViUInt32 cnt, ViPUInt32 retCnt);
KYVISA_API ViStatus viBufRead(ViSession vi, ViPBuf buf, ViUInt32 cnt, ViPUInt32 retCnt);
KYVISA_API ViStatus viPrintf(ViSession vi, ViConstString writeFmt, ...);
KYVISA_API ViStatus viVPrintf(ViSession vi, ViConstString writeFmt, ViVAList params);
KYVISA_API ViStatus viSPrintf(ViSession vi, ViPBuf buf, ViConstString writeFmt, ...);
KYVISA_API ViStatus viVSPrintf(ViSession vi, ViPBuf buf, ViConstString writeFmt, ViVAList parms);
KYVISA_API ViStatus viScanf(ViSession vi, ViConstString readFmt, ...);
KYVISA_API ViStatus viVScanf(ViSession vi, ViConstString readFmt, ViVAList params);
KYVISA_API ViStatus viSScanf(ViSession vi, ViConstBuf buf, ViConstString readFmt, ...);
KYVISA_API ViStatus viVSScanf(ViSession vi, ViConstBuf buf, ViConstString readFmt, ViVAList parms);
KYVISA_API ViStatus viQueryf(ViSession vi, ViConstString writeFmt, ViConstString readFmt, ...);
KYVISA_API ViStatus viVQueryf(ViSession vi, ViConstString writeFmt, ViConstString readFmt, ViVAList params);
KYVISA_API ViStatus viIn8(ViSession vi, ViUInt16 space, ViBusAddress offset, ViPUInt8 val8);
KYVISA_API ViStatus viOut8(ViSession vi, ViUInt16 space, ViBusAddress offset, ViUInt8 val8);
KYVISA_API ViStatus viIn16(ViSession vi, ViUInt16 space, ViBusAddress offset, ViPUInt16 val16);
KYVISA_API ViStatus viOut16(ViSession vi, ViUInt16 space, ViBusAddress offset, ViUInt16 val16);
KYVISA_API ViStatus viIn32(ViSession vi, ViUInt16 space, ViBusAddress offset, ViPUInt32 val32);
KYVISA_API ViStatus viOut32(ViSession vi, ViUInt16 space, ViBusAddress offset, ViUInt32 val32);
KYVISA_API ViStatus viIn64(ViSession vi, ViUInt16 space, ViBusAddress offset, ViPUInt64 val64);
KYVISA_API ViStatus viOut64(ViSession vi, ViUInt16 space, ViBusAddress offset, ViUInt64 val64);
KYVISA_API ViStatus viIn8Ex(ViSession vi, ViUInt16 space, ViBusAddress64 offset, ViPUInt8 val8);
KYVISA_API ViStatus viOut8Ex(ViSession vi, ViUInt16 space, ViBusAddress64 offset, ViUInt8 val8);
KYVISA_API ViStatus viIn16Ex(ViSession vi, ViUInt16 space, ViBusAddress64 offset, ViPUInt16 val16);
KYVISA_API ViStatus viOut16Ex(ViSession vi, ViUInt16 space, ViBusAddress64 offset, ViUInt16 val16);
KYVISA_API ViStatus viIn32Ex(ViSession vi, ViUInt16 space, ViBusAddress64 offset, ViPUInt32 val32);
KYVISA_API ViStatus viOut32Ex(ViSession vi, ViUInt16 space, ViBusAddress64 offset, ViUInt32 val32);
KYVISA_API ViStatus viIn64Ex(ViSession vi, ViUInt16 space, ViBusAddress64 offset, ViPUInt64 val64);
KYVISA_API ViStatus viOut64Ex(ViSession vi, ViUInt16 space, ViBusAddress64 offset, ViUInt64 val64);
KYVISA_API ViStatus viMoveIn8(ViSession vi, ViUInt16 space, ViBusAddress offset, ViBusSize length, ViAUInt8 buf8);
KYVISA_API ViStatus viMoveOut8(ViSession vi, ViUInt16 space, ViBusAddress offset, ViBusSize length, ViAUInt8 buf8);
KYVISA_API ViStatus viMoveIn16(ViSession vi, ViUInt16 space, ViBusAddress offset, ViBusSize length, ViAUInt16 buf16);
KYVISA_API ViStatus viMoveOut16(ViSession vi, ViUInt16 space, ViBusAddress offset, ViBusSize length, ViAUInt16 buf16);
KYVISA_API ViStatus viMoveIn32(ViSession vi, ViUInt16 space, ViBusAddress offset, ViBusSize length, ViAUInt32 buf32);
KYVISA_API ViStatus viMoveOut32(ViSession vi, ViUInt16 space, ViBusAddress offset, ViBusSize length, ViAUInt32 buf32);
KYVISA_API ViStatus viMoveIn64(ViSession vi, ViUInt16 space, ViBusAddress offset, ViBusSize length, ViAUInt64 buf64);
KYVISA_API ViStatus viMoveOut64(ViSession vi, ViUInt16 space, ViBusAddress offset, ViBusSize length, ViAUInt64 buf64);
KYVISA_API ViStatus viMoveIn8Ex(ViSession vi, ViUInt16 space, ViBusAddress64 offset, ViBusSize length, ViAUInt8 buf8);
KYVISA_API ViStatus viMoveOut8Ex(ViSession vi, ViUInt16 space, ViBusAddress64 offset, ViBusSize length, ViAUInt8 buf8);
KYVISA_API ViStatus viMoveIn16Ex(ViSession vi, ViUInt16 space, ViBusAddress64 offset, ViBusSize length,
                                 ViAUInt16 buf16);
KYVISA_API ViStatus viMoveOut16Ex(ViSession vi, ViUInt16 space, ViBusAddress64 offset, ViBusSize length,
                                  ViAUInt16 buf16);
KYVISA_API ViStatus viMoveIn32Ex(ViSession vi, ViUInt16 space, ViBusAddress64 offset, ViBusSize length,
                                 ViAUInt32 buf32);
KYVISA_API ViStatus viMoveOut32Ex(ViSession vi, ViUInt16 space, ViBusAddress64 offset, ViBusSize length,
                                  ViAUInt32 buf32);
KYVISA_API ViStatus viMoveIn64Ex(ViSession vi, ViUInt16 space, ViBusAddress64 offset, ViBusSize length,
                                 ViAUInt64 buf64);
KYVISA_API ViStatus viMoveOut64Ex(ViSession vi, ViUInt16 space, ViBusAddress64 offset, ViBusSize length,
                                  ViAUInt64 buf64);
KYVISA_API ViStatus viMove(ViSession vi, ViUInt16 srcSpace, ViBusAddress srcOffset, ViUInt16 srcWidth,
                           ViUInt16 destSpace, ViBusAddress destOffset, ViUInt16 destWidth, ViBusSize srcLength);
KYVISA_API ViStatus viMoveAsync(ViSession vi, ViUInt16 srcSpace, ViBusAddress srcOffset, ViUInt16 srcWidth,
                                ViUInt16 destSpace, ViBusAddress destOffset, ViUInt16 destWidth, ViBusSize srcLength,
                                ViPJobId jobId);
KYVISA_API ViStatus viMoveEx(ViSession vi, ViUInt16 srcSpace, ViBusAddress64 srcOffset, ViUInt16 srcWidth,
                             ViUInt16 destSpace, ViBusAddress64 destOffset, ViUInt16 destWidth, ViBusSize srcLength);
KYVISA_API ViStatus viMoveAsyncEx(ViSession vi, ViUInt16 srcSpace, ViBusAddress64 srcOffset, ViUInt16 srcWidth,
                                  ViUInt16 destSpace, ViBusAddress64 destOffset, ViUInt16 destWidth,
                                  ViBusSize srcLength, ViPJobId jobId);
KYVISA_API ViStatus viMapAddress(ViSession vi, ViUInt16 mapSpace, ViBusAddress mapOffset, ViBusSize mapSize,
                                 ViBoolean access, ViAddr suggested, ViPAddr address);
KYVISA_API ViStatus viUnmapAddress(ViSession vi);
KYVISA_API ViStatus viMapAddressEx(ViSession vi, ViUInt16 mapSpace, ViBusAddress64 mapOffset, ViBusSize mapSize,
                                   ViBoolean access, ViAddr suggested, ViPAddr address);
KYVISA_API void viPeek8(ViSession vi, ViAddr address, ViPUInt8 val8);
KYVISA_API void viPoke8(ViSession vi, ViAddr address, ViUInt8 val8);
KYVISA_API void viPeek16(ViSession vi, ViAddr address, ViPUInt16 val16);
KYVISA_API void viPoke16(ViSession vi, ViAddr address, ViUInt16 val16);
KYVISA_API void viPeek32(ViSession vi, ViAddr address, ViPUInt32 val32);
KYVISA_API void viPoke32(ViSession vi, ViAddr address, ViUInt32 val32);
KYVISA_API void viPeek64(ViSession vi, ViAddr address, ViPUInt64 val64);
KYVISA_API void viPoke64(ViSession vi, ViAddr address, ViUInt64 val64);
KYVISA_API ViStatus viMemAlloc(ViSession vi, ViBusSize size, ViPBusAddress offset);
KYVISA_API ViStatus viMemFree(ViSession vi, ViBusAddress offset);
KYVISA_API ViStatus viMemAllocEx(ViSession vi, ViBusSize size, ViPBusAddress64 offset);
KYVISA_API ViStatus viMemFreeEx(ViSession vi, ViBusAddress64 offset);
KYVISA_API ViStatus viGpibControlREN(ViSession vi, ViUInt16 mode);
KYVISA_API ViStatus viGpibControlATN(ViSession vi, ViUInt16 mode);
KYVISA_API ViStatus viGpibSendIFC(ViSession vi);
KYVISA_API ViStatus viGpibCommand(ViSession vi, ViConstBuf cmd, ViUInt32 cnt, ViPUInt32 retCnt);
KYVISA_API ViStatus viGpibPassControl(ViSession vi, ViUInt16 primAddr, ViUInt16 secAddr);
KYVISA_API ViStatus viVxiCommandQuery(ViSession vi, ViUInt16 mode, ViUInt32 cmd, ViPUInt32 response);
KYVISA_API ViStatus viAssertUtilSignal(ViSession vi, ViUInt16 line);
KYVISA_API ViStatus viAssertIntrSignal(ViSession vi, ViInt16 mode, ViUInt32 statusID);
KYVISA_API ViStatus viMapTrigger(ViSession vi, ViInt16 trigSrc, ViInt16 trigDest, ViUInt16 mode);
KYVISA_API ViStatus viUnmapTrigger(ViSession vi, ViInt16 trigSrc, ViInt16 trigDest);
KYVISA_API ViStatus viUsbControlOut(ViSession vi, ViInt16 bmRequestType, ViInt16 bRequest, ViUInt16 wValue,
                                    ViUInt16 wIndex, ViUInt16 wLength, ViConstBuf buf);
KYVISA_API ViStatus viUsbControlIn(ViSession vi, ViInt16 bmRequestType, ViInt16 bRequest, ViUInt16 wValue,
                                   ViUInt16 wIndex, ViUInt16 wLength, ViPBuf buf, ViPUInt16 retCnt);
KYVISA_API ViStatus viPxiReserveTriggers(ViSession vi, ViInt16 cnt, ViAInt16 trigBuses, ViAInt16 trigLines,
                                         ViPInt16 failureIndex);

#if defined(__cplusplus)
}
#endif

#endif /* KYVISA_VISA_H */
