#include "instrtests/visatestfunctions.h"

#include "instrtests/PerformanceTest.h"
#include "instrtests/Stress4882Test.h"
#include "instrtests/StressMmemTest.h"

#include <iterator>

namespace
{
constexpr _visatest Tests[] = {
    {"Performance Test", performanceTest},
    {"Stress 4882 Test ", test4882}, // the blank at the end is part of the name
    {"Stress Mmem Test", stressMmemTest},
};
} // namespace

void getListOfTests(const _visatest **list, unsigned *count)
{
    *list = Tests;
    *count = std::size(Tests);
}
