#include "panels/AttributeListView.h"

#include "panels/AttributeListModel.h"

#include <QKeyEvent>

AttributeListView::AttributeListView(QWidget *parent) : QListView(parent)
{
    setSelectionMode(QAbstractItemView::SingleSelection);
    connect(this, &QListView::clicked, this, &AttributeListView::newItemSelceted);
}

void AttributeListView::newItemSelceted(const QModelIndex &index)
{
    // The arrow keys come here in an empty list too.
    if (index.isValid())
        emit selectedAttributeChanged(index.data(AttributeListModel::AttributeRole).value<AttributeEx>());
}

bool AttributeListView::getParameter(Parameter &parameter)
{
    const QModelIndex current = currentIndex();
    if (!current.isValid() || !selectionModel()->hasSelection())
        return false;
    parameter.uintValue = current.data(AttributeListModel::AttributeRole).value<AttributeEx>().attribute;
    return true;
}

void AttributeListView::keyReleaseEvent(QKeyEvent *event)
{
    QListView::keyReleaseEvent(event);
    if (event->key() == Qt::Key_Up || event->key() == Qt::Key_Down)
        newItemSelceted(currentIndex());
}

void AttributeListView::rowsAboutToBeRemoved(const QModelIndex &parent, int start, int end)
{
    if (currentIndex().row() >= start && currentIndex().row() <= end)
        selectionModel()->clear();
    QListView::rowsAboutToBeRemoved(parent, start, end);
}
