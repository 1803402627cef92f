#include "ConfigFixture.h"
#include "config/KyVisaTextConfigure.h"
#include "support/ModalAnswer.h"

#include <QDialogButtonBox>
#include <QGuiApplication>
#include <QLabel>
#include <QMessageBox>
#include <QPushButton>
#include <QScreen>
#include <QSettings>
#include <QTextEdit>
#include <QtTest/QTest>

#include <sys/stat.h>

namespace
{
class ConfigEditor : public ConfigFile
{
protected:
    ConfigEditor() { QSettings().clear(); }

    static QTextEdit *text(const QDialog &dialog) { return dialog.findChild<QTextEdit *>("configText"); }

    static void click(const QDialog &dialog, const char *button)
    {
        QTest::mouseClick(dialog.findChild<QPushButton *>(button), Qt::LeftButton);
    }

    /// Shows @p dialog and waits until it is there.
    static void show(QDialog &dialog)
    {
        dialog.show();
        ASSERT_TRUE(QTest::qWaitForWindowExposed(&dialog));
    }

    static void expectWarning(QDialog *dialog, const QString &text)
    {
        auto *box = qobject_cast<QMessageBox *>(dialog);
        ASSERT_NE(box, nullptr);
        EXPECT_EQ(box->windowTitle(), "Config file editor");
        EXPECT_EQ(box->text().toStdString(), text.toStdString());
        EXPECT_EQ(box->icon(), QMessageBox::Warning);
        EXPECT_EQ(box->standardButtons(), QMessageBox::Ok);
        QTest::mouseClick(box->button(QMessageBox::Ok), Qt::LeftButton);
    }
};
} // namespace

TEST_F(ConfigEditor, ShowsTheFileAsPlainText)
{
    write("; comment <b>kept</b>\n[KYVISA]\nDebug = 1\n");
    KyVisaTextConfigure dialog(path(), nullptr);
    EXPECT_EQ(dialog.windowTitle(), "Config file editor - " + path());
    EXPECT_TRUE(dialog.isModal());
    EXPECT_EQ(dialog.minimumWidth(), 500);
    EXPECT_EQ(text(dialog)->toPlainText(), "; comment <b>kept</b>\n[KYVISA]\nDebug = 1\n");
    EXPECT_FALSE(text(dialog)->acceptRichText());
    const auto *box = dialog.findChild<QDialogButtonBox *>("configButtons");
    EXPECT_EQ(box->orientation(), Qt::Horizontal);
    EXPECT_EQ(box->standardButtons(),
              QDialogButtonBox::Ok | QDialogButtonBox::Cancel | QDialogButtonBox::RestoreDefaults);
}

TEST_F(ConfigEditor, WritesTheTextOnOk)
{
    write("[KYVISA]\nDebug = 1\n");
    KyVisaTextConfigure dialog(path(), nullptr);
    show(dialog);
    QTest::keyClicks(text(dialog), "; mine ");
    click(dialog, "configOk");
    EXPECT_EQ(dialog.result(), QDialog::Accepted);
    EXPECT_FALSE(dialog.isVisible());
    EXPECT_EQ(content(), "; mine [KYVISA]\nDebug = 1\n");
}

TEST_F(ConfigEditor, TruncatesALongerFile)
{
    write("0123456789\n");
    KyVisaTextConfigure dialog(path(), nullptr);
    show(dialog);
    QTest::keyClick(text(dialog), Qt::Key_A, Qt::ControlModifier);
    QTest::keyClicks(text(dialog), "x");
    click(dialog, "configOk");
    EXPECT_EQ(content(), "x");
}

TEST_F(ConfigEditor, KeepsTheBytesOfAnUntouchedFile)
{
    for (const std::string bytes : {"; m\xc3\xbcnchen\n", "; m\xfcnchen\n", ""}) {
        write(bytes);
        KyVisaTextConfigure dialog(path(), nullptr);
        show(dialog);
        click(dialog, "configOk");
        EXPECT_EQ(content(), bytes);
    }
}

TEST_F(ConfigEditor, WritesUtf8WhenTheOldEncodingLacksALetter)
{
    write("; \xfc ");
    KyVisaTextConfigure dialog(path(), nullptr);
    show(dialog);
    QTest::keyClick(text(dialog), Qt::Key_End, Qt::ControlModifier);
    text(dialog)->insertPlainText(QStringLiteral("\u03a9"));
    click(dialog, "configOk");
    EXPECT_EQ(content(), "; \xc3\xbc \xce\xa9");
}

TEST_F(ConfigEditor, RestoresDefaultsIntoTheEditorAlone)
{
    write("[KYVISA]\nDebug = 1\n");
    KyVisaTextConfigure dialog(path(), nullptr);
    show(dialog);
    click(dialog, "configRestoreDefaults");
    EXPECT_TRUE(text(dialog)->toPlainText().contains(";@file         " + path() + "\n"));
    EXPECT_EQ(text(dialog)->toPlainText().count('\n'), 79);
    EXPECT_TRUE(dialog.isVisible());
    EXPECT_EQ(content(), "[KYVISA]\nDebug = 1\n");

    click(dialog, "configCancel");
    EXPECT_EQ(dialog.result(), QDialog::Rejected);
    EXPECT_EQ(content(), "[KYVISA]\nDebug = 1\n");
}

TEST_F(ConfigEditor, TakesRestoreDefaultsBackWithUndo)
{
    write("; mine\n");
    KyVisaTextConfigure dialog(path(), nullptr);
    show(dialog);
    click(dialog, "configRestoreDefaults");
    QTest::keyClick(text(dialog), Qt::Key_Z, Qt::ControlModifier);
    EXPECT_EQ(text(dialog)->toPlainText(), "; mine\n");
}

TEST_F(ConfigEditor, WritesTheDefaultsOnOk)
{
    ModalAnswer box("configEditorWarning", [](QDialog *dialog) { QTest::keyClick(dialog, Qt::Key_Return); });
    KyVisaTextConfigure dialog(path(), nullptr);
    show(dialog);
    click(dialog, "configRestoreDefaults");
    click(dialog, "configOk");
    EXPECT_EQ(QByteArray::fromStdString(content()).count('\n'), 79);
    EXPECT_EQ(section("KYVISA").at("Debug"), "0");
    EXPECT_EQ(section("ALIASES").at("NumAliases"), "0");
}

TEST_F(ConfigEditor, SaysThatAFileCannotBeReadAndStaysUsable)
{
    const QString expected = "Cannot read file " + path() + ":\nNo such file or directory";
    ModalAnswer box("configEditorWarning", [&](QDialog *dialog) { expectWarning(dialog, expected); });
    KyVisaTextConfigure dialog(path(), nullptr);
    EXPECT_EQ(box.count(), 1);
    show(dialog);
    EXPECT_EQ(text(dialog)->toPlainText(), "");
    QTest::keyClicks(text(dialog), "[KYVISA]");
    click(dialog, "configOk");
    EXPECT_EQ(content(), "[KYVISA]");
    EXPECT_EQ(box.unexpected(), 0);
}

TEST_F(ConfigEditor, SaysThatAFileCannotBeWrittenAndKeepsTheText)
{
    const QString name = folder() + "/%2 <b>";
    ASSERT_TRUE(QDir(folder()).mkdir("%2 <b>"));
    QStringList expected{"Cannot read file " + name + ":\nfile to open is a directory",
                         "Cannot write file " + name + ":\nIs a directory"};
    ModalAnswer box("configEditorWarning", [&](QDialog *dialog) { expectWarning(dialog, expected.takeFirst()); });
    KyVisaTextConfigure dialog(name, nullptr);
    show(dialog);
    QTest::keyClicks(text(dialog), "precious");
    click(dialog, "configOk");
    EXPECT_EQ(box.count(), 2);
    EXPECT_TRUE(dialog.isVisible());
    EXPECT_EQ(text(dialog)->toPlainText(), "precious");
}

TEST_F(ConfigEditor, SaysThatTheDiskIsFull)
{
    write("text\n");
    const QString link = folder() + "/link";
    ASSERT_TRUE(QFile::link(path(), link));
    KyVisaTextConfigure dialog(link, nullptr);
    show(dialog);
    // Reading the device would never end, so the name leads there from now on only.
    ASSERT_TRUE(QFile::remove(link));
    ASSERT_TRUE(QFile::link("/dev/full", link));
    const QString expected = "Cannot write file " + link + ":\nNo space left on device";
    ModalAnswer box("configEditorWarning", [&](QDialog *warning) { expectWarning(warning, expected); });
    click(dialog, "configOk");
    EXPECT_EQ(box.count(), 1);
    EXPECT_TRUE(dialog.isVisible());
}

TEST_F(ConfigEditor, OpensAtFiveHundredByFiveHundredInTheMiddleOfTheScreen)
{
    write("");
    const KyVisaTextConfigure dialog(path(), nullptr);
    EXPECT_EQ(dialog.size(), QSize(500, 500));
    QRect expected(0, 0, 500, 500);
    expected.moveCenter(QGuiApplication::primaryScreen()->geometry().center());
    EXPECT_EQ(dialog.pos(), expected.topLeft());
    EXPECT_FALSE(dialog.isMaximized());
}

TEST_F(ConfigEditor, OpensAgainWhereItWas)
{
    write("");
    {
        KyVisaTextConfigure dialog(path(), nullptr);
        dialog.resize(640, 333);
        dialog.move(31, 47);
    }
    const KyVisaTextConfigure dialog(path(), nullptr);
    EXPECT_EQ(dialog.size(), QSize(640, 333));
    EXPECT_EQ(dialog.pos(), QPoint(31, 47));
}

TEST_F(ConfigEditor, OpensMaximizedAgainAndSpellsTheKeyAsEver)
{
    write("");
    {
        KyVisaTextConfigure dialog(path(), nullptr);
        dialog.showMaximized();
    }
    EXPECT_TRUE(QSettings().value("ConfigEditor/fullsreen").toBool());
    EXPECT_FALSE(QSettings().contains("ConfigEditor/fullscreen"));
    const KyVisaTextConfigure dialog(path(), nullptr);
    EXPECT_TRUE(dialog.isMaximized());
}
