// A mapping, and a list of them. The list is never longer than its limit, and can be written and read again.
#include "tests/fuzz/Promise.h"
#include "wire/Portmap.h"

using namespace wire;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size)
{
    const xdr::Bytes bytes = std::as_bytes(std::span(data, size));
    std::vector<std::byte> buffer;
    xdr::Writer writer(buffer);

    xdr::Reader mappingReader(bytes);
    portmap::Mapping mapping;
    promise(portmap::decode(mappingReader, mapping) == (size >= 16));

    constexpr std::size_t Limit = 8;
    xdr::Reader listReader(bytes);
    std::vector<portmap::Mapping> mappings;
    const bool whole = portmap::decodeList(listReader, mappings, Limit);
    promise(mappings.size() <= Limit);
    if (whole) {
        portmap::encodeList(writer, mappings);
        xdr::Reader again(buffer);
        std::vector<portmap::Mapping> copy;
        promise(portmap::decodeList(again, copy, Limit));
        promise(copy == mappings && again.rest().empty());
    }
    return 0;
}
