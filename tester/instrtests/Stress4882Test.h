#pragma once

#include "instrtests/TestFunction.h"

/**
 * Hammers an instrument with a random mix of IEEE 488.2 common commands, status polls, service requests, clears, compound
 * and split error queries, queries left unread, re-opens and GPIB addressing changes, and checks that the answers stay
 * consistent. Runs until it is stopped or finds an inconsistency; a finding ends it with status 0 too, its log lines tell.
 */
unsigned test4882(SessionLog *log, VisaSessionWithLog *session, const std::atomic<bool> *stop);
