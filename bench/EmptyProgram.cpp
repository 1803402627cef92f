// The measure for the tester's start and memory: a Qt Widgets program with nothing in its window.

#include <QApplication>
#include <QMainWindow>

int main(int argc, char **argv)
{
    const QApplication application(argc, argv);
    QMainWindow window;
    window.resize(750, 480);
    window.show();
    return QApplication::exec();
}
