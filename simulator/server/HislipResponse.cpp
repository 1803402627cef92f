#include "simulator/server/HislipResponse.h"

#include "simulator/server/HislipChannel.h"
#include "simulator/server/HislipDelivery.h"

#include <algorithm>

namespace simulator
{
namespace
{

constexpr std::size_t EnoughForNow = 1024 * 1024;
// Also a client that takes everything at once leaves the others their turn.
constexpr std::size_t BytesPerTurn = 8 * 1024 * 1024;

} // namespace

void HislipResponse::begin(ResponseSegments segments, std::uint32_t request)
{
    m_left = sizeOf(segments);
    m_request = request;
    m_pieces.clear();
    for (Outgoing &piece : toOutgoing(std::move(segments)))
        m_pieces.push_back(std::move(piece));
}

void HislipResponse::drop()
{
    m_pieces.clear();
    m_left = 0;
}

void HislipResponse::pump(HislipChannel &channel, std::size_t maxPayload, HislipDelivery &delivery)
{
    using namespace wire::hislip;
    std::size_t turn = 0;
    while (m_left > 0 && turn < BytesPerTurn && channel.connection().unsent() < EnoughForNow) {
        const std::size_t size = std::min(m_left, maxPayload);
        const MessageType type = size == m_left ? MessageType::DataEnd : MessageType::Data;
        channel.sendData({type, 0, delivery.nextId(m_request), size}, cut(size));
        m_left -= size;
        turn += size;
    }
}

std::vector<Outgoing> HislipResponse::cut(std::size_t size)
{
    std::vector<Outgoing> result;
    while (size > 0) {
        Outgoing &first = m_pieces.front();
        if (first.size() <= size) {
            size -= first.size();
            result.push_back(std::move(first));
            m_pieces.pop_front();
            continue;
        }
        Outgoing part;
        part.text = first.text.substr(0, size);
        first.text.erase(0, part.text.size());
        size -= part.text.size();
        if (size > 0) {
            part.keeper = first.keeper;
            part.bytes = first.bytes.first(size);
            first.bytes = first.bytes.subspan(size);
            size = 0;
        }
        result.push_back(std::move(part));
    }
    return result;
}

} // namespace simulator
