/* A program of somebody who has installed libkyvisa: asks the instrument ARGUMENT who it is. */
#include <visa.h>

#include <stdio.h>

int main(int argc, char **argv)
{
    ViSession manager;
    ViSession instrument;
    ViChar answer[256] = "";
    ViStatus status = viOpenDefaultRM(&manager);
    if (argc != 2 || status < VI_SUCCESS)
        return 2;
    status = viOpen(manager, argv[1], VI_NULL, 20000, &instrument);
    if (status >= VI_SUCCESS)
        status = viSetAttribute(instrument, VI_ATTR_TMO_VALUE, 20000);
    if (status >= VI_SUCCESS) /* a raw socket has no other end of an answer than its line feed */
        status = viSetAttribute(instrument, VI_ATTR_TERMCHAR_EN, VI_TRUE);
    if (status >= VI_SUCCESS)
        status = viQueryf(instrument, "*IDN?\n", "%t", answer);
    printf("%s", answer);
    viClose(manager);
    return status < VI_SUCCESS;
}
