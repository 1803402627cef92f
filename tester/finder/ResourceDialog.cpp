#include "finder/ResourceDialog.h"

#include "finder/DeviceKey.h"
#include "panels/ExprLineEdit.h"
#include "pipeline/VisaFunctionCallButton.h"

#include <visa.h>

#include <QCheckBox>
#include <QDesktopServices>
#include <QGridLayout>
#include <QGuiApplication>
#include <QHBoxLayout>
#include <QHeaderView>
#include <QLabel>
#include <QMenu>
#include <QMessageBox>
#include <QPushButton>
#include <QSettings>
#include <QShortcut>
#include <QSignalBlocker>
#include <QSpinBox>
#include <QToolTip>
#include <QTreeWidget>
#include <QUrl>
#include <QVBoxLayout>

#include <algorithm>
#include <utility>

namespace
{
constexpr ViAttr FindModeAttribute = 0x0FAF0002;
constexpr ViAttr FindTimeOutAttribute = 0x0FAF0001;
constexpr std::uint64_t ManufacturerId = 4015; // LAN discovery can be set with this library only
constexpr std::uint64_t ModeVxi11 = 2;
constexpr std::uint64_t ModeMdns = 4;
constexpr int LongestTimeOut = 600000;

constexpr int ResourceRole = Qt::UserRole;
constexpr int HostRole = Qt::UserRole + 1;

const QString SettingsGroup = QStringLiteral("ResourceDialog");
const QString MaximizedKey = QStringLiteral("fullscreen");
const QString SizeKey = QStringLiteral("size");
const QString PositionKey = QStringLiteral("pos");
constexpr QSize InitialSize(720, 480);
} // namespace

/// Knows whether the handler has taken a search: the button says that it was pressed, also when the request was refused.
class ResourceDialog::StartWatch final : public VisaFunctionCallListener
{
public:
    explicit StartWatch(VisaFunctionCallHandler *handler) : VisaFunctionCallListener(handler, VisaFunctionCallTyp::All)
    {
    }

    void visaFunctionCallFinished(_visaFunctionCall &) override {}
    void newVisaCallStarted(const VisaFunctionCallTyp &type) override
    {
        if (type == VisaFunctionCallTyp::FindRsrc)
            m_started = true;
    }
    bool takeStarted() { return std::exchange(m_started, false); }

private:
    bool m_started = false;
};

QList<SearchResult> ResourceDialog::s_lastSearch;

ResourceDialog::ResourceDialog(VisaFunctionCallHandler *handler, QWidget *parent)
    : QDialog(parent), VisaFunctionCallListener(handler, VisaFunctionCallTyp::FindRsrc),
      m_startWatch(std::make_unique<StartWatch>(handler))
{
    listenToType(VisaFunctionCallTyp::FindNext);
    listenToType(VisaFunctionCallTyp::GetAttributeDef);
    askForAttributes();
    setupUi(handler);
    setupConnections();
    restoreGeometryOfLastTime();
}

ResourceDialog::~ResourceDialog()
{
    endSearch();
    QSettings settings;
    settings.beginGroup(SettingsGroup);
    settings.setValue(MaximizedKey, isMaximized());
    settings.setValue(SizeKey, size());
    settings.setValue(PositionKey, pos());
    settings.endGroup();
}

void ResourceDialog::askForAttributes()
{
    for (const ViAttr attribute : {FindModeAttribute, FindTimeOutAttribute, ViAttr(VI_ATTR_RSRC_MANF_ID)}) {
        _visaFunctionCall call;
        call.type = VisaFunctionCallTyp::GetAttributeDef;
        call.parameter[0].uintValue = attribute;
        sendVisaFunctionCall(call);
    }
}

void ResourceDialog::setupUi(VisaFunctionCallHandler *handler)
{
    setObjectName(QStringLiteral("resourceDialog"));
    setWindowTitle(tr("Find and select resource"));
    setWindowFlags(windowFlags() & ~Qt::WindowContextHelpButtonHint);
    setModal(true);

    auto *expressionLabel = new QLabel(tr("Search expression"), this);
    expressionLabel->setObjectName(QStringLiteral("finderExpressionLabel"));
    m_expression = new ExprLineEdit(this);
    m_expression->setObjectName(QStringLiteral("finderExpression"));
    m_expression->setAccessibleName(tr("Search expression"));
    m_expression->setText(QStringLiteral("?*"));
    m_expression->setToolTip(
        tr("A VISA expression: ? is any character, * any number of the one before. \"?*\" finds everything."));
    expressionLabel->setBuddy(m_expression);

    m_findButton = new VisaFunctionCallButton(handler, VisaFunctionCallTyp::FindRsrc, this);
    m_findButton->setObjectName(QStringLiteral("finderFind"));
    m_findButton->setText(tr("Find Resources"));
    m_findButton->setParameter(m_expression);

    m_mdns = new QCheckBox(tr("LXI (mDNS)"), this);
    m_mdns->setObjectName(QStringLiteral("finderMdns"));
    m_mdns->setToolTip(tr("Search devices in LAN via mDNS query"));
    m_vxi11 = new QCheckBox(tr("VXI-11"), this);
    m_vxi11->setObjectName(QStringLiteral("finderVxi11"));
    m_vxi11->setToolTip(tr("Search devices in LAN via VXI-11 query"));

    m_timeOutLabel = new QLabel(tr("LAN discovery timeout (ms)"), this);
    m_timeOutLabel->setObjectName(QStringLiteral("finderTimeOutLabel"));
    m_timeOut = new QSpinBox(this);
    m_timeOut->setObjectName(QStringLiteral("finderTimeOut"));
    m_timeOut->setAccessibleName(tr("LAN discovery timeout (ms)"));
    m_timeOut->setRange(1, LongestTimeOut);
    m_timeOut->setToolTip(tr("How long a search waits for devices in the LAN to answer"));
    m_timeOutLabel->setBuddy(m_timeOut);

    m_tree = new QTreeWidget(this);
    m_tree->setObjectName(QStringLiteral("finderResults"));
    m_tree->setAccessibleName(tr("Found resources"));
    m_tree->setHeaderLabels({tr("Identification"), tr("Description"), tr("Resource")});
    m_tree->setColumnWidth(0, 200);
    m_tree->setTextElideMode(Qt::ElideMiddle);
    m_tree->setContextMenuPolicy(Qt::CustomContextMenu);

    auto *caption = new QLabel(tr("Selected Resource"), this);
    caption->setObjectName(QStringLiteral("finderSelectedLabel"));
    m_selectedLabel = new QLabel(this);
    m_selectedLabel->setObjectName(QStringLiteral("finderSelected"));
    m_selectedLabel->setAccessibleName(tr("Selected Resource"));
    m_selectedLabel->setTextFormat(Qt::PlainText);
    m_selectedLabel->setTextInteractionFlags(Qt::TextSelectableByMouse);
    m_selectedLabel->setSizePolicy(QSizePolicy::Ignored,
                                   QSizePolicy::Preferred); // a long one must not widen the dialog

    auto *select = new QPushButton(tr("Select"), this);
    select->setObjectName(QStringLiteral("finderSelect"));
    connect(select, &QPushButton::clicked, this, &ResourceDialog::okClicked);
    auto *cancel = new QPushButton(tr("Cancel"), this);
    cancel->setObjectName(QStringLiteral("finderCancel"));
    connect(cancel, &QPushButton::clicked, this, &QDialog::reject);
    // Return in the expression field searches; it must not press a button besides.
    for (QPushButton *button : {static_cast<QPushButton *>(m_findButton), select, cancel})
        button->setAutoDefault(false);

    auto *search = new QGridLayout;
    search->addWidget(expressionLabel, 0, 0);
    search->addWidget(m_expression, 0, 1);
    search->addWidget(m_findButton, 0, 2);
    auto *discovery = new QHBoxLayout;
    discovery->addWidget(m_mdns);
    discovery->addSpacing(12);
    discovery->addWidget(m_vxi11);
    discovery->addStretch();
    discovery->addWidget(m_timeOutLabel);
    discovery->addWidget(m_timeOut);
    auto *selection = new QHBoxLayout;
    selection->addWidget(caption);
    selection->addSpacing(12);
    selection->addWidget(m_selectedLabel, 1);
    auto *buttons = new QHBoxLayout;
    buttons->addStretch();
    buttons->addWidget(select);
    buttons->addWidget(cancel);

    auto *layout = new QVBoxLayout(this);
    layout->addLayout(search);
    layout->addLayout(discovery);
    layout->addWidget(m_tree, 1);
    layout->addLayout(selection);
    layout->addLayout(buttons);
    m_expression->setFocus();
}

void ResourceDialog::setupConnections()
{
    connect(m_mdns, &QCheckBox::stateChanged, this, &ResourceDialog::findModeChanged);
    connect(m_vxi11, &QCheckBox::stateChanged, this, &ResourceDialog::findModeChanged);
    connect(m_timeOut, qOverload<int>(&QSpinBox::valueChanged), this, &ResourceDialog::findTimeOutChanged);
    connect(m_findButton, &VisaFunctionCallButton::functionCallSended, this, &ResourceDialog::searchActiv);
    connect(m_tree, &QTreeView::clicked, this, &ResourceDialog::itemClicked);
    connect(m_tree, &QTreeView::doubleClicked, this, &ResourceDialog::itemDoubleClicked);
    connect(m_tree, &QTreeView::customContextMenuRequested, this, &ResourceDialog::treeResourceListPopupMenu);

    // The keyboard's way: the find button answers to the mouse alone.
    connect(m_expression, &QLineEdit::returnPressed, this, [this] {
        if (m_findButton->isEnabled())
            m_findButton->sendFunctionCall();
    });
    for (const int key : {Qt::Key_Return, Qt::Key_Enter}) {
        auto *shortcut = new QShortcut(QKeySequence(key), m_tree);
        shortcut->setContext(Qt::WidgetShortcut);
        connect(shortcut, &QShortcut::activated, this, [this] { itemDoubleClicked(m_tree->currentIndex()); });
    }
}

void ResourceDialog::restoreGeometryOfLastTime()
{
    QSettings settings;
    settings.beginGroup(SettingsGroup);
    resize(settings.value(SizeKey, InitialSize).toSize());
    if (settings.contains(PositionKey))
        move(settings.value(PositionKey).toPoint());
    if (settings.value(MaximizedKey, false).toBool())
        setWindowState(windowState() | Qt::WindowMaximized);
    settings.endGroup();
}

void ResourceDialog::done(int result)
{
    endSearch();
    QDialog::done(result);
}

void ResourceDialog::removeHandler()
{
    VisaFunctionCallListener::removeHandler();
    endSearch(); // no answer will come any more
}

void ResourceDialog::visaFunctionCallFinished(_visaFunctionCall &call)
{
    if (call.type == VisaFunctionCallTyp::GetAttributeDef)
        attributeArrived(call);
    else if (call.type == VisaFunctionCallTyp::FindRsrc || call.type == VisaFunctionCallTyp::FindNext)
        resourceArrived(call);
}

void ResourceDialog::attributeArrived(const _visaFunctionCall &call)
{
    if (call.status < 0)
        return;
    const std::uint64_t value = call.parameter[1].uintValue;
    switch (call.parameter[0].uintValue) {
    case FindModeAttribute: {
        // Showing what the library has is no wish of the user.
        const QSignalBlocker mdns(m_mdns);
        const QSignalBlocker vxi11(m_vxi11);
        m_findMode = value;
        m_mdns->setChecked((value & ModeMdns) != 0);
        m_vxi11->setChecked((value & ModeVxi11) != 0);
        break;
    }
    case FindTimeOutAttribute: {
        const QSignalBlocker timeOut(m_timeOut);
        m_timeOut->setValue(static_cast<int>(std::min<std::uint64_t>(value, LongestTimeOut)));
        break;
    }
    case VI_ATTR_RSRC_MANF_ID:
        if (value != ManufacturerId) {
            for (QWidget *option : {static_cast<QWidget *>(m_mdns), static_cast<QWidget *>(m_vxi11),
                                    static_cast<QWidget *>(m_timeOutLabel), static_cast<QWidget *>(m_timeOut)})
                option->hide();
        }
        break;
    default:
        break;
    }
}

void ResourceDialog::findModeChanged()
{
    std::uint64_t mode = m_findMode & ~(ModeMdns | ModeVxi11);
    if (m_mdns->isChecked())
        mode |= ModeMdns;
    if (m_vxi11->isChecked())
        mode |= ModeVxi11;
    sendAttribute(FindModeAttribute, mode);
}

void ResourceDialog::findTimeOutChanged(int milliseconds)
{
    sendAttribute(FindTimeOutAttribute, static_cast<std::uint64_t>(milliseconds));
}

void ResourceDialog::sendAttribute(ViAttr attribute, std::uint64_t value)
{
    _visaFunctionCall call;
    call.type = VisaFunctionCallTyp::SetAttributeDef;
    call.parameter[0].uintValue = attribute;
    call.parameter[1].uintValue = value;
    sendVisaFunctionCall(call);
}

void ResourceDialog::searchActiv()
{
    if (!m_startWatch->takeStarted()) {
        // Refused: another call is running. No answer would ever end the search.
        QToolTip::showText(m_findButton->mapToGlobal(QPoint(0, m_findButton->height())),
                           tr("Another call is still running. Search again when it has finished."), m_findButton);
        return;
    }
    clearResults();
    m_firstAwaited = true;
    m_findButton->setEnabled(false);
    if (!std::exchange(m_waitCursor, true))
        QGuiApplication::setOverrideCursor(Qt::WaitCursor);
}

void ResourceDialog::resourceArrived(const _visaFunctionCall &call)
{
    const bool first = call.type == VisaFunctionCallTyp::FindRsrc;
    if (!first && !std::exchange(m_nextAwaited, false) && m_firstAwaited)
        return; // the end of a search that was left in its middle; the one asked for has not begun
    m_firstAwaited = m_firstAwaited && !first;
    if (call.status != 0) {
        endSearch();
        return;
    }

    if (first)
        clearResults();
    s_lastSearch.append(SearchResult(call));
    addtoDeviceMap(s_lastSearch.last());
    const bool more = call.parameter[1].uintValue != 0 && s_lastSearch.size() < MaxResults;
    if (more && askForNext())
        return;
    displayDeviceMap();
    endSearch();
}

bool ResourceDialog::askForNext()
{
    if (m_nextAwaited)
        return true;
    _visaFunctionCall call;
    call.type = VisaFunctionCallTyp::FindNext;
    m_nextAwaited = sendVisaFunctionCall(call);
    return m_nextAwaited;
}

void ResourceDialog::clearResults()
{
    m_tree->clear();
    s_lastSearch.clear();
    m_devices.clear();
}

void ResourceDialog::endSearch()
{
    m_findButton->setEnabled(true);
    if (std::exchange(m_waitCursor, false))
        QGuiApplication::restoreOverrideCursor();
}

void ResourceDialog::addtoDeviceMap(const SearchResult &found)
{
    m_devices[deviceKey(found.resource)].append(found);
}

void ResourceDialog::displayDeviceMap()
{
    m_tree->clear();
    for (auto device = m_devices.cbegin(); device != m_devices.cend(); ++device) {
        auto *item = new QTreeWidgetItem({device.key()});
        for (const SearchResult &found : device.value()) {
            item->addChild(itemFor(found));
            if (item->data(0, HostRole).toString().isEmpty())
                item->setData(0, HostRole, found.hostName);
        }
        m_tree->addTopLevelItem(item);
    }
    m_tree->expandAll();
    widenColumns();
}

void ResourceDialog::widenColumns()
{
    // Resource strings of one device differ at their end: it has to be readable, whatever the font.
    const int width = m_tree->viewport()->width();
    const int limits[] = {width / 2, width / 3};
    for (int column = 0; column < 2; ++column) {
        const int before = m_tree->columnWidth(column);
        m_tree->resizeColumnToContents(column);
        m_tree->setColumnWidth(column, std::max(before, std::min(m_tree->columnWidth(column), limits[column])));
    }
}

QTreeWidgetItem *ResourceDialog::itemFor(const SearchResult &found) const
{
    auto *item = new QTreeWidgetItem({found.resource});
    if (!found.description.isEmpty())
        item->setText(1, found.description);
    if (!found.identification.isEmpty())
        item->setText(2, found.identification);
    item->setData(0, ResourceRole, found.resource);
    item->setData(0, HostRole, found.hostName);
    for (int column = 0; column < 3; ++column)
        item->setToolTip(column, item->text(column).toHtmlEscaped());
    return item;
}

void ResourceDialog::itemClicked(const QModelIndex &index)
{
    // A device is no resource: clicking it leaves nothing selected.
    m_selected = index.siblingAtColumn(0).data(ResourceRole).toString();
    m_selectedLabel->setText(m_selected);
}

void ResourceDialog::itemDoubleClicked(const QModelIndex &index)
{
    itemClicked(index);
    okClicked();
}

void ResourceDialog::okClicked()
{
    if (!m_selected.isEmpty()) {
        accept();
        return;
    }
    QMessageBox box(QMessageBox::Information, tr("No resource selected"), tr("Please select one resource!"),
                    QMessageBox::Ok, this);
    box.setObjectName(QStringLiteral("noResourceSelected"));
    box.exec();
}

void ResourceDialog::treeResourceListPopupMenu(const QPoint &position)
{
    const QTreeWidgetItem *item = m_tree->itemAt(position);
    if (!item)
        return;
    const QString hostName = item->data(0, HostRole).toString();
    auto *menu = new QMenu(this);
    menu->setObjectName(QStringLiteral("finderMenu"));
    menu->setAttribute(Qt::WA_DeleteOnClose);
    QAction *action = menu->addAction(tr("Go to webpage"));
    action->setObjectName(QStringLiteral("finderGoToWebpage"));
    action->setEnabled(!hostName.isEmpty());
    connect(action, &QAction::triggered, this, [this, hostName] { goToHomepage(hostName); });
    menu->popup(m_tree->viewport()->mapToGlobal(position));
}

void ResourceDialog::goToHomepage(const QString &hostName)
{
    QDesktopServices::openUrl(QUrl(QStringLiteral("http://%1").arg(hostName)));
}
