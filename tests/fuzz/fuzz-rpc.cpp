// One message, read as a call and as a reply. What was read can be written and read again.
#include "tests/fuzz/Promise.h"
#include "wire/Rpc.h"

using namespace wire;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size)
{
    const xdr::Bytes bytes = std::as_bytes(std::span(data, size));
    std::vector<std::byte> buffer;
    xdr::Writer writer(buffer);

    xdr::Reader callReader(bytes);
    rpc::Call call;
    if (rpc::decode(callReader, call) == rpc::CallForm::Good) {
        rpc::encode(writer, call);
        xdr::Reader again(buffer);
        rpc::Call copy;
        promise(rpc::decode(again, copy) == rpc::CallForm::Good);
        promise(copy == call && again.rest().empty());
    }

    buffer.clear();
    xdr::Reader replyReader(bytes);
    rpc::Reply reply;
    if (rpc::decode(replyReader, reply)) {
        rpc::encode(writer, reply);
        xdr::Reader again(buffer);
        rpc::Reply copy;
        promise(rpc::decode(again, copy));
        promise(copy == reply && again.rest().empty());
    }
    return 0;
}
