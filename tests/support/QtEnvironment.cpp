// A source file to add to a test program that needs a QApplication: it creates one before the first test and destroys it
// after the last one. The offscreen platform is taken unless the environment asks for another one, and home is a temporary
// folder: no test touches the user's settings, data or documents. A process that a test starts shares that home.
#include <QApplication>
#include <QDir>
#include <QFile>
#include <QScreen>
#include <QTemporaryDir>

#include <gtest/gtest.h>

#include <memory>

#ifdef __SANITIZE_ADDRESS__
// What the font library keeps to the end of the process is none of ours.
extern "C" const char *__lsan_default_suppressions();
extern "C" const char *__lsan_default_suppressions()
{
    return "leak:libfontconfig.so\n";
}
#endif

namespace
{
// The offscreen platform never deletes its screen. While somebody knows where it is, the leak checker does not mind.
const void *volatile s_platformScreen = nullptr;

class QtEnvironment : public testing::Environment
{
public:
    void SetUp() override
    {
        if (!qEnvironmentVariableIsSet("KYVISA_TEST_HOME"))
            makeHome();
        if (qEnvironmentVariableIsEmpty("QT_QPA_PLATFORM"))
            qputenv("QT_QPA_PLATFORM", "offscreen");
        m_application = std::make_unique<QApplication>(m_count, m_arguments);
        s_platformScreen = QGuiApplication::primaryScreen()->handle();
    }

    void TearDown() override
    {
#ifdef __SANITIZE_ADDRESS__
        // The offscreen platform drops its screen without deleting it. While the application lives, that counts as no leak.
        static_cast<void>(m_application.release());
#else
        m_application.reset();
#endif
    }

private:
    void makeHome()
    {
        m_home = std::make_unique<QTemporaryDir>();
        ASSERT_TRUE(m_home->isValid());
        qputenv("KYVISA_TEST_HOME", QFile::encodeName(m_home->path()));
        qputenv("HOME", QFile::encodeName(m_home->path()));
        for (const char *variable : {"XDG_CONFIG_HOME", "XDG_DATA_HOME", "XDG_CACHE_HOME", "XDG_RUNTIME_DIR"}) {
            const QString folder = m_home->filePath(QString::fromLatin1(variable).toLower());
            QDir().mkpath(folder);
            QFile::setPermissions(folder, QFile::ReadOwner | QFile::WriteOwner | QFile::ExeOwner);
            qputenv(variable, QFile::encodeName(folder));
        }
    }

    std::unique_ptr<QTemporaryDir> m_home;
    char m_name[5] = "test";
    char *m_arguments[2] = {m_name, nullptr};
    int m_count = 1;
    std::unique_ptr<QApplication> m_application;
};

const testing::Environment *const s_environment = testing::AddGlobalTestEnvironment(new QtEnvironment);
} // namespace
