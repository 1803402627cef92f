#pragma once

#include "hostile/TesterSession.h"

#include "support/SimulatorProcess.h"
#include "support/TemporaryFolder.h"

#include <memory>
#include <string>

namespace hostile
{

/**
 * One way to an instrument: a simulator, a way of its own to switch its faults on and off, and the operations of the tester.
 *
 * The ways are those of docs/fault-matrix.md. The library finds portmapper and gateway through the environment, so there is one way
 * a process.
 */
class MatrixWay
{
public:
    explicit MatrixWay(std::string way);
    ~MatrixWay();
    MatrixWay(const MatrixWay &) = delete;
    MatrixWay &operator=(const MatrixWay &) = delete;

    /// Runs one operation while the fault is on, in a session of its own. Adds to @p troubles what else was wrong: a log line with
    /// another status, something left behind, a next session that does not work.
    /// @param expectsTimeout nothing will come: the time-outs may be short
    ViStatus run(const std::string &fault, const std::string &operation, bool expectsTimeout, std::string &troubles);
    /// True when the simulator takes the fault on this way.
    bool takes(const std::string &fault);

private:
    void start();
    void prepare(TesterSession &session, const std::string &operation);
    void perform(TesterSession &session, const std::string &operation, unsigned timeout);
    void awaitSerialLine();
    void recover(const std::string &operation, std::string &troubles);
    bool isRpc() const { return m_way == "vxi11" || m_way == "gpib"; }
    bool hasHeaders() const { return m_way != "socket" && m_way != "serial"; }
    bool isOfTheBus(const std::string &operation) const;
    std::string resource(const std::string &operation) const;

    /// Says something to the instrument on the other way and answers what it says.
    std::string ask(const std::string &text);
    std::string post(const std::string &form, const std::string &values);
    bool switchOn(const std::string &fault);
    void switchOff();

    const std::string m_way;
    test::TemporaryFolder m_folder;
    std::unique_ptr<test::SimulatorProcess> m_simulator;
    ViSession m_manager = VI_NULL;
    ViSession m_control = VI_NULL;
};

} // namespace hostile
