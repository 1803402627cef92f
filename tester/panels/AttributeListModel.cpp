#include "panels/AttributeListModel.h"

#include <QColor>

#include <algorithm>

AttributeListModel::AttributeListModel(QObject *parent) : QAbstractListModel(parent) {}

int AttributeListModel::rowCount(const QModelIndex &parent) const
{
    return parent.isValid() ? 0 : static_cast<int>(m_attributes.size());
}

QVariant AttributeListModel::data(const QModelIndex &index, int role) const
{
    if (!index.isValid())
        return {};
    const AttributeEx &entry = *m_attributes[static_cast<std::size_t>(index.row())];
    switch (role) {
    case Qt::DisplayRole:
        return entry.name;
    case Qt::ForegroundRole:
        if ((entry.state & AttributeEx::Changed) != 0)
            return QColor(Qt::red);
        if ((entry.state & AttributeEx::Read) != 0)
            return QColor(Qt::darkGreen);
        return QColor(Qt::black);
    case AttributeRole:
        return QVariant::fromValue(entry);
    default:
        return {};
    }
}

void AttributeListModel::addAttribute(const AttributeEx &attribute)
{
    const int row = rowCount();
    beginInsertRows({}, row, row);
    m_attributes.push_back(std::make_unique<AttributeEx>(attribute));
    endInsertRows();
}

void AttributeListModel::update(const AttributeEx &attribute)
{
    const auto known = std::find_if(m_attributes.begin(), m_attributes.end(),
                                    [&](const auto &entry) { return entry->attribute == attribute.attribute; });
    if (known == m_attributes.end())
        return;
    (*known)->value = attribute.value;
    (*known)->state |= attribute.state;
    const QModelIndex changed = index(static_cast<int>(known - m_attributes.begin()));
    emit dataChanged(changed, changed);
}

void AttributeListModel::resetValues()
{
    if (m_attributes.empty())
        return;
    for (const auto &entry : m_attributes) {
        entry->value = 0;
        entry->state = 0;
    }
    emit dataChanged(index(0), index(rowCount() - 1));
}
