#pragma once

#include <gtest/gtest.h>

#include <QDir>
#include <QModelIndex>
#include <QString>
#include <QStringList>
#include <QTemporaryDir>
#include <QVariant>
#include <QWidget>

#include <functional>
#include <memory>

class MainWindow;

/**
 * The real main window, driven as a person would: widgets are found by object name, pressed with the mouse and written into with
 * keys; what they show is read. Nothing else behind the window is touched.
 *
 * Each test has a home folder of its own (settings, session data, documents). A warning of Qt fails the test, and so does a
 * window that is left open.
 */
class WindowTest : public ::testing::Test
{
public:
    WindowTest();
    ~WindowTest() override;

protected:
    /// Opens the window and waits until it is shown.
    MainWindow &openWindow();
    /// Closes it as the window manager would and deletes it, as the end of the program does.
    void closeWindow();
    MainWindow &window() { return *m_window; }

    /// The widget of that object name; the test fails and stops when there is none.
    QWidget *widget(const char *name) const;
    /// A property of the widget: what it shows.
    QVariant shown(const char *name, const char *property) const;
    QString text(const char *name) const { return shown(name, "text").toString(); }
    bool isVisible(const char *name) const { return widget(name)->isVisible(); }
    bool isEnabled(const char *name) const { return widget(name)->isEnabled(); }

    /// Presses and releases the left mouse button over the middle of the widget.
    void press(const char *name);
    /// The same for a check box: over its indicator.
    void tick(const char *name);
    /// Clicks into a line edit (or an editable combo box), marks all of it and types over it.
    void enter(const char *name, const QString &text);
    /// A key, pressed and released where the keyboard focus is.
    void key(Qt::Key key, Qt::KeyboardModifiers modifiers = Qt::NoModifier);
    /// Text, typed where the keyboard focus is.
    void type(const QString &text);
    /// Types the number into a spin box.
    void enterNumber(const char *name, int number);

    /// Clicks on the tab of that label.
    void showPage(const QString &label);
    /// Opens a combo box with the mouse and picks that item with the keys.
    void choose(const char *name, const QString &item);
    /// Clicks on the row of a list that shows that text; the test fails when none does, or only outside the visible part.
    void chooseRow(const char *list, const QString &text);
    /// A row of a list as shown: what it has for @p role, invalid when no row shows the text.
    QVariant rowData(const char *list, const QString &text, int role) const;
    /// The rows of a list, from the top.
    QStringList rows(const char *list) const;

    /// Runs the event loop until @p condition holds. False when it does not within @p ms.
    static bool eventually(const std::function<bool()> &condition, int ms = 10000);
    /// Runs the event loop for a while, to see that something does not happen.
    static void meanwhile(int ms = 200);

    /// Rows of the live log as shown: the text of a cell, empty where there is none.
    QString logCell(int row, int column) const;
    int logRows() const;
    /// Row of the first line with that text, or -1.
    int logRow(const QString &text) const;

    QString home() const { return m_home.path(); }
    /// Where session values are kept between runs.
    QString dataFile() const;
    /// The log files in the standard folder, oldest first.
    QStringList logFiles() const;
    static QByteArray contents(const QString &path);

private:
    QModelIndex rowIndex(const char *list, const QString &text) const;

    QTemporaryDir m_home;
    std::unique_ptr<MainWindow> m_window;
};
