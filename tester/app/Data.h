#pragma once

#include <QByteArray>

/**
 * A value that survives from one run of the program to the next. File writes all registered items when the session tab
 * ends and gives them back when the next one is built.
 *
 * Identifiers in use: 2 resource name, 3 log folder, 4 command history.
 */
class Data
{
public:
    explicit Data(const unsigned long long &id) : m_id(id) {}

    virtual QByteArray getData() = 0;
    /// Restores the state. Must accept anything: a damaged file yields short, empty or foreign bytes.
    virtual void setData(const QByteArray &data) = 0;

    bool operator<(const Data &other) const { return m_id < other.m_id; }
    bool operator==(const Data &other) const { return m_id == other.m_id; }

protected:
    ~Data() = default;

private:
    unsigned long long m_id;
};
