#include "gui/support/WindowTest.h"

#include "app/MainWindow.h"

#include <QAbstractItemView>
#include <QApplication>
#include <QComboBox>
#include <QElapsedTimer>
#include <QFile>
#include <QLineEdit>
#include <QTabBar>
#include <QTableWidget>
#include <QTest>

#include <stdexcept>

namespace
{

void failOnWarning(QtMsgType type, const QMessageLogContext &, const QString &message)
{
    // The offscreen platform says this of every window and means nothing by it.
    if (message.contains(QLatin1String("This plugin does not support")))
        return;
    if (type != QtDebugMsg && type != QtInfoMsg)
        ADD_FAILURE() << "Qt warns: " << message.toStdString();
}

} // namespace

WindowTest::WindowTest()
{
    qInstallMessageHandler(failOnWarning);
    qputenv("HOME", m_home.path().toLocal8Bit());
    for (const char *name : {"XDG_DATA_HOME", "XDG_CONFIG_HOME", "XDG_CACHE_HOME", "XDG_DATA_DIRS"})
        qunsetenv(name);
    QDir(m_home.path()).mkdir(QStringLiteral("Documents"));
}

WindowTest::~WindowTest()
{
    closeWindow();
    qInstallMessageHandler(nullptr);
}

MainWindow &WindowTest::openWindow()
{
    m_window = std::make_unique<MainWindow>(nullptr);
    m_window->show();
    if (!QTest::qWaitForWindowExposed(m_window.get()))
        ADD_FAILURE() << "the window does not show";
    QApplication::setActiveWindow(m_window.get()); // acts as the system: the window manager
    return *m_window;
}

void WindowTest::closeWindow()
{
    if (!m_window)
        return;
    m_window->close();
    m_window.reset();
}

QWidget *WindowTest::widget(const char *name) const
{
    auto *found = m_window->findChild<QWidget *>(QString::fromLatin1(name));
    if (!found)
        throw std::runtime_error(std::string("there is no widget ") + name);
    return found;
}

QVariant WindowTest::shown(const char *name, const char *property) const
{
    const QVariant value = widget(name)->property(property);
    if (!value.isValid())
        throw std::runtime_error(std::string(name) + " has no property " + property);
    return value;
}

void WindowTest::press(const char *name)
{
    QTest::mouseClick(widget(name), Qt::LeftButton);
}

void WindowTest::tick(const char *name)
{
    QWidget *box = widget(name);
    QTest::mouseClick(box, Qt::LeftButton, Qt::NoModifier, QPoint(8, box->height() / 2));
}

void WindowTest::enter(const char *name, const QString &text)
{
    QWidget *field = widget(name);
    auto *line = qobject_cast<QLineEdit *>(field);
    if (!line)
        line = field->findChild<QLineEdit *>();
    // acts as the system: a click brings a window to the front, also when a list or a dialog took the keyboard with it
    if (!QApplication::activeWindow() || !QApplication::activeWindow()->isVisible())
        QApplication::setActiveWindow(field->window());
    QTest::mouseClick(line ? line : field, Qt::LeftButton);
    key(Qt::Key_A, Qt::ControlModifier);
    if (text.isEmpty())
        key(Qt::Key_Delete);
    else
        type(text);
}

void WindowTest::key(Qt::Key key, Qt::KeyboardModifiers modifiers)
{
    QWidget *focused = QApplication::focusWidget();
    QTest::keyClick(focused ? focused : m_window.get(), key, modifiers);
}

void WindowTest::type(const QString &text)
{
    QWidget *focused = QApplication::focusWidget();
    ASSERT_NE(focused, nullptr) << "nothing has the keyboard focus";
    QTest::keyClicks(focused, text);
}

void WindowTest::enterNumber(const char *name, int number)
{
    enter(name, QString::number(number));
    key(Qt::Key_Tab);
}

void WindowTest::showPage(const QString &label)
{
    auto *bar = widget("sessionPages")->findChild<QTabBar *>();
    for (int tab = 0; tab < bar->count(); ++tab) {
        if (bar->tabText(tab) == label) {
            QTest::mouseClick(bar, Qt::LeftButton, {}, bar->tabRect(tab).center());
            return;
        }
    }
    ADD_FAILURE() << "there is no page " << label.toStdString();
}

void WindowTest::choose(const char *name, const QString &item)
{
    auto *box = qobject_cast<QComboBox *>(widget(name));
    ASSERT_NE(box, nullptr) << name;
    const int row = box->findText(item, Qt::MatchExactly | Qt::MatchCaseSensitive);
    ASSERT_GE(row, 0) << name << " does not offer " << item.toStdString();
    press(name);
    ASSERT_TRUE(eventually([box] { return box->view()->isVisible(); }));
    QTest::keyClick(box->view(), Qt::Key_Home);
    for (int i = 0; i < row; ++i)
        QTest::keyClick(box->view(), Qt::Key_Down);
    QTest::keyClick(box->view(), Qt::Key_Return);
    ASSERT_TRUE(eventually([box] { return !box->view()->isVisible(); }));
    ASSERT_EQ(box->currentText(), item);
}

QModelIndex WindowTest::rowIndex(const char *list, const QString &text) const
{
    const auto *model = qobject_cast<QAbstractItemView *>(widget(list))->model();
    for (int row = 0; row < model->rowCount(); ++row)
        if (model->index(row, 0).data().toString() == text)
            return model->index(row, 0);
    return {};
}

void WindowTest::chooseRow(const char *list, const QString &text)
{
    auto *view = qobject_cast<QAbstractItemView *>(widget(list));
    const QPoint place = view->visualRect(rowIndex(list, text)).center();
    ASSERT_TRUE(view->indexAt(place).data().toString() == text) << text.toStdString() << " is not to be seen";
    QTest::mouseClick(view->viewport(), Qt::LeftButton, {}, place);
}

QVariant WindowTest::rowData(const char *list, const QString &text, int role) const
{
    return rowIndex(list, text).data(role);
}

QStringList WindowTest::rows(const char *list) const
{
    const auto *model = qobject_cast<QAbstractItemView *>(widget(list))->model();
    QStringList texts;
    for (int row = 0; row < model->rowCount(); ++row)
        texts << model->index(row, 0).data().toString();
    return texts;
}

bool WindowTest::eventually(const std::function<bool()> &condition, int ms)
{
    return QTest::qWaitFor(condition, ms);
}

void WindowTest::meanwhile(int ms)
{
    QElapsedTimer timer;
    timer.start();
    while (timer.elapsed() < ms)
        QApplication::processEvents(QEventLoop::AllEvents, 10);
}

QString WindowTest::logCell(int row, int column) const
{
    auto *table = qobject_cast<QTableWidget *>(widget("logTable"));
    const QTableWidgetItem *item = table->item(row, column);
    return item ? item->text() : QString();
}

int WindowTest::logRows() const
{
    return qobject_cast<QTableWidget *>(widget("logTable"))->rowCount();
}

int WindowTest::logRow(const QString &text) const
{
    for (int row = 0; row < logRows(); ++row)
        if (logCell(row, 3) == text)
            return row;
    return -1;
}

QString WindowTest::dataFile() const
{
    return home() + QStringLiteral("/.local/share/Oltrava/KyVisaTester/data.adr");
}

QStringList WindowTest::logFiles() const
{
    const QDir folder(home() + QStringLiteral("/Documents/KyVisaTester"));
    QStringList paths;
    for (const QString &name : folder.entryList(QDir::Files, QDir::Name))
        paths << folder.filePath(name);
    return paths;
}

QByteArray WindowTest::contents(const QString &path)
{
    QFile file(path);
    return file.open(QIODevice::ReadOnly) ? file.readAll() : QByteArray();
}
