#include "config/KyVisaTextConfigure.h"

#include "config/ConfigEncoding.h"
#include "config/ConfigTemplate.h"

#include <QDialogButtonBox>
#include <QFile>
#include <QFontDatabase>
#include <QGuiApplication>
#include <QMessageBox>
#include <QPushButton>
#include <QScreen>
#include <QSettings>
#include <QTextCodec>
#include <QTextEdit>
#include <QTextStream>
#include <QVBoxLayout>

#include <utility>

namespace
{
const QString SettingsGroup = QStringLiteral("ConfigEditor");
const QString SizeKey = QStringLiteral("size");
const QString PositionKey = QStringLiteral("pos");
const QString MaximizedKey = QStringLiteral("fullsreen"); // spelled so in everybody's settings
constexpr QSize InitialSize(500, 500);
} // namespace

KyVisaTextConfigure::KyVisaTextConfigure(QString path, QWidget *parent)
    : QDialog(parent), m_path(std::move(path)), m_encoding(configEncoding(QByteArray()))
{
    setupUi();
    connect(m_buttons, &QDialogButtonBox::accepted, this, &KyVisaTextConfigure::okClicked);
    connect(m_buttons, &QDialogButtonBox::rejected, this, &QDialog::reject);
    connect(m_buttons, &QDialogButtonBox::clicked, this, &KyVisaTextConfigure::clicked);
}

KyVisaTextConfigure::~KyVisaTextConfigure()
{
    QSettings settings;
    settings.beginGroup(SettingsGroup);
    settings.setValue(SizeKey, size());
    settings.setValue(PositionKey, pos());
    settings.setValue(MaximizedKey, isMaximized());
    settings.endGroup();
}

void KyVisaTextConfigure::setupUi()
{
    setObjectName(QStringLiteral("configEditor"));
    setWindowTitle(tr("Config file editor - ") + m_path);
    setModal(true);
    setMinimumWidth(500);

    m_editor = new QTextEdit(this);
    m_editor->setObjectName(QStringLiteral("configText"));
    m_editor->setAccessibleName(tr("Configuration file"));
    m_editor->setAcceptRichText(false);
    m_editor->setLineWrapMode(QTextEdit::NoWrap);
    m_editor->setFont(QFontDatabase::systemFont(QFontDatabase::FixedFont));

    m_buttons = new QDialogButtonBox(
        QDialogButtonBox::Ok | QDialogButtonBox::Cancel | QDialogButtonBox::RestoreDefaults, Qt::Horizontal, this);
    m_buttons->setObjectName(QStringLiteral("configButtons"));
    QPushButton *defaults = m_buttons->button(QDialogButtonBox::RestoreDefaults);
    defaults->setObjectName(QStringLiteral("configRestoreDefaults"));
    defaults->setToolTip(tr("Replaces the text by a commented template. The file changes with OK only."));
    m_buttons->button(QDialogButtonBox::Ok)->setObjectName(QStringLiteral("configOk"));
    m_buttons->button(QDialogButtonBox::Cancel)->setObjectName(QStringLiteral("configCancel"));

    auto *layout = new QVBoxLayout(this);
    layout->addWidget(m_editor);
    layout->addWidget(m_buttons);

    readFile();
    restoreGeometryOfLastTime();
    m_editor->setFocus();
}

void KyVisaTextConfigure::readFile()
{
    QFile file(m_path);
    if (!file.open(QIODevice::ReadOnly | QIODevice::Text)) {
        warn(tr("Cannot read file %1:\n%2").arg(m_path, file.errorString()));
        return;
    }
    m_encoding = configEncoding(file.readAll());
    file.seek(0);
    QTextStream stream(&file);
    stream.setCodec(m_encoding);
    m_editor->setPlainText(stream.readAll());
}

void KyVisaTextConfigure::restoreGeometryOfLastTime()
{
    resize(InitialSize);
    if (const QScreen *screen = QGuiApplication::primaryScreen()) {
        QRect frame(QPoint(), InitialSize);
        frame.moveCenter(screen->geometry().center());
        move(frame.topLeft());
    }

    QSettings settings;
    settings.beginGroup(SettingsGroup);
    if (settings.contains(SizeKey))
        resize(settings.value(SizeKey).toSize());
    if (settings.contains(PositionKey))
        move(settings.value(PositionKey).toPoint());
    if (settings.value(MaximizedKey, false).toBool())
        setWindowState(windowState() | Qt::WindowMaximized);
    settings.endGroup();
}

void KyVisaTextConfigure::okClicked()
{
    QString error;
    if (writeFile(error))
        accept();
    else
        warn(tr("Cannot write file %1:\n%2").arg(m_path, error));
}

bool KyVisaTextConfigure::writeFile(QString &error) const
{
    const QString text = m_editor->toPlainText();
    QFile file(m_path);
    if (!file.open(QIODevice::WriteOnly | QIODevice::Text)) {
        error = file.errorString();
        return false;
    }
    QTextStream stream(&file);
    stream.setCodec(m_encoding->canEncode(text) ? m_encoding : QTextCodec::codecForName("UTF-8"));
    stream << text;
    stream.flush();
    const bool written = stream.status() == QTextStream::Ok && file.flush();
    error = file.errorString();
    file.close();
    return written;
}

void KyVisaTextConfigure::clicked(QAbstractButton *button)
{
    if (button != m_buttons->button(QDialogButtonBox::RestoreDefaults))
        return;
    QTextCursor all(m_editor->document()); // rather than setPlainText(), so that it can be undone
    all.select(QTextCursor::Document);
    all.insertText(configTemplate(m_path));
    m_editor->moveCursor(QTextCursor::Start);
}

void KyVisaTextConfigure::warn(const QString &text)
{
    QMessageBox box(QMessageBox::Warning, tr("Config file editor"), text, QMessageBox::Ok, this);
    box.setObjectName(QStringLiteral("configEditorWarning"));
    box.setTextFormat(Qt::PlainText); // a path may look like markup
    box.exec();
}
