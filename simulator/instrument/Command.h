#pragma once

#include "simulator/instrument/Arguments.h"
#include "simulator/instrument/CommandTable.h"
#include "simulator/instrument/Instrument.h"
#include "simulator/instrument/MessageExchange.h"
#include "simulator/instrument/Response.h"
#include "simulator/instrument/ScpiError.h"

namespace simulator
{

/// What a command is given when it runs: its parameters, where its answer goes, and the instrument.
class Command
{
public:
    Instrument &instrument;
    MessageExchange &exchange; ///< of the client who sent it
    Arguments &arguments;
    ResponseUnit &response;
    const std::vector<unsigned> &suffixes; ///< of the header, 1 where none was sent
};

} // namespace simulator
