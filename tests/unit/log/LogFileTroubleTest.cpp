#include "TemporaryHome.h"

#include "log/LogFile.h"

#include <csignal>

#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

namespace
{

class LogFileTrouble : public TemporaryHome
{
};

/// Runs @p check as a user who is not root, which ignores permissions, and leaves with its answer.
template <typename Check>
[[noreturn]] void leaveAsNobody(Check check)
{
    if (geteuid() == 0 && (setgid(65534) != 0 || setuid(65534) != 0))
        _exit(2);
    _exit(check() ? 0 : 1);
}

TEST_F(LogFileTrouble, HasNoCurrentFileAfterItWasDeletedFromOutside)
{
    LogFile file(nullptr);
    file.writeData(line(1, "gone"));
    ASSERT_TRUE(QFile::remove(file.getCurrentFileName()));
    EXPECT_EQ(file.getCurrentFileName(), QString());
    file.writeData(line(2, "gone too"));
    EXPECT_EQ(filesIn(standardFolder()), QStringList());

    ASSERT_TRUE(file.createNewFile(home("new.txt")));
    file.writeData(line(3, "here"));
    EXPECT_EQ(contentOf(home("new.txt")), "3\tVI_SUCCESS\there\t0 nsec\n");
}

TEST_F(LogFileTrouble, LeavesAloneWhatTookTheNameOfItsEmptyFile)
{
    LogFile file(nullptr);
    const QString path = file.getCurrentFileName();
    ASSERT_TRUE(QFile::remove(path));
    writeFile(path, "somebody else's");
    ASSERT_TRUE(file.createNewFile(home("new.txt")));
    EXPECT_EQ(contentOf(path), "somebody else's");
}

TEST_F(LogFileTrouble, RemovesNothingButRegularFiles)
{
    const QString pipe = home("pipe");
    ASSERT_EQ(mkfifo(pipe.toLocal8Bit().constData(), 0600), 0);
    {
        LogFile file(nullptr);
        ASSERT_TRUE(file.createNewFile(pipe));
    }
    EXPECT_TRUE(QFileInfo::exists(pipe));
}

TEST_F(LogFileTrouble, SurvivesAFolderThatVanishes)
{
    LogFile file(nullptr);
    file.writeData(line(1, "x"));
    ASSERT_TRUE(QDir(home("Documents")).removeRecursively());
    file.writeData(line(2, "x"));
    EXPECT_EQ(file.getCurrentFileName(), QString());
    EXPECT_FALSE(file.createNewFile(home("missing/x.txt")))
        << "neither the new file nor the previous one can be opened";
    file.writeData(line(3, "skipped"));
    file.setData(standardFolder().toLatin1());
    file.writeData(line(4, "back"));
    EXPECT_EQ(contentOf(file.getCurrentFileName()), "4\tVI_SUCCESS\tback\t0 nsec\n");
}

TEST_F(LogFileTrouble, StaysQuietInAFolderThatItMayNotWrite)
{
    const QByteArray folder = home("closed").toLocal8Bit();
    ASSERT_EQ(mkdir(folder.constData(), 0555), 0);
    ASSERT_EQ(chmod(home().toLocal8Bit().constData(), 0755), 0);
    EXPECT_EXIT(leaveAsNobody([&] {
                    LogFile file(nullptr); // its home may not be written either
                    const bool noneAtStart = file.getCurrentFileName().isEmpty();
                    file.writeData(line(1, "x"));
                    file.setCurrentStandardDir(home("closed"));
                    file.writeData(line(2, "x"));
                    file.setData(home("closed/below").toLatin1());
                    file.writeData(line(3, "x"));
                    return noneAtStart && file.getCurrentFileName().isEmpty() &&
                           !file.createNewFile(home("closed/x.txt")) && filesIn(home("closed")).isEmpty();
                }),
                testing::ExitedWithCode(0), "");
    EXPECT_EQ(filesIn(home()), QStringList({"closed"}));
}

TEST_F(LogFileTrouble, DoesNotSwitchToAFileThatItMayNotWrite)
{
    writeFile(home("read-only.txt"), "mine\n");
    ASSERT_EQ(chmod(home("read-only.txt").toLocal8Bit().constData(), 0444), 0);
    ASSERT_EQ(chmod(home().toLocal8Bit().constData(), 0755), 0);
    const QByteArray open = home("open").toLocal8Bit();
    ASSERT_EQ(mkdir(open.constData(), 0777), 0);
    ASSERT_EQ(chmod(open.constData(), 0777), 0);
    EXPECT_EXIT(leaveAsNobody([&] {
                    LogFile file(nullptr);
                    file.setCurrentStandardDir(home("open"));
                    const QString before = file.getCurrentFileName();
                    const bool refused = !file.createNewFile(home("read-only.txt"));
                    file.writeData(line(1, "x"));
                    return refused && !before.isEmpty() && file.getCurrentFileName() == before &&
                           contentOf(before) == "1\tVI_SUCCESS\tx\t0 nsec\n";
                }),
                testing::ExitedWithCode(0), "");
    EXPECT_EQ(contentOf(home("read-only.txt")), "mine\n");
}

TEST_F(LogFileTrouble, LosesOnlyWhatDoesNotFitOnAFullDisk)
{
    // A limit of the file size stands in for the full disk: the write that crosses it is cut, the next ones fail.
    LogFile file(nullptr);
    const QString path = file.getCurrentFileName();
    struct rlimit before {
    };
    ASSERT_EQ(getrlimit(RLIMIT_FSIZE, &before), 0);
    const auto ignored = std::signal(SIGXFSZ, SIG_IGN);
    const struct rlimit full = {40, before.rlim_max};
    ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &full), 0);
    for (std::uint64_t i = 1; i <= 1000; ++i)
        file.writeData(line(i, "x"));
    ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &before), 0);
    std::signal(SIGXFSZ, ignored);

    EXPECT_EQ(contentOf(path), "1\tVI_SUCCESS\tx\t0 nsec\n2\tVI_SUCCESS\tx\t0 n");
    file.writeData(line(1001, "room again"));
    file.writeData(line(1002, "and again"));
    EXPECT_EQ(contentOf(path), "1\tVI_SUCCESS\tx\t0 nsec\n"
                               "2\tVI_SUCCESS\tx\t0 n\n"
                               "1001\tVI_SUCCESS\troom again\t0 nsec\n"
                               "1002\tVI_SUCCESS\tand again\t0 nsec\n");
}

TEST_F(LogFileTrouble, AcceptsADamagedPayload)
{
    const QString inside = home("inside");
    QDir().mkpath(inside);
    const QString before = QDir::currentPath();
    QDir::setCurrent(inside); // a payload that is no absolute path means a folder below
    {
        LogFile file(nullptr);
        for (const QByteArray &data :
             {QByteArray("\x01\x02\xff\xfe"), QByteArray(100000, 'x'), QByteArray("a//.././b/"),
              QByteArray("000123abc"), QByteArray("/proc/self/no"), QByteArray("\n")}) {
            file.setData(data);
            file.writeData(line(1, "x"));
            EXPECT_FALSE(file.getCurrentStandardDir().isEmpty());
        }
        file.setData(home("good").toLatin1());
        EXPECT_EQ(file.getCurrentStandardDir(), home("good"));
    }
    QDir::setCurrent(before);
}

} // namespace
