#pragma once

#include <visa.h>

#include <functional>
#include <string>
#include <vector>

/// Every operation of the VISA C interface with ordinary arguments, for tests that try each of them.
namespace operations
{

/// What an operation is tried on.
struct Subject {
    ViObject handle = VI_NULL; ///< what is handed to it
    ViSession rm = VI_NULL;
    std::string resource;     ///< something that viOpen accepts
    bool isInterface = false; ///< GPIB INTFC: data goes to those that have been addressed
    std::string file;         ///< may be written and read
};

struct Operation {
    const char *name;
    /// Makes what the operation needs: a question where it reads, a handler where it removes one.
    std::function<void(const Subject &)> prepare;
    std::function<ViStatus(const Subject &)> call;
    bool givesStatus = true; ///< viPeek and viPoke return nothing
};

/// In the order of their names.
const std::vector<Operation> &all();

/// The names that the library exports, from the list that its symbols are compared with.
std::vector<std::string> exportedNames();

/// "VI_ERROR_NSUP_OPER", as tables write it.
std::string statusName(ViStatus status);

} // namespace operations
