// A source file to add to a test program that needs a QApplication: it creates one before the first test and destroys it
// after the last one. The offscreen platform is taken unless the environment asks for another one.
#include <QApplication>
#include <QtGlobal>

#include <gtest/gtest.h>

#include <memory>

namespace
{
class QtEnvironment : public testing::Environment
{
public:
    void SetUp() override
    {
        if (qEnvironmentVariableIsEmpty("QT_QPA_PLATFORM"))
            qputenv("QT_QPA_PLATFORM", "offscreen");
        m_application = std::make_unique<QApplication>(m_count, m_arguments);
    }

    void TearDown() override { m_application.reset(); }

private:
    char m_name[5] = "test";
    char *m_arguments[2] = {m_name, nullptr};
    int m_count = 1;
    std::unique_ptr<QApplication> m_application;
};

const testing::Environment *const s_environment = testing::AddGlobalTestEnvironment(new QtEnvironment);
} // namespace
