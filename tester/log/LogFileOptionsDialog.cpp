#include "log/LogFileOptionsDialog.h"

#include "log/LogFile.h"
#include "ui_LogFileOptionsDialog.h"

#include <QDesktopServices>
#include <QDir>
#include <QFileDialog>
#include <QFileInfo>
#include <QMessageBox>
#include <QUrl>

LogFileOptionsDialog::LogFileOptionsDialog(LogFile *logFile, QWidget *parent)
    : QDialog(parent), m_ui(std::make_unique<Ui_logFileOptionsDialog>()), m_logFile(logFile)
{
    m_ui->setupUi(this);
    if (m_logFile)
        m_ui->logFolderEdit->setText(QDir::toNativeSeparators(m_logFile->getCurrentStandardDir()));
    setupUi();
    setupConnections();
}

LogFileOptionsDialog::~LogFileOptionsDialog()
{
    if (m_logFile && result() == QDialog::Accepted)
        apply();
}

void LogFileOptionsDialog::setupUi()
{
    setWindowTitle(tr("Logging"));
    setWindowFlags(windowFlags() & ~Qt::WindowContextHelpButtonHint);
    if (m_logFile)
        m_ui->logFileEdit->setText(m_logFile->getCurrentFileName());
    setMinimumWidth(500);
}

void LogFileOptionsDialog::setupConnections()
{
    connect(m_ui->logSelectFolder, &QPushButton::clicked, this, &LogFileOptionsDialog::buttonSelectFolderClicked);
    connect(m_ui->logSelectFile, &QPushButton::clicked, this, &LogFileOptionsDialog::buttonNewFileClicked);
    connect(m_ui->logOpen, &QPushButton::clicked, this, &LogFileOptionsDialog::buttonOpenLogClicked);
}

void LogFileOptionsDialog::apply()
{
    if (m_folderChanged)
        m_logFile->setCurrentStandardDir(m_ui->logFolderEdit->text());
    // Asked for after the folder's own new file, which therefore gives way to the file that the field shows.
    if (m_logFile->getCurrentFileName() != m_ui->logFileEdit->text())
        m_logFile->createNewFile(m_ui->logFileEdit->text());
}

void LogFileOptionsDialog::buttonSelectFolderClicked()
{
    QFileDialog dialog(this, tr("Select Folder"), m_ui->logFolderEdit->text());
    dialog.setObjectName(QStringLiteral("logFolderDialog"));
    dialog.setFileMode(QFileDialog::Directory);
    if (dialog.exec() != QDialog::Accepted)
        return;
    m_ui->logFolderEdit->setText(QDir::toNativeSeparators(dialog.selectedFiles().value(0)));
    m_folderChanged = true;
}

void LogFileOptionsDialog::buttonNewFileClicked()
{
    const QFileInfo current(m_ui->logFileEdit->text());
    QFileDialog dialog(this, tr("New File"));
    dialog.setObjectName(QStringLiteral("newLogFileDialog"));
    dialog.setAcceptMode(QFileDialog::AcceptSave);
    dialog.setFileMode(QFileDialog::AnyFile);
    dialog.setOption(QFileDialog::DontConfirmOverwrite); // an existing log is continued, nothing gets lost
    if (!m_ui->logFileEdit->text().isEmpty()) {
        dialog.setDirectory(current.absolutePath());
        dialog.selectFile(current.fileName());
    }
    if (dialog.exec() != QDialog::Accepted)
        return;
    const QString chosen = dialog.selectedFiles().value(0);
    if (!chosen.isEmpty())
        m_ui->logFileEdit->setText(QDir::toNativeSeparators(chosen));
}

void LogFileOptionsDialog::buttonOpenLogClicked()
{
    const QString path = m_ui->logFileEdit->text();
    if (path.isEmpty() || QDesktopServices::openUrl(QUrl::fromLocalFile(path)))
        return;
    QMessageBox box(QMessageBox::Information, tr("Info"), tr("Cannot open: %1").arg(path), QMessageBox::Ok, this);
    box.setObjectName(QStringLiteral("cannotOpenLog"));
    box.setTextFormat(Qt::PlainText); // a path may look like markup
    box.exec();
}
