#pragma once

#include "log/FastBuffer.h"
#include "pipeline/VisaFunctionCallListener.h"

#include <QColor>
#include <QTimer>
#include <QWidget>

#include <array>
#include <cstdint>

class QLabel;
class QPushButton;
class QTableWidget;
class QTableWidgetItem;
class StringMessageQueue;

/**
 * The live view: a table of the newest log lines.
 *
 * Live mode shows as many of the newest lines as fit and follows new ones; a timer looks every 300 ms, so that the cost does
 * not grow with the rate of lines. View mode shows the whole snapshot of the last look, frozen, to browse and copy. Any
 * finished call of the session brings live mode back. The mode is what the buttons say: the one of the current mode is disabled.
 */
class LogTextDisplay : public QWidget, public VisaFunctionCallListener
{
    Q_OBJECT

public:
    LogTextDisplay(VisaFunctionCallHandler *handler, QWidget *parent);

    /// Starts to show @p queue, which is not owned, in live mode.
    void setQueue(StringMessageQueue *queue);

    void visaFunctionCallFinished(_visaFunctionCall &call) override;

    /// Rows that fit into the table; 0 when not even one does.
    int visibleLines() const;
    void showVisaLine(const FastBuffer &line, unsigned int row);
    void showNonVisaLine(const FastBuffer &line, unsigned int row);

    bool eventFilter(QObject *watched, QEvent *event) override;

public slots:
    void timeout();
    void buttonClearClicked();
    void buttonLiveModeClicked();
    void buttonViewModeClicked();

protected:
    void keyPressEvent(QKeyEvent *event) override;
    void resizeEvent(QResizeEvent *event) override;

private:
    static constexpr unsigned SnapshotSize = 1024;

    void setupUi();
    void setupTable();
    bool isLiveMode() const;
    bool isViewMode() const;
    void showNewestLines();
    void showLine(const FastBuffer &line, int row);
    QTableWidgetItem *setCell(int row, int column, const QString &text, Qt::Alignment alignment);

    std::array<FastBuffer, SnapshotSize> m_snapshot; ///< lines of the last look, oldest first
    int m_snapshotCount = 0;
    StringMessageQueue *m_queue = nullptr;
    QTimer m_timer{this};
    std::uint64_t m_lastTotal = 0; ///< the ring's total at the last look; 0 makes the next look redraw
    int m_rowHeight = 1;
    QColor m_warningColor;

    QTableWidget *m_table = nullptr;
    QPushButton *m_clear = nullptr;
    QPushButton *m_liveMode = nullptr;
    QPushButton *m_viewMode = nullptr;
    QLabel *m_lines = nullptr;
    QLabel *m_displayed = nullptr;
};
