#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <memory>
#include <vector>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size);

namespace
{

/// Hands the target a block of exactly this size, so that the address sanitizer sees a read behind its end.
void replay(const std::vector<char> &input, std::size_t size)
{
    const std::unique_ptr<std::uint8_t[]> exact(new std::uint8_t[size]);
    std::copy_n(input.begin(), size, exact.get());
    LLVMFuzzerTestOneInput(exact.get(), size);
}

} // namespace

int main(int argc, char **argv)
{
    if (argc != 2) {
        std::fprintf(stderr, "usage: %s CORPUS_FOLDER\n", argv[0]);
        return 2;
    }
    std::error_code error;
    std::size_t inputs = 0;
    for (const auto &entry : std::filesystem::directory_iterator(argv[1], error)) {
        std::ifstream file(entry.path(), std::ios::binary);
        const std::vector<char> input{std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
        if (!file) {
            std::fprintf(stderr, "cannot read %s\n", entry.path().c_str());
            return 1;
        }
        // Printed before, so that the last line of a crash names its input.
        std::printf("%s, %zu bytes\n", entry.path().filename().c_str(), input.size());
        std::fflush(stdout);
        for (std::size_t size = 0; size <= input.size(); ++size)
            replay(input, size);
        ++inputs;
    }
    if (error || inputs == 0) {
        std::fprintf(stderr, "nothing to replay in %s\n", argv[1]);
        return 1;
    }
    return 0;
}
