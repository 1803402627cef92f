// The first byte says in what pieces the rest arrives. The records must not depend on it.
#include "tests/fuzz/Promise.h"
#include "wire/RpcRecord.h"

#include <algorithm>

using wire::rpc::RecordReader;
using wire::xdr::Bytes;

namespace
{

constexpr std::size_t Limit = 4096;

struct Outcome {
    std::vector<std::vector<std::byte>> records;
    bool refused = false;

    bool operator==(const Outcome &) const = default;
};

Outcome read(Bytes bytes, std::size_t piece)
{
    Outcome outcome;
    RecordReader reader(Limit);
    while (!bytes.empty() && !outcome.refused) {
        const std::size_t used = reader.feed(bytes.first(std::min(piece, bytes.size())));
        promise(reader.record().size() <= Limit);
        bytes = bytes.subspan(used);
        switch (reader.state()) {
        case RecordReader::State::NeedMore:
            promise(used > 0);
            break;
        case RecordReader::State::Complete:
            outcome.records.emplace_back(reader.record().begin(), reader.record().end());
            reader.next();
            break;
        case RecordReader::State::Refused:
            outcome.refused = true;
            break;
        }
    }
    return outcome;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size)
{
    if (size == 0)
        return 0;
    const Bytes bytes = std::as_bytes(std::span(data + 1, size - 1));
    promise(read(bytes, data[0] + std::size_t{1}) == read(bytes, SIZE_MAX));
    return 0;
}
