/*
 * Asks an instrument a question and prints its answer.
 *
 *     query [RESOURCE [QUESTION]]
 *
 * RESOURCE is a VISA resource name or an alias of the configuration file; without it, the simulator's on this machine.
 */
#include <visa.h>

#include <stdio.h>
#include <string.h>

/* Says what went wrong, in the library's words. */
static int failed(ViObject object, const char *what, ViStatus status)
{
    char text[256];
    viStatusDesc(object, status, text);
    fprintf(stderr, "%s: %s\n", what, text);
    return 1;
}

int main(int argc, char **argv)
{
    const char *resource = argc > 1 ? argv[1] : "TCPIP::localhost::hislip0::INSTR";
    const char *question = argc > 2 ? argv[2] : "*IDN?";
    char message[1024];
    char answer[1024];
    ViSession manager;
    ViSession instrument;
    ViUInt32 count = 0;
    ViStatus status;

    status = viOpenDefaultRM(&manager);
    if (status < VI_SUCCESS)
        return failed(VI_NULL, "viOpenDefaultRM", status);
    status = viOpen(manager, resource, VI_NO_LOCK, 5000, &instrument);
    if (status < VI_SUCCESS) {
        failed(manager, resource, status);
        viClose(manager);
        return 1;
    }
    viSetAttribute(instrument, VI_ATTR_TMO_VALUE, 5000);
    /* A raw socket does not tell where an answer ends: its line feed does. Elsewhere it changes nothing. */
    viSetAttribute(instrument, VI_ATTR_TERMCHAR_EN, VI_TRUE);

    snprintf(message, sizeof message, "%s\n", question);
    status = viWrite(instrument, (ViConstBuf)message, (ViUInt32)strlen(message), &count);
    if (status < VI_SUCCESS) {
        failed(instrument, "viWrite", status);
    } else {
        /* An answer that is longer than the place for it comes in pieces: VI_SUCCESS_MAX_CNT says that there is more. */
        do {
            status = viRead(instrument, (ViPBuf)answer, sizeof answer, &count);
            if (status < VI_SUCCESS)
                failed(instrument, "viRead", status);
            else
                fwrite(answer, 1, count, stdout);
        } while (status == VI_SUCCESS_MAX_CNT);
    }
    viClose(instrument);
    viClose(manager);
    return status < VI_SUCCESS;
}
