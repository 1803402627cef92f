#include "instrtests/TestLine.h"

#include "log/FastBuffer.h"
#include "log/SessionLog.h"

#include <cstdarg>
#include <cstdio>

void logTestLine(SessionLog *log, const char *format, ...)
{
    FastBuffer line;
    va_list arguments;
    va_start(arguments, format);
    std::vsnprintf(line.text, sizeof line.text, format, arguments);
    va_end(arguments);
    line.status = 0;
    line.duration = 0;
    log->forceEmitWriteMessage(&line);
}
