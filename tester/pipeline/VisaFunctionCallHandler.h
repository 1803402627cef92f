#pragma once

#include "pipeline/VisaFunctionCall.h"

#include <QSemaphore>

#include <pthread.h>

#include <array>
#include <atomic>
#include <list>
#include <mutex>
#include <vector>

class VisaDispatcher;

/**
 * The only meeting point of the user-interface thread and a session's worker thread.
 *
 *     user interface                                        worker (and test threads, for completions)
 *     sendVisaFunctionCall ──> request ring (1024) ──────> getVisaFunctionCall   (blocks while empty)
 *     getFinishedVisaFunctionCall <── result ring (4096) <── VisaFunctionCallFinshed (waits while full)
 *
 * A locking request is refused while another one is outstanding; any finished call and any non-locking request end that
 * state. Both rings are arrays inside the handler: passing a call copies a record and allocates nothing but the strings
 * in it. The handler is therefore large and lives on the heap.
 *
 * close() is final: takers wake and get false, results are dropped, a producer that waits for room gives up.
 *
 * Listeners come and go on the user-interface thread, also in the middle of a delivery and while results are being
 * distributed: one that was detached is blanked in the copies that still wait and gets no new ones. The dispatcher and
 * every producer's thread outlive their use of the handler: end the worker before destroying it.
 */
class VisaFunctionCallHandler
{
public:
    static constexpr unsigned RequestCapacity = 1024;
    static constexpr unsigned ResultCapacity = 4096;

    explicit VisaFunctionCallHandler(VisaDispatcher *dispatcher);
    ~VisaFunctionCallHandler();
    VisaFunctionCallHandler(const VisaFunctionCallHandler &) = delete;
    VisaFunctionCallHandler &operator=(const VisaFunctionCallHandler &) = delete;

    /// Queues a request. False when @p lock is set and a locking request is outstanding, or when the ring is full.
    bool sendVisaFunctionCall(const _visaFunctionCall &call, bool lock);
    /// Worker thread: takes the next request, waiting for one. False once the handler is closed.
    bool getVisaFunctionCall(_visaFunctionCall &call);
    /// Worker and test threads: copies a result to every listener of its kind, then to every listener of All.
    void VisaFunctionCallFinshed(_visaFunctionCall &call);
    /// Takes the next result without waiting. False when there is none or the handler is closed.
    bool getFinishedVisaFunctionCall(finsihedFunctionCall &finished);
    /// Results that wait at this moment.
    unsigned finishedCount() const;
    /// Tells the listeners of All that a call started.
    void VisaFunctionCallStart(const VisaFunctionCallTyp &type);

    void addVisaFunctionCallHandlerListener(_VisaFunctionCallHandlerListener *listener);
    /// Detaches @p listener and tells it so by removeHandler(), also when it was not attached.
    bool removeVisaFunctionCallHandlerListener(_VisaFunctionCallHandlerListener *listener);
    /// Drops every trace of @p listener without telling it.
    void forgetListener(_VisaFunctionCallHandlerListener *listener);
    /// False when @p type is above 41 or the listener is registered for it already.
    bool addVisaFunctionCallListener(_VisaFunctionCallHandlerListener *listener, VisaFunctionCallTyp type);
    bool removeVisaFunctionCallListener(_VisaFunctionCallHandlerListener *listener, VisaFunctionCallTyp type);

    void close();

private:
    bool isRegistered(const _VisaFunctionCallHandlerListener *listener, VisaFunctionCallTyp type) const;
    bool distribute(const _visaFunctionCall &call, VisaFunctionCallTyp listenersOf);
    void wakeDispatcher();
    void blankWaitingResults(const _VisaFunctionCallHandlerListener *listener);

    std::atomic<bool> m_lock{false};                                        ///< a locking request is outstanding
    std::list<_VisaFunctionCallHandlerListener *> m_handlerListeners;       ///< not owned, in order of attachment
    std::vector<std::list<_VisaFunctionCallHandlerListener *>> m_listeners; ///< not owned, by kind
    /// Guards m_listeners against the threads that distribute. Never held while waiting or calling out.
    mutable std::mutex m_listenersMutex;

    std::array<_visaFunctionCall, RequestCapacity> m_calls;
    unsigned m_callWrite = 0;
    unsigned m_callRead = 0;
    std::atomic<unsigned> m_callCount{0};

    std::array<finsihedFunctionCall, ResultCapacity> m_finished;
    unsigned m_finishedWrite = 0;
    unsigned m_finishedRead = 0;
    std::atomic<unsigned> m_finishedCount{0};

    VisaDispatcher *m_dispatcher;    ///< not owned; without one, results wait until they are taken
    QSemaphore m_callSemaphore;      ///< one permit a queued request
    pthread_mutex_t m_finishedMutex; ///< process-shared; serialises the producers of results
    std::atomic<bool> m_closed{false};
};
