#pragma once

#include <QFile>
#include <QList>

class Data;

/**
 * The session data store: one file "data.adr" in the application's data folder, with all registered items.
 *
 *     000001                   the format number
 *     000012 twelve bytes ...  for each item its length and its bytes
 *
 * All numbers are six decimal digits. The file holds no identifiers: the order of registration is part of the format.
 * There are no messages; what cannot be read leaves an item as it is or gives it short bytes, what cannot be written is
 * lost.
 */
class File : public QFile
{
    Q_OBJECT

public:
    File();

    /// Registers @p item, which is not owned. Always true.
    bool addData(Data *item);
    /// Restores every registered item.
    void readData();
    /// Writes every registered item.
    void saveData();

protected:
    using QFile::readData; // the device's own operation of that name

private:
    QByteArray readNumbered();

    QList<Data *> m_items; ///< not owned, in order of registration
};
