// Each operation of the interface on each kind of session, against the simulator, compared with the table for users.
#include "Operations.h"
#include "support/SimulatorProcess.h"

#include <visa.h>

#include <algorithm>
#include <array>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <gtest/gtest.h>
#include <map>
#include <sstream>
#include <string>
#include <unistd.h>
#include <vector>

using operations::Operation;
using operations::Subject;

namespace
{

constexpr std::size_t KindCount = 7;
// The columns of docs/operations.md.
constexpr std::array<const char *, KindCount> Kinds = {"RM",        "SOCKET",    "HiSLIP", "VXI-11",
                                                       "GPIBINSTR", "GPIBINTFC", "ASRL"};

std::string trimmed(std::string text)
{
    text.erase(0, text.find_first_not_of(" `"));
    text.erase(text.find_last_not_of(" `") + 1);
    return text;
}

/// The rows of the document: operation, then a cell a kind.
std::map<std::string, std::vector<std::string>> documentedRows()
{
    std::map<std::string, std::vector<std::string>> rows;
    std::ifstream document(OPERATION_DOCUMENT);
    for (std::string line; std::getline(document, line);) {
        if (!line.starts_with("| `vi"))
            continue;
        std::vector<std::string> cells;
        std::istringstream parts(line.substr(1));
        for (std::string cell; std::getline(parts, cell, '|');)
            cells.push_back(trimmed(cell));
        const std::string name = cells.front();
        cells.erase(cells.begin());
        EXPECT_TRUE(rows.emplace(name, cells).second) << name << " twice";
    }
    return rows;
}

class OperationTable : public testing::TestWithParam<std::size_t>
{
protected:
    OperationTable()
    {
        std::ofstream(m_configuration) << "[KYGPIB-GATEWAYS]\nBoard0 = TCPIP::127.0.0.1::gpib0\n";
        ::setenv("KYVISA_CONFIG", m_configuration.c_str(), 1);
        ::setenv("KYVISA_PORTMAPPER_PORT", m_simulator.resource("portmapper").c_str(), 1);
    }
    ~OperationTable() override
    {
        std::filesystem::remove(m_configuration);
        std::filesystem::remove(m_configuration + ".data");
    }

    std::string kind() const { return Kinds[GetParam()]; }
    std::string resource() const
    {
        const std::map<std::string, std::string> services = {
            {"RM", "hislip"}, {"SOCKET", "socket"}, {"HiSLIP", "hislip"}, {"VXI-11", "vxi11"}, {"ASRL", "serial"}};
        if (kind() == "GPIBINSTR")
            return "GPIB0::5::INSTR";
        return kind() == "GPIBINTFC" ? "GPIB0::INTFC" : m_simulator.resource(services.at(kind()));
    }

    /// The status of an operation on a session of its own.
    std::string tried(const Operation &operation)
    {
        Subject subject;
        EXPECT_EQ(viOpenDefaultRM(&subject.rm), VI_SUCCESS);
        viSetAttribute(subject.rm, VI_KY_ATTR_TCPIP_FIND_RSRC_MODE, 0);
        subject.resource = resource();
        subject.file = m_configuration + ".data";
        subject.handle = subject.rm;
        subject.isInterface = kind() == "GPIBINTFC";
        if (kind() != "RM") {
            EXPECT_EQ(viOpen(subject.rm, subject.resource.c_str(), VI_NO_LOCK, 20000, &subject.handle), VI_SUCCESS)
                << subject.resource;
            viSetAttribute(subject.handle, VI_ATTR_TMO_VALUE, 20000);
            viSetAttribute(subject.handle, VI_ATTR_TERMCHAR_EN, kind() == "SOCKET");
            viSetAttribute(subject.handle, VI_ATTR_IO_PROT,
                           kind() == "SOCKET" || kind() == "ASRL" ? VI_PROT_4882_STRS : VI_PROT_NORMAL);
            if (subject.isInterface) {
                EXPECT_EQ(viGpibSendIFC(subject.handle), VI_SUCCESS);
            }
        }
        operation.prepare(subject);
        const ViStatus status = operation.call(subject);
        viClose(subject.rm);
        return operation.givesStatus ? operations::statusName(status) : "nothing";
    }

    const std::string m_configuration = testing::TempDir() + "operations-" + std::to_string(::getpid()) + ".ini";
    test::SimulatorProcess m_simulator{
        {"--hislip", "0", "--socket", "0", "--vxi11", "0", "--portmapper", "0", "--gpib", "--serial"}};
};

TEST_P(OperationTable, EachGivesTheDocumentedStatus)
{
    const auto rows = documentedRows();
    std::ostringstream made;
    for (const Operation &operation : operations::all()) {
        const auto row = rows.find(operation.name);
        const std::string status = tried(operation);
        made << operation.name << ' ' << status << '\n';
        ASSERT_TRUE(row != rows.end() && row->second.size() > KindCount) << operation.name << " has no row; " << status;
        const std::string cell = row->second[GetParam()];
        EXPECT_EQ(status, cell == "nothing" ? cell : "VI_" + cell) << operation.name << " on " << kind();
    }
    if (const char *folder = std::getenv("KYVISA_OPERATIONS_MADE"))
        std::ofstream(std::string(folder) + "/" + kind()) << made.str();
}

INSTANTIATE_TEST_SUITE_P(Kinds, OperationTable, testing::Range<std::size_t>(0, KindCount), [](const auto &kind) {
    std::string name = Kinds[kind.param];
    std::erase(name, '-');
    return name;
});

TEST(OperationTableRows, AreTheExportedOperations)
{
    std::vector<std::string> documented;
    for (const auto &[name, cells] : documentedRows()) {
        EXPECT_EQ(cells.size(), KindCount + 1) << name;
        documented.push_back(name);
    }
    std::vector<std::string> tried;
    for (const Operation &operation : operations::all())
        tried.emplace_back(operation.name);
    std::vector<std::string> exported = operations::exportedNames();
    std::sort(exported.begin(), exported.end());
    std::sort(tried.begin(), tried.end());
    EXPECT_EQ(exported.size(), 107u);
    EXPECT_EQ(documented, exported);
    EXPECT_EQ(tried, exported);
}

} // namespace
