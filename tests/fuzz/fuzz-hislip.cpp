#include "tests/fuzz/Promise.h"
#include "wire/Hislip.h"

#include <algorithm>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size)
{
    using namespace wire::hislip;
    if (size < HeaderSize)
        return 0;
    const std::span<const std::byte, HeaderSize> bytes{reinterpret_cast<const std::byte *>(data), HeaderSize};
    Header header;
    if (!decode(bytes, header)) {
        promise(header == Header{});
        return 0;
    }
    promise(data[0] == 'H' && data[1] == 'S');
    promise(std::ranges::equal(encode(header), bytes));
    return 0;
}
