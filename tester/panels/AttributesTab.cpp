#include "panels/AttributesTab.h"

#include "panels/AttributeCatalogue.h"
#include "panels/AttributeLabel.h"
#include "panels/AttributeListModel.h"
#include "panels/AttributeListView.h"
#include "panels/LineEditAttribute.h"
#include "pipeline/VisaFunctionCallButton.h"

#include <QGridLayout>
#include <QLabel>
#include <QSortFilterProxyModel>

AttributesTab::AttributesTab(VisaFunctionCallHandler *handler, QWidget *parent)
    : QWidget(parent), VisaFunctionCallListener(handler, VisaFunctionCallTyp::Close),
      m_model(new AttributeListModel(this)), m_proxy(new QSortFilterProxyModel(this)), m_filterLabel(new QLabel(this)),
      m_filter(new QLineEdit(this)), m_list(new AttributeListView(this)), m_currentLabel(new QLabel(this)),
      m_current(new AttributeLabel(this)),
      m_get(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::GetAttribute, this)), m_newLabel(new QLabel(this)),
      m_new(new LineEditAttribute(this)),
      m_set(new VisaFunctionCallButton(handler, VisaFunctionCallTyp::SetAttribute, this))
{
    qRegisterMetaType<AttributeEx>("AttributeEx");
    listenToType(VisaFunctionCallTyp::GetAttribute);
    listenToType(VisaFunctionCallTyp::SetAttribute);
    m_get->setParameter(m_list);
    m_set->setParameter(m_list);
    m_set->setParameter(m_new);
    setupUi();
    addAttributes();
    m_proxy->setFilterCaseSensitivity(Qt::CaseInsensitive);
    m_proxy->setSourceModel(m_model);
    m_list->setModel(m_proxy);
    connect(m_list, &AttributeListView::selectedAttributeChanged, this, &AttributesTab::attributeChanged);
    connect(m_filter, &QLineEdit::textEdited, m_proxy, &QSortFilterProxyModel::setFilterFixedString);
}

void AttributesTab::setupUi()
{
    setupNames();
    setupTexts();

    m_filterLabel->setBuddy(m_filter);
    m_currentLabel->setBuddy(m_current);
    m_newLabel->setBuddy(m_new);
    // Request buttons answer the mouse only; keeping them out of the tab chain leaves no stop where the keys do nothing.
    for (VisaFunctionCallButton *button : {m_get, m_set})
        button->setFocusPolicy(Qt::NoFocus);

    auto *filter = new QHBoxLayout;
    filter->addWidget(m_filterLabel);
    filter->addWidget(m_filter, 1);
    auto *values = new QGridLayout;
    values->addWidget(m_currentLabel, 0, 0);
    values->addWidget(m_current, 1, 0);
    values->addWidget(m_get, 1, 1);
    values->addWidget(m_newLabel, 2, 0);
    values->addWidget(m_new, 3, 0);
    values->addWidget(m_set, 3, 1);
    values->setColumnStretch(0, 1);
    auto *layout = new QVBoxLayout(this);
    layout->addLayout(filter);
    layout->addWidget(m_list, 1);
    layout->addLayout(values);

    setTabOrder(m_filter, m_list);
    setTabOrder(m_list, m_current);
    setTabOrder(m_current, m_new);
}

void AttributesTab::setupNames()
{
    setObjectName(QStringLiteral("attributesTab"));
    m_filterLabel->setObjectName(QStringLiteral("attributesFilterLabel"));
    m_filter->setObjectName(QStringLiteral("attributesFilter"));
    m_list->setObjectName(QStringLiteral("attributesList"));
    m_currentLabel->setObjectName(QStringLiteral("attributesCurrentLabel"));
    m_current->setObjectName(QStringLiteral("attributesCurrent"));
    m_get->setObjectName(QStringLiteral("attributesGet"));
    m_newLabel->setObjectName(QStringLiteral("attributesNewLabel"));
    m_new->setObjectName(QStringLiteral("attributesNew"));
    m_set->setObjectName(QStringLiteral("attributesSet"));

    m_filter->setAccessibleName(tr("Filter"));
    m_list->setAccessibleName(tr("Attributes"));
    m_current->setAccessibleName(tr("Current value"));
    m_new->setAccessibleName(tr("New attribute value"));
}

void AttributesTab::setupTexts()
{
    m_filterLabel->setText(tr("Filter:"));
    m_filter->setToolTip(tr("Show the attributes whose names contain this text."));
    m_list->setToolTip(
        tr("Black: Attribute is unchanged.\r\nGreen: Attribute was read.\r\nRed: Attribute was changed."));
    m_currentLabel->setText(tr("Current Value:"));
    m_current->setToolTip(
        tr("Green: from the library, just now.\nRed: as remembered when the attribute was selected."));
    m_get->setText(tr("Get Attribute"));
    m_get->setToolTip(tr("Read the selected attribute."));
    m_newLabel->setText(tr("New AttributeValue:"));
    m_new->setToolTip(tr("A number, decimal or hexadecimal: 2000 or 0x7d0."));
    m_set->setText(tr("Set Attribute"));
    m_set->setToolTip(tr("Give the selected attribute the new value."));
}

void AttributesTab::addAttributes()
{
    for (const auto &[name, attribute] : attributeCatalogue())
        m_model->addAttribute({.attribute = attribute, .name = QString::fromLatin1(name)});
}

void AttributesTab::visaFunctionCallFinished(_visaFunctionCall &call)
{
    if (call.status < 0)
        return;
    if (call.type == VisaFunctionCallTyp::Close) {
        m_model->resetValues();
        return;
    }
    if (call.type != VisaFunctionCallTyp::GetAttribute && call.type != VisaFunctionCallTyp::SetAttribute)
        return;
    const bool read = call.type == VisaFunctionCallTyp::GetAttribute;
    AttributeEx attribute{.attribute = call.parameter[0].uintValue,
                          .state = read ? AttributeEx::Read : AttributeEx::Changed};
    if (attribute.isText())
        attribute.value = QString::fromStdString(call.parameter[1].stringValue);
    else
        attribute.value = QVariant::fromValue<unsigned long>(call.parameter[1].uintValue);
    m_model->update(attribute);
    showCurrentValue(attribute, Qt::darkGreen);
}

void AttributesTab::attributeChanged(const AttributeEx &attribute)
{
    m_current->clear();
    if (attribute.state != 0)
        showCurrentValue(attribute, Qt::red);
}

void AttributesTab::showCurrentValue(const AttributeEx &attribute, Qt::GlobalColor color)
{
    QPalette palette = m_current->palette();
    palette.setColor(QPalette::Text, color);
    m_current->setPalette(palette);
    m_current->showAttributeValue(attribute);
}
