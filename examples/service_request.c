/*
 * Lets the instrument say when it has finished, instead of asking it again and again.
 *
 *     service_request [RESOURCE]
 *
 * HiSLIP, VXI-11 and GPIB carry service requests; raw sockets and serial ports do not.
 */
#include <visa.h>

#include <stdio.h>

int main(int argc, char **argv)
{
    const char *resource = argc > 1 ? argv[1] : "TCPIP::localhost::hislip0::INSTR";
    ViSession manager;
    ViSession instrument;
    ViEvent event;
    ViEventType type;
    ViUInt16 byte = 0;
    ViInt32 events = 0;
    ViStatus status;

    if (viOpenDefaultRM(&manager) < VI_SUCCESS)
        return 1;
    status = viOpen(manager, resource, VI_NO_LOCK, 5000, &instrument);
    if (status >= VI_SUCCESS)
        status = viEnableEvent(instrument, VI_EVENT_SERVICE_REQ, VI_QUEUE, VI_NULL);
    /* "Operation complete" goes into the event status byte, that into the status byte, and that requests service. */
    if (status >= VI_SUCCESS)
        status = viPrintf(instrument, "*CLS;*ESE 1;*SRE 32\n");
    if (status >= VI_SUCCESS)
        status = viPrintf(instrument, "INIT;*OPC\n");
    if (status >= VI_SUCCESS)
        status = viWaitOnEvent(instrument, VI_EVENT_SERVICE_REQ, 10000, &type, &event);
    if (status >= VI_SUCCESS) {
        viClose(event);
        /* The poll takes the request back; reading the event status clears its cause. */
        status = viReadSTB(instrument, &byte);
    }
    if (status >= VI_SUCCESS)
        status = viQueryf(instrument, "*ESR?\n", "%d", &events);
    if (status >= VI_SUCCESS) {
        printf("status byte 0x%02X, event status %d\n", (unsigned)byte, (int)events);
    } else {
        char text[256];
        viStatusDesc(manager, status, text);
        fprintf(stderr, "%s: %s\n", resource, text);
    }
    viClose(manager); /* closes what was opened through it */
    return status < VI_SUCCESS;
}
