#pragma once

#include "pipeline/VisaFunctionCallListener.h"

#include <QWidget>

class AttributeLabel;
class AttributeListModel;
class AttributeListView;
class LineEditAttribute;
class QLabel;
class QLineEdit;
class QSortFilterProxyModel;
class VisaFunctionCallButton;
struct AttributeEx;

/**
 * The page that reads and sets the attributes of the session.
 *
 * The list remembers what became known of each attribute, until the session is closed: green names were read, red ones were
 * changed. It follows the attribute calls of all pages. The value of a call that has just finished is shown in green, the
 * remembered value of an entry that the user selects in red.
 */
class AttributesTab : public QWidget, public VisaFunctionCallListener
{
    Q_OBJECT

public:
    AttributesTab(VisaFunctionCallHandler *handler, QWidget *parent);

    void visaFunctionCallFinished(_visaFunctionCall &call) override;

public slots:
    /// Another entry was selected.
    void attributeChanged(const AttributeEx &attribute);

private:
    void setupUi();
    void setupNames();
    void setupTexts();
    void addAttributes();
    void showCurrentValue(const AttributeEx &attribute, Qt::GlobalColor color);

    AttributeListModel *m_model;
    QSortFilterProxyModel *m_proxy;
    QLabel *m_filterLabel;
    QLineEdit *m_filter;
    AttributeListView *m_list;
    QLabel *m_currentLabel;
    AttributeLabel *m_current;
    VisaFunctionCallButton *m_get;
    QLabel *m_newLabel;
    LineEditAttribute *m_new;
    VisaFunctionCallButton *m_set;
};
