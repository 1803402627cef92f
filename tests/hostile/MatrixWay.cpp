#include "hostile/MatrixWay.h"

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <map>
#include <stdexcept>
#include <thread>
#include <vector>

namespace hostile
{
namespace
{

constexpr unsigned Long = 30000; // milliseconds: only what never comes takes so long
constexpr unsigned Short = 100;

std::vector<std::string> optionsOf(const std::string &way)
{
    if (way == "socket")
        return {"--socket", "0", "--hislip", "0", "--http", "0"};
    if (way.starts_with("hislip"))
        return {"--hislip", "0", "--socket", "0", "--http", "0"};
    if (way.starts_with("overlapped"))
        return {"--hislip", "0", "--hislip-overlap", "--socket", "0", "--http", "0"};
    if (way == "vxi11")
        return {"--vxi11", "0", "--portmapper", "0", "--socket", "0", "--http", "0"};
    if (way == "gpib")
        return {"--gpib", "--vxi11", "0", "--portmapper", "0", "--socket", "0", "--http", "0"};
    if (way == "serial")
        return {"--serial", "--socket", "0", "--http", "0"};
    throw std::runtime_error("no way is called " + way);
}

/// The protocol as the simulator's faults name it.
std::string protocolOf(const std::string &way)
{
    const std::size_t mode = way.find("overlapped");
    return mode == std::string::npos ? way : "hislip" + way.substr(std::string("overlapped").size());
}

std::string specOf(const std::string &way, const std::string &fault)
{
    static const std::map<std::string, std::string> Kinds = {
        {"delay", "delay=0.02:on=all"},
        {"late", "delay=3600:on=all"},
        {"drop-reply", "drop-reply:on=all"},
        {"cut", "cut:on=all"},
        {"short-header", "short-header:on=all"},
        {"oversized-header", "oversized-header:on=all"},
        {"garbage", "garbage=8192:on=all"},
        {"change-byte", "change-byte:on=all"},
        {"stale-id", "stale-id:on=all"},
        {"no-end", "no-end:on=all"},
        {"refuse-lock", "refuse-lock"},
        {"withhold-srq", "withhold-srq"},
        {"repeat-srq", "repeat-srq"},
        {"nonsense-status", "nonsense-status"},
        {"fill-errors", "fill-errors:on=all"},
    };
    return protocolOf(way) + ":" + Kinds.at(fault);
}

std::size_t entries(const char *folder)
{
    const std::filesystem::directory_iterator all(folder);
    return static_cast<std::size_t>(std::distance(begin(all), end(all)));
}

/// A thread that was joined may stay in the list for a moment.
bool threadsBecome(std::size_t count)
{
    for (int i = 0; i < 3000 && entries("/proc/self/task") != count; ++i)
        std::this_thread::sleep_for(std::chrono::milliseconds(10));
    return entries("/proc/self/task") == count;
}

void check(ViStatus status, const char *what)
{
    if (status < VI_SUCCESS)
        throw std::runtime_error(std::string(what) + " answered " + shortName(status));
}

} // namespace

MatrixWay::MatrixWay(std::string way) : m_way(std::move(way))
{
    std::ofstream(m_folder.file("kyvisa.ini")) << "[KYGPIB-GATEWAYS]\nBoard0 = \"TCPIP::127.0.0.1::gpib0\"\n";
    ::setenv("KYVISA_CONFIG", m_folder.file("kyvisa.ini").c_str(), 1);
    start();
    // What the library makes once for all sessions is made before anything is counted.
    std::string ignored;
    run("none", "lock", false, ignored);
}

MatrixWay::~MatrixWay()
{
    viClose(m_manager);
}

void MatrixWay::start()
{
    if (m_manager != VI_NULL)
        viClose(m_manager);
    m_simulator.reset();
    m_simulator = std::make_unique<test::SimulatorProcess>(optionsOf(m_way));
    ::setenv("KYVISA_PORTMAPPER_PORT", m_simulator->resource("portmapper").c_str(), 1);
    check(viOpenDefaultRM(&m_manager), "opening the resource manager");
    const std::string other = m_simulator->resource(m_way == "socket" ? "hislip" : "socket");
    check(viOpen(m_manager, other.c_str(), VI_NULL, Long, &m_control), "opening the way for faults");
    check(viSetAttribute(m_control, VI_ATTR_TMO_VALUE, Long), "setting a time-out");
    check(viSetAttribute(m_control, VI_ATTR_TERMCHAR_EN, VI_TRUE), "setting the termination character");
}

std::string MatrixWay::ask(const std::string &text)
{
    const std::string line = text + "\n";
    check(viWrite(m_control, reinterpret_cast<ViConstBuf>(line.data()), static_cast<ViUInt32>(line.size()), nullptr),
          "writing to the instrument");
    std::string answer(1024, '\0');
    ViUInt32 count = 0;
    check(viRead(m_control, reinterpret_cast<ViPBuf>(answer.data()), 1024, &count), "reading from the instrument");
    return answer.substr(0, count);
}

/// Fills in a form of the simulator's page of faults, which no lock keeps anybody from. The first line of the answer.
std::string MatrixWay::post(const std::string &form, const std::string &values)
{
    ViSession page = VI_NULL;
    const std::string name = "TCPIP::127.0.0.1::" + std::to_string(m_simulator->port("http")) + "::SOCKET";
    check(viOpen(m_manager, name.c_str(), VI_NULL, Long, &page), "opening the page of faults");
    const std::string request = "POST /faults/" + form +
                                " HTTP/1.1\r\nHost: localhost\r\nConnection: close\r\n"
                                "Content-Type: application/x-www-form-urlencoded\r\nContent-Length: " +
                                std::to_string(values.size()) + "\r\n\r\n" + values;
    check(viSetAttribute(page, VI_ATTR_TMO_VALUE, Long), "setting a time-out");
    check(viSetAttribute(page, VI_ATTR_TERMCHAR_EN, VI_TRUE), "setting the termination character");
    check(viWrite(page, reinterpret_cast<ViConstBuf>(request.data()), static_cast<ViUInt32>(request.size()), nullptr),
          "writing to the page of faults");
    std::string line(256, '\0');
    ViUInt32 count = 0;
    check(viRead(page, reinterpret_cast<ViPBuf>(line.data()), 256, &count), "reading from the page of faults");
    viClose(page);
    return line.substr(0, count);
}

bool MatrixWay::switchOn(const std::string &fault)
{
    return fault == "none" || post("add", "spec=" + specOf(m_way, fault)).starts_with("HTTP/1.1 303 ");
}

void MatrixWay::switchOff()
{
    if (!post("remove", "number=all").starts_with("HTTP/1.1 303 "))
        throw std::runtime_error("the faults stay");
}

bool MatrixWay::takes(const std::string &fault)
{
    const bool taken = switchOn(fault);
    switchOff();
    return taken;
}

bool MatrixWay::isOfTheBus(const std::string &operation) const
{
    return m_way == "gpib" &&
           (operation == "atn" || operation == "ifc" || operation == "command" || operation == "pass-control");
}

std::string MatrixWay::resource(const std::string &operation) const
{
    if (m_way == "gpib")
        return isOfTheBus(operation) ? "GPIB0::INTFC" : "GPIB0::5::INSTR";
    const std::string protocol = protocolOf(m_way);
    return m_simulator->resource(protocol.substr(0, protocol.find('-')));
}

/// What comes before the fault.
void MatrixWay::prepare(TesterSession &session, const std::string &operation)
{
    if (operation == "open")
        return;
    session.open(resource(operation), Long);
    session->setTimeout(Long);
    if (m_way == "socket")
        session->setAttribute(VI_ATTR_TERMCHAR_EN, VI_TRUE, true);
    if (!hasHeaders())
        session->setAttribute(VI_ATTR_IO_PROT, VI_PROT_4882_STRS, true);
    if (operation == "unlock")
        session->lockExclusive(Long);
    if (operation == "wait-event" && hasHeaders()) {
        session->enableEvent(VI_EVENT_SERVICE_REQ, VI_QUEUE, VI_NULL);
        ask("*CLS;*ESE 1;*SRE 32;*OPC?");
    }
    // Where the client fetches its answers, the question comes before the fault.
    if (isRpc() && (operation == "read" || operation == "scanf"))
        session->write("*IDN?\n");
}

void MatrixWay::perform(TesterSession &session, const std::string &operation, unsigned timeout)
{
    std::vector<char> text(16384);
    char key[512] = "";
    char noKey[] = "";
    if (operation == "open")
        session.open(resource(operation), timeout);
    else if (operation == "write")
        session->write("*CLS\n");
    else if (operation == "read")
        session->read(text.data(), 1024);
    else if (operation == "query")
        session->query("*IDN?\n", 6, text.data(), 1024);
    else if (operation == "printf")
        session->viPrintf("*CLS;*ESE %d\n", 0);
    else if (operation == "scanf")
        session->viScanf("%t", text.data());
    else if (operation == "queryf")
        session->viQueryf("*IDN?\n", "%t", text.data());
    else if (operation == "read-stb")
        session->getSTB();
    else if (operation == "trigger")
        session->trigger(VI_TRIG_PROT_DEFAULT);
    else if (operation == "clear")
        session->clear();
    else if (operation == "lock")
        session->lockExclusive(timeout);
    else if (operation == "lock-shared")
        session->lockShared(timeout, noKey, key);
    else if (operation == "unlock")
        session->unlock();
    else if (operation == "ren")
        session->gpibControlREN(VI_GPIB_REN_ASSERT_ADDRESS);
    else if (operation == "atn")
        session->gpibConrtolATN(VI_GPIB_ATN_ASSERT);
    else if (operation == "ifc")
        session->gpibSendIFC();
    else if (operation == "command")
        session->gpibCommand(std::string("?_").data(), 2);
    else if (operation == "pass-control")
        session->gpibPassControl(5, VI_NO_SEC_ADDR);
    else if (operation == "enable-event")
        session->enableEvent(VI_EVENT_SERVICE_REQ, VI_QUEUE, VI_NULL);
    else if (operation == "wait-event")
        session->waitOnEvent(VI_EVENT_SERVICE_REQ, timeout, nullptr);
    else if (operation == "get-attribute") {
        Attribute attribute;
        attribute.id = m_way == "gpib"     ? VI_ATTR_GPIB_REN_STATE
                       : m_way == "serial" ? VI_ATTR_ASRL_AVAIL_NUM
                                           : VI_ATTR_RSRC_LOCK_STATE;
        session->getAttribute(attribute, true);
    } else if (operation == "set-attribute" && m_way == "gpib")
        session->setAttribute(VI_ATTR_GPIB_UNADDR_EN, VI_TRUE, true);
    else if (operation == "set-attribute" && m_way == "serial")
        session->setAttribute(VI_ATTR_ASRL_BAUD, 19200, true);
    else if (operation == "set-attribute" && hasHeaders() && !isRpc())
        session->setAttribute(VI_ATTR_TCPIP_HISLIP_MAX_MESSAGE_KB, 512, true);
    else if (operation == "set-attribute")
        session->setAttribute(VI_ATTR_TCPIP_KEEPALIVE, VI_TRUE, true);
    else if (operation == "close")
        session->closeSession();
    else
        throw std::runtime_error("no operation is called " + operation);
}

ViStatus MatrixWay::run(const std::string &fault, const std::string &operation, bool expectsTimeout,
                        std::string &troubles)
{
    awaitSerialLine();
    const std::size_t descriptors = entries("/proc/self/fd");
    const std::size_t threads = entries("/proc/self/task");
    ViStatus status = VI_SUCCESS;
    {
        TesterSession session;
        prepare(session, operation);
        if (expectsTimeout && operation != "open")
            session->setTimeout(Short);
        if (!switchOn(fault))
            troubles += "the simulator refuses the fault; ";
        if (!isRpc() && (operation == "read" || operation == "scanf"))
            session->write("*IDN?\n");
        if (operation == "wait-event")
            ask("*OPC;*IDN?");
        status = TesterSession::statusOf([&] { perform(session, operation, expectsTimeout ? Short : Long); });
        const FastBuffer line = session.lastLine();
        if (line.status != status && (status != VI_SUCCESS || line.status < VI_SUCCESS))
            troubles += std::string("the log says ") + VisaError::StatusCode(line.status) + " of " + line.text + "; ";
        switchOff();
    }
    if (entries("/proc/self/fd") != descriptors)
        troubles += "descriptors are left open; ";
    if (!threadsBecome(threads))
        troubles += "threads are left running; ";
    // There is one serial line, and what stands on it unread stays.
    if (m_way == "serial" && (fault == "late" || fault == "garbage"))
        start();
    recover(operation, troubles);
    return status;
}

/// The instrument makes its serial line raw again once it has seen that it was closed, also under whoever has opened it meanwhile. What
/// it answers to the second question it answers after that.
void MatrixWay::awaitSerialLine()
{
    for (int i = 0; i < 2 && m_way == "serial"; ++i)
        ask("*OPC?");
}

void MatrixWay::recover(const std::string &operation, std::string &troubles)
{
    awaitSerialLine();
    if (ask("*CLS;*SRE 0;*ESE 0;*OPC?") != "1\n")
        troubles += "the instrument is not as before; ";
    const ViStatus status = TesterSession::statusOf([&] {
        if (isOfTheBus(operation)) {
            TesterSession bus;
            bus.open("GPIB0::INTFC", Long);
            bus->setTimeout(Long);
            bus->gpibSendIFC();
            bus->gpibConrtolATN(VI_GPIB_ATN_DEASSERT);
        }
        TesterSession next;
        next.open(resource("query"), Long);
        next->setTimeout(Long);
        if (m_way == "socket")
            next->setAttribute(VI_ATTR_TERMCHAR_EN, VI_TRUE, true);
        std::vector<char> text(1025);
        text[next->query("*IDN?\n", 6, text.data(), 1024)] = '\0';
        if (!std::string(text.data()).starts_with("Oltrava,KyVisaSimulator,"))
            troubles += std::string("the next session reads ") + text.data() + "; ";
    });
    if (status != VI_SUCCESS)
        troubles += "the next session answers " + shortName(status) + "; ";
}

} // namespace hostile
