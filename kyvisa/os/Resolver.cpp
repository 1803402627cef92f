#include "kyvisa/os/Resolver.h"

#include "kyvisa/os/Poll.h"
#include "kyvisa/os/SystemCalls.h"
#include "kyvisa/os/Thread.h"

#include <arpa/inet.h>
#include <array>
#include <atomic>
#include <cstring>
#include <exception>
#include <memory>
#include <netinet/in.h>
#include <strings.h>

namespace kyvisa::os
{
namespace
{

/// Questions that may be open at once. A dead name server must not cost a program a thread for each attempt.
constexpr int MaxOpenQuestions = 64;
std::atomic<int> g_openQuestions{0};

/// Shared by the asking thread and the helper; whoever is last frees it.
struct Question {
    std::string host;
    std::string service;
    const SystemCalls *calls = nullptr;
    std::vector<Address> answer;
    Wakeup done; ///< closed when the answer is there
};

std::vector<Address> lookUp(const SystemCalls &calls, const std::string &host, const std::string &service, int flags)
{
    addrinfo hints{};
    hints.ai_family = AF_UNSPEC;
    hints.ai_socktype = SOCK_STREAM;
    hints.ai_flags = flags | AI_NUMERICSERV;
    addrinfo *found = nullptr;
    std::vector<Address> addresses;
    if (calls.getaddrinfo(host.c_str(), service.c_str(), &hints, &found) != 0)
        return addresses;
    const std::unique_ptr<addrinfo, decltype(&::freeaddrinfo)> owned(found, &::freeaddrinfo);
    for (const addrinfo *entry = found; entry != nullptr; entry = entry->ai_next) {
        Address address;
        if (entry->ai_addrlen > sizeof address.storage)
            continue;
        std::memcpy(&address.storage, entry->ai_addr, entry->ai_addrlen);
        address.length = entry->ai_addrlen;
        addresses.push_back(address);
    }
    return addresses;
}

bool isLocalhost(const std::string &host)
{
    return ::strcasecmp(host.c_str(), "localhost") == 0 || ::strcasecmp(host.c_str(), "localhost.") == 0;
}

/// Both loopback addresses, whatever the hosts file lists: the instrument may listen on either.
std::vector<Address> loopback(std::uint16_t port)
{
    std::vector<Address> addresses(2);
    sockaddr_in6 six{};
    six.sin6_family = AF_INET6;
    six.sin6_port = htons(port);
    six.sin6_addr = in6addr_loopback;
    std::memcpy(&addresses[0].storage, &six, sizeof six);
    addresses[0].length = sizeof six;
    sockaddr_in four{};
    four.sin_family = AF_INET;
    four.sin_port = htons(port);
    four.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    std::memcpy(&addresses[1].storage, &four, sizeof four);
    addresses[1].length = sizeof four;
    return addresses;
}

void answer(const std::shared_ptr<Question> &question)
{
    try {
        question->answer = lookUp(*question->calls, question->host, question->service, 0);
    } catch (const std::bad_alloc &) {
        question->answer.clear();
    }
    question->done.close();
    g_openQuestions.fetch_sub(1);
}

IoResult askOnThread(const std::string &host, const std::string &service, const WaitLimit &limit,
                     std::vector<Address> &addresses)
{
    const auto question = std::make_shared<Question>();
    question->host = host;
    question->service = service;
    question->calls = &systemCalls();
    if (!question->done.valid())
        return IoResult::NoMemory;
    if (g_openQuestions.fetch_add(1) >= MaxOpenQuestions) {
        g_openQuestions.fetch_sub(1);
        return IoResult::NoMemory;
    }
    try {
        startThread([question] { answer(question); }).detach();
    } catch (const std::exception &) { // neither a thread nor memory for one
        g_openQuestions.fetch_sub(1);
        return IoResult::NoMemory;
    }
    std::array<pollfd, 2> watched = {pollfd{question->done.descriptor(), POLLIN, 0}};
    const IoResult result = pollWithin(watched, limit);
    if (result == IoResult::Done && question->done.closed())
        addresses = std::move(question->answer);
    return result;
}

} // namespace

IoResult resolve(const std::string &host, std::uint16_t port, const WaitLimit &limit, std::vector<Address> &addresses)
{
    addresses.clear();
    if (isLocalhost(host)) {
        addresses = loopback(port);
        return IoResult::Done;
    }
    const std::string service = std::to_string(port);
    addresses = lookUp(systemCalls(), host, service, AI_NUMERICHOST);
    if (!addresses.empty())
        return IoResult::Done;
    const IoResult result = askOnThread(host, service, limit, addresses);
    return result == IoResult::Done && addresses.empty() ? IoResult::NoAddress : result;
}

} // namespace kyvisa::os
