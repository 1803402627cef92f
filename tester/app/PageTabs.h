#pragma once

#include <QTabWidget>

/**
 * The pages of a session, with room for all their tabs.
 *
 * A tab widget is content with the width of its pages and scrolls the tabs that do not fit. In a large font they still
 * scroll: the log beside them has to have its place in a small window.
 */
class PageTabs : public QTabWidget
{
    Q_OBJECT

public:
    using QTabWidget::QTabWidget;

    QSize minimumSizeHint() const override;
};
