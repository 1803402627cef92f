// A DNS message. What was read can be written, unless it grows too long without the sender's compression, and what was written reads the same.
#include "tests/fuzz/Promise.h"
#include "wire/Dns.h"

using namespace wire;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size)
{
    dns::Message message;
    if (!dns::decode(std::as_bytes(std::span(data, size)), message)) {
        promise(message == dns::Message{});
        return 0;
    }
    // Labels of no length end a name, so none is left inside: every name that was read is valid.
    for (const dns::Question &question : message.questions)
        promise(question.name.valid());
    const std::vector<std::byte> bytes = dns::encode(message);
    dns::Message again;
    promise(bytes.empty() || (dns::decode(bytes, again) && again == message));
    return 0;
}
