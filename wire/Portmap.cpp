#include "Portmap.h"

namespace wire::portmap
{

void encode(xdr::Writer &writer, const Mapping &mapping)
{
    writer.u32(mapping.program);
    writer.u32(mapping.version);
    writer.u32(mapping.protocol);
    writer.u32(mapping.port);
}

bool decode(xdr::Reader &reader, Mapping &mapping)
{
    mapping.program = reader.u32();
    mapping.version = reader.u32();
    mapping.protocol = reader.u32();
    mapping.port = reader.u32();
    return reader.ok();
}

void encodePort(xdr::Writer &writer, std::uint16_t port)
{
    writer.u32(port);
}

bool decodePort(xdr::Reader &reader, std::uint16_t &port)
{
    const std::uint32_t value = reader.u32();
    port = value <= UINT16_MAX ? static_cast<std::uint16_t>(value) : std::uint16_t{0};
    return reader.ok();
}

void encodeDone(xdr::Writer &writer, bool done)
{
    writer.boolean(done);
}

bool decodeDone(xdr::Reader &reader, bool &done)
{
    done = reader.boolean();
    return reader.ok();
}

void encodeList(xdr::Writer &writer, std::span<const Mapping> mappings)
{
    for (const Mapping &mapping : mappings) {
        writer.boolean(true);
        encode(writer, mapping);
    }
    writer.boolean(false);
}

bool decodeList(xdr::Reader &reader, std::vector<Mapping> &mappings, std::size_t limit)
{
    mappings.clear();
    while (reader.boolean()) {
        Mapping mapping;
        if (mappings.size() == limit || !decode(reader, mapping))
            return false;
        mappings.push_back(mapping);
    }
    return reader.ok();
}

} // namespace wire::portmap
