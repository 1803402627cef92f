#include "hostile/MatrixPage.h"

#include <fstream>
#include <sstream>
#include <stdexcept>

namespace hostile
{
namespace
{

/// The cells of a row "| a | b |", blanks around them and the number of a reason taken off.
std::vector<std::string> cellsOf(const std::string &row)
{
    std::vector<std::string> cells;
    std::istringstream in(row.substr(1));
    for (std::string cell; std::getline(in, cell, '|');) {
        const std::size_t first = cell.find_first_not_of(' ');
        const std::size_t last = cell.find_last_not_of(' ', cell.find('[') - 1);
        cells.push_back(first == std::string::npos ? std::string() : cell.substr(first, last - first + 1));
    }
    return cells;
}

} // namespace

MatrixTable readMatrix(const std::string &page, const std::string &way)
{
    std::ifstream in(page);
    std::string line;
    while (std::getline(in, line) && line != "## " + way) {
    }
    while (std::getline(in, line) && line.empty()) {
    }
    if (!line.starts_with("| operation"))
        throw std::runtime_error(page + " has no table of " + way);
    MatrixTable table;
    table.faults = cellsOf(line);
    table.faults.erase(table.faults.begin());
    std::getline(in, line); // |---|
    while (std::getline(in, line) && line.starts_with('|')) {
        const std::vector<std::string> cells = cellsOf(line);
        if (cells.size() != table.faults.size() + 1)
            throw std::runtime_error("not a whole row: " + line);
        table.operations.push_back(cells[0]);
        for (std::size_t i = 1; i < cells.size(); ++i) {
            if (cells[i].empty())
                throw std::runtime_error("an empty cell: " + line);
            table.cells[table.faults[i - 1]][cells[0]] = cells[i];
        }
    }
    return table;
}

} // namespace hostile
