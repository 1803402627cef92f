#pragma once

#include "panels/AttributeEx.h"
#include "pipeline/VisaFunctionCallParameter.h"

#include <QListView>

/**
 * The list in which an attribute is chosen: the identifier of the selected one, 64 bits. Refuses while none is selected.
 *
 * A selected entry that leaves the list leaves none selected. A view would select its neighbour, and the next "Set" would
 * change an attribute that nobody chose.
 */
class AttributeListView : public QListView, public VisaFunctionCallParameter
{
    Q_OBJECT

public:
    explicit AttributeListView(QWidget *parent);

    bool getParameter(Parameter &parameter) override;

signals:
    /// By a click or by the arrow keys, also when the same entry is clicked again.
    void selectedAttributeChanged(const AttributeEx &attribute);

public slots:
    void newItemSelceted(const QModelIndex &index);

protected slots:
    void rowsAboutToBeRemoved(const QModelIndex &parent, int start, int end) override;

protected:
    void keyReleaseEvent(QKeyEvent *event) override;
};
