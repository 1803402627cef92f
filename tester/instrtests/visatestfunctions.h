#pragma once

#include "instrtests/TestFunction.h"

/// One entry of the test catalogue.
struct _visatest {
    const char *name; ///< as the chooser and the log show it, UTF-8
    TestFunction function;
};

/// The catalogue, in the order in which the chooser offers it.
void getListOfTests(const _visatest **list, unsigned *count);
