#include "app/PageTabs.h"

#include <QTabBar>

#include <algorithm>

namespace
{
constexpr int MostForTabs = 430; ///< pixels, of a window that begins with 750
}

QSize PageTabs::minimumSizeHint() const
{
    const int tabs = std::min(tabBar()->sizeHint().width(), MostForTabs);
    return QTabWidget::minimumSizeHint().expandedTo(QSize(tabs, 0));
}
