#pragma once

#include "app/Data.h"
#include "pipeline/VisaFunctionCallParameter.h"

#include <QComboBox>

/**
 * The command line of the basic panel, with the command history as its items: newest first, at most 20.
 *
 * What is typed may hold escapes. They are shown and remembered as typed; getCommand() expands them, pass by pass, for
 * sending. Return and Enter ask for a write, or for a read when the line holds nothing but "r". Neither inserts an item
 * by itself: only a command that is asked for enters the history.
 */
class ScipiLineEdit : public QComboBox, public Data, public VisaFunctionCallParameter
{
    Q_OBJECT

public:
    static constexpr int HistorySize = 20;

    explicit ScipiLineEdit(QWidget *parent);

    /// Records the current text in the history and returns it with its escapes expanded.
    QString getCommand();
    bool getParameter(Parameter &parameter) override;

    /// The history, a line feed between items, Latin-1: setData() reads it as Latin-1.
    QByteArray getData() override;
    void setData(const QByteArray &bytes) override;

    /// Leaves the two preset commands as history.
    void clear();

signals:
    void write();
    void read();

protected:
    void keyPressEvent(QKeyEvent *event) override;

private:
    void remember(const QString &command);
};
