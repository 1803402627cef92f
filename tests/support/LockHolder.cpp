// A program beside the one under test that holds a lock: opens the resource, takes the lock, says which key it was given, and
// holds on until its input ends.
//   lock-holder RESOURCE exclusive|shared [KEY]
#include <visa.h>

#include <cstdio>
#include <cstring>

int main(int argc, char **argv)
{
    if (argc < 3)
        return 2;
    const bool shared = std::strcmp(argv[2], "shared") == 0;
    const char *wanted = argc > 3 ? argv[3] : nullptr;
    ViSession manager = VI_NULL;
    ViSession session = VI_NULL;
    char key[VI_FIND_BUFLEN] = "";
    ViStatus status = viOpenDefaultRM(&manager);
    if (status == VI_SUCCESS)
        status = viOpen(manager, argv[1], VI_NO_LOCK, 5000, &session);
    if (status == VI_SUCCESS && shared)
        status = viLock(session, VI_SHARED_LOCK, 5000, wanted, key);
    else if (status == VI_SUCCESS)
        status = viLock(session, VI_EXCLUSIVE_LOCK, 5000, nullptr, nullptr);
    if (status != VI_SUCCESS) {
        std::printf("failed %08lX\n", static_cast<unsigned long>(static_cast<ViUInt32>(status)));
        return 1;
    }
    std::printf("holds %s\n", key);
    std::fflush(stdout);
    while (std::getchar() != EOF) {
    }
    viClose(manager); // and with it the lock
    return 0;
}
