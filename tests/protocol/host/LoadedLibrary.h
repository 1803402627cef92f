#pragma once

#include "HostCheck.h"

#include <visa.h>

#include <dlfcn.h>
#include <string>
#include <string_view>

namespace host
{

/// The library as a program has it that was not linked with it.
class LoadedLibrary
{
public:
    explicit LoadedLibrary(const char *path) : m_library(::dlopen(path, RTLD_NOW | RTLD_LOCAL))
    {
        if (!m_library)
            std::fprintf(stderr, "%s\n", ::dlerror());
        CHECK(m_library);
        find(openManager, "viOpenDefaultRM");
        find(open, "viOpen");
        find(close, "viClose");
        find(write, "viWrite");
        find(read, "viRead");
        find(set, "viSetAttribute");
        find(lock, "viLock");
        find(unlock, "viUnlock");
        find(enable, "viEnableEvent");
        find(wait, "viWaitOnEvent");
    }
    void unload() const { CHECK(::dlclose(m_library) == 0); }

    /// A session with service requests enabled where the protocol has them: then the library has a thread of its own.
    ViSession openSession(ViSession manager, const std::string &name) const
    {
        ViSession session = VI_NULL;
        CHECK_STATUS(open(manager, name.c_str(), VI_NO_LOCK, 60000, &session), VI_SUCCESS);
        CHECK_STATUS(set(session, VI_ATTR_TMO_VALUE, 60000), VI_SUCCESS);
        if (name.ends_with("::SOCKET"))
            CHECK_STATUS(set(session, VI_ATTR_TERMCHAR_EN, VI_TRUE), VI_SUCCESS);
        else
            CHECK_STATUS(enable(session, VI_EVENT_SERVICE_REQ, VI_QUEUE, VI_NULL), VI_SUCCESS);
        return session;
    }
    ViStatus query(ViSession session, std::string_view question, std::string &answer) const
    {
        answer.assign(256, '\0');
        ViUInt32 count = 0;
        ViStatus status = write(session, reinterpret_cast<ViConstBuf>(question.data()),
                                static_cast<ViUInt32>(question.size()), nullptr);
        if (status >= VI_SUCCESS)
            status = read(session, reinterpret_cast<ViPBuf>(answer.data()), 256, &count);
        answer.resize(count);
        return status;
    }
    void checkAnswer(ViSession session, int number) const
    {
        const std::string text = std::to_string(number);
        std::string answer;
        CHECK(query(session, "*ESE " + text + ";*ESE?\n", answer) >= VI_SUCCESS);
        CHECK(answer == text + "\n");
    }

    decltype(&viOpenDefaultRM) openManager;
    decltype(&viOpen) open;
    decltype(&viClose) close;
    decltype(&viWrite) write;
    decltype(&viRead) read;
    decltype(&viSetAttribute) set;
    decltype(&viLock) lock;
    decltype(&viUnlock) unlock;
    decltype(&viEnableEvent) enable;
    decltype(&viWaitOnEvent) wait;

private:
    template <typename Function>
    void find(Function &function, const char *name)
    {
        function = reinterpret_cast<Function>(::dlsym(m_library, name));
        CHECK(function);
    }

    void *m_library;
};

} // namespace host
