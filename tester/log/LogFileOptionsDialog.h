#pragma once

#include <QDialog>
#include <QPointer>

#include <memory>

class LogFile;
class Ui_logFileOptionsDialog;

/**
 * Shows and changes where a session's log goes: the current file, and the folder for new ones.
 *
 *     LogFileOptionsDialog dialog(logFile, window);
 *     dialog.setModal(true);
 *     dialog.exec();
 *     ... what was chosen takes effect when the dialog is destroyed, if it was accepted
 *
 * A folder is taken over only after it was picked with the button. It starts a new file there, which the file field then
 * switches back to the file that it shows: picking a folder alone keeps the log where it is.
 *
 * The dialogs that it opens have the object names "logFolderDialog", "newLogFileDialog" and "cannotOpenLog".
 */
class LogFileOptionsDialog : public QDialog
{
    Q_OBJECT

public:
    LogFileOptionsDialog(LogFile *logFile, QWidget *parent);
    ~LogFileOptionsDialog() override;

private slots:
    void buttonSelectFolderClicked();
    void buttonNewFileClicked();
    void buttonOpenLogClicked();

private:
    void setupUi();
    void setupConnections();
    void apply();

    std::unique_ptr<Ui_logFileOptionsDialog> m_ui;
    QPointer<LogFile> m_logFile; ///< not owned; without one the fields are empty and nothing is applied
    bool m_folderChanged = false;
};
