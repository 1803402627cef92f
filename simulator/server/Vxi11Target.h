#pragma once

#include "simulator/server/Vxi11Response.h"
#include "wire/Vxi11.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <vector>

namespace simulator
{

class LockTable;
class Vxi11Device;

/**
 * What a device name of VXI-11 leads to: the instrument, an address of the bus, or the bus itself. All links to it share it.
 *
 * Nothing here waits. What cannot be done now answers nothing, and is tried again when something has changed. Locks are looked at by whoever
 * calls.
 */
class Vxi11Target
{
public:
    using Error = wire::vxi11::Error;

    struct Reading {
        Error error = Error::NoError;
        Vxi11Response::Piece piece;
    };

    virtual ~Vxi11Target() = default;

    virtual LockTable &locks() = 0;
    /// The instrument that is behind it now; none behind the bus itself and where nobody is.
    virtual Vxi11Device *device() { return nullptr; }

    /// At least one byte. @p end: END comes with the last one.
    virtual std::optional<Error> write(std::span<const std::byte> bytes, bool end) = 0;
    /// Once a read, before the first attempt: a device that is asked for an answer and has none finds an error in that.
    virtual void beginRead() = 0;
    virtual std::optional<Reading> read(std::size_t most, std::optional<std::uint8_t> termination) = 0;

    virtual std::optional<Error> trigger() = 0;
    virtual Error clear() = 0;
    virtual Error remote() = 0;
    virtual Error local() = 0;
    virtual wire::vxi11::ReadStbResult poll() = 0;
    /// device_docmd. What it answers is appended to @p answer.
    virtual std::optional<Error> command(const wire::vxi11::DocmdCall &call, std::vector<std::byte> &answer) = 0;
};

} // namespace simulator
