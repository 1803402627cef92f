// A plugin for any Qt program, loaded with QT_QPA_GENERIC_PLUGINS=firstpaint and QT_PLUGIN_PATH: writes the monotonic time, in
// nanoseconds, at which the program's first window has been painted to the descriptor in FIRST_PAINT_FD.

#include <QCoreApplication>
#include <QEvent>
#include <QGenericPlugin>

#include <unistd.h>

#include <cstdio>
#include <ctime>

namespace
{

class FirstPaint : public QObject
{
public:
    FirstPaint() { QCoreApplication::instance()->installEventFilter(this); }

    bool eventFilter(QObject *watched, QEvent *event) override
    {
        if (event->type() == QEvent::Paint && watched->isWidgetType()) {
            QCoreApplication::instance()->removeEventFilter(this);
            // All widgets of a window are painted in one go; this is the first thing that happens then.
            QCoreApplication::postEvent(this, new QEvent(QEvent::User), Qt::HighEventPriority);
        }
        return false;
    }

    bool event(QEvent *event) override
    {
        if (event->type() == QEvent::User)
            painted();
        return QObject::event(event);
    }

private:
    void painted()
    {
        std::timespec time{};
        clock_gettime(CLOCK_MONOTONIC, &time);
        char text[64];
        const int size =
            std::snprintf(text, sizeof text, "%lld\n", static_cast<long long>(time.tv_sec) * 1000000000 + time.tv_nsec);
        const int descriptor = qEnvironmentVariableIntValue("FIRST_PAINT_FD");
        if (::write(descriptor, text, static_cast<std::size_t>(size)) == size)
            ::close(descriptor);
    }
};

} // namespace

class FirstPaintPlugin : public QGenericPlugin
{
    Q_OBJECT
    Q_PLUGIN_METADATA(IID QGenericPluginFactoryInterface_iid FILE "FirstPaint.json")

public:
    QObject *create(const QString &, const QString &) override { return new FirstPaint; }
};

#include "FirstPaint.moc"
