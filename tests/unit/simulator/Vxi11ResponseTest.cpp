#include "simulator/server/Vxi11Response.h"
#include "simulator/instrument/Bytes.h"

#include <gtest/gtest.h>

using namespace simulator;

namespace
{

std::string textOf(const Vxi11Response::Piece &piece)
{
    std::string text;
    for (const Outgoing &part : piece.bytes) {
        text += part.text;
        text.append(reinterpret_cast<const char *>(part.bytes.data()), part.bytes.size());
    }
    EXPECT_EQ(text.size(), piece.size);
    return text;
}

/// "ab" + a block of "cd\nef" + "gh\n".
ResponseSegments sample()
{
    auto block = std::make_shared<Bytes>(std::make_shared<ByteBudget>(100));
    block->append(std::as_bytes(std::span("cd\nef", 5)), 5);
    ResponseSegments segments;
    segments.push_back({"ab", block});
    segments.push_back({"gh\n", nullptr});
    return segments;
}

} // namespace

TEST(Vxi11Response, GivesTheSameBytesInPiecesOfAnySize)
{
    for (std::size_t most = 1; most <= 11; ++most) {
        Vxi11Response response;
        response.begin(sample());
        std::string all;
        while (response.active()) {
            const Vxi11Response::Piece piece = response.take(most, std::nullopt);
            EXPECT_EQ(piece.last, !response.active());
            EXPECT_FALSE(piece.matched);
            EXPECT_LE(piece.size, most);
            all += textOf(piece);
        }
        EXPECT_EQ(all, "abcd\nefgh\n") << most;
    }
}

TEST(Vxi11Response, StopsBehindTheTerminationCharacterWhereverItStands)
{
    Vxi11Response response;
    response.begin(sample());
    Vxi11Response::Piece piece = response.take(100, '\n');
    EXPECT_EQ(textOf(piece), "abcd\n");
    EXPECT_TRUE(piece.matched);
    EXPECT_FALSE(piece.last);
    piece = response.take(2, '\n');
    EXPECT_EQ(textOf(piece), "ef");
    EXPECT_FALSE(piece.matched);
    piece = response.take(100, '\n');
    EXPECT_EQ(textOf(piece), "gh\n");
    EXPECT_TRUE(piece.matched);
    EXPECT_TRUE(piece.last);
}

TEST(Vxi11Response, SharesBlocksInsteadOfCopyingThem)
{
    Vxi11Response response;
    ResponseSegments segments = sample();
    const std::byte *block = segments[0].block->view().data();
    response.begin(std::move(segments));
    const Vxi11Response::Piece piece = response.take(4, std::nullopt);
    ASSERT_EQ(piece.bytes.size(), 2u);
    EXPECT_EQ(piece.bytes[1].bytes.data(), block);
    response.drop();
    EXPECT_FALSE(response.active());
    EXPECT_EQ(textOf(piece), "abcd") << "kept alive by the piece";
}
