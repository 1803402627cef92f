// The first byte chooses a structure, the rest is read as that. What was read can be written, and read and written again to the same bytes.
#include "tests/fuzz/Promise.h"
#include "wire/Vxi11.h"

using namespace wire;
using xdr::Bytes;

namespace
{

template <typename Value>
void roundTrip(Bytes bytes)
{
    xdr::Reader reader(bytes);
    Value value{};
    if (!vxi11::decode(reader, value))
        return;
    std::vector<std::byte> once;
    xdr::Writer onceWriter(once);
    vxi11::encode(onceWriter, value);
    promise(once.size() + reader.rest().size() == bytes.size());

    xdr::Reader again(once);
    Value copy{};
    promise(vxi11::decode(again, copy) && again.rest().empty());
    std::vector<std::byte> twice;
    xdr::Writer twiceWriter(twice);
    vxi11::encode(twiceWriter, copy);
    promise(once == twice);
}

using RoundTrip = void (*)(Bytes);
constexpr RoundTrip RoundTrips[] = {
    roundTrip<vxi11::Link>,           roundTrip<vxi11::ErrorResult>,
    roundTrip<vxi11::CreateLinkCall>, roundTrip<vxi11::CreateLinkResult>,
    roundTrip<vxi11::WriteCall>,      roundTrip<vxi11::WriteResult>,
    roundTrip<vxi11::ReadCall>,       roundTrip<vxi11::ReadResult>,
    roundTrip<vxi11::ReadHead>,       roundTrip<vxi11::ReadStbResult>,
    roundTrip<vxi11::GenericCall>,    roundTrip<vxi11::LockCall>,
    roundTrip<vxi11::EnableSrqCall>,  roundTrip<vxi11::RemoteFunc>,
    roundTrip<vxi11::DocmdCall>,      roundTrip<vxi11::DocmdResult>,
    roundTrip<vxi11::IntrSrqCall>,
};

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size)
{
    if (size == 0)
        return 0;
    RoundTrips[data[0] % std::size(RoundTrips)](std::as_bytes(std::span(data + 1, size - 1)));
    return 0;
}
