#pragma once

#include "instrtests/TestFunction.h"

/**
 * Measures status byte reads, short queries, service requests and the transfer of a large block to and from the mass
 * memory. It only reports: 0 unless a VISA error stopped it.
 *
 * The stop flag is ignored on purpose: the test runs to its end or to its first VISA error.
 */
unsigned performanceTest(SessionLog *log, VisaSessionWithLog *session, const std::atomic<bool> *stop);
