// viFlush and viSetBuf of the system's buffers, over every protocol.
#include "contract/Contract.h"

#include <algorithm>
#include <filesystem>
#include <string_view>
#include <sys/socket.h>
#include <vector>

using test::VisaSession;

namespace contract
{
namespace
{

class SystemBuffers : public Contract
{
protected:
    ViStatus flush(int mask) { return viFlush(m_session.vi, static_cast<ViUInt16>(mask)); }
    ViStatus resize(int mask, ViUInt32 size) { return viSetBuf(m_session.vi, static_cast<ViUInt16>(mask), size); }

    /// The system's buffers belong to the session's own connection, which carries nothing but its messages.
    bool hasSizes() const
    {
        const std::string_view name = GetParam().name;
        return name == "socket" || name == "hislip" || name == "overlapped";
    }
};

INSTANTIATE_TEST_SUITE_P(All, SystemBuffers, testing::ValuesIn(protocols()), nameOf);

TEST_P(SystemBuffers, FlushOfTheInputDropsTheRestOfAnAnswer)
{
    for (const int mask : {VI_IO_IN_BUF, VI_IO_IN_BUF_DISCARD}) {
        ASSERT_EQ(m_session.write("*ESE 123;*ESE?;*ESE?;*ESE?\n"), VI_SUCCESS);
        ASSERT_EQ(m_session.read(2), VI_SUCCESS_MAX_CNT); // the answer comes in one piece: the rest is here
        EXPECT_EQ(m_session.text, "12");
        EXPECT_EQ(flush(mask), VI_SUCCESS);
        EXPECT_EQ(query("*OPC?"), "1\n") << mask;
    }
}

TEST_P(SystemBuffers, FlushOfTheInputWaitsForNothing)
{
    m_session.set(VI_ATTR_TMO_VALUE, VI_TMO_INFINITE);
    EXPECT_EQ(flush(VI_IO_IN_BUF), VI_SUCCESS);
    EXPECT_EQ(flush(VI_IO_IN_BUF_DISCARD), VI_SUCCESS);
    EXPECT_EQ(query("*OPC?"), "1\n");
}

TEST_P(SystemBuffers, FlushOfTheOutputLosesNothing)
{
    ASSERT_EQ(m_session.write("*ESE 45\n"), VI_SUCCESS);
    EXPECT_EQ(flush(VI_IO_OUT_BUF), VI_SUCCESS);
    EXPECT_EQ(query("*ESE?"), "45\n");
    EXPECT_EQ(flush(VI_IO_OUT_BUF_DISCARD), VI_SUCCESS);
    EXPECT_EQ(query("*ESE?"), "45\n");
}

TEST_P(SystemBuffers, FlagsCombineUnlessTheyMeanOneBuffer)
{
    EXPECT_EQ(flush(VI_IO_IN_BUF | VI_IO_OUT_BUF), VI_SUCCESS);
    EXPECT_EQ(flush(VI_IO_IN_BUF_DISCARD | VI_IO_OUT_BUF_DISCARD | VI_READ_BUF_DISCARD | VI_WRITE_BUF_DISCARD),
              VI_SUCCESS);
    EXPECT_EQ(flush(VI_IO_IN_BUF | VI_IO_IN_BUF_DISCARD), VI_ERROR_INV_MASK);
    EXPECT_EQ(flush(VI_IO_OUT_BUF | VI_IO_OUT_BUF_DISCARD), VI_ERROR_INV_MASK);
}

TEST_P(SystemBuffers, SizesAreSetWhereTheConnectionHasThem)
{
    const ViStatus expected = hasSizes() ? VI_SUCCESS : VI_WARN_NSUP_BUF;
    EXPECT_EQ(resize(VI_IO_IN_BUF, 30000), expected);
    EXPECT_EQ(resize(VI_IO_OUT_BUF, 30000), expected);
    EXPECT_EQ(resize(VI_IO_IN_BUF | VI_IO_OUT_BUF | VI_READ_BUF | VI_WRITE_BUF, 20000), expected);
    EXPECT_EQ(m_session.get<ViUInt32>(VI_ATTR_RD_BUF_SIZE), 20000u);
    EXPECT_EQ(m_session.get<ViUInt32>(VI_ATTR_WR_BUF_SIZE), 20000u);
    EXPECT_EQ(resize(VI_IO_IN_BUF, 0), VI_WARN_NSUP_BUF);
    EXPECT_EQ(resize(VI_IO_IN_BUF_DISCARD, 100), VI_ERROR_INV_MASK);
    EXPECT_EQ(query("*OPC?"), "1\n");
}

/// Of all sockets of this process.
std::vector<int> sizes(int option)
{
    std::vector<int> found;
    for (const auto &entry : std::filesystem::directory_iterator("/proc/self/fd")) {
        int size = 0;
        socklen_t length = sizeof size;
        if (::getsockopt(std::stoi(entry.path().filename().string()), SOL_SOCKET, option, &size, &length) == 0)
            found.push_back(size);
    }
    return found;
}

TEST_P(SystemBuffers, TheSystemLearnsTheSize)
{
    if (!hasSizes())
        return; // see SizesAreSetWhereTheConnectionHasThem
    EXPECT_EQ(resize(VI_IO_IN_BUF, 31234), VI_SUCCESS);
    EXPECT_EQ(resize(VI_IO_OUT_BUF, 41234), VI_SUCCESS);
    // Linux keeps twice the size that it is told, for its own bookkeeping.
    const auto input = sizes(SO_RCVBUF);
    const auto output = sizes(SO_SNDBUF);
    EXPECT_EQ(std::count(input.begin(), input.end(), 2 * 31234), 1);
    EXPECT_EQ(std::count(output.begin(), output.end(), 2 * 41234), 1);
}

} // namespace
} // namespace contract
