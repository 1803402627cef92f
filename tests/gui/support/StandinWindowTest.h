#pragma once

#include "gui/support/WindowTest.h"

#include "support/standin/Standin.h"

#include <string>

/// A window on the scripted VISA library.
class StandinWindowTest : public WindowTest
{
protected:
    StandinWindowTest() { standin::reset(); }

    /// Runs the event loop until the library's operation was called that often.
    static bool called(const std::string &operation, std::size_t count)
    {
        return eventually([&] { return standin::calls(operation).size() >= count; });
    }

    bool statusIs(const QString &name)
    {
        return eventually([&] { return text("statusLabel") == "Status: " + name; });
    }

    /// Connects to a resource by hand and waits until the basic page's follow-up call has been delivered too.
    void connectSession()
    {
        enter("resourceName", "TCPIP::localhost::hislip0");
        press("resourceConnect");
        // The follow-up call has the same status as the open; its line in the log tells them apart.
        ASSERT_TRUE(
            eventually([this] { return logRow("viSetAttribute(vi= 2,type= VI_ATTR_SEND_END_EN,value= 0x1)") >= 0; }));
        ASSERT_TRUE(statusIs("VI_SUCCESS"));
    }
};
