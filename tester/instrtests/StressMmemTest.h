#pragma once

#include "instrtests/TestFunction.h"

/**
 * Writes random blocks into the file "Test.dat" of the instrument's mass memory, reads them back at random moments and
 * compares them byte by byte, in between clears, triggers, status polls and looks into the error queue. Runs until it is
 * stopped or finds a difference, and reports the average throughput.
 *
 * Answers 1 for a difference, a wrong answer or a VISA error.
 */
unsigned stressMmemTest(SessionLog *log, VisaSessionWithLog *session, const std::atomic<bool> *stop);
