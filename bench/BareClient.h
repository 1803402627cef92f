#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>
#include <sys/types.h>

namespace bench
{

/// What the machine can do at all: one byte to a child process on the same core and back, over a loopback connection.
class BareEcho
{
public:
    BareEcho();
    ~BareEcho();
    BareEcho(const BareEcho &) = delete;
    BareEcho &operator=(const BareEcho &) = delete;

    void ping();

private:
    int m_socket = -1;
    pid_t m_process = -1;
};

/// The limit of a raw socket query: one send, one recv, nothing checked but the line feed.
class BareSocket
{
public:
    explicit BareSocket(std::uint16_t port); ///< on 127.0.0.1
    ~BareSocket();
    BareSocket(const BareSocket &) = delete;
    BareSocket &operator=(const BareSocket &) = delete;

    std::size_t query(std::string_view command, char *answer, std::size_t size);
    void write(const void *data, std::size_t size);
    void readAll(void *data, std::size_t size);

private:
    int m_socket;
};

/// The limit of a HiSLIP query: header and payload in one send, the answer's header and payload in one recv.
class BareHislip
{
public:
    explicit BareHislip(std::uint16_t port);
    ~BareHislip();
    BareHislip(const BareHislip &) = delete;
    BareHislip &operator=(const BareHislip &) = delete;

    std::size_t query(std::string_view command, char *answer, std::size_t size);

private:
    int m_synchronous;
    int m_asynchronous;
    std::uint32_t m_messageId;
    char m_out[256];
    char m_in[4096];
};

/// The limit of a block: a child process that swallows or delivers bytes on a loopback connection, with plain send and recv.
class BareCopy
{
public:
    explicit BareCopy(std::size_t size);
    ~BareCopy();
    BareCopy(const BareCopy &) = delete;
    BareCopy &operator=(const BareCopy &) = delete;

    void write(const char *data); ///< sends `size` bytes, waits for one byte in answer
    void read(char *data);        ///< asks with one byte, receives `size` bytes

private:
    std::size_t m_size;
    int m_socket = -1;
    pid_t m_process = -1;
};

} // namespace bench
