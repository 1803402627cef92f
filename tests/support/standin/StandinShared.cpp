// As a shared library, the stand-in has no test inside the process to obey: the environment says what to do.
#include "support/standin/StandinState.h"

#include <cstdlib>
#include <cstring>

#include <fcntl.h>
#include <unistd.h>

namespace
{

/// True when the comma-separated @p list names @p operation.
bool lists(const char *list, const char *operation)
{
    const std::string all = std::string(",") + (list != nullptr ? list : "") + ",";
    return all.find(std::string(",") + operation + ",") != std::string::npos;
}

void trace(const char *operation)
{
    const char *path = std::getenv("STANDIN_TRACE");
    if (path == nullptr)
        return;
    const int file = open(path, O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0600);
    if (file < 0)
        return;
    const std::string line = std::string(operation) + "\n";
    // A trace that cannot be written shows as a missing line in the test that reads it.
    [[maybe_unused]] const ssize_t written = write(file, line.data(), line.size());
    close(file);
}

} // namespace

void standin::entered(const char *operation)
{
    trace(operation);
    if (lists(std::getenv("STANDIN_BLOCK"), operation))
        for (;;)
            pause();
}
