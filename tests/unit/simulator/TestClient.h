#pragma once

#include "simulator/instrument/Bytes.h"
#include "simulator/instrument/Instrument.h"
#include "simulator/instrument/MessageExchange.h"

#include <deque>
#include <string>
#include <string_view>
#include <vector>

/// A client of the instrument without a protocol in between: bytes in, responses out, as a transport would do it.
class TestClient final : private simulator::MessageExchange::Client
{
public:
    explicit TestClient(simulator::Instrument &instrument, bool hasEnd = true)
        : exchange(instrument, *this, {hasEnd, true, [this](std::uint8_t byte) { serviceRequests.push_back(byte); }})
    {
    }

    /// Sends a piece of a message.
    void send(std::string_view bytes)
    {
        m_input.insert(m_input.end(), bytes.begin(), bytes.end());
        inputAccepted();
    }
    void sendEnd()
    {
        m_ends = true;
        inputAccepted();
    }
    /// Sends a message with END on its last byte. The answers that it brings, joined.
    std::string ask(std::string_view message)
    {
        send(message);
        sendEnd();
        return takeAnswers();
    }
    /// Device clear; what the transport had kept goes too.
    void clear()
    {
        m_input.clear();
        m_ends = false;
        exchange.clear();
    }
    std::string takeAnswers() { return std::exchange(m_answers, {}); }

    simulator::MessageExchange exchange;
    std::vector<std::uint8_t> serviceRequests;

private:
    void inputAccepted() override
    {
        collect();
        while (!m_input.empty() && exchange.accepting()) {
            const std::string text{m_input.begin(), m_input.end()};
            std::span<const std::byte> bytes = std::as_bytes(std::span{text});
            exchange.receive(bytes);
            m_input.erase(m_input.begin(), m_input.end() - static_cast<std::ptrdiff_t>(bytes.size()));
            collect();
        }
        if (m_input.empty() && m_ends && exchange.accepting()) {
            m_ends = false;
            exchange.end();
            collect();
        }
    }

    void collect()
    {
        if (!exchange.output().isComplete())
            return;
        for (const simulator::ResponseSegment &segment : exchange.output().take()) {
            m_answers += segment.text;
            if (segment.block)
                m_answers.append(reinterpret_cast<const char *>(segment.block->view().data()), segment.block->size());
        }
    }

    std::deque<char> m_input;
    bool m_ends = false;
    std::string m_answers;
};
