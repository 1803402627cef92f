// Asks *IDN? through libkyvisa again and again and prints nanoseconds a query: for the comparison with other programs.
//
//     bench-query RESOURCE COUNT

#include <visa.h>

#include <array>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <string_view>

int main(int argc, char **argv)
{
    const int count = argc == 3 ? std::atoi(argv[2]) : 0;
    ViSession manager = VI_NULL;
    ViSession session = VI_NULL;
    if (count <= 0 || viOpenDefaultRM(&manager) < VI_SUCCESS ||
        viOpen(manager, argv[1], VI_NO_LOCK, 5000, &session) < VI_SUCCESS) {
        std::fprintf(stderr, "usage: bench-query RESOURCE COUNT, with a resource that opens\n");
        return 2;
    }
    if (std::string_view(argv[1]).ends_with("SOCKET"))
        viSetAttribute(session, VI_ATTR_TERMCHAR_EN, VI_TRUE);
    std::array<ViByte, 1024> answer{};
    const auto begin = std::chrono::steady_clock::now();
    for (int i = 0; i < count; ++i) {
        ViUInt32 got = 0;
        if (viWrite(session, reinterpret_cast<ViConstBuf>("*IDN?\n"), 6, &got) < VI_SUCCESS ||
            viRead(session, answer.data(), answer.size(), &got) < VI_SUCCESS || got < 10) {
            std::fprintf(stderr, "query %d failed\n", i);
            return 1;
        }
    }
    const std::chrono::duration<double, std::nano> took = std::chrono::steady_clock::now() - begin;
    std::printf("%.1f\n", took.count() / count);
    viClose(manager);
    return 0;
}
