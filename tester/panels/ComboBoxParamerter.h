#pragma once

#include "pipeline/VisaFunctionCallParameter.h"

#include <QComboBox>

/// A choice among items that its owner fills in; the kind says what of the current item is sent.
class ComboBoxParamerter : public QComboBox, public VisaFunctionCallParameter
{
    Q_OBJECT

public:
    enum class ComboBoxType : std::uint32_t {
        Index = 0,      ///< the index, 32 bits; -1 when nothing is selected
        Text = 1,       ///< the text, UTF-8
        DataString = 2, ///< the user data as text, UTF-8
        DataUInt64 = 3, ///< the user data as a number, 64 bits
    };

    explicit ComboBoxParamerter(QWidget *parent);

    void setParameterType(const ComboBoxType &type);
    /// False for a kind that is none of the four.
    bool getParameter(Parameter &parameter) override;

private:
    ComboBoxType m_type = ComboBoxType::Index;
};
