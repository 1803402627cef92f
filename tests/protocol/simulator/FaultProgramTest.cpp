#include "protocol/simulator/SimulatorFixture.h"

using namespace test;

namespace
{

/// Which of a hundred answers of a simulator of its own are missing, one mark each.
std::string missing(const std::vector<std::string> &options)
{
    std::vector<std::string> all{"--socket", "0"};
    all.insert(all.end(), options.begin(), options.end());
    SimulatorProcess simulator(all);
    RawClient client(simulator.port("socket"));
    constexpr int Queries = 100;
    for (int i = 0; i < Queries; ++i)
        client.send("*ESE " + std::to_string(i) + ";*ESE?\n");
    client.send("DIAG:FAUL:DEL ALL;:SYST:VERS?\n");
    std::string marks(Queries, 'x');
    for (std::string line = client.receiveLine(); line != "1999.0\n" && !line.empty(); line = client.receiveLine())
        marks.at(static_cast<std::size_t>(std::stoi(line))) = '.';
    EXPECT_EQ(simulator.stop(SIGTERM), 0);
    return marks;
}

} // namespace

TEST(FaultProgram, StrikesTheSameAnswersWithTheSameSeed)
{
    const std::string marks = missing({"--fault", "socket:drop-reply:p=0.3", "--seed", "11"});
    EXPECT_NE(marks.find('x'), std::string::npos);
    EXPECT_NE(marks.find('.'), std::string::npos);
    EXPECT_EQ(missing({"--fault", "socket:drop-reply:p=0.3", "--seed", "11"}), marks);
    EXPECT_NE(missing({"--fault", "socket:drop-reply:p=0.3", "--seed", "12"}), marks);
}

TEST(FaultProgram, StrikesExactlyTheNthAnswer)
{
    std::string expected(100, '.');
    expected[36] = 'x';
    EXPECT_EQ(missing({"--fault", "socket:drop-reply:nth=37"}), expected);
}

TEST(FaultProgram, StrikesNothingThatItWasNotToldTo)
{
    EXPECT_EQ(missing({}), std::string(100, '.'));
    EXPECT_EQ(missing({"--fault", "hislip:drop-reply", "--fault", "vxi11:cut"}), std::string(100, '.'));
}
