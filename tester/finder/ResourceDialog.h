#pragma once

#include "finder/SearchResult.h"
#include "pipeline/VisaFunctionCallListener.h"

#include <QDialog>
#include <QList>
#include <QMap>
#include <QString>

#include <memory>

class ExprLineEdit;
class QCheckBox;
class QLabel;
class QModelIndex;
class QPoint;
class QSpinBox;
class QTreeWidget;
class QTreeWidgetItem;
class VisaFunctionCallButton;
class VisaFunctionCallHandler;

/**
 * Finds resources, shows them grouped by device, and lets the user pick one.
 *
 *     ResourceDialog dialog(handler, window);
 *     if (dialog.exec() == QDialog::Accepted)
 *         ... dialog.getSelectedResource()
 *
 * The search itself is the worker's. The find button sends FindRsrc; each answer carries one resource and the number of
 * those still to come, and the dialog asks for the next one with FindNext. Nothing is shown before the last has arrived.
 *
 * The dialog may go away at any moment, in the middle of a search too: it is detached from the handler, the worker's
 * answer is dropped, and the wait cursor goes with it. A handler that ends first ends the search.
 */
class ResourceDialog : public QDialog, public VisaFunctionCallListener
{
    Q_OBJECT

public:
    /// A search that finds more than this shows so many.
    static constexpr int MaxResults = 10000;

    ResourceDialog(VisaFunctionCallHandler *handler, QWidget *parent);
    ~ResourceDialog() override;

    QString getSelectedResource() const { return m_selected; }
    /// What the most recent search of any such dialog found.
    static QList<SearchResult> getLastSearch() { return s_lastSearch; }

    void visaFunctionCallFinished(_visaFunctionCall &call) override;
    void removeHandler() override;
    void done(int result) override;

private slots:
    void findModeChanged();
    void findTimeOutChanged(int milliseconds);
    void searchActiv();
    void itemClicked(const QModelIndex &index);
    void itemDoubleClicked(const QModelIndex &index);
    void treeResourceListPopupMenu(const QPoint &position);
    void okClicked();

private:
    class StartWatch;

    void setupUi(VisaFunctionCallHandler *handler);
    void setupConnections();
    void restoreGeometryOfLastTime();
    void askForAttributes();

    void attributeArrived(const _visaFunctionCall &call);
    void resourceArrived(const _visaFunctionCall &call);
    bool askForNext();
    void clearResults();
    void endSearch();

    void addtoDeviceMap(const SearchResult &found);
    void displayDeviceMap();
    void widenColumns();
    QTreeWidgetItem *itemFor(const SearchResult &found) const;
    void goToHomepage(const QString &hostName);
    void sendAttribute(ViAttr attribute, std::uint64_t value);

    static QList<SearchResult> s_lastSearch;

    QMap<QString, QList<SearchResult>> m_devices; ///< by device key
    std::uint64_t m_findMode = 0;                 ///< as the library has it
    QString m_selected;
    bool m_firstAwaited = false; ///< a FindRsrc of this dialog is on its way
    bool m_nextAwaited = false;  ///< a FindNext of this dialog is on its way
    bool m_waitCursor = false;
    std::unique_ptr<StartWatch> m_startWatch;

    ExprLineEdit *m_expression = nullptr;
    VisaFunctionCallButton *m_findButton = nullptr;
    QCheckBox *m_mdns = nullptr;
    QCheckBox *m_vxi11 = nullptr;
    QLabel *m_timeOutLabel = nullptr;
    QSpinBox *m_timeOut = nullptr;
    QTreeWidget *m_tree = nullptr;
    QLabel *m_selectedLabel = nullptr;
};
