#include "log/LogFileOptionsDialog.h"

#include "TemporaryHome.h"
#include "log/LogFile.h"
#include "panels/Subject.h"
#include "support/ModalAnswer.h"

#include <QDesktopServices>
#include <QDialogButtonBox>
#include <QLabel>
#include <QLineEdit>
#include <QMessageBox>
#include <QPushButton>
#include <QUrl>
#include <QtTest/QTest>

#include <memory>

namespace
{
/// What the desktop was asked to open.
class Desktop : public QObject
{
    Q_OBJECT

public:
    Desktop() { QDesktopServices::setUrlHandler("file", this, "open"); }
    ~Desktop() override { QDesktopServices::unsetUrlHandler("file"); }

    QList<QUrl> opened;

public slots:
    void open(const QUrl &url) { opened.append(url); }
};

class LogFileOptions : public TemporaryHome, public Observer
{
protected:
    LogFileOptions()
    {
        m_logFile = std::make_unique<LogFile>(nullptr);
        m_first = m_logFile->getCurrentFileName();
        QDir().mkpath(other());
        open();
        m_logFile->addObserver(this);
        m_switches = 0;
    }

    ~LogFileOptions() override { m_logFile->removeObserver(this); }

    void update(Subject *) override { ++m_switches; }

    QString other() const { return home("other folder"); }

    void open()
    {
        m_dialog = std::make_unique<LogFileOptionsDialog>(m_logFile.get(), nullptr);
        m_dialog->show();
        ASSERT_TRUE(QTest::qWaitForWindowExposed(m_dialog.get()));
    }

    template <class Widget>
    Widget *find(const char *name) const
    {
        return m_dialog->findChild<Widget *>(QString::fromLatin1(name));
    }
    std::string fileField() const { return find<QLineEdit>("logFileEdit")->text().toStdString(); }
    std::string folderField() const { return find<QLineEdit>("logFolderEdit")->text().toStdString(); }
    void click(const char *name) const { QTest::mouseClick(find<QPushButton>(name), Qt::LeftButton); }

    /// Presses OK or Cancel and destroys the dialog.
    void finish(QDialogButtonBox::StandardButton button)
    {
        QTest::mouseClick(find<QDialogButtonBox>("logFileButtons")->button(button), Qt::LeftButton);
        ASSERT_FALSE(m_dialog->isVisible());
        EXPECT_EQ(m_switches, 0) << "nothing is applied before the dialog is destroyed";
        m_dialog.reset();
    }

    /// Presses @p button and types @p path into the file dialog that it opens.
    void pick(const char *button, const char *dialogName, const QString &path)
    {
        ModalAnswer answer(dialogName, [&](QDialog *dialog) {
            auto *name = dialog->findChild<QLineEdit *>("fileNameEdit");
            if (m_fileDialogTitle.isEmpty()) {
                m_fileDialogTitle = dialog->windowTitle();
                m_offered = name->text();
                m_offeredFolder = qobject_cast<QFileDialog *>(dialog)->directory().absolutePath();
            }
            if (path.isEmpty()) {
                QTest::keyClick(name, Qt::Key_Escape);
            } else if (name->text() == path) {
                QTest::keyClick(name, Qt::Key_Return);
            } else { // and again, when the folder's contents arrive only now and the proposed name with them
                QTest::keyClick(name, Qt::Key_A, Qt::ControlModifier);
                QTest::keyClicks(name, path);
            }
        });
        m_fileDialogTitle.clear();
        click(button);
        EXPECT_GE(answer.count(), 1);
        EXPECT_EQ(answer.unexpected(), 0);
    }
    void pickFolder(const QString &path) { pick("logSelectFolder", "logFolderDialog", path); }
    void pickFile(const QString &path) { pick("logSelectFile", "newLogFileDialog", path); }

    std::unique_ptr<LogFile> m_logFile;
    std::unique_ptr<LogFileOptionsDialog> m_dialog;
    QString m_first; ///< the log file at the beginning
    QString m_fileDialogTitle;
    QString m_offered;
    QString m_offeredFolder;
    int m_switches = 0;
};
} // namespace

TEST_F(LogFileOptions, ShowsFileAndFolder)
{
    EXPECT_EQ(m_dialog->windowTitle(), "Logging");
    EXPECT_EQ(m_dialog->minimumWidth(), 500);
    EXPECT_EQ(m_dialog->objectName(), "logFileOptionsDialog");
    EXPECT_FALSE(m_dialog->windowFlags().testFlag(Qt::WindowContextHelpButtonHint));
    EXPECT_EQ(fileField(), m_first.toStdString());
    EXPECT_EQ(folderField(), standardFolder().toStdString());
    EXPECT_EQ(find<QLabel>("logFileLabel")->text(), "Current log file");
    EXPECT_EQ(find<QLabel>("logFolderLabel")->text(), "Default path for logs");
    EXPECT_EQ(find<QPushButton>("logSelectFile")->text(), "Select File");
    EXPECT_EQ(find<QPushButton>("logSelectFolder")->text(), "Select Folder");
    EXPECT_EQ(find<QPushButton>("logOpen")->text(), "Open Log");
}

TEST_F(LogFileOptions, AcceptedWithoutChangesDoesNothing)
{
    finish(QDialogButtonBox::Ok);
    EXPECT_EQ(m_switches, 0);
    EXPECT_EQ(m_logFile->getCurrentFileName(), m_first);
}

TEST_F(LogFileOptions, CancelledChangesNothingThoughBothWerePicked)
{
    pickFolder(other());
    pickFile(home("mine.txt"));
    EXPECT_EQ(folderField(), other().toStdString());
    EXPECT_EQ(fileField(), home("mine.txt").toStdString());
    finish(QDialogButtonBox::Cancel);
    EXPECT_EQ(m_switches, 0);
    EXPECT_EQ(m_logFile->getCurrentFileName(), m_first);
    EXPECT_EQ(m_logFile->getCurrentStandardDir(), standardFolder());
    EXPECT_FALSE(QFile::exists(home("mine.txt")));
}

TEST_F(LogFileOptions, DestroyedWithoutAnAnswerChangesNothing)
{
    pickFolder(other());
    m_dialog.reset();
    EXPECT_EQ(m_switches, 0);
}

TEST_F(LogFileOptions, ClosedByTheWindowManagerChangesNothing)
{
    pickFolder(other());
    m_dialog->close();
    m_dialog.reset();
    EXPECT_EQ(m_switches, 0);
}

TEST_F(LogFileOptions, AFileThatWasPickedContinues)
{
    writeFile(home("mine.txt"), "earlier\n");
    m_logFile->writeData(line(1, "one"));
    pickFile(home("mine.txt"));
    EXPECT_EQ(m_fileDialogTitle, "New File");
    EXPECT_EQ(m_offered, QFileInfo(m_first).fileName());
    EXPECT_EQ(m_offeredFolder, standardFolder());
    finish(QDialogButtonBox::Ok);
    EXPECT_EQ(m_switches, 1);
    EXPECT_EQ(m_logFile->getCurrentFileName(), home("mine.txt"));
    EXPECT_EQ(m_logFile->getCurrentStandardDir(), standardFolder());
    m_logFile->writeData(line(2, "two", 0, 7));
    EXPECT_EQ(contentOf(home("mine.txt")), "earlier\n2\tVI_SUCCESS\ttwo\t7 nsec\n");
}

TEST_F(LogFileOptions, AFileThatDoesNotExistIsCreated)
{
    pickFile(home("new.txt"));
    finish(QDialogButtonBox::Ok);
    EXPECT_EQ(m_logFile->getCurrentFileName(), home("new.txt"));
}

TEST_F(LogFileOptions, AFolderAloneLeavesTheLogInTheOldFile)
{
    m_logFile->writeData(line(1, "one", 0, 5));
    pickFolder(other());
    EXPECT_EQ(m_offeredFolder, standardFolder());
    finish(QDialogButtonBox::Ok);
    EXPECT_EQ(m_switches, 2) << "to the new folder's file and back";
    EXPECT_EQ(m_logFile->getCurrentStandardDir(), other());
    EXPECT_EQ(m_logFile->getCurrentFileName(), m_first);
    EXPECT_EQ(filesIn(other()), QStringList()) << "the new file was empty and has gone";
    m_logFile->writeData(line(2, "two", 0, 6));
    EXPECT_EQ(contentOf(m_first), "1\tVI_SUCCESS\tone\t5 nsec\n2\tVI_SUCCESS\ttwo\t6 nsec\n");
}

TEST_F(LogFileOptions, FolderAndFileAreBothTaken)
{
    pickFolder(other());
    pickFile(home("mine.txt"));
    finish(QDialogButtonBox::Ok);
    EXPECT_EQ(m_logFile->getCurrentStandardDir(), other());
    EXPECT_EQ(m_logFile->getCurrentFileName(), home("mine.txt"));
}

TEST_F(LogFileOptions, AFolderThatWasTypedIsNotTaken)
{
    auto *edit = find<QLineEdit>("logFolderEdit");
    QTest::keyClick(edit, Qt::Key_A, Qt::ControlModifier);
    QTest::keyClicks(edit, other());
    finish(QDialogButtonBox::Ok);
    EXPECT_EQ(m_switches, 0);
    EXPECT_EQ(m_logFile->getCurrentStandardDir(), standardFolder());
}

TEST_F(LogFileOptions, CancelledFileDialogsLeaveTheFields)
{
    pickFolder(QString());
    pickFile(QString());
    EXPECT_EQ(fileField(), m_first.toStdString());
    EXPECT_EQ(folderField(), standardFolder().toStdString());
    finish(QDialogButtonBox::Ok);
    EXPECT_EQ(m_switches, 0);
}

TEST_F(LogFileOptions, AFileThatCannotBeOpenedLeavesTheLogWhereItIs)
{
    m_logFile->writeData(line(1, "one"));
    auto *edit = find<QLineEdit>("logFileEdit");
    QTest::keyClick(edit, Qt::Key_A, Qt::ControlModifier);
    QTest::keyClicks(edit, home("no such folder/log.txt"));
    ModalAnswer none("", [](QDialog *) {});
    finish(QDialogButtonBox::Ok);
    for (const QWidget *window : QApplication::topLevelWidgets())
        EXPECT_FALSE(window->isVisible()) << "no message: " << window->objectName().toStdString();
    EXPECT_EQ(none.unexpected(), 0);
    EXPECT_EQ(m_switches, 0);
    EXPECT_EQ(m_logFile->getCurrentFileName(), m_first);
}

TEST_F(LogFileOptions, OpensTheLogThatTheFieldShows)
{
    Desktop desktop;
    click("logOpen");
    ASSERT_EQ(desktop.opened.size(), 1);
    EXPECT_EQ(desktop.opened[0], QUrl::fromLocalFile(m_first));
}

TEST_F(LogFileOptions, OpensNothingWhenTheFieldIsEmpty)
{
    QFile::remove(m_first);
    open();
    EXPECT_EQ(fileField(), "");
    Desktop desktop;
    click("logOpen");
    EXPECT_TRUE(desktop.opened.isEmpty());
    finish(QDialogButtonBox::Ok);
    EXPECT_EQ(m_switches, 0);
}

TEST_F(LogFileOptions, SaysThatTheDesktopCannotOpenALog)
{
    // The offscreen platform has no desktop that could.
    ModalAnswer answer("cannotOpenLog", [&](QDialog *dialog) {
        const auto *box = qobject_cast<QMessageBox *>(dialog);
        EXPECT_EQ(box->windowTitle(), "Info");
        EXPECT_EQ(box->text().toStdString(), "Cannot open: " + m_first.toStdString());
        EXPECT_EQ(box->icon(), QMessageBox::Information);
        QTest::keyClick(dialog, Qt::Key_Return);
    });
    click("logOpen");
    EXPECT_EQ(answer.count(), 1);
    EXPECT_TRUE(m_dialog->isVisible());
    EXPECT_EQ(m_switches, 0);
}

TEST_F(LogFileOptions, SurvivesALogFileThatIsMissingOrGoesAway)
{
    LogFileOptionsDialog none(nullptr, nullptr);
    none.accept();
    m_dialog->accept();
    m_logFile->removeObserver(this);
    m_logFile = std::make_unique<LogFile>(nullptr);
    m_dialog.reset();
    EXPECT_EQ(m_switches, 0);
}

#include "LogFileOptionsDialogTest.moc"
