/*
 * Fetches a record of an oscilloscope as a binary block of 32-bit floating point numbers.
 *
 *     block [RESOURCE [CHANNEL]]
 *
 * The simulator is one with --profile oscilloscope.
 */
#include <visa.h>

#include <stdio.h>
#include <stdlib.h>

#define MOST_POINTS 1000000L

int main(int argc, char **argv)
{
    const char *resource = argc > 1 ? argv[1] : "TCPIP::localhost::hislip0::INSTR";
    const int channel = argc > 2 ? atoi(argv[2]) : 1;
    float *record = malloc(MOST_POINTS * sizeof *record);
    long count = MOST_POINTS; /* room before the call, points after it */
    double step = 0;
    ViSession manager;
    ViSession instrument;
    ViStatus status;

    if (!record || viOpenDefaultRM(&manager) < VI_SUCCESS)
        return 1;
    status = viOpen(manager, resource, VI_NO_LOCK, 5000, &instrument);
    if (status >= VI_SUCCESS)
        status = viPrintf(instrument, "FORM:DATA REAL;:ACQ:POIN %d\n", 5000);
    if (status >= VI_SUCCESS)
        status = viQueryf(instrument, "WAV%d:XINC?\n", "%lf", channel, &step);
    /* %b takes an IEEE 488.2 block, z makes floats of it: the bytes of the block are in the order of the network. */
    if (status >= VI_SUCCESS)
        status = viQueryf(instrument, "WAV%d:DATA?\n", "%#zb", channel, &count, record);
    if (status >= VI_SUCCESS) {
        float lowest = count > 0 ? record[0] : 0;
        float highest = lowest;
        long i;
        for (i = 1; i < count; ++i) {
            lowest = record[i] < lowest ? record[i] : lowest;
            highest = record[i] > highest ? record[i] : highest;
        }
        printf("%ld points, %g s apart, from %g V to %g V\n", count, step, (double)lowest, (double)highest);
    } else {
        char text[256];
        viStatusDesc(manager, status, text);
        fprintf(stderr, "%s: %s\n", resource, text);
    }
    viClose(manager);
    free(record);
    return status < VI_SUCCESS;
}
