#pragma once

#include <string>

namespace simulator
{

/// A numeric IPv4 or IPv6 address to listen on.
struct ListenAddress {
    std::string text;      ///< without brackets
    bool optional = false; ///< not to have it, or not to have this family at all, is no error

    bool isIpv6() const { return text.find(':') != std::string::npos; }
    bool isLoopback() const;
};

} // namespace simulator
