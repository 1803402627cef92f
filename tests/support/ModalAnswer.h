#pragma once

#include <QApplication>
#include <QDialog>
#include <QFileDialog>
#include <QMessageBox>
#include <QTimer>

#include <functional>
#include <utility>

/**
 * Answers modal dialogs that the code under test opens and waits for.
 *
 *     ModalAnswer box("configEditorWarning", [](QDialog *dialog) { QTest::keyClick(dialog, Qt::Key_Return); });
 *     ... what opens the dialog ...
 *     EXPECT_EQ(box.count(), 1);
 *
 * A message box or file dialog of another name is rejected, so that an unexpected one fails the test instead of stopping it.
 */
class ModalAnswer
{
public:
    ModalAnswer(const char *name, std::function<void(QDialog *)> answer)
        : m_name(QString::fromLatin1(name)), m_answer(std::move(answer))
    {
        QObject::connect(&m_timer, &QTimer::timeout, [this] { look(); });
        m_timer.start(5);
    }

    int count() const { return m_count; }
    int unexpected() const { return m_unexpected; }

private:
    void look()
    {
        auto *dialog = qobject_cast<QDialog *>(QApplication::activeModalWidget());
        if (!dialog || !dialog->isVisible())
            return;
        // Until a box is active, shortcuts of the window behind it take its keys.
        if (qobject_cast<QMessageBox *>(dialog) && !dialog->isActiveWindow())
            return;
        if (dialog->objectName() == m_name) {
            ++m_count;
            m_answer(dialog);
        } else if (qobject_cast<QMessageBox *>(dialog) || qobject_cast<QFileDialog *>(dialog)) {
            ++m_unexpected;
            dialog->reject();
        }
    }

    QString m_name;
    std::function<void(QDialog *)> m_answer;
    QTimer m_timer;
    int m_count = 0;
    int m_unexpected = 0;
};
