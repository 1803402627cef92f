// A program with the library on one side of a network that somebody else spoils. It takes one order a line, carries it out on a
// session of its own and answers with one line: what each call returned, and how long the whole took.
//   exchange NAME [MS]     open, one question and its answer, close; each call within MS milliseconds
//   blocks NAME            blocks of many sizes there and back, compared here
//   service NAME           a service request reaches a session that waits for one
//   terminate NAME         a read that nothing answers is ended by another thread once the next line has come, whatever it says,
//                          and the next question is answered
#include <visa.h>

#include <atomic>
#include <chrono>
#include <cstdio>
#include <iostream>
#include <sstream>
#include <string>
#include <string_view>
#include <thread>

namespace
{

constexpr ViUInt32 LongTime = 60000; // milliseconds

class Session
{
public:
    /// @param timeout of opening and of each transfer, milliseconds.
    Session(ViSession manager, const std::string &name, ViUInt32 timeout = LongTime)
        : m_hasEnd(name.find("::SOCKET") == name.npos)
    {
        opened = viOpen(manager, name.c_str(), VI_NO_LOCK, timeout, &vi);
        if (opened < VI_SUCCESS)
            return;
        viSetAttribute(vi, VI_ATTR_TMO_VALUE, timeout);
        readToLineFeed(true);
    }
    ~Session()
    {
        if (opened >= VI_SUCCESS)
            viClose(vi);
    }
    Session(const Session &) = delete;
    Session &operator=(const Session &) = delete;

    void readToLineFeed(bool on) const
    {
        if (!m_hasEnd)
            viSetAttribute(vi, VI_ATTR_TERMCHAR_EN, on ? VI_TRUE : VI_FALSE);
    }
    ViStatus write(std::string_view data) const
    {
        return viWrite(vi, reinterpret_cast<ViConstBuf>(data.data()), static_cast<ViUInt32>(data.size()), nullptr);
    }
    ViStatus read(std::size_t size)
    {
        text.assign(size, '\0');
        ViUInt32 count = 0;
        const ViStatus status = viRead(vi, reinterpret_cast<ViPBuf>(text.data()), static_cast<ViUInt32>(size), &count);
        text.resize(count);
        return status;
    }
    ViStatus query(std::string_view question, std::size_t size = 1024)
    {
        const ViStatus status = write(question);
        return status < VI_SUCCESS ? status : read(size);
    }

    ViSession vi = VI_NULL;
    ViStatus opened = VI_ERROR_SYSTEM_ERROR;
    std::string text;

private:
    const bool m_hasEnd;
};

std::string hexadecimal(ViStatus status)
{
    char text[16];
    std::snprintf(text, sizeof text, "%08X", static_cast<unsigned>(status));
    return text;
}

std::string withoutLineFeed(std::string text)
{
    while (!text.empty() && text.back() == '\n')
        text.pop_back();
    return text;
}

std::string exchange(ViSession manager, const std::string &name, ViUInt32 timeout)
{
    Session session(manager, name, timeout);
    std::string story = "open=" + hexadecimal(session.opened);
    if (session.opened < VI_SUCCESS)
        return story;
    story += " write=" + hexadecimal(session.write("*ESE 5;*ESE?\n"));
    story += " read=" + hexadecimal(session.read(64));
    story += " text=" + withoutLineFeed(session.text);
    const ViStatus closed = viClose(session.vi);
    session.opened = VI_ERROR_CONN_LOST;
    return story + " close=" + hexadecimal(closed);
}

/// Bytes without a pattern that a lost or doubled piece would leave unchanged.
std::string noise(std::size_t size)
{
    std::string data(size, '\0');
    unsigned state = 12345 + static_cast<unsigned>(size);
    for (char &byte : data) {
        state = state * 1664525 + 1013904223;
        byte = static_cast<char>(state >> 24);
    }
    return data;
}

std::string blocks(ViSession manager, const std::string &name)
{
    Session session(manager, name);
    if (session.opened < VI_SUCCESS)
        return "open=" + hexadecimal(session.opened);
    for (const std::size_t size : {0, 1, 2, 3, 4, 5, 15, 16, 17, 255, 1023, 1024, 1025, 4096, 20000}) {
        const std::string digits = std::to_string(size);
        const std::string block = "#" + std::to_string(digits.size()) + digits + noise(size);
        const ViStatus written = session.write("MMEM:DATA \"lab\"," + block + "\n");
        session.readToLineFeed(false);
        const ViStatus read = session.query("MMEM:DATA? \"lab\"\n", block.size() + 1);
        session.readToLineFeed(true);
        if (written != VI_SUCCESS || read < VI_SUCCESS || session.text != block + "\n")
            return "size=" + digits + " write=" + hexadecimal(written) + " read=" + hexadecimal(read) +
                   " got=" + std::to_string(session.text.size());
        if (session.query("*OPC?\n") < VI_SUCCESS || session.text != "1\n")
            return "size=" + digits + " then=" + withoutLineFeed(session.text);
    }
    const ViStatus cleared = viClear(session.vi);
    if (cleared != VI_SUCCESS)
        return "clear=" + hexadecimal(cleared);
    if (session.query("*OPC?\n") < VI_SUCCESS || session.text != "1\n")
        return "afterclear=" + withoutLineFeed(session.text);
    return "equal";
}

std::string service(ViSession manager, const std::string &name)
{
    Session session(manager, name);
    if (session.opened < VI_SUCCESS)
        return "open=" + hexadecimal(session.opened);
    const ViStatus enabled = viEnableEvent(session.vi, VI_EVENT_SERVICE_REQ, VI_QUEUE, VI_NULL);
    const ViStatus written = session.write("*CLS;*ESE 1;*SRE 32;*OPC\n");
    const ViStatus waited = viWaitOnEvent(session.vi, VI_EVENT_SERVICE_REQ, LongTime, nullptr, nullptr);
    ViUInt16 byte = 0;
    const ViStatus polled = viReadSTB(session.vi, &byte);
    session.write("*CLS;*SRE 0\n");
    return "enable=" + hexadecimal(enabled) + " write=" + hexadecimal(written) + " wait=" + hexadecimal(waited) +
           " poll=" + hexadecimal(polled) + " requested=" + ((byte & 0x40) != 0 ? "yes" : "no");
}

std::string terminate(ViSession manager, const std::string &name)
{
    Session session(manager, name);
    if (session.opened < VI_SUCCESS)
        return "open=" + hexadecimal(session.opened);
    ViStatus read = VI_SUCCESS;
    std::thread reading([&] { read = session.read(64); });
    std::string now;
    std::getline(std::cin, now);
    // A termination ends what is going on; one that comes before the read does nothing. So there is one more until it ends.
    std::atomic<bool> ended{false};
    std::thread ending([&] {
        while (!ended) {
            viTerminate(session.vi, VI_NULL, VI_NULL);
            std::this_thread::sleep_for(std::chrono::milliseconds(20));
        }
    });
    reading.join();
    ended = true;
    ending.join();
    std::string story = "read=" + hexadecimal(read);
    const ViStatus cleared = viClear(session.vi);
    story += " clear=" + hexadecimal(cleared);
    session.query("*ESE 7;*ESE?\n");
    return story + " text=" + withoutLineFeed(session.text);
}

std::string carryOut(ViSession manager, const std::string &order, const std::string &name, ViUInt32 timeout)
{
    if (order == "exchange")
        return exchange(manager, name, timeout);
    if (order == "blocks")
        return blocks(manager, name);
    if (order == "service")
        return service(manager, name);
    if (order == "terminate")
        return terminate(manager, name);
    return "what?";
}

} // namespace

int main()
{
    ViSession manager = VI_NULL;
    if (viOpenDefaultRM(&manager) != VI_SUCCESS)
        return 1;
    for (std::string line; std::getline(std::cin, line);) {
        std::istringstream words(line);
        std::string order;
        std::string name;
        words >> order >> name;
        ViUInt32 timeout = LongTime;
        words >> timeout;
        timeout = words ? timeout : LongTime;
        const auto begin = std::chrono::steady_clock::now();
        const std::string story = carryOut(manager, order, name, timeout);
        const auto took =
            std::chrono::duration_cast<std::chrono::milliseconds>(std::chrono::steady_clock::now() - begin);
        std::cout << story << " ms=" << took.count() << std::endl;
    }
    return viClose(manager) == VI_SUCCESS ? 0 : 1;
}
