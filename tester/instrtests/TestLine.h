#pragma once

class SessionLog;

/// Writes a line of free text into a test's log; it is always shown. Longer text is cut as every log line is.
void logTestLine(SessionLog *log, const char *format, ...) __attribute__((format(printf, 2, 3)));
