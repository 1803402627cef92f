#pragma once

#include "panels/AttributeEx.h"

#include <QAbstractListModel>

#include <memory>
#include <vector>

/**
 * The attributes that the page knows, in the order of the catalogue, with what is known of each.
 *
 * An identifier can stand in the list under several names. What becomes known of it goes to the first of them.
 */
class AttributeListModel : public QAbstractListModel
{
    Q_OBJECT

public:
    static constexpr int AttributeRole = Qt::UserRole + 10; ///< the whole AttributeEx

    explicit AttributeListModel(QObject *parent);

    int rowCount(const QModelIndex &parent = {}) const override;
    QVariant data(const QModelIndex &index, int role) const override;

    /// Appends a copy.
    void addAttribute(const AttributeEx &attribute);
    /// Gives the first entry of the same identifier the value, and adds the state's flags to its own. Others are ignored.
    void update(const AttributeEx &attribute);
    /// All entries become untouched.
    void resetValues();

private:
    std::vector<std::unique_ptr<AttributeEx>> m_attributes;
};
