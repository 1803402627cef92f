// Linked statically, the stand-in obeys the test alone.
#include "support/standin/StandinState.h"

void standin::entered(const char *) {}
