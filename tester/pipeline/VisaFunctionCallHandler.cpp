#include "pipeline/VisaFunctionCallHandler.h"

#include "pipeline/VisaDispatcher.h"
#include "pipeline/VisaFunctionCallListener.h"

#include <visa.h>

#include <QVarLengthArray>

#include <algorithm>
#include <new>
#include <thread>
#include <utility>

namespace
{
constexpr std::size_t ListenerLists = 100;
constexpr int ClosingPermits = 100;

// Copies of a listener list stay on the stack: passing a call allocates nothing for them.
using Snapshot = QVarLengthArray<_VisaFunctionCallHandlerListener *, 64>;

bool isCallKind(VisaFunctionCallTyp type)
{
    return type < VisaFunctionCallTyp::End;
}

std::size_t indexOf(VisaFunctionCallTyp type)
{
    return static_cast<std::size_t>(type);
}

class PosixLock
{
public:
    explicit PosixLock(pthread_mutex_t &mutex) : m_mutex(mutex) { pthread_mutex_lock(&m_mutex); }
    ~PosixLock() { pthread_mutex_unlock(&m_mutex); }
    PosixLock(const PosixLock &) = delete;
    PosixLock &operator=(const PosixLock &) = delete;

private:
    pthread_mutex_t &m_mutex;
};

Snapshot copyOf(const std::list<_VisaFunctionCallHandlerListener *> &listeners, std::mutex &mutex)
{
    Snapshot snapshot;
    const std::lock_guard guard(mutex);
    for (auto *listener : listeners)
        snapshot.append(listener);
    return snapshot;
}

/// A result that does not fit into memory once more is delivered as a failure without texts, rather than not at all.
void copyResult(const _visaFunctionCall &from, _visaFunctionCall &to)
{
    try {
        to = from;
    } catch (const std::bad_alloc &) {
        to = {};
        to.type = from.type;
        to.status = from.status < 0 ? from.status : VI_ERROR_ALLOC;
    }
}
} // namespace

VisaFunctionCallHandler::VisaFunctionCallHandler(VisaDispatcher *dispatcher)
    : m_listeners(ListenerLists), m_dispatcher(dispatcher)
{
    pthread_mutexattr_t attributes;
    pthread_mutexattr_init(&attributes);
    pthread_mutexattr_setpshared(&attributes, PTHREAD_PROCESS_SHARED);
    pthread_mutex_init(&m_finishedMutex, &attributes);
    pthread_mutexattr_destroy(&attributes);
}

VisaFunctionCallHandler::~VisaFunctionCallHandler()
{
    if (m_dispatcher)
        m_dispatcher->forget(this);
    // One at a time: what removeHandler() does may detach others.
    while (!m_handlerListeners.empty()) {
        auto *listener = m_handlerListeners.front();
        m_handlerListeners.pop_front();
        listener->removeHandler();
    }
    pthread_mutex_destroy(&m_finishedMutex);
}

bool VisaFunctionCallHandler::sendVisaFunctionCall(const _visaFunctionCall &call, bool lock)
{
    if (m_lock.load(std::memory_order_relaxed) && lock)
        return false;
    const unsigned count = m_callCount.load(std::memory_order_acquire);
    // Before the test of the capacity: a refused request sets or clears the flag, too.
    m_lock.store(lock, std::memory_order_relaxed);
    if (count >= RequestCapacity)
        return false;

    m_calls[m_callWrite] = call;
    m_callWrite = (m_callWrite + 1) % RequestCapacity;
    m_callCount.fetch_add(1, std::memory_order_release);
    m_callSemaphore.release();
    VisaFunctionCallStart(call.type);
    return true;
}

bool VisaFunctionCallHandler::getVisaFunctionCall(_visaFunctionCall &call)
{
    // close() grants a limited number of permits; a taker that comes later must not wait for one.
    if (m_closed.load(std::memory_order_acquire))
        return false;
    m_callSemaphore.acquire();
    if (m_closed.load(std::memory_order_acquire))
        return false;

    m_callCount.load(std::memory_order_acquire); // pairs with the increment that published the slot
    // A slot that was taken keeps no memory: a thousand large writes would stay for ever.
    call = std::exchange(m_calls[m_callRead], {});
    m_callRead = (m_callRead + 1) % RequestCapacity;
    m_callCount.fetch_sub(1, std::memory_order_release);
    return true;
}

void VisaFunctionCallHandler::VisaFunctionCallFinshed(_visaFunctionCall &call)
{
    if (m_closed.load(std::memory_order_acquire))
        return;
    const PosixLock guard(m_finishedMutex);
    m_lock.store(false, std::memory_order_relaxed);
    // A listener of the kind and of All gets two copies.
    if (!distribute(call, call.type) || !distribute(call, VisaFunctionCallTyp::All))
        return;
    // Once more: a request that was refused meanwhile has set it again.
    m_lock.store(false, std::memory_order_relaxed);
    wakeDispatcher();
}

bool VisaFunctionCallHandler::distribute(const _visaFunctionCall &call, VisaFunctionCallTyp listenersOf)
{
    if (!isCallKind(listenersOf))
        return true;
    for (auto *listener : copyOf(m_listeners[indexOf(listenersOf)], m_listenersMutex)) {
        while (m_finishedCount.load(std::memory_order_acquire) >= ResultCapacity &&
               !m_closed.load(std::memory_order_acquire)) {
            wakeDispatcher();
            std::this_thread::yield();
        }
        if (m_closed.load(std::memory_order_acquire))
            return false;

        finsihedFunctionCall &slot = m_finished[m_finishedWrite];
        copyResult(call, slot.call);
        slot.listener = listener;
        // Publishing under the lock: either the listener is found to be gone here, or detaching it finds this copy.
        const std::lock_guard guard(m_listenersMutex);
        if (!isRegistered(listener, listenersOf))
            continue;
        m_finishedWrite = (m_finishedWrite + 1) % ResultCapacity;
        m_finishedCount.fetch_add(1);
    }
    return true;
}

void VisaFunctionCallHandler::wakeDispatcher()
{
    if (m_dispatcher)
        m_dispatcher->startWorking(this);
}

bool VisaFunctionCallHandler::getFinishedVisaFunctionCall(finsihedFunctionCall &finished)
{
    if (m_closed.load(std::memory_order_acquire) || m_finishedCount.load(std::memory_order_acquire) == 0)
        return false;
    finished = std::exchange(m_finished[m_finishedRead], {});
    m_finishedRead = (m_finishedRead + 1) % ResultCapacity;
    m_finishedCount.fetch_sub(1, std::memory_order_release);
    return true;
}

unsigned VisaFunctionCallHandler::finishedCount() const
{
    // Sequentially consistent, like the dispatcher's flag: a producer that found the flag set has its results seen here.
    return m_finishedCount.load();
}

void VisaFunctionCallHandler::VisaFunctionCallStart(const VisaFunctionCallTyp &type)
{
    // A listener may detach itself or others, so each is looked up again.
    for (auto *attached : copyOf(m_listeners[indexOf(VisaFunctionCallTyp::All)], m_listenersMutex)) {
        {
            const std::lock_guard guard(m_listenersMutex);
            if (!isRegistered(attached, VisaFunctionCallTyp::All))
                continue;
        }
        if (auto *listener = dynamic_cast<VisaFunctionCallListener *>(attached))
            listener->newVisaCallStarted(type);
    }
}

void VisaFunctionCallHandler::addVisaFunctionCallHandlerListener(_VisaFunctionCallHandlerListener *listener)
{
    const auto end = m_handlerListeners.end();
    if (listener && std::find(m_handlerListeners.begin(), end, listener) == end)
        m_handlerListeners.push_back(listener);
}

bool VisaFunctionCallHandler::removeVisaFunctionCallHandlerListener(_VisaFunctionCallHandlerListener *listener)
{
    forgetListener(listener);
    if (listener)
        listener->removeHandler();
    return true;
}

void VisaFunctionCallHandler::forgetListener(_VisaFunctionCallHandlerListener *listener)
{
    m_handlerListeners.remove(listener);
    // The listener may be gone a moment from now: nothing may reach it any more, however it was registered.
    const std::lock_guard guard(m_listenersMutex);
    for (auto &listeners : m_listeners)
        listeners.remove(listener);
    blankWaitingResults(listener);
}

void VisaFunctionCallHandler::blankWaitingResults(const _VisaFunctionCallHandlerListener *listener)
{
    const unsigned count = m_finishedCount.load(std::memory_order_acquire);
    for (unsigned i = 0; i < count; ++i) {
        finsihedFunctionCall &slot = m_finished[(m_finishedRead + i) % ResultCapacity];
        if (slot.listener == listener)
            slot.listener = nullptr;
    }
}

bool VisaFunctionCallHandler::addVisaFunctionCallListener(_VisaFunctionCallHandlerListener *listener,
                                                          VisaFunctionCallTyp type)
{
    if (!listener || !isCallKind(type))
        return false;
    const std::lock_guard guard(m_listenersMutex);
    if (isRegistered(listener, type))
        return false;
    m_listeners[indexOf(type)].push_back(listener);
    return true;
}

bool VisaFunctionCallHandler::removeVisaFunctionCallListener(_VisaFunctionCallHandlerListener *listener,
                                                             VisaFunctionCallTyp type)
{
    if (!isCallKind(type))
        return false;
    const std::lock_guard guard(m_listenersMutex);
    m_listeners[indexOf(type)].remove(listener);
    return true;
}

bool VisaFunctionCallHandler::isRegistered(const _VisaFunctionCallHandlerListener *listener,
                                           VisaFunctionCallTyp type) const
{
    const auto &listeners = m_listeners[indexOf(type)];
    return std::find(listeners.begin(), listeners.end(), listener) != listeners.end();
}

void VisaFunctionCallHandler::close()
{
    m_closed.store(true, std::memory_order_release);
    m_callSemaphore.release(ClosingPermits);
}
