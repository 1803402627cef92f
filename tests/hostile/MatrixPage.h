#pragma once

#include <map>
#include <string>
#include <vector>

namespace hostile
{

/// The table of one way in docs/fault-matrix.md, as it stands there.
struct MatrixTable {
    std::vector<std::string> faults;
    std::vector<std::string> operations;
    std::map<std::string, std::map<std::string, std::string>>
        cells; ///< by fault, then operation: without the number of a reason
};

/// Throws std::runtime_error when the page has no such table, or a row of it is not whole.
MatrixTable readMatrix(const std::string &page, const std::string &way);

} // namespace hostile
