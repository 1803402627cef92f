#pragma once

#include "kyvisa/discovery/LanQuery.h"

#include <cstdint>
#include <functional>

namespace kyvisa
{

/// Asks the portmapper of every host for the port of VXI-11, by broadcast. Hosts that do not serve it answer with none.
class Vxi11Query : public LanQuery
{
public:
    /// @param port where its core channel listens. Called for each answer, also for repeated ones.
    using Found = std::function<void(const std::string &host, std::uint16_t port)>;

    Vxi11Query(std::span<const os::NetworkInterface> interfaces, Found found);

    std::span<const std::chrono::milliseconds> schedule() const override;

protected:
    void askOn(Link &link) override;
    void take(std::span<const std::byte> answer, const std::string &from, Link &link) override;

private:
    const Found m_found;
    const std::uint32_t m_xid; ///< of every question of this search
};

} // namespace kyvisa
