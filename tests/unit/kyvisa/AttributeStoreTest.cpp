#include "kyvisa/core/AttributeStore.h"
#include "kyvisa/include/visa.h"

#include <array>
#include <gtest/gtest.h>

using namespace kyvisa;

namespace
{

ViStatus check(const AttributeStore &store, ViAttr attribute, ViAttrState state)
{
    const AttributeRow *row = nullptr;
    std::int64_t value = 0;
    return store.check(attribute, state, row, value);
}

TEST(AttributeTable, FindsEveryRow)
{
    for (const AttributeRow &row : attributeTable()) {
        EXPECT_EQ(findAttribute(row.id, row.kinds), &row) << std::hex << row.id;
        EXPECT_EQ(findAttribute(row.id, static_cast<std::uint16_t>(~row.kinds)), nullptr) << std::hex << row.id;
        EXPECT_EQ(row.type == AttributeType::Text, (row.id & 0x80000000u) != 0) << std::hex << row.id;
    }
}

struct Initial {
    ViAttr attribute;
    std::uint16_t kind;
    ViUInt64 value;
    std::size_t width;
};

class InitialValue : public testing::TestWithParam<Initial>
{
};

TEST_P(InitialValue, IsWrittenInItsWidth)
{
    const AttributeStore store(GetParam().kind);
    std::array<unsigned char, 16> bytes;
    bytes.fill(0xEE);
    ASSERT_EQ(store.get(GetParam().attribute, bytes.data()), VI_SUCCESS);
    ViUInt64 value = 0;
    for (std::size_t i = GetParam().width; i-- > 0;)
        value = value << 8 | bytes[i];
    EXPECT_EQ(value, GetParam().value);
    for (std::size_t i = GetParam().width; i < bytes.size(); ++i)
        EXPECT_EQ(bytes[i], 0xEE);
}

INSTANTIATE_TEST_SUITE_P(
    AttributeStore, InitialValue,
    testing::Values(Initial{VI_ATTR_TERMCHAR, kind::Hislip, 0x0A, 1}, Initial{VI_ATTR_TERMCHAR_EN, kind::Hislip, 0, 2},
                    Initial{VI_ATTR_SUPPRESS_END_EN, kind::Hislip, 0, 2},
                    Initial{VI_ATTR_SEND_END_EN, kind::Socket, 1, 2}, Initial{VI_ATTR_TMO_VALUE, kind::Socket, 2000, 4},
                    Initial{VI_ATTR_MAX_QUEUE_LENGTH, kind::ResourceManager, 50, 4},
                    Initial{VI_ATTR_IO_PROT, kind::Socket, 1, 2}, Initial{VI_ATTR_TRIG_ID, kind::Hislip, 0xFFFF, 2},
                    Initial{VI_ATTR_GPIB_SECONDARY_ADDR, kind::GpibInstr, 0xFFFF, 2},
                    Initial{VI_ATTR_ASRL_BAUD, kind::Serial, 9600, 4},
                    Initial{VI_ATTR_ASRL_XON_CHAR, kind::Serial, 0x11, 1},
                    Initial{VI_ATTR_USER_DATA, kind::Socket, 0, 8}));

struct Attempt {
    ViAttr attribute;
    std::uint16_t kind;
    ViAttrState state;
    ViStatus expected;
};

class SettingAttempt : public testing::TestWithParam<Attempt>
{
};

TEST_P(SettingAttempt, IsJudgedByTheTable)
{
    EXPECT_EQ(check(AttributeStore(GetParam().kind), GetParam().attribute, GetParam().state), GetParam().expected);
}

INSTANTIATE_TEST_SUITE_P(AttributeStore, SettingAttempt,
                         testing::Values(Attempt{VI_ATTR_TERMCHAR, kind::Socket, 255, VI_SUCCESS},
                                         Attempt{VI_ATTR_TERMCHAR, kind::Socket, 256, VI_ERROR_NSUP_ATTR_STATE},
                                         Attempt{VI_ATTR_TERMCHAR_EN, kind::Socket, 2, VI_ERROR_NSUP_ATTR_STATE},
                                         Attempt{VI_ATTR_TMO_VALUE, kind::Socket, 0xFFFFFFFF, VI_SUCCESS},
                                         Attempt{VI_ATTR_TMO_VALUE, kind::Socket, 0x100000000,
                                                 VI_ERROR_NSUP_ATTR_STATE},
                                         Attempt{VI_ATTR_TMO_VALUE, kind::ResourceManager, 1, VI_ERROR_NSUP_ATTR},
                                         Attempt{VI_ATTR_SUPPRESS_END_EN, kind::Socket, 1, VI_ERROR_NSUP_ATTR},
                                         Attempt{VI_ATTR_RSRC_NAME, kind::Socket, 1, VI_ERROR_ATTR_READONLY},
                                         Attempt{VI_ATTR_RSRC_LOCK_STATE, kind::Socket, 1, VI_ERROR_ATTR_READONLY},
                                         Attempt{VI_ATTR_TRIG_ID, kind::Hislip, 0xFFFF, VI_SUCCESS},
                                         Attempt{VI_ATTR_TRIG_ID, kind::Hislip, 0xFFFFFFFFFFFFFFFF, VI_SUCCESS},
                                         Attempt{VI_ATTR_TRIG_ID, kind::Hislip, 0, VI_ERROR_NSUP_ATTR_STATE},
                                         Attempt{VI_ATTR_TRIG_ID, kind::Hislip, 0x12345FFFF, VI_ERROR_NSUP_ATTR_STATE},
                                         Attempt{VI_ATTR_IO_PROT, kind::Hislip, 4, VI_SUCCESS},
                                         Attempt{VI_ATTR_IO_PROT, kind::Hislip, 3, VI_ERROR_NSUP_ATTR_STATE},
                                         Attempt{VI_ATTR_ASRL_STOP_BITS, kind::Serial, 15, VI_SUCCESS},
                                         Attempt{VI_ATTR_ASRL_STOP_BITS, kind::Serial, 11, VI_ERROR_NSUP_ATTR_STATE},
                                         Attempt{VI_ATTR_ASRL_FLOW_CNTRL, kind::Serial, 6, VI_SUCCESS},
                                         Attempt{VI_ATTR_GPIB_READDR_EN, kind::GpibInstr, 0, VI_SUCCESS},
                                         Attempt{VI_ATTR_RD_BUF_OPER_MODE, kind::Hislip, 2, VI_ERROR_NSUP_ATTR_STATE},
                                         Attempt{VI_ATTR_MAX_QUEUE_LENGTH, kind::Hislip, 0, VI_ERROR_NSUP_ATTR_STATE},
                                         Attempt{VI_ATTR_USER_DATA, kind::Hislip, 0xFFFFFFFFFFFFFFFF, VI_SUCCESS},
                                         Attempt{0x3FFF0999, kind::Hislip, 1, VI_ERROR_NSUP_ATTR}));

TEST(AttributeStore, CutsTextsToTheBufferOfTheInterface)
{
    AttributeStore store(kind::Hislip);
    store.setText(VI_ATTR_TCPIP_HOSTNAME, std::string(1000, 'h'));
    std::array<char, 300> buffer;
    buffer.fill('x');
    ASSERT_EQ(store.get(VI_ATTR_TCPIP_HOSTNAME, buffer.data()), VI_SUCCESS);
    EXPECT_EQ(std::string(buffer.data()).size(), 255u);
    EXPECT_EQ(buffer[256], 'x');
}

TEST(AttributeStore, HasNoTextThatWasNeverSet)
{
    std::array<char, 256> buffer{};
    EXPECT_EQ(AttributeStore(kind::FindListObject).get(VI_KY_ATTR_LXI_MANF, buffer.data()), VI_ERROR_NSUP_ATTR);
}

} // namespace
