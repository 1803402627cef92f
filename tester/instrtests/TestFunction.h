#pragma once

#include <atomic>

class SessionLog;
class VisaSessionWithLog;

/**
 * An instrument test. It runs on a thread of its own, with a session that is open, closes that session before it returns,
 * and looks at @p stop at its own checkpoints.
 *
 * Answers 0 for success; anything else marks the test as failed. VisaError is the only exception that may leave it.
 */
using TestFunction = unsigned (*)(SessionLog *log, VisaSessionWithLog *session, const std::atomic<bool> *stop);
