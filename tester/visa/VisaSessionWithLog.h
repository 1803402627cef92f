#pragma once

#include "log/FastBuffer.h"
#include "visa/Attribute.h"

#include <visatype.h>

#include <QElapsedTimer>
#include <QString>

class SessionLog;

/**
 * One VISA session and the resource manager below it: the only place where the program calls the VISA library.
 *
 * Every operation times the library call alone, emits one log line and then throws VisaError for a status that it
 * counts as failure: a negative one in write, read, viPrintf, viScanf and viQueryf, any other than 0 everywhere else.
 * Failed calls are logged too. No text is built while nobody listens.
 *
 * Used by one thread at a time.
 */
class VisaSessionWithLog
{
public:
    explicit VisaSessionWithLog(SessionLog *log); ///< @p log is not owned and may be null
    ~VisaSessionWithLog();
    VisaSessionWithLog(const VisaSessionWithLog &) = delete;
    VisaSessionWithLog &operator=(const VisaSessionWithLog &) = delete;

    ViStatus openRM(); ///< neither timed nor logged, never throws
    void closeRM();    ///< closes the session too, whatever that answers

    void open(char *rsrc, unsigned int mode, unsigned int timeout);
    void closeSession();

    unsigned int write(const char *buf, unsigned int cnt);
    unsigned int write(const char *text);
    unsigned int read(char *buf, unsigned int cnt);
    unsigned int query(const char *wbuf, unsigned int wcnt, char *rbuf, unsigned int rcnt);
    void viPrintf(const char *fmt, ...);
    void viScanf(const char *fmt, ...);
    void viQueryf(const char *writeFmt, const char *readFmt, ...);

    /// @p onSession: the open session's attribute; otherwise, or when none is open, the resource manager's.
    void setAttribute(unsigned int attr, unsigned long value, bool onSession);
    void setAttribute(const Attribute &attribute, bool onSession);
    /// The buffer of a text attribute is allocated on every path, the failing one too.
    void getAttribute(Attribute &attribute, bool onSession);
    void setTimeout(unsigned int ms);

    unsigned short getSTB();
    void trigger(unsigned short protocol);
    void clear();

    void lockExclusive(unsigned int timeout);
    void lockShared(unsigned int timeout, char *requestedKey, char *accessKey);
    void unlock();

    void gpibControlREN(unsigned short mode);
    void gpibConrtolATN(unsigned short mode);
    void gpibSendIFC();
    unsigned int gpibCommand(char *buf, unsigned int cnt);
    void gpibPassControl(unsigned short primAddr, unsigned short secAddr);

    void enableEvent(unsigned int type, unsigned short mech, unsigned int context);
    void disableEvent(unsigned int type, unsigned short mech);
    void discardEvents(unsigned int type, unsigned short mech);
    /// Answers the type of the event. The context belongs to the caller, also when a positive status is thrown; without a
    /// place for it the context is closed here.
    unsigned int waitOnEvent(unsigned int inType, unsigned int timeout, unsigned int *outContext);
    void installHandler(unsigned int type, ViHndlr handler, void *userHandle);
    void uninstallHandler(unsigned int type, ViHndlr handler, void *userHandle);

    unsigned int findRsrc(char *expr, unsigned int *findList, char *instrDesc);
    void findNext(unsigned int findList, char *instrDesc);
    /// Reads the three texts below from a find list. Ends quietly at the first one that the library does not have.
    void getExtendedRsrcInformation(unsigned int handle);

    unsigned int In32(unsigned short space, unsigned long offset);
    void closeObject(unsigned int object);

    QString lxiIdentification; ///< manufacturer, model, serial number and version of the last resource found, joined by
                               ///< commas
    QString lxiDescription;
    QString lxiHostName; ///< without a trailing "."

private:
    bool isLogging() const;
    /// Runs @p call and puts its status and its duration into @p line.
    template <typename Call>
    ViStatus timed(FastBuffer &line, Call call);
    void emitLine(FastBuffer &line, const char *format, ...) __attribute__((format(printf, 3, 4)));
    ViObject attributeHandle(bool onSession) const;

    ViSession m_session = 0; ///< 0 when none is open
    ViSession m_resourceManager = 0;
    SessionLog *m_log;
    QElapsedTimer m_timer; ///< restarted before each library call
    bool m_open = false;   ///< from the first open() until a closeSession() that was logged
};
