#pragma once

#include "simulator/instrument/Response.h"

#include <cstddef>
#include <memory>
#include <span>
#include <string>
#include <vector>

namespace simulator
{

/// Bytes to be sent: some text, then perhaps a stretch of a stored block, which is kept alive and not copied.
struct Outgoing {
    std::string text;
    std::shared_ptr<const Bytes> keeper;
    std::span<const std::byte> bytes; ///< of keeper

    std::size_t size() const { return text.size() + bytes.size(); }
};

std::vector<Outgoing> toOutgoing(ResponseSegments segments);
std::size_t sizeOf(const std::vector<Outgoing> &pieces);

} // namespace simulator
