#pragma once

#include "pipeline/VisaError.h"

#include <visa.h>

#include <cstdint>
#include <cstring>
#include <limits>
#include <memory>
#include <new>
#include <string>

/**
 * Runs @p read on a buffer of @p size bytes and puts what it received, up to the first zero byte, into @p text.
 *
 * @p read takes the buffer and its size and answers the count received. When it throws VisaError, that passes on, with
 * an empty text; but the two statuses that say why a read ended are no failure of the read: with them the whole buffer
 * counts as received.
 *
 * @throws std::bad_alloc for a size that no read can have, or that does not fit into memory
 */
template <typename Read>
void receiveText(std::uint64_t size, std::string &text, Read read)
{
    if (size > std::numeric_limits<ViUInt32>::max())
        throw std::bad_alloc();
    // One byte more for the end of the text. Not zero-filled: a large buffer would cost more than many a read.
    const std::unique_ptr<char[]> buffer(new char[size + 1]);
    buffer[0] = '\0';
    buffer[size] = '\0';
    try {
        const ViUInt32 count = read(buffer.get(), static_cast<ViUInt32>(size));
        buffer[count < size ? count : size] = '\0';
    } catch (const VisaError &error) {
        if (error.getStatus() == VI_SUCCESS_TERM_CHAR || error.getStatus() == VI_SUCCESS_MAX_CNT)
            text = buffer.get();
        else
            text.clear();
        throw;
    }
    text = buffer.get();
}
