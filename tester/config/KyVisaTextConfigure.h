#pragma once

#include <QDialog>
#include <QString>

class QAbstractButton;
class QDialogButtonBox;
class QTextCodec;
class QTextEdit;

/**
 * Edits the configuration file of the VISA library as plain text, comments and all.
 *
 * The file is read when the dialog is built and written on OK only. "Restore Defaults" puts a commented template into the
 * editor. A file that cannot be read leaves the editor empty, one that cannot be written keeps the dialog open; both are
 * said in a message box (object name "configEditorWarning").
 */
class KyVisaTextConfigure : public QDialog
{
    Q_OBJECT

public:
    KyVisaTextConfigure(QString path, QWidget *parent);
    ~KyVisaTextConfigure() override;

private slots:
    void okClicked();
    void clicked(QAbstractButton *button);

private:
    void setupUi();
    void readFile();
    bool writeFile(QString &error) const;
    void restoreGeometryOfLastTime();
    void warn(const QString &text);

    QString m_path;
    QTextCodec *m_encoding; ///< of the file that was read; not owned
    QTextEdit *m_editor = nullptr;
    QDialogButtonBox *m_buttons = nullptr;
};
