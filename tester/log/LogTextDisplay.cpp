#include "log/LogTextDisplay.h"

#include "log/Log.h"
#include "pipeline/VisaError.h"

#include <QApplication>
#include <QClipboard>
#include <QHBoxLayout>
#include <QHeaderView>
#include <QKeyEvent>
#include <QLabel>
#include <QPushButton>
#include <QScrollBar>
#include <QTableWidget>
#include <QVBoxLayout>

#include <algorithm>
#include <cstring>

namespace
{
constexpr int RefreshInterval = 300; // ms

enum Column { LineColumn, DurationColumn, StatusColumn, OperationColumn, ColumnCount };

/// A cell whose tool tip is its text: the columns are narrow and the calls long.
class Cell : public QTableWidgetItem
{
public:
    QVariant data(int role) const override
    {
        if (role == Qt::ToolTipRole)
            return QStringLiteral("<p>%1</p>").arg(text().toHtmlEscaped()); // rich text, so that long lines wrap
        return QTableWidgetItem::data(role);
    }
};

QString durationText(std::uint64_t nanoseconds)
{
    const auto d = static_cast<qulonglong>(nanoseconds);
    if (d <= 999)
        return LogTextDisplay::tr("%1 ns").arg(d);
    if (d <= 999999)
        return LogTextDisplay::tr("%1 µs").arg(d / 1000);
    if (d <= 999999999)
        return LogTextDisplay::tr("%1 ms").arg(d / 1000000);
    return LogTextDisplay::tr("%1 s").arg(d / 1000000000);
}

bool isCopy(const QKeyEvent *event)
{
    return event->modifiers() == Qt::ControlModifier && event->key() == Qt::Key_C;
}

QPushButton *button(const QString &text, const char *name, const QString &toolTip, QWidget *parent)
{
    auto *result = new QPushButton(text, parent);
    result->setObjectName(QLatin1String(name));
    result->setToolTip(toolTip);
    return result;
}

QLabel *number(const char *name, const QString &accessibleName, const QString &toolTip, QWidget *parent)
{
    auto *result = new QLabel(QStringLiteral("0"), parent);
    result->setObjectName(QLatin1String(name));
    result->setAccessibleName(accessibleName);
    result->setToolTip(toolTip);
    return result;
}
} // namespace

LogTextDisplay::LogTextDisplay(VisaFunctionCallHandler *handler, QWidget *parent)
    : QWidget(parent), VisaFunctionCallListener(handler, VisaFunctionCallTyp::All),
      m_warningColor(QColor::fromHsl(30, 255, 128, 255))
{
    setupUi();
    m_timer.setObjectName(QStringLiteral("logTimer"));
    m_timer.setInterval(RefreshInterval);
    connect(&m_timer, &QTimer::timeout, this, &LogTextDisplay::timeout);
    connect(m_clear, &QPushButton::clicked, this, &LogTextDisplay::buttonClearClicked);
    connect(m_liveMode, &QPushButton::clicked, this, &LogTextDisplay::buttonLiveModeClicked);
    connect(m_viewMode, &QPushButton::clicked, this, &LogTextDisplay::buttonViewModeClicked);
}

void LogTextDisplay::setupUi()
{
    setObjectName(QStringLiteral("logTextDisplay"));
    setupTable();

    m_clear = button(tr("Clear"), "logClear", tr("Empties the table. The log file keeps its lines."), this);
    m_liveMode = button(tr("Live Mode"), "logLiveMode",
                        tr("Follows the newest lines. The next finished VISA call comes back to it by itself."), this);
    m_viewMode = button(tr("View Mode"), "logViewMode",
                        tr("Stops the table, so that up to 1024 recent lines can be browsed and copied."), this);

    const QString linesTip = tr("Log lines numbered so far, shown or not");
    auto *linesCaption = new QLabel(tr("Lines:"), this);
    linesCaption->setToolTip(linesTip);
    m_lines = number("logLines", tr("Lines"), linesTip, this);
    const QString displayedTip = tr("Rows in the table");
    auto *displayedCaption = new QLabel(tr("Displayed:"), this);
    displayedCaption->setToolTip(displayedTip);
    m_displayed = number("logDisplayed", tr("Displayed"), displayedTip, this);

    auto *hint =
        new QLabel(tr("Use ") + QStringLiteral("Ctrl") + tr(" + C to copy the selected rows to the cache."), this);
    hint->setObjectName(QStringLiteral("logHint"));
    hint->setToolTip(tr("The rows go to the clipboard as text, the columns separated by tabs."));
    hint->setWordWrap(true);

    auto *buttons = new QHBoxLayout;
    buttons->addWidget(m_clear);
    buttons->addWidget(m_liveMode);
    buttons->addWidget(m_viewMode);
    buttons->addStretch();

    constexpr int Gap = 12;
    auto *numbers = new QHBoxLayout;
    numbers->addWidget(linesCaption);
    numbers->addWidget(m_lines);
    numbers->addSpacing(Gap);
    numbers->addWidget(displayedCaption);
    numbers->addWidget(m_displayed);
    numbers->addStretch();

    auto *layout = new QVBoxLayout(this);
    layout->setContentsMargins(0, 0, 0, 0);
    layout->addWidget(m_table, 1);
    layout->addLayout(buttons);
    layout->addLayout(numbers);
    layout->addWidget(hint);
}

void LogTextDisplay::setupTable()
{
    m_table = new QTableWidget(0, ColumnCount, this);
    m_table->setObjectName(QStringLiteral("logTable"));
    m_table->setAccessibleName(tr("Log"));
    m_table->setToolTip(tr("The VISA calls of this session, the newest at the bottom"));
    m_table->setHorizontalHeaderLabels({tr("Line"), tr("Duration"), tr("Status"), tr("Visa Operation")});
    const QString widthTip = tr("Drag the right border to see more, double-click it to see everything.");
    m_table->horizontalHeaderItem(LineColumn)
        ->setToolTip(tr("Number of the line: one sequence for all sessions, the log file's too. ") + widthTip);
    m_table->horizontalHeaderItem(DurationColumn)
        ->setToolTip(tr("Time that the VISA library took for the call, in whole units. ") + widthTip);
    m_table->horizontalHeaderItem(StatusColumn)
        ->setToolTip(tr("What the call returned: errors are red, warnings and completion codes orange. ") + widthTip);
    m_table->horizontalHeaderItem(OperationColumn)
        ->setToolTip(tr("The VISA function with its arguments, or a message of a test or an event"));
    m_table->setHorizontalScrollBarPolicy(Qt::ScrollBarAlwaysOff);
    m_table->setEditTriggers(QAbstractItemView::NoEditTriggers);
    m_table->setSelectionBehavior(QAbstractItemView::SelectRows);
    m_table->setWordWrap(false);
    // Without a frame the rows that visibleLines() counts fit to the pixel.
    m_table->setFrameShape(QFrame::NoFrame);
    m_table->installEventFilter(this);

    const QFontMetrics metrics(m_table->font());
    m_rowHeight = metrics.height() + 2;
    QHeaderView *rows = m_table->verticalHeader();
    rows->hide();
    rows->setMinimumSectionSize(1); // the style's minimum is taller than a row
    rows->setDefaultSectionSize(m_rowHeight);

    QHeaderView *columns = m_table->horizontalHeader();
    columns->setMinimumSectionSize(1);
    columns->setStretchLastSection(true);
    constexpr int Margin = 10;
    m_table->setColumnWidth(LineColumn, metrics.horizontalAdvance(tr("Line")) + Margin);
    m_table->setColumnWidth(DurationColumn, metrics.horizontalAdvance(tr("Duration (s)")) + Margin);
    m_table->setColumnWidth(StatusColumn, metrics.horizontalAdvance(tr("Status")) + Margin);
}

void LogTextDisplay::setQueue(StringMessageQueue *queue)
{
    m_queue = queue;
    buttonLiveModeClicked();
    m_timer.start();
}

void LogTextDisplay::visaFunctionCallFinished(_visaFunctionCall &)
{
    if (isViewMode())
        buttonLiveModeClicked();
}

bool LogTextDisplay::isLiveMode() const
{
    return !m_liveMode->isEnabled();
}

bool LogTextDisplay::isViewMode() const
{
    return !m_viewMode->isEnabled();
}

int LogTextDisplay::visibleLines() const
{
    return std::max(0, (m_table->height() - m_table->horizontalHeader()->height()) / m_rowHeight);
}

void LogTextDisplay::timeout()
{
    m_lines->setText(QString::number(static_cast<qulonglong>(Log::s_line.load())));
    if (!m_queue)
        return;
    const std::uint64_t total = m_queue->getLines();
    if (total == m_lastTotal)
        return;
    m_lastTotal = total;
    if (isViewMode())
        return;
    m_snapshotCount = static_cast<int>(m_queue->copyFromQueue(m_snapshot.data(), SnapshotSize));
    if (m_snapshotCount > 0)
        showNewestLines();
}

void LogTextDisplay::showNewestLines()
{
    const int rows = std::min(m_snapshotCount, visibleLines());
    m_table->setRowCount(rows);
    for (int row = 0; row < rows; ++row)
        showLine(m_snapshot[static_cast<std::size_t>(m_snapshotCount - rows + row)], row);
    m_displayed->setText(QString::number(rows));
}

void LogTextDisplay::showLine(const FastBuffer &line, int row)
{
    if (line.visaLine)
        showVisaLine(line, static_cast<unsigned>(row));
    else
        showNonVisaLine(line, static_cast<unsigned>(row));
}

void LogTextDisplay::showVisaLine(const FastBuffer &line, unsigned int row)
{
    const int tableRow = static_cast<int>(row);
    setCell(tableRow, LineColumn, QString::number(static_cast<qulonglong>(line.line)),
            Qt::AlignRight | Qt::AlignVCenter);
    setCell(tableRow, DurationColumn, durationText(line.duration), Qt::AlignRight | Qt::AlignVCenter);
    QTableWidgetItem *status =
        setCell(tableRow, StatusColumn, QString::fromLatin1(VisaError::StatusCode(line.status)), Qt::AlignCenter);
    if (status) {
        const QVariant colour = line.status < 0   ? QVariant(QBrush(Qt::red))
                                : line.status > 0 ? QVariant(QBrush(m_warningColor))
                                                  : QVariant();
        status->setData(Qt::ForegroundRole, colour);
    }
    const auto length = static_cast<int>(strnlen(line.text, sizeof line.text));
    setCell(tableRow, OperationColumn, QString::fromUtf8(line.text, length), Qt::AlignLeft | Qt::AlignVCenter);
    m_table->setRowHeight(tableRow, m_rowHeight);
}

void LogTextDisplay::showNonVisaLine(const FastBuffer &line, unsigned int row)
{
    const int tableRow = static_cast<int>(row);
    setCell(tableRow, LineColumn, QString::number(static_cast<qulonglong>(line.line)),
            Qt::AlignRight | Qt::AlignVCenter);
    delete m_table->takeItem(tableRow, DurationColumn);
    delete m_table->takeItem(tableRow, StatusColumn);
    const auto length = static_cast<int>(strnlen(line.text, sizeof line.text));
    setCell(tableRow, OperationColumn, QString::fromUtf8(line.text, length), Qt::AlignLeft | Qt::AlignVCenter);
    m_table->setRowHeight(tableRow, m_rowHeight);
}

QTableWidgetItem *LogTextDisplay::setCell(int row, int column, const QString &text, Qt::Alignment alignment)
{
    if (row < 0 || row >= m_table->rowCount())
        return nullptr;
    // The rows of the last look are used again: new items a look would cost more than all the rest.
    QTableWidgetItem *cell = m_table->item(row, column);
    if (!cell) {
        cell = new Cell;
        cell->setTextAlignment(static_cast<int>(alignment));
        m_table->setItem(row, column, cell);
    }
    if (cell->text() != text)
        cell->setText(text);
    return cell;
}

void LogTextDisplay::buttonLiveModeClicked()
{
    m_table->setVerticalScrollBarPolicy(Qt::ScrollBarAlwaysOff);
    m_table->verticalScrollBar()->hide();
    m_liveMode->setEnabled(false);
    m_viewMode->setEnabled(true);
    m_table->setRowCount(0);
    m_lastTotal = 0;
}

void LogTextDisplay::buttonViewModeClicked()
{
    m_table->setRowCount(0);
    m_table->setVerticalScrollBarPolicy(Qt::ScrollBarAsNeeded);
    m_table->verticalScrollBar()->show();
    m_liveMode->setEnabled(true);
    m_viewMode->setEnabled(false);
    m_table->setRowCount(m_snapshotCount);
    m_displayed->setText(QString::number(m_snapshotCount));
    for (int row = 0; row < m_snapshotCount; ++row)
        showLine(m_snapshot[static_cast<std::size_t>(row)], row);
    m_table->scrollToBottom();
}

void LogTextDisplay::buttonClearClicked()
{
    if (m_queue)
        m_queue->clear();
    m_snapshotCount = 0;
    m_lastTotal = 0;
    m_table->setRowCount(0);
    m_displayed->setText(QStringLiteral("0"));
}

void LogTextDisplay::keyPressEvent(QKeyEvent *event)
{
    if (!isCopy(event)) {
        QWidget::keyPressEvent(event);
        return;
    }
    QString text;
    const QList<QTableWidgetSelectionRange> ranges = m_table->selectedRanges();
    for (const QTableWidgetSelectionRange &range : ranges) {
        for (int row = range.topRow(); row <= range.bottomRow(); ++row) {
            for (int column = 0; column < ColumnCount; ++column) {
                const QTableWidgetItem *cell = m_table->item(row, column);
                text += (cell ? cell->text() : QString()) + QLatin1Char('\t');
            }
            text += QLatin1Char('\n');
        }
    }
    QApplication::clipboard()->setText(text);
}

bool LogTextDisplay::eventFilter(QObject *watched, QEvent *event)
{
    // The table has the focus when rows are selected, and would copy a single cell first.
    if (watched == m_table && event->type() == QEvent::KeyPress) {
        auto *key = static_cast<QKeyEvent *>(event);
        if (isCopy(key)) {
            keyPressEvent(key);
            return true;
        }
    }
    return QWidget::eventFilter(watched, event);
}

void LogTextDisplay::resizeEvent(QResizeEvent *event)
{
    if (isLiveMode())
        showNewestLines();
    QWidget::resizeEvent(event);
}
