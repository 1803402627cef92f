#include "kyvisa/core/AttributeTable.h"

#include "kyvisa/include/visa.h"

#include <algorithm>

namespace kyvisa
{
namespace
{

using enum AttributeType;
using enum Access;
using enum Scope;

// Groups of kinds that share attributes.
constexpr std::uint16_t Hi = kind::Hislip;
constexpr std::uint16_t Lan = kind::Hislip | kind::Vxi11;
constexpr std::uint16_t Sock = kind::Socket;
constexpr std::uint16_t Asrl = kind::Serial;
constexpr std::uint16_t GpibI = kind::GpibInstr;
constexpr std::uint16_t Intfc = kind::GpibIntfc;
constexpr std::uint16_t Instr = Lan | Asrl | GpibI;
constexpr std::uint16_t Session = Instr | Sock | Intfc;
constexpr std::uint16_t Template = Session | kind::ResourceManager;
constexpr std::uint16_t List = kind::FindListObject;
constexpr std::uint16_t Outcome = kind::CompletionEvent | kind::ExceptionEvent;
constexpr std::uint16_t AnyEvent = Outcome | kind::OtherEvent;
constexpr std::uint16_t Done = kind::CompletionEvent;

constexpr std::int64_t Max8 = 0xFF;
constexpr std::int64_t Max16 = 0xFFFF;
constexpr std::int64_t Max32 = 0xFFFFFFFF;
constexpr std::int64_t Max64 = INT64_MAX; // 64-bit values are compared as they are: every pattern is allowed

// clang-format off
constexpr std::array<AttributeRow, AttributeCount> Table = {{
    {VI_KY_ATTR_TCPIP_FIND_RSRC_TMO,  UInt32, ReadWrite, Local,  0, Max32, 2000, kind::ResourceManager},
    {VI_KY_ATTR_TCPIP_FIND_RSRC_MODE, UInt32, ReadWrite, Local,  0, Max32, 6, kind::ResourceManager},
    {VI_ATTR_RSRC_IMPL_VERSION,       UInt32, ReadOnly,  Global, 0, Max32, 0x00500806, Template},
    {VI_ATTR_RSRC_LOCK_STATE,         UInt32, ReadOnly,  Global, 0, 2, VI_NO_LOCK, Template},
    {VI_ATTR_MAX_QUEUE_LENGTH,        UInt32, ReadWrite, Local,  1, Max32, 50, Template},
    {VI_ATTR_USER_DATA_32,            UInt32, ReadWrite, Local,  0, Max32, 0, Template},
    {VI_ATTR_USER_DATA_64,            UInt64, ReadWrite, Local,  INT64_MIN, Max64, 0, Template},
    {VI_ATTR_SEND_END_EN,             UInt16, ReadWrite, Local,  0, 1, VI_TRUE, Session},
    {VI_ATTR_TERMCHAR,                UInt8,  ReadWrite, Local,  0, Max8, 0x0A, Session},
    {VI_ATTR_TMO_VALUE,               UInt32, ReadWrite, Local,  0, Max32, 2000, Session},
    {VI_ATTR_GPIB_READDR_EN,          UInt16, ReadWrite, Local,  0, 1, VI_TRUE, GpibI},
    {VI_ATTR_IO_PROT,                 UInt16, ReadWrite, Local,  1, 4, VI_PROT_NORMAL, Session & ~Intfc, {VI_PROT_NORMAL, VI_PROT_4882_STRS}, 2},
    {VI_ATTR_DMA_ALLOW_EN,            UInt16, ReadWrite, Local,  0, 1, VI_FALSE, Session},
    {VI_ATTR_ASRL_BAUD,               UInt32, ReadWrite, Global, 0, Max32, 9600, Asrl},
    {VI_ATTR_ASRL_DATA_BITS,          UInt16, ReadWrite, Global, 5, 8, 8, Asrl},
    {VI_ATTR_ASRL_PARITY,             UInt16, ReadWrite, Global, 0, 4, VI_ASRL_PAR_NONE, Asrl},
    {VI_ATTR_ASRL_STOP_BITS,          UInt16, ReadWrite, Global, 10, 20, VI_ASRL_STOP_ONE, Asrl, {VI_ASRL_STOP_ONE, VI_ASRL_STOP_ONE5, VI_ASRL_STOP_TWO}, 3},
    {VI_ATTR_ASRL_FLOW_CNTRL,         UInt16, ReadWrite, Global, 0, 7, VI_ASRL_FLOW_NONE, Asrl},
    {VI_ATTR_RD_BUF_OPER_MODE,        UInt16, ReadWrite, Local,  1, 3, VI_FLUSH_DISABLE, Session, {VI_FLUSH_ON_ACCESS, VI_FLUSH_DISABLE}, 2},
    {VI_ATTR_RD_BUF_SIZE,             UInt32, ReadOnly,  Local,  0, Max32, 4096, Session},
    {VI_ATTR_WR_BUF_OPER_MODE,        UInt16, ReadWrite, Local,  1, 2, VI_FLUSH_WHEN_FULL, Session},
    {VI_ATTR_WR_BUF_SIZE,             UInt32, ReadOnly,  Local,  0, Max32, 4096, Session},
    {VI_ATTR_SUPPRESS_END_EN,         UInt16, ReadWrite, Local,  0, 1, VI_FALSE, Instr},
    {VI_ATTR_TERMCHAR_EN,             UInt16, ReadWrite, Local,  0, 1, VI_FALSE, Session},
    {VI_ATTR_GPIB_ATN_STATE,          Int16,  ReadOnly,  Global, -1, 1, VI_STATE_UNKNOWN, Intfc},
    {VI_ATTR_GPIB_ADDR_STATE,         Int16,  ReadOnly,  Global, 0, 2, VI_GPIB_UNADDRESSED, Intfc},
    {VI_ATTR_GPIB_CIC_STATE,          UInt16, ReadOnly,  Global, 0, 1, VI_TRUE, Intfc},
    {VI_ATTR_GPIB_NDAC_STATE,         Int16,  ReadOnly,  Global, -1, 1, VI_STATE_UNKNOWN, Intfc},
    {VI_ATTR_GPIB_SRQ_STATE,          Int16,  ReadOnly,  Global, -1, 1, VI_STATE_UNKNOWN, Intfc},
    {VI_ATTR_GPIB_SYS_CNTRL_STATE,    UInt16, ReadOnly,  Global, 0, 1, VI_TRUE, Intfc},
    {VI_ATTR_GPIB_HS488_CBL_LEN,      Int16,  ReadWrite, Global, -1, -1, VI_GPIB_HS488_NIMPL, Intfc},
    {VI_ATTR_ASRL_AVAIL_NUM,          UInt32, ReadOnly,  Global, 0, Max32, 0, Asrl},
    {VI_ATTR_ASRL_CTS_STATE,          Int16,  ReadOnly,  Global, -1, 1, VI_STATE_UNKNOWN, Asrl},
    {VI_ATTR_ASRL_DCD_STATE,          Int16,  ReadOnly,  Global, -1, 1, VI_STATE_UNKNOWN, Asrl},
    {VI_ATTR_ASRL_DSR_STATE,          Int16,  ReadOnly,  Global, -1, 1, VI_STATE_UNKNOWN, Asrl},
    {VI_ATTR_ASRL_DTR_STATE,          Int16,  ReadWrite, Global, 0, 1, VI_STATE_ASSERTED, Asrl},
    {VI_ATTR_ASRL_END_IN,             UInt16, ReadWrite, Local,  0, 2, VI_ASRL_END_TERMCHAR, Asrl},
    {VI_ATTR_ASRL_END_OUT,            UInt16, ReadWrite, Local,  0, 3, VI_ASRL_END_NONE, Asrl},
    {VI_ATTR_ASRL_REPLACE_CHAR,       UInt8,  ReadWrite, Local,  0, Max8, 0, Asrl},
    {VI_ATTR_ASRL_RI_STATE,           Int16,  ReadOnly,  Global, -1, 1, VI_STATE_UNKNOWN, Asrl},
    {VI_ATTR_ASRL_RTS_STATE,          Int16,  ReadWrite, Global, 0, 1, VI_STATE_ASSERTED, Asrl},
    {VI_ATTR_ASRL_XON_CHAR,           UInt8,  ReadWrite, Local,  0, Max8, 0x11, Asrl},
    {VI_ATTR_ASRL_XOFF_CHAR,          UInt8,  ReadWrite, Local,  0, Max8, 0x13, Asrl},
    {VI_ATTR_RM_SESSION,              UInt32, ReadOnly,  Local,  0, Max32, 0, Template},
    {VI_ATTR_RSRC_SPEC_VERSION,       UInt32, ReadOnly,  Global, 0, Max32, VI_SPEC_VERSION, Template},
    {VI_ATTR_INTF_TYPE,               UInt16, ReadOnly,  Global, 1, 7, 0, Session},
    {VI_ATTR_GPIB_PRIMARY_ADDR,       UInt16, ReadWrite, Global, 0, 30, 0, static_cast<std::uint16_t>(GpibI | Intfc)},
    {VI_ATTR_GPIB_SECONDARY_ADDR,     UInt16, ReadWrite, Global, 0, Max16, VI_NO_SEC_ADDR, static_cast<std::uint16_t>(GpibI | Intfc)},
    {VI_ATTR_RSRC_MANF_ID,            UInt16, ReadOnly,  Global, 0, 0x3FFF, 0x0FAF, Template},
    {VI_ATTR_INTF_NUM,                UInt16, ReadOnly,  Global, 0, Max16, 0, Session},
    {VI_ATTR_TRIG_ID,                 Int16,  ReadWrite, Local,  VI_TRIG_SW, VI_TRIG_SW, VI_TRIG_SW, Instr},
    {VI_ATTR_GPIB_REN_STATE,          Int16,  ReadOnly,  Global, -1, 1, VI_STATE_UNKNOWN, static_cast<std::uint16_t>(GpibI | Intfc)},
    {VI_ATTR_GPIB_UNADDR_EN,          UInt16, ReadWrite, Local,  0, 1, VI_FALSE, GpibI},
    {VI_ATTR_DEV_STATUS_BYTE,         UInt8,  ReadWrite, Global, 0, Max8, 0, Intfc},
    {VI_ATTR_FILE_APPEND_EN,          UInt16, ReadWrite, Local,  0, 1, VI_FALSE, Session},
    {VI_ATTR_TCPIP_PORT,              UInt16, ReadOnly,  Global, 0, Max16, 0, static_cast<std::uint16_t>(Hi | Sock)},
    {VI_ATTR_TCPIP_NODELAY,           UInt16, ReadWrite, Local,  0, 1, VI_TRUE, static_cast<std::uint16_t>(Lan | Sock)},
    {VI_ATTR_TCPIP_KEEPALIVE,         UInt16, ReadWrite, Local,  0, 1, VI_FALSE, static_cast<std::uint16_t>(Lan | Sock)},
    {VI_ATTR_TCPIP_HISLIP_OVERLAP_EN, UInt16, ReadWrite, Local,  0, 1, VI_FALSE, Hi},
    {VI_ATTR_TCPIP_HISLIP_VERSION,    UInt32, ReadOnly,  Local,  0, Max32, 0, Hi},
    {VI_ATTR_TCPIP_HISLIP_MAX_MESSAGE_KB, UInt32, ReadWrite, Local, 0, Max32, 1024, Hi},
    {VI_ATTR_TCPIP_IS_HISLIP,         UInt16, ReadOnly,  Global, 0, 1, VI_FALSE, Lan},
    {VI_ATTR_JOB_ID,                  UInt32, ReadOnly,  Local,  0, Max32, 0, Done},
    {VI_ATTR_EVENT_TYPE,              UInt32, ReadOnly,  Local,  0, Max32, 0, AnyEvent},
    {VI_ATTR_STATUS,                  Int32,  ReadOnly,  Local,  INT32_MIN, INT32_MAX, 0, Outcome},
    {VI_ATTR_RET_COUNT_32,            UInt32, ReadOnly,  Local,  0, Max32, 0, Done},
    {VI_ATTR_BUFFER,                  UInt64, ReadOnly,  Local,  INT64_MIN, Max64, 0, Done},
    {VI_ATTR_RET_COUNT_64,            UInt64, ReadOnly,  Local,  INT64_MIN, Max64, 0, Done},
    {VI_KY_ATTR_LXI_MANF,             Text,   ReadOnly,  Global, 0, 0, 0, List},
    {VI_KY_ATTR_LXI_MODEL,            Text,   ReadOnly,  Global, 0, 0, 0, List},
    {VI_KY_ATTR_LXI_SERIAL,           Text,   ReadOnly,  Global, 0, 0, 0, List},
    {VI_KY_ATTR_LXI_VERSION,          Text,   ReadOnly,  Global, 0, 0, 0, List},
    {VI_KY_ATTR_LXI_DESCRIPTION,      Text,   ReadOnly,  Global, 0, 0, 0, List},
    {VI_KY_ATTR_LXI_HOSTNAME,         Text,   ReadOnly,  Global, 0, 0, 0, List},
    {VI_ATTR_RSRC_CLASS,              Text,   ReadOnly,  Global, 0, 0, 0, Template},
    {VI_ATTR_RSRC_NAME,               Text,   ReadOnly,  Global, 0, 0, 0, Template},
    {VI_ATTR_INTF_INST_NAME,          Text,   ReadOnly,  Global, 0, 0, 0, Session},
    {VI_ATTR_RSRC_MANF_NAME,          Text,   ReadOnly,  Global, 0, 0, 0, Template},
    {VI_ATTR_TCPIP_ADDR,              Text,   ReadOnly,  Global, 0, 0, 0, static_cast<std::uint16_t>(Lan | Sock)},
    {VI_ATTR_TCPIP_HOSTNAME,          Text,   ReadOnly,  Global, 0, 0, 0, static_cast<std::uint16_t>(Lan | Sock)},
    {VI_ATTR_TCPIP_DEVICE_NAME,       Text,   ReadOnly,  Global, 0, 0, 0, Lan},
    {VI_ATTR_OPER_NAME,               Text,   ReadOnly,  Local,  0, 0, 0, Outcome},
}};
// clang-format on

static_assert(std::is_sorted(Table.begin(), Table.end(),
                             [](const AttributeRow &a, const AttributeRow &b) { return a.id < b.id; }));

// Every transfer looks up half a dozen attributes: a search by halves would be a third of its instructions.
constexpr std::uint8_t Nobody = 0xFF;
static_assert(AttributeCount < Nobody);

constexpr std::size_t placeOf(ViAttr id)
{
    return id * 0x9E3779B1u >> 24;
}

/// The number of the row of each attribute, at placeOf() or behind it.
constexpr std::array<std::uint8_t, 256> Places = [] {
    std::array<std::uint8_t, 256> places{};
    places.fill(Nobody);
    for (std::size_t row = 0; row < Table.size(); ++row) {
        std::size_t place = placeOf(Table[row].id);
        while (places[place] != Nobody)
            place = (place + 1) % places.size();
        places[place] = static_cast<std::uint8_t>(row);
    }
    return places;
}();

std::int64_t signExtend(std::uint64_t value, int bits)
{
    return static_cast<std::int64_t>(value << (64 - bits)) >> (64 - bits);
}

} // namespace

std::size_t AttributeRow::width() const
{
    switch (type) {
    case UInt8:
        return 1;
    case Int16:
    case UInt16:
        return 2;
    case Int32:
    case UInt32:
        return 4;
    case UInt64:
        return 8;
    case Text:
        break;
    }
    return 0;
}

bool AttributeRow::accepts(std::int64_t value) const
{
    if (value < low || value > high)
        return false;
    return allowedCount == 0 ||
           std::find(allowed.begin(), allowed.begin() + allowedCount, value) != allowed.begin() + allowedCount;
}

bool AttributeRow::convert(ViAttrState state, std::int64_t &value) const
{
    if (type == Text)
        return false;
    const int bits = static_cast<int>(width()) * 8;
    if (type == Int16 || type == Int32) {
        value = signExtend(state, bits);
        // Above the sign bit all zeros (a value of this width) or all ones (one that was sign-extended).
        return bits == 64 || state >> bits == 0 || static_cast<std::int64_t>(state) == value ||
               state >> bits == (0xFFFFFFFFu >> bits);
    }
    value = static_cast<std::int64_t>(state);
    return true;
}

std::span<const AttributeRow, AttributeCount> attributeTable()
{
    return Table;
}

const AttributeRow *findAttribute(ViAttr id, std::uint16_t kinds)
{
    for (std::size_t place = placeOf(id); Places[place] != Nobody; place = (place + 1) % Places.size()) {
        const AttributeRow &row = Table[Places[place]];
        if (row.id == id)
            return (row.kinds & kinds) != 0 ? &row : nullptr;
    }
    return nullptr;
}

} // namespace kyvisa
