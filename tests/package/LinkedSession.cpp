// A small program on the logged session, linked the way KyVisaTester is: what happens when the library is exchanged.
#include "pipeline/VisaError.h"
#include "visa/VisaSessionWithLog.h"

#include <cstdio>

int main()
{
    VisaSessionWithLog session(nullptr);
    char name[] = "TCPIP::localhost::hislip0";
    char answer[101] = {};
    try {
        session.open(name, 0, 2000);
        session.write("*IDN?\n");
        std::printf("%.*s", static_cast<int>(session.read(answer, 100)), answer);
        session.closeSession();
    } catch (const VisaError &error) {
        std::printf("%s\n", VisaError::StatusCode(error.getStatus()));
        return 1;
    }
    return 0;
}
