#include "instrtests/RandomNumbers.h"

#include <QtGlobal>

namespace randomnumbers
{
namespace
{

unsigned next()
{
    // By this name: its sequence is part of what the tests do.
    QT_WARNING_PUSH
    QT_WARNING_DISABLE_DEPRECATED
    return static_cast<unsigned>(qrand());
    QT_WARNING_POP
}

} // namespace

unsigned below(unsigned limit)
{
    return next() % limit;
}

bool odd()
{
    return next() % 2 == 1;
}

int width(unsigned limit)
{
    return static_cast<int>((next() + 5) % limit);
}

} // namespace randomnumbers
