#include "Vxi11.h"

namespace wire::vxi11
{
namespace
{

void put(xdr::Writer &writer, Error error)
{
    writer.i32(static_cast<std::int32_t>(error));
}

Error takeError(xdr::Reader &reader)
{
    return static_cast<Error>(reader.i32());
}

/// Characters travel as whole words, and some senders extend their sign.
std::uint8_t takeByte(xdr::Reader &reader)
{
    return static_cast<std::uint8_t>(reader.u32());
}

} // namespace

void encode(xdr::Writer &writer, const Link &value)
{
    writer.i32(value.link);
}

bool decode(xdr::Reader &reader, Link &value)
{
    value.link = reader.i32();
    return reader.ok();
}

void encode(xdr::Writer &writer, const ErrorResult &value)
{
    put(writer, value.error);
}

bool decode(xdr::Reader &reader, ErrorResult &value)
{
    value.error = takeError(reader);
    return reader.ok();
}

void encode(xdr::Writer &writer, const CreateLinkCall &value)
{
    writer.i32(value.clientId);
    writer.boolean(value.lockDevice);
    writer.u32(value.lockTimeout);
    writer.string(value.device);
}

bool decode(xdr::Reader &reader, CreateLinkCall &value)
{
    value.clientId = reader.i32();
    value.lockDevice = reader.boolean();
    value.lockTimeout = reader.u32();
    value.device = reader.string();
    return reader.ok();
}

void encode(xdr::Writer &writer, const CreateLinkResult &value)
{
    put(writer, value.error);
    writer.i32(value.link);
    writer.u32(value.abortPort);
    writer.u32(value.maxRecvSize);
}

bool decode(xdr::Reader &reader, CreateLinkResult &value)
{
    value.error = takeError(reader);
    value.link = reader.i32();
    const std::uint32_t port = reader.u32();
    value.abortPort = port <= UINT16_MAX ? static_cast<std::uint16_t>(port) : std::uint16_t{0};
    value.maxRecvSize = reader.u32();
    return reader.ok();
}

void encodeHead(xdr::Writer &writer, const WriteCall &value)
{
    writer.u32s({static_cast<std::uint32_t>(value.link), value.ioTimeout, value.lockTimeout, value.flags,
                 static_cast<std::uint32_t>(value.data.size())});
}

void encode(xdr::Writer &writer, const WriteCall &value)
{
    writer.i32(value.link);
    writer.u32(value.ioTimeout);
    writer.u32(value.lockTimeout);
    writer.u32(value.flags);
    writer.opaque(value.data);
}

bool decode(xdr::Reader &reader, WriteCall &value)
{
    value.link = reader.i32();
    value.ioTimeout = reader.u32();
    value.lockTimeout = reader.u32();
    value.flags = reader.u32();
    value.data = reader.opaque();
    return reader.ok();
}

void encode(xdr::Writer &writer, const WriteResult &value)
{
    put(writer, value.error);
    writer.u32(value.size);
}

bool decode(xdr::Reader &reader, WriteResult &value)
{
    value.error = takeError(reader);
    value.size = reader.u32();
    return reader.ok();
}

void encode(xdr::Writer &writer, const ReadCall &value)
{
    writer.u32s({static_cast<std::uint32_t>(value.link), value.requestSize, value.ioTimeout, value.lockTimeout,
                 value.flags, value.termChar});
}

bool decode(xdr::Reader &reader, ReadCall &value)
{
    value.link = reader.i32();
    value.requestSize = reader.u32();
    value.ioTimeout = reader.u32();
    value.lockTimeout = reader.u32();
    value.flags = reader.u32();
    value.termChar = takeByte(reader);
    return reader.ok();
}

void encode(xdr::Writer &writer, const ReadHead &value)
{
    put(writer, value.error);
    writer.u32(value.reason);
    writer.u32(value.length);
}

bool decode(xdr::Reader &reader, ReadHead &value)
{
    value.error = takeError(reader);
    value.reason = reader.u32();
    value.length = reader.u32();
    return reader.ok();
}

void encode(xdr::Writer &writer, const ReadResult &value)
{
    put(writer, value.error);
    writer.u32(value.reason);
    writer.opaque(value.data);
}

bool decode(xdr::Reader &reader, ReadResult &value)
{
    value.error = takeError(reader);
    value.reason = reader.u32();
    value.data = reader.opaque();
    return reader.ok();
}

void encode(xdr::Writer &writer, const ReadStbResult &value)
{
    put(writer, value.error);
    writer.u32(value.statusByte);
}

bool decode(xdr::Reader &reader, ReadStbResult &value)
{
    value.error = takeError(reader);
    value.statusByte = takeByte(reader);
    return reader.ok();
}

void encode(xdr::Writer &writer, const GenericCall &value)
{
    writer.i32(value.link);
    writer.u32(value.flags);
    writer.u32(value.lockTimeout);
    writer.u32(value.ioTimeout);
}

bool decode(xdr::Reader &reader, GenericCall &value)
{
    value.link = reader.i32();
    value.flags = reader.u32();
    value.lockTimeout = reader.u32();
    value.ioTimeout = reader.u32();
    return reader.ok();
}

void encode(xdr::Writer &writer, const LockCall &value)
{
    writer.i32(value.link);
    writer.u32(value.flags);
    writer.u32(value.lockTimeout);
}

bool decode(xdr::Reader &reader, LockCall &value)
{
    value.link = reader.i32();
    value.flags = reader.u32();
    value.lockTimeout = reader.u32();
    return reader.ok();
}

void encode(xdr::Writer &writer, const EnableSrqCall &value)
{
    writer.i32(value.link);
    writer.boolean(value.enable);
    writer.opaque(value.handle);
}

bool decode(xdr::Reader &reader, EnableSrqCall &value)
{
    value.link = reader.i32();
    value.enable = reader.boolean();
    value.handle = reader.opaque(MaxHandle);
    return reader.ok();
}

void encode(xdr::Writer &writer, const RemoteFunc &value)
{
    writer.u32(value.hostAddress);
    writer.u32(value.hostPort);
    writer.u32(value.program);
    writer.u32(value.version);
    writer.u32(value.family);
}

bool decode(xdr::Reader &reader, RemoteFunc &value)
{
    value.hostAddress = reader.u32();
    value.hostPort = reader.u32();
    value.program = reader.u32();
    value.version = reader.u32();
    value.family = reader.u32();
    return reader.ok();
}

void encode(xdr::Writer &writer, const DocmdCall &value)
{
    writer.i32(value.link);
    writer.u32(value.flags);
    writer.u32(value.ioTimeout);
    writer.u32(value.lockTimeout);
    writer.u32(value.command);
    writer.boolean(value.networkOrder);
    writer.i32(value.dataSize);
    writer.opaque(value.data);
}

bool decode(xdr::Reader &reader, DocmdCall &value)
{
    value.link = reader.i32();
    value.flags = reader.u32();
    value.ioTimeout = reader.u32();
    value.lockTimeout = reader.u32();
    value.command = reader.u32();
    value.networkOrder = reader.boolean();
    value.dataSize = reader.i32();
    value.data = reader.opaque();
    return reader.ok();
}

void encode(xdr::Writer &writer, const DocmdResult &value)
{
    put(writer, value.error);
    writer.opaque(value.data);
}

bool decode(xdr::Reader &reader, DocmdResult &value)
{
    value.error = takeError(reader);
    value.data = reader.opaque();
    return reader.ok();
}

void encode(xdr::Writer &writer, const IntrSrqCall &value)
{
    writer.opaque(value.handle);
}

bool decode(xdr::Reader &reader, IntrSrqCall &value)
{
    value.handle = reader.opaque();
    return reader.ok();
}

} // namespace wire::vxi11
