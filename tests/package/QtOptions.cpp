// Prints what is left of its arguments when Qt has taken its own, one a line.
#include <QApplication>

#include <cstdio>

int main(int argc, char **argv)
{
    const QApplication application(argc, argv);
    for (int i = 1; i < argc; ++i)
        std::puts(argv[i]);
    return 0;
}
