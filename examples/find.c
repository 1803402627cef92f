/*
 * Lists the resources that match an expression, with what the instruments in the LAN say of themselves.
 *
 *     find [EXPRESSION [METHODS [MILLISECONDS]]]
 *
 * METHODS is a sum: 4 asks by mDNS, 2 by VXI-11, 0 leaves the network alone.
 */
#include <visa.h>

#include <locale.h>
#include <stdio.h>
#include <stdlib.h>

static void print_text(ViFindList list, ViAttr attribute, const char *name)
{
    char text[256];
    if (viGetAttribute(list, attribute, text) == VI_SUCCESS)
        printf("    %s: %s\n", name, text);
}

static void print_resource(ViFindList list, const char *resource)
{
    printf("%s\n", resource);
    print_text(list, VI_KY_ATTR_LXI_MANF, "manufacturer");
    print_text(list, VI_KY_ATTR_LXI_MODEL, "model");
    print_text(list, VI_KY_ATTR_LXI_SERIAL, "serial number");
    print_text(list, VI_KY_ATTR_LXI_VERSION, "firmware");
    print_text(list, VI_KY_ATTR_LXI_DESCRIPTION, "description");
    print_text(list, VI_KY_ATTR_LXI_HOSTNAME, "host");
}

int main(int argc, char **argv)
{
    ViSession manager;
    ViFindList list;
    ViUInt32 count;
    char resource[VI_FIND_BUFLEN];

    setlocale(LC_ALL, ""); /* the user's: names and numbers of the library do not depend on it */
    if (viOpenDefaultRM(&manager) < VI_SUCCESS)
        return 1;
    if (argc > 2)
        viSetAttribute(manager, VI_KY_ATTR_TCPIP_FIND_RSRC_MODE, (ViAttrState)atoi(argv[2]));
    if (argc > 3)
        viSetAttribute(manager, VI_KY_ATTR_TCPIP_FIND_RSRC_TMO, (ViAttrState)atoi(argv[3]));

    ViStatus status = viFindRsrc(manager, argc > 1 ? argv[1] : "?*", &list, &count, resource);
    if (status < VI_SUCCESS) {
        char text[256];
        viStatusDesc(manager, status, text);
        fprintf(stderr, "%s\n", text);
    } else {
        do
            print_resource(list, resource);
        while (viFindNext(list, resource) == VI_SUCCESS);
    }
    viClose(manager);
    return status < VI_SUCCESS;
}
