#pragma once

#include <cstdint>

/**
 * One log line. A plain record of fixed size that is copied whole into and out of the queues, so that emitting a line
 * allocates nothing.
 */
struct FastBuffer {
    static constexpr unsigned TextSize = 450; ///< bytes of text including the terminating NUL; longer text is cut

    char text[TextSize];
    std::int32_t status;    ///< VISA status; meaningful for VISA lines only
    std::uint64_t duration; ///< nanoseconds that the library call alone took; meaningful for VISA lines only
    std::uint64_t line;     ///< number of the line, unique in the process
    bool visaLine;          ///< a VISA call (true) or free text (false)
};
