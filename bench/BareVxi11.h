#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>

namespace bench
{

/// The limit of a VXI-11 query: two RPC calls, each one send and one recv, nothing checked but the data's length.
class BareVxi11
{
public:
    explicit BareVxi11(std::uint16_t portmapper); ///< on 127.0.0.1; makes a link to inst0
    ~BareVxi11();
    BareVxi11(const BareVxi11 &) = delete;
    BareVxi11 &operator=(const BareVxi11 &) = delete;

    std::size_t query(std::string_view command, char *answer, std::size_t size);

private:
    std::uint32_t *arguments(std::uint32_t procedure);
    void call(const std::uint32_t *end);

    int m_socket;
    std::uint32_t m_xid = 0;
    std::uint32_t m_link = 0;
    std::uint32_t m_out[64];
    std::uint32_t m_in[1024];
};

} // namespace bench
