#include "kyvisa/core/FileTransfer.h"

#include "kyvisa/core/InstrumentSession.h"
#include "kyvisa/include/visa.h"
#include "kyvisa/os/File.h"

#include <algorithm>
#include <utility>
#include <vector>

namespace kyvisa
{
namespace
{

constexpr std::size_t Piece = std::size_t{256} << 10;

using Bytes = std::vector<std::byte>;

} // namespace

ViStatus readToFile(InstrumentSession &session, const char *file, ViUInt32 size, ViUInt32 &count)
{
    const os::Deadline deadline = session.operationDeadline();
    // A file is not touched for the sake of a session that may not read.
    if (const ViStatus status = session.mayTransfer(); status != VI_SUCCESS)
        return status;
    const bool append = session.attributes().number(VI_ATTR_FILE_APPEND_EN) != 0;
    os::File output(file, append ? os::File::Use::Append : os::File::Use::Replace);
    if (!output.isOpen())
        return VI_ERROR_FILE_ACCESS;
    Bytes piece(std::min<std::size_t>(Piece, size));
    ViStatus status = VI_SUCCESS_MAX_CNT;
    for (std::size_t left = size; left > 0 && status == VI_SUCCESS_MAX_CNT;) {
        std::size_t got = 0;
        status = session.read(std::span(piece).first(std::min(left, piece.size())), got, deadline);
        if (!output.write(std::span(piece).first(got)))
            return VI_ERROR_FILE_IO;
        left -= got;
        count += static_cast<ViUInt32>(got);
    }
    return output.close() ? status : VI_ERROR_FILE_IO;
}

ViStatus writeFromFile(InstrumentSession &session, const char *file, ViUInt32 size, ViUInt32 &count)
{
    const os::Deadline deadline = session.operationDeadline();
    os::File input(file, os::File::Use::Read);
    if (!input.isOpen())
        return VI_ERROR_FILE_ACCESS;
    std::size_t left = size;
    const auto fill = [&](Bytes &piece) {
        piece.resize(std::min(left, Piece));
        std::size_t got = 0;
        const bool fine = input.read(piece, got);
        piece.resize(got);
        left -= got;
        return fine;
    };
    // END goes with the file's last byte, so a piece is sent when it is known whether another one follows.
    Bytes piece;
    Bytes following;
    if (!fill(piece))
        return VI_ERROR_FILE_IO;
    do {
        if (!fill(following))
            return VI_ERROR_FILE_IO;
        std::size_t sent = 0;
        const ViStatus status = session.write(piece, sent, deadline, following.empty());
        count += static_cast<ViUInt32>(sent);
        if (status != VI_SUCCESS)
            return status;
        std::swap(piece, following);
    } while (!piece.empty());
    return VI_SUCCESS;
}

} // namespace kyvisa
