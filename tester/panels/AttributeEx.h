#pragma once

#include <QMetaType>
#include <QVariant>

/// One entry of the attribute list: which attribute, its last known value, and what has happened to it.
struct AttributeEx {
    /// Flags of the state; 0 is untouched.
    static constexpr quint8 Read = 1;
    static constexpr quint8 Changed = 2;

    quint64 attribute = 0;
    QVariant name = {}; ///< a QString
    QVariant value = 0; ///< a QString for text attributes, otherwise an unsigned long; the integer 0 before any access
    quint8 state = 0;

    bool isText() const { return attribute > 0xBFFF0000; }
};

Q_DECLARE_METATYPE(AttributeEx)
