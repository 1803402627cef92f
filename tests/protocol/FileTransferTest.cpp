// viReadToFile and viWriteFromFile on a real instrument.
#include "support/SimulatorProcess.h"
#include "support/VisaSession.h"

#include <filesystem>
#include <fstream>
#include <gtest/gtest.h>
#include <unistd.h>

using test::SimulatorProcess;
using test::VisaSession;

namespace
{

class FileTransfer : public testing::Test
{
protected:
    void SetUp() override
    {
        ASSERT_EQ(m_session.open(m_simulator.resource("hislip")), VI_SUCCESS);
        m_session.set(VI_ATTR_TMO_VALUE, 20000);
    }
    void TearDown() override { std::filesystem::remove_all(m_folder); }

    std::string inFolder(const std::string &name)
    {
        std::filesystem::create_directories(m_folder);
        return (m_folder / name).string();
    }
    void save(const std::string &name, const std::string &content) { std::ofstream(name, std::ios::binary) << content; }
    std::string load(const std::string &name)
    {
        std::ifstream file(name, std::ios::binary);
        return {std::istreambuf_iterator<char>(file), {}};
    }

    SimulatorProcess m_simulator{{"--hislip", "0"}};
    VisaSession m_session;
    std::filesystem::path m_folder =
        std::filesystem::path(testing::TempDir()) / ("file-transfer-" + std::to_string(::getpid()));
};

TEST_F(FileTransfer, WritesACommandAndReadsTheAnswer)
{
    save(inFolder("command"), "*ESE 21;*ESE?\n");
    EXPECT_EQ(viWriteFromFile(m_session.vi, inFolder("command").c_str(), 1000, &m_session.count), VI_SUCCESS);
    EXPECT_EQ(m_session.count, 14u);
    EXPECT_EQ(viReadToFile(m_session.vi, inFolder("answer").c_str(), 1000, &m_session.count), VI_SUCCESS);
    EXPECT_EQ(m_session.count, 3u);
    EXPECT_EQ(load(inFolder("answer")), "21\n");
}

TEST_F(FileTransfer, SendsNoMoreThanItWasAskedFor)
{
    save(inFolder("command"), "*ESE 21;*ESE?;THIS:IS:NOT:SENT\n");
    EXPECT_EQ(viWriteFromFile(m_session.vi, inFolder("command").c_str(), 13, &m_session.count), VI_SUCCESS);
    EXPECT_EQ(m_session.count, 13u);
    EXPECT_EQ(m_session.read(), VI_SUCCESS);
    EXPECT_EQ(m_session.text, "21\n");
}

TEST_F(FileTransfer, MovesAFileOfManyPiecesAsOneMessage)
{
    std::string content(3'000'000, '\0');
    for (std::size_t i = 0; i < content.size(); ++i)
        content[i] = static_cast<char>(i * 7 + i / 1000);
    save(inFolder("command"), "MMEM:DATA \"big\",#73000000" + content + "\n");
    EXPECT_EQ(viWriteFromFile(m_session.vi, inFolder("command").c_str(), VI_TMO_INFINITE, nullptr), VI_SUCCESS);
    ASSERT_EQ(m_session.write("MMEM:DATA? \"big\"\n"), VI_SUCCESS);
    EXPECT_EQ(viReadToFile(m_session.vi, inFolder("answer").c_str(), 4'000'000, &m_session.count), VI_SUCCESS);
    EXPECT_EQ(m_session.count, 3'000'010u);
    EXPECT_EQ(load(inFolder("answer")), "#73000000" + content + "\n");
}

TEST_F(FileTransfer, ReplacesAFileOrAppendsToIt)
{
    const std::string name = inFolder("answer");
    save(name, "old and long");
    ASSERT_EQ(m_session.write("*ESE 1;*ESE?"), VI_SUCCESS);
    EXPECT_EQ(viReadToFile(m_session.vi, name.c_str(), 100, nullptr), VI_SUCCESS);
    EXPECT_EQ(load(name), "1\n");
    m_session.set(VI_ATTR_FILE_APPEND_EN, VI_TRUE);
    ASSERT_EQ(m_session.write("*ESE 2;*ESE?"), VI_SUCCESS);
    EXPECT_EQ(viReadToFile(m_session.vi, name.c_str(), 100, nullptr), VI_SUCCESS);
    EXPECT_EQ(load(name), "1\n2\n");
}

TEST_F(FileTransfer, StopsAtTheCount)
{
    ASSERT_EQ(m_session.write("*ESE 123;*ESE?"), VI_SUCCESS);
    EXPECT_EQ(viReadToFile(m_session.vi, inFolder("answer").c_str(), 2, &m_session.count), VI_SUCCESS_MAX_CNT);
    EXPECT_EQ(m_session.count, 2u);
    EXPECT_EQ(load(inFolder("answer")), "12");
    EXPECT_EQ(m_session.read(), VI_SUCCESS);
    EXPECT_EQ(m_session.text, "3\n");
}

TEST_F(FileTransfer, TellsWhatIsWrongWithTheFile)
{
    const std::string folder = inFolder("");
    EXPECT_EQ(viReadToFile(m_session.vi, (folder + "no/such/folder").c_str(), 10, nullptr), VI_ERROR_FILE_ACCESS);
    EXPECT_EQ(viWriteFromFile(m_session.vi, (folder + "absent").c_str(), 10, nullptr), VI_ERROR_FILE_ACCESS);
    EXPECT_EQ(viReadToFile(m_session.vi, nullptr, 10, nullptr), VI_ERROR_FILE_ACCESS);
    EXPECT_EQ(viWriteFromFile(m_session.vi, nullptr, 10, nullptr), VI_ERROR_FILE_ACCESS);
    EXPECT_EQ(viWriteFromFile(m_session.vi, folder.c_str(), 10, nullptr), VI_ERROR_FILE_IO)
        << "a folder opens, but has no bytes";
    ASSERT_EQ(m_session.write("*ESE?"), VI_SUCCESS);
    EXPECT_EQ(viReadToFile(m_session.vi, "/dev/full", 10, nullptr), VI_ERROR_FILE_IO);
}

TEST_F(FileTransfer, AnswersTheTimeOutOfTheWholeOperation)
{
    m_session.set(VI_ATTR_TMO_VALUE, 50);
    EXPECT_EQ(viReadToFile(m_session.vi, inFolder("answer").c_str(), 10, &m_session.count), VI_ERROR_TMO);
    EXPECT_EQ(m_session.count, 0u);
}

} // namespace
