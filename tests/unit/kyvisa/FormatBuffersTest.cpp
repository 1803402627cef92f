#include "kyvisa/format/FormattedBuffers.h"
#include "kyvisa/include/visa.h"

#include <cstdarg>
#include <deque>
#include <gtest/gtest.h>
#include <string>
#include <vector>

using namespace kyvisa::format;

namespace
{

/// What a session would send and receive, piece by piece.
class RecordedChannel : public MessageChannel
{
public:
    struct Chunk {
        std::string data;
        ViStatus status = VI_SUCCESS;
    };

    ViStatus write(std::span<const std::byte> data, bool end) override
    {
        sent.push_back(std::string(reinterpret_cast<const char *>(data.data()), data.size()) + (end ? "<END>" : ""));
        return writeStatus;
    }

    ViStatus read(std::span<std::byte> data, std::size_t &count) override
    {
        asked.push_back(data.size());
        if (incoming.empty()) {
            count = 0;
            return VI_ERROR_TMO;
        }
        Chunk &chunk = incoming.front();
        count = std::min(chunk.data.size(), data.size());
        std::copy_n(reinterpret_cast<const std::byte *>(chunk.data.data()), count, data.begin());
        if (count < chunk.data.size()) {
            chunk.data.erase(0, count);
            return VI_SUCCESS_MAX_CNT;
        }
        const ViStatus status = chunk.status;
        incoming.pop_front();
        return status;
    }

    bool readsEnd() const override { return ends; }

    std::vector<std::string> sent;
    std::vector<std::size_t> asked;
    std::deque<Chunk> incoming;
    ViStatus writeStatus = VI_SUCCESS;
    bool ends = true;
};

using Sent = std::vector<std::string>;

class FormattedBuffersTest : public testing::Test
{
protected:
    ViStatus print(const char *format, ...)
    {
        Directives directives;
        if (const ViStatus status = parseOutputFormat(format, directives); status < VI_SUCCESS)
            return status;
        va_list list;
        va_start(list, format);
        Arguments arguments(list);
        va_end(list);
        return buffers.print(directives, arguments, flushAlways, channel);
    }

    ViStatus scan(const char *format, ...)
    {
        Directives directives;
        if (const ViStatus status = parseInputFormat(format, directives); status < VI_SUCCESS)
            return status;
        va_list list;
        va_start(list, format);
        Arguments arguments(list);
        va_end(list);
        return buffers.scan(directives, arguments, flushAlways, channel);
    }

    FormattedBuffers buffers;
    RecordedChannel channel;
    bool flushAlways = false;
};

TEST_F(FormattedBuffersTest, SendsALineWithEndAndKeepsTextWithoutOne)
{
    EXPECT_EQ(print("VOLT %d", 5), VI_SUCCESS);
    EXPECT_EQ(channel.sent, Sent{});
    EXPECT_EQ(print(";CURR %d\n", 1), VI_SUCCESS);
    EXPECT_EQ(channel.sent, Sent{"VOLT 5;CURR 1\n<END>"});
}

TEST_F(FormattedBuffersTest, SendsEachLineOfOneFormatAsAMessage)
{
    EXPECT_EQ(print("*CLS\n*RST\n"), VI_SUCCESS);
    EXPECT_EQ(channel.sent, (Sent{"*CLS\n<END>", "*RST\n<END>"}));
}

TEST_F(FormattedBuffersTest, SendsNoEndForALineFeedInABlock)
{
    EXPECT_EQ(print("DATA %3b\n", "a\nb"), VI_SUCCESS);
    EXPECT_EQ(channel.sent, Sent{"DATA #13a\nb\n<END>"});
}

TEST_F(FormattedBuffersTest, EndsAnIndefiniteBlockWithEnd)
{
    EXPECT_EQ(print("DATA %3B", "abc"), VI_SUCCESS);
    EXPECT_EQ(channel.sent, Sent{"DATA #0abc\n<END>"});
}

TEST_F(FormattedBuffersTest, SendsEveryPrintWhenToldTo)
{
    flushAlways = true;
    EXPECT_EQ(print("*IDN?"), VI_SUCCESS);
    EXPECT_EQ(channel.sent, Sent{"*IDN?<END>"});
}

TEST_F(FormattedBuffersTest, KeepsAByteForEndWhenItIsFull)
{
    ASSERT_EQ(buffers.output.resize(4, channel), VI_SUCCESS);
    EXPECT_EQ(print("abcd"), VI_SUCCESS);
    EXPECT_EQ(channel.sent, Sent{});
    EXPECT_EQ(print("e"), VI_SUCCESS);
    EXPECT_EQ(channel.sent, Sent{"abcd"});
    EXPECT_EQ(buffers.output.flush(channel), VI_SUCCESS);
    EXPECT_EQ(channel.sent, (Sent{"abcd", "e<END>"}));
    EXPECT_EQ(print("0123456789"), VI_SUCCESS);
    EXPECT_EQ(buffers.output.flush(channel), VI_SUCCESS);
    EXPECT_EQ(channel.sent, (Sent{"abcd", "e<END>", "012345678", "9<END>"}));
}

TEST_F(FormattedBuffersTest, SendsWhatIsInsideBeforeItChangesSize)
{
    EXPECT_EQ(print("abc"), VI_SUCCESS);
    EXPECT_EQ(buffers.output.resize(100, channel), VI_SUCCESS);
    EXPECT_EQ(channel.sent, Sent{"abc<END>"});
}

TEST_F(FormattedBuffersTest, ForgetsOutputThatCouldNotBeSent)
{
    channel.writeStatus = VI_ERROR_TMO;
    EXPECT_EQ(print("abc\n"), VI_ERROR_TMO);
    channel.writeStatus = VI_SUCCESS;
    EXPECT_EQ(print("def\n"), VI_SUCCESS);
    EXPECT_EQ(channel.sent, (Sent{"abc\n<END>", "def\n<END>"}));
}

TEST_F(FormattedBuffersTest, CallsEveryFailureButAFewIo)
{
    const std::pair<ViStatus, ViStatus> expected[] = {
        {VI_ERROR_CONN_LOST, VI_ERROR_IO},
        {VI_ERROR_BERR, VI_ERROR_IO},
        {VI_ERROR_TMO, VI_ERROR_TMO},
        {VI_ERROR_RSRC_LOCKED, VI_ERROR_RSRC_LOCKED},
        {VI_ERROR_INV_OBJECT, VI_ERROR_INV_OBJECT},
        {VI_ERROR_ABORT, VI_ERROR_ABORT},
    };
    for (const auto &[status, answer] : expected) {
        channel.writeStatus = status;
        EXPECT_EQ(print("x\n"), answer);
        channel.incoming = {{"", status}};
        int value = 0;
        EXPECT_EQ(scan("%d", &value), answer);
    }
}

TEST_F(FormattedBuffersTest, KeepsUnreadInputForTheNextScan)
{
    channel.incoming = {{"1,2,3\n"}, {"7\n"}};
    int a = 0;
    int b = 0;
    int c = 0;
    EXPECT_EQ(scan("%d,", &a), VI_SUCCESS);
    EXPECT_EQ(scan("%d,%d%*T", &b, &c), VI_SUCCESS);
    EXPECT_EQ(a * 100 + b * 10 + c, 123);
    EXPECT_EQ(channel.asked.size(), 1u);
    EXPECT_EQ(scan("%d", &a), VI_SUCCESS);
    EXPECT_EQ(a, 7);
}

TEST_F(FormattedBuffersTest, DoesNotReadPastTheEndOfAMessage)
{
    channel.incoming = {{"1"}, {"2"}};
    int a = 0;
    int b = -1;
    EXPECT_EQ(scan("%d,%d", &a, &b), VI_SUCCESS);
    EXPECT_EQ(b, -1);
    EXPECT_EQ(channel.incoming.size(), 1u);
}

TEST_F(FormattedBuffersTest, ReadsOnWhereTheDeviceSendsAMessageInPieces)
{
    channel.incoming = {{"12", VI_SUCCESS_MAX_CNT}, {"34,", VI_SUCCESS_MAX_CNT}, {"5"}};
    int a = 0;
    int b = 0;
    EXPECT_EQ(scan("%d,%d", &a, &b), VI_SUCCESS);
    EXPECT_EQ(a, 1234);
    EXPECT_EQ(b, 5);
}

TEST_F(FormattedBuffersTest, TakesATerminationCharacterForAnEnd)
{
    channel.incoming = {{"abc\n", VI_SUCCESS_TERM_CHAR}, {"def\n", VI_SUCCESS_TERM_CHAR}};
    char text[32];
    EXPECT_EQ(scan("%t", text), VI_SUCCESS);
    EXPECT_STREQ(text, "abc\n");
    EXPECT_EQ(scan("%t", text), VI_SUCCESS);
    EXPECT_STREQ(text, "def\n");
}

TEST_F(FormattedBuffersTest, AsksForNoMoreThanItNeedsWhereNothingEndsARead)
{
    channel.ends = false;
    channel.incoming = {{"12\n", VI_SUCCESS_MAX_CNT}};
    int value = 0;
    EXPECT_EQ(scan("%d%*T", &value), VI_SUCCESS);
    EXPECT_EQ(value, 12);
    EXPECT_EQ(channel.asked, (std::vector<std::size_t>{1, 1, 1}));
    channel.incoming = {{"#13abc\n", VI_SUCCESS_MAX_CNT}};
    char bytes[8]{};
    EXPECT_EQ(scan("%3b%*T", bytes), VI_SUCCESS);
    EXPECT_STREQ(bytes, "abc");
}

TEST_F(FormattedBuffersTest, ReadsLargeBlocksStraightIntoTheirPlace)
{
    std::string block(100'000, 'x');
    block.back() = 'y';
    channel.incoming = {{"#6100000" + block + "\n"}};
    std::vector<char> bytes(100'000);
    long count = 100'000;
    EXPECT_EQ(scan("%#b%*T", &count, bytes.data()), VI_SUCCESS);
    EXPECT_EQ(count, 100'000);
    EXPECT_EQ(std::string(bytes.begin(), bytes.end()), block);
    EXPECT_EQ(channel.asked.size(), 3u) << "the buffer, the rest of the block, the line feed";
}

TEST_F(FormattedBuffersTest, ClearsTheReadBufferAfterATimeOutWithoutData)
{
    channel.incoming = {{"12", VI_SUCCESS_MAX_CNT}};
    int value = 0;
    EXPECT_EQ(scan("%d", &value), VI_ERROR_TMO);
    channel.incoming = {{"7"}};
    EXPECT_EQ(scan("%d", &value), VI_SUCCESS);
    EXPECT_EQ(value, 7);
}

TEST_F(FormattedBuffersTest, FlushReadsAwayTheRestOfAMessage)
{
    ASSERT_NO_FATAL_FAILURE(buffers.input.resize(4));
    channel.incoming = {{"123456789"}, {"7"}};
    int value = 0;
    EXPECT_EQ(scan("%2d", &value), VI_SUCCESS);
    EXPECT_EQ(buffers.input.flush(channel), VI_SUCCESS);
    EXPECT_EQ(scan("%d", &value), VI_SUCCESS);
    EXPECT_EQ(value, 7);
    EXPECT_EQ(buffers.input.flush(channel), VI_SUCCESS) << "nothing has begun, so nothing is waited for";
}

TEST_F(FormattedBuffersTest, DiscardForgetsWithoutReading)
{
    channel.incoming = {{"1 2"}, {"7"}};
    int value = 0;
    EXPECT_EQ(scan("%d", &value), VI_SUCCESS);
    buffers.input.discard();
    EXPECT_EQ(scan("%d", &value), VI_SUCCESS);
    EXPECT_EQ(value, 7);
}

TEST_F(FormattedBuffersTest, ForgetsUnreadInputAfterEveryScanWhenToldTo)
{
    flushAlways = true;
    channel.incoming = {{"1 2"}, {"7"}};
    int value = 0;
    EXPECT_EQ(scan("%d", &value), VI_SUCCESS);
    EXPECT_EQ(scan("%d", &value), VI_SUCCESS);
    EXPECT_EQ(value, 7);
}

class BufferedRead : public FormattedBuffersTest
{
protected:
    std::pair<ViStatus, std::string> read(std::size_t size)
    {
        std::string data(size, '\0');
        std::size_t count = 0;
        const ViStatus status = buffers.read(std::as_writable_bytes(std::span(data)), count, channel);
        data.resize(count);
        return {status, data};
    }
};

TEST_F(BufferedRead, EndsAsAPlainReadDoes)
{
    using Result = std::pair<ViStatus, std::string>;
    channel.incoming = {{"abcdef"}, {"gh\n", VI_SUCCESS_TERM_CHAR}};
    char first = 0;
    EXPECT_EQ(scan("%c", &first), VI_SUCCESS);
    EXPECT_EQ(read(2), (Result{VI_SUCCESS_MAX_CNT, "bc"}));
    EXPECT_EQ(read(3), (Result{VI_SUCCESS, "def"}));
    EXPECT_EQ(scan("%c", &first), VI_SUCCESS);
    EXPECT_EQ(read(10), (Result{VI_SUCCESS_TERM_CHAR, "h\n"}));
    EXPECT_EQ(read(1), (Result{VI_ERROR_TMO, ""}));
}

} // namespace
