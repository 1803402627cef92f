#!/usr/bin/python3
"""What users of PyVISA do, with the library loaded by its path, against a simulator on free ports.

Usage: acceptance.py LIBRARY SIMULATOR CASE          runs one case
       acceptance.py LIBRARY SIMULATOR --are CASE... checks that these are all cases
"""
import os
import pathlib
import random
import subprocess
import sys
import tempfile
import threading

sys.path.insert(0, str(pathlib.Path(__file__).resolve().parents[2] / "support"))
import netlab  # noqa: E402
import pyvisa  # noqa: E402
from pyvisa import attributes, constants  # noqa: E402
from pyvisa.ctwrapper import types  # noqa: E402
from pyvisa.constants import EventMechanism, EventType, StatusCode  # noqa: E402

FIND_MODE = 0x0FAF0002  # VI_KY_ATTR_TCPIP_FIND_RSRC_MODE: 4 asks by mDNS, 2 by VXI-11
FIND_TIME = 0x0FAF0001  # VI_KY_ATTR_TCPIP_FIND_RSRC_TMO
PATIENCE = 30000  # milliseconds; nothing here takes as long

cases = {}


def case(function):
    cases[function.__name__.replace("_", "-")] = function
    return function


def expect(condition, *what):
    if not condition:
        raise AssertionError(" ".join(str(part) for part in what) or "not as expected")


def equal(got, expected):
    expect(got == expected, repr(got), "is not", repr(expected))


def fails(status, function, *arguments, **named):
    try:
        result = function(*arguments, **named)
    except pyvisa.VisaIOError as error:
        equal(StatusCode(error.error_code), status)
        return
    raise AssertionError(f"{status!r} did not come, but {result!r}")


class Simulator:
    """An instrument of the test's own, and the configuration in which its resources are known."""

    def __init__(self, *options):
        options = options or ("--hislip", "0", "--socket", "0", "--vxi11", "0", "--portmapper", "0", "--gpib", "--serial")
        self.process = subprocess.Popen([SIMULATOR, *options], stdout=subprocess.PIPE, text=True)
        self.resources = {}
        for line in self.process.stdout:
            words = line.split()
            if words == ["ready"]:
                break
            self.resources.setdefault(words[0], words[-1])
        expect(self.process.poll() is None, "the simulator did not become ready")
        folder = tempfile.mkdtemp(prefix="kyvisa-python-")
        self.configuration = pathlib.Path(folder, "kyvisa.ini")
        os.environ["KYVISA_CONFIG"] = str(self.configuration)
        if "portmapper" in self.resources:
            os.environ["KYVISA_PORTMAPPER_PORT"] = self.resources["portmapper"]
        sections = {"HISLIP-RSRCS": "hislip", "SOCKET-RSRCS": "socket", "KYVXI11-RSRCS": "vxi11"}
        text = "".join(
            f'[{section}]\nName0 = "{self.resources[service]}"\n'
            for section, service in sections.items() if service in self.resources)
        if "gpib" in self.resources:
            text += '[KYGPIB-GATEWAYS]\nBoard0 = "TCPIP::127.0.0.1::gpib0"\n[KYGPIB-RSRCS]\nName0 = GPIB0::7::INSTR\n'
        if "hislip" in self.resources:
            text += f"[ALIASES]\nAlias0 = \"'meter','{self.resources['hislip']}'\"\n"
        self.configuration.write_text(text)

    def close(self):
        self.process.terminate()
        equal(self.process.wait(60), 0)
        self.configuration.unlink()
        self.configuration.parent.rmdir()


def manager(methods=0):
    made = pyvisa.ResourceManager(LIBRARY)
    made.visalib.set_attribute(made.session, FIND_MODE, methods)
    return made


SERVICES = ["hislip", "vxi11", "socket", "serial", "gpib"]
WITH_EVENTS = ["hislip", "vxi11", "gpib"]


def open_service(resources, simulator, service, **named):
    name = "GPIB0::7::INSTR" if service == "gpib" else simulator.resources[service]
    instrument = resources.open_resource(name, open_timeout=PATIENCE, timeout=PATIENCE, **named)
    instrument.write_termination = "\n"
    if service in ("socket", "serial"):
        instrument.read_termination = "\n"
        instrument.set_visa_attribute(constants.ResourceAttribute.io_prot, constants.IOProtocol.protocol4882_strs)
    return instrument


def full(name):
    return name.replace("TCPIP::", "TCPIP0::", 1)


@case
def lists_what_is_configured(simulator):
    resources = manager()
    listed = resources.list_resources("?*")
    for service in ("hislip", "vxi11", "socket"):
        expect(full(simulator.resources[service]).replace(",4880", "") in listed, service, "is not in", listed)
    expect("GPIB0::7::INSTR" in listed and "GPIB0::INTFC" in listed, listed)
    equal(len(listed), len(set(listed)))
    equal(resources.list_resources("TCPIP?*SOCKET"), (full(simulator.resources["socket"]),))
    equal(resources.list_resources("GPIB?*INSTR{VI_ATTR_GPIB_PRIMARY_ADDR == 7}"), ("GPIB0::7::INSTR",))
    equal(resources.list_resources("USB?*"), ())
    fails(StatusCode.error_invalid_expression, resources.list_resources, "TCPIP[")
    for name in listed:
        expect(resources.resource_info(name).resource_name == name, name)
    equal(resources.resource_info("METER").resource_name, full(simulator.resources["hislip"]))
    equal(resources.resource_info(simulator.resources["hislip"]).alias, "meter")
    resources.close()


@case
def discovers_only_when_asked(_):
    netlab.enter()
    netlab.ip("link", "set", "lo", "multicast", "on")
    os.environ["KYVISA_CONFIG"] = "/dev/null"
    os.environ.pop("KYVISA_PORTMAPPER_PORT", None)
    alone = subprocess.Popen([SIMULATOR, "--hislip", "4881", "--vxi11", "0", "--portmapper", "111", "--mdns"], stdout=subprocess.PIPE, text=True)
    try:
        for line in alone.stdout:
            if line == "ready\n":
                break
        equal(manager(0).list_resources("TCPIP?*"), ())
        resources = manager(4)
        resources.visalib.set_attribute(resources.session, FIND_TIME, 3000)
        # It answers once it has made sure of its name, and nobody has to answer in time on a machine that is busy.
        hislip, vxi11 = "TCPIP0::127.0.0.1::hislip0,4881::INSTR", "TCPIP0::127.0.0.1::inst0::INSTR"
        expect(any(hislip in resources.list_resources("TCPIP?*") for _ in range(10)), "not found by mDNS")
        resources.visalib.set_attribute(resources.session, FIND_MODE, 2)
        found = next((names for names in (resources.list_resources("TCPIP?*") for _ in range(10)) if names), ())
        equal(found, (vxi11,))
        equal(resources.open_resource(vxi11, open_timeout=PATIENCE, timeout=PATIENCE).query("*OPC?"), "1\n")
    finally:
        alone.terminate()
        alone.wait(60)


discovers_only_when_asked.own_simulator = True


@case
def queries_over_every_interface(simulator):
    resources = manager()
    for service in SERVICES:
        instrument = open_service(resources, simulator, service)
        expect(len(instrument.query("*IDN?").split(",")) == 4, service)
        equal(instrument.query_ascii_values("SOUR:VOLT 1.5;:SOUR:VOLT?"), [1.5])
        equal(instrument.query("*ESE 7;*ESE?").strip(), "7")
        instrument.close()
    equal(resources.open_resource("meter", open_timeout=PATIENCE, timeout=PATIENCE).query("*OPC?"), "1\n")
    equal(type(resources.open_resource("GPIB0::INTFC", open_timeout=PATIENCE)).__name__, "GPIBInterface")
    resources.close()


@case
def carries_binary_blocks(simulator):
    resources = manager()
    numbers = random.Random(1)
    for service in SERVICES:
        instrument = open_service(resources, simulator, service)
        instrument.chunk_size = 1 << 20
        count = {"serial": 1 << 12, "gpib": 1 << 16, "socket": 1 << 18}.get(service, 1 << 20)
        values = [numbers.getrandbits(31) for _ in range(count)]
        instrument.write_binary_values('MMEM:DATA "block",', values, datatype="i", is_big_endian=True)
        equal(instrument.query_binary_values('MMEM:DATA? "block"', datatype="i", is_big_endian=True), values)
        equal(instrument.query("*OPC?").strip(), "1")
        instrument.write_binary_values('MMEM:DATA "block",', [0.5, -2.0, 1e300], datatype="d")
        equal(instrument.query_binary_values('MMEM:DATA? "block"', datatype="d"), [0.5, -2.0, 1e300])
        instrument.close()
    resources.close()


def text_of(key):
    """Some versions of PyVISA hand out keys as bytes."""
    return key.decode() if isinstance(key, bytes) else key


class Neighbour:
    """A second program that uses the same instrument."""

    def __init__(self, resource):
        self.process = subprocess.Popen([sys.executable, __file__, LIBRARY, SIMULATOR, "--neighbour", resource],
                                        stdin=subprocess.PIPE, stdout=subprocess.PIPE, text=True)
        equal(self.process.stdout.readline(), "open\n")

    def does(self, *words):
        self.process.stdin.write(" ".join(words) + "\n")
        self.process.stdin.flush()
        return self.process.stdout.readline().strip()

    def close(self):
        self.process.stdin.close()
        equal(self.process.wait(60), 0)


def neighbour(resource):
    instrument = manager().open_resource(resource, open_timeout=PATIENCE, timeout=PATIENCE, write_termination="\n")
    if resource.endswith("SOCKET"):
        instrument.read_termination = "\n"
    print("open", flush=True)
    for line in sys.stdin:
        words = line.split()
        try:
            if words[0] == "share":
                answer = text_of(instrument.lock(int(words[1]), words[2].encode()))
            elif words[0] == "lock":
                answer = instrument.lock_excl(int(words[1])) or "locked"
            elif words[0] == "unlock":
                answer = instrument.unlock() or "unlocked"
            else:
                instrument.timeout = int(words[1])
                answer = instrument.query("*OPC?").strip()
        except pyvisa.VisaIOError as error:
            answer = StatusCode(error.error_code).name
        print(answer, flush=True)


@case
def locks_keep_a_second_program_out(simulator):
    resources = manager()
    for service in ("hislip", "vxi11", "socket", "gpib"):
        instrument = open_service(resources, simulator, service)
        other = Neighbour(instrument.resource_name)
        equal(other.does("query", str(PATIENCE)), "1")
        instrument.lock_excl(PATIENCE)
        expect(other.does("query", "100") in ("error_resource_locked", "error_timeout"), service)
        expect(other.does("lock", "0") in ("error_resource_locked", "error_timeout"), service)
        equal(instrument.query("*OPC?").strip(), "1")
        instrument.unlock()
        equal(other.does("lock", str(PATIENCE)), "locked")
        expect(lock_status(instrument) in (StatusCode.error_resource_locked, StatusCode.error_timeout), service)
        equal(other.does("unlock"), "unlocked")
        fails(StatusCode.error_session_not_locked, instrument.unlock)

        key = text_of(instrument.lock(PATIENCE))
        expect(key, "no key")
        equal(other.does("share", str(PATIENCE), key), key)
        equal(other.does("query", str(PATIENCE)), "1")
        equal(instrument.query("*OPC?").strip(), "1")
        equal(other.does("unlock"), "unlocked")
        expect(other.does("share", "0", "another") in ("error_invalid_access_key", "error_resource_locked", "error_timeout"), service)
        instrument.unlock()

        with instrument.lock_context(PATIENCE) as nothing:
            equal(nothing, None)
            expect(other.does("lock", "0") in ("error_resource_locked", "error_timeout"), service)
        with instrument.lock_context(PATIENCE, requested_key=b"ours") as mine:
            equal(text_of(mine), "ours")
            equal(other.does("share", str(PATIENCE), "ours"), "ours")
            equal(other.does("unlock"), "unlocked")
        equal(other.does("query", str(PATIENCE)), "1")
        # What a program leaves locked is free when it has gone.
        equal(other.does("lock", str(PATIENCE)), "locked")
        other.close()
        instrument.lock_excl(PATIENCE)
        instrument.unlock()
        instrument.close()
    resources.close()


def lock_status(instrument):
    try:
        instrument.lock_excl(0)
    except pyvisa.VisaIOError as error:
        return StatusCode(error.error_code)
    return StatusCode.success


@case
def waits_for_service_requests(simulator):
    resources = manager()
    for service in WITH_EVENTS:
        instrument = open_service(resources, simulator, service)
        fails(StatusCode.error_not_enabled, instrument.wait_on_event, EventType.service_request, 0)
        instrument.enable_event(EventType.service_request, EventMechanism.queue)
        instrument.write("*CLS;*ESE 1;*SRE 32")
        expect(instrument.wait_on_event(EventType.service_request, 0, capture_timeout=True).timed_out, service)
        for _ in range(3):
            instrument.write("*OPC")
            response = instrument.wait_on_event(EventType.service_request, PATIENCE)
            expect(not response.timed_out)
            equal(response.event.event_type, EventType.service_request)
            equal(instrument.read_stb() & 0x40, 0x40)
            equal(instrument.query("*ESR?").strip(), "1")
        instrument.disable_event(EventType.service_request, EventMechanism.queue)
        instrument.discard_events(EventType.service_request, EventMechanism.queue)
        fails(StatusCode.error_not_enabled, instrument.wait_on_event, EventType.service_request, 0)
        instrument.close()
    for service in ("socket", "serial"):
        instrument = open_service(resources, simulator, service)
        fails(StatusCode.error_invalid_event, instrument.enable_event, EventType.service_request, EventMechanism.queue)
        instrument.close()
    resources.close()


@case
def calls_handlers(simulator):
    resources = manager()
    for service in WITH_EVENTS:
        instrument = open_service(resources, simulator, service)
        fails(StatusCode.error_handler_not_installed, instrument.enable_event, EventType.service_request, EventMechanism.handler)
        heard = []
        come = threading.Event()

        def handle(resource, event, user_handle):
            heard.append((resource, event.event_type, user_handle.value, threading.get_ident()))
            come.set()

        handler = instrument.wrap_handler(handle)
        user_handle = instrument.install_handler(EventType.service_request, handler, 4711)
        instrument.enable_event(EventType.service_request, EventMechanism.handler)
        instrument.write("*CLS;*ESE 1;*SRE 32")
        for number in (1, 2):
            come.clear()
            instrument.write("*OPC")
            expect(come.wait(PATIENCE / 1000), service, "did not call")
            equal(len(heard), number)
            equal(instrument.read_stb() & 0x40, 0x40)
            equal(instrument.query("*ESR?").strip(), "1")
        equal([entry[:3] for entry in heard], [(instrument, EventType.service_request, 4711)] * 2)
        instrument.disable_event(EventType.service_request, EventMechanism.handler)
        instrument.uninstall_handler(EventType.service_request, handler, user_handle)
        fails(StatusCode.error_handler_not_installed, instrument.enable_event, EventType.service_request, EventMechanism.handler)
        instrument.close()
    resources.close()


def attribute_classes(instrument):
    kind = (instrument.interface_type, instrument.resource_class)
    return attributes.AttributesPerResource[kind] | attributes.AttributesPerResource[attributes.AllSessionTypes]


# What PyVISA asks of sessions for which VPP-4.3 does not list it: HiSLIP's own, END where there is none, what belongs to
# instruments, and what no standard knows.
NOT_LISTED = {
    "vxi11": {"VI_ATTR_TCPIP_HISLIP_OVERLAP_EN", "VI_ATTR_TCPIP_HISLIP_VERSION"},
    "socket": {"VI_ATTR_SUPPRESS_END_EN"},
    "interface": {"VI_ATTR_IO_PROT", "VI_ATTR_TRIG_ID"},
    "serial": {f"VI_ATTR_ASRL_{name}" for name in ("ALLOW_TRANSMIT", "BREAK_LEN", "BREAK_STATE", "CONNECTED", "DISCARD_NULL", "WIRE_MODE")},
}


@case
def reads_attributes_by_name(simulator):
    resources = manager()
    for service in SERVICES + ["interface"]:
        instrument = resources.open_resource("GPIB0::INTFC", open_timeout=PATIENCE) if service == "interface" else open_service(resources, simulator, service)
        unsupported = set()
        for known in attribute_classes(instrument):
            if not known.read or not hasattr(types, known.visa_type):  # one of PyVISA's own is misspelt
                continue
            try:
                instrument.get_visa_attribute(known.attribute_id)
            except pyvisa.VisaIOError as error:
                equal((known.visa_name, error.error_code), (known.visa_name, StatusCode.error_nonsupported_attribute))
                unsupported.add(known.visa_name)
        equal((service, unsupported), (service, NOT_LISTED.get(service, set())))
        instrument.close()
    resources.close()


@case
def sets_attributes_of_every_width(simulator):
    resources = manager()
    names = constants.ResourceAttribute
    instrument = open_service(resources, simulator, "hislip")
    for attribute, value in (
        (names.termchar, 0x7E),  # 8 bits
        (names.termchar_enabled, True),  # 16 bits, Boolean
        (names.send_end_enabled, False),
        (names.io_prot, constants.IOProtocol.normal),  # 16 bits
        (names.timeout_value, 12345),  # 32 bits
        (names.max_queue_length, 7),
        (names.user_data, 0x9ABCDEF0),  # 64 bits here, of which PyVISA hands over 32
    ):
        instrument.set_visa_attribute(attribute, value)
        equal(instrument.get_visa_attribute(attribute), value)
    fails(StatusCode.error_attribute_read_only, instrument.set_visa_attribute, names.interface_type, 6)
    fails(StatusCode.error_nonsupported_attribute, instrument.get_visa_attribute, names.asrl_baud_rate)
    fails(StatusCode.error_nonsupported_attribute_state, instrument.set_visa_attribute, names.io_prot, 999)
    equal(instrument.resource_manufacturer_name, "Oltrava")
    equal(instrument.resource_class, "INSTR")
    equal(instrument.get_visa_attribute(names.tcpip_address), "127.0.0.1")
    equal(instrument.get_visa_attribute(names.tcpip_is_hislip), True)
    instrument.timeout = None
    equal(instrument.timeout, float("+inf"))
    instrument.close()
    serial = open_service(resources, simulator, "serial")
    serial.baud_rate = 115200
    serial.data_bits = 8
    serial.parity = constants.Parity.none
    serial.stop_bits = constants.StopBits.one
    serial.flow_control = constants.ControlFlow.xon_xoff
    equal((serial.baud_rate, serial.data_bits, serial.parity, serial.stop_bits, serial.flow_control),
          (115200, 8, constants.Parity.none, constants.StopBits.one, constants.ControlFlow.xon_xoff))
    equal(serial.query("*OPC?"), "1")
    resources.close()


def completion(instrument, job):
    """What the event says that a transfer leaves behind."""
    response = instrument.wait_on_event(EventType.io_completion, PATIENCE)
    names = constants.EventAttribute
    event = response.event
    equal(event.get_visa_attribute(names.job_id), getattr(job, "value", job))
    expect(getattr(job, "value", job) != 0, "a job without a number")
    return {
        "status": StatusCode(event.get_visa_attribute(names.status)),
        "count": event.get_visa_attribute(names.return_count),
        "operation": event.get_visa_attribute(names.operation_name),
    }


@case
def reads_and_writes_asynchronously(simulator):
    resources = manager()
    for service in SERVICES:
        instrument = open_service(resources, simulator, service)
        library, session = instrument.visalib, instrument.session
        instrument.enable_event(EventType.io_completion, EventMechanism.queue)
        job, status = library.write_asynchronously(session, b"*IDN?\n")
        expect(status >= 0, status)
        done = completion(instrument, job)
        equal((done["status"], done["count"], done["operation"]), (StatusCode.success, 6, "viWriteAsync"))
        buffer, job, status = library.read_asynchronously(session, 1000)
        expect(status >= 0, status)
        done = completion(instrument, job)
        equal(done["operation"], "viReadAsync")
        expect(done["status"] in (StatusCode.success, StatusCode.success_termination_character_read), done["status"])
        equal(done["count"], len(buffer.value))
        equal(len(buffer.value.decode().split(",")), 4)
        # One that nobody answers is ended by its time-out, or by the user, and says so.
        instrument.timeout = 100
        buffer, job, status = library.read_asynchronously(session, 1000)
        expect(status >= 0, status)
        equal(completion(instrument, job)["status"], StatusCode.error_timeout)
        instrument.timeout = PATIENCE
        buffer, job, status = library.read_asynchronously(session, 1000)
        equal(status, StatusCode.success)
        library.terminate(session, 0, job)
        equal(completion(instrument, job)["status"], StatusCode.error_abort)
        instrument.clear()
        equal(instrument.query("*OPC?").strip(), "1")
        instrument.disable_event(EventType.io_completion, EventMechanism.queue)
        instrument.close()
    resources.close()


@case
def clears_triggers_and_polls(simulator):
    resources = manager()
    for service in SERVICES:
        instrument = open_service(resources, simulator, service)
        instrument.write("*CLS;*ESE 1;*SRE 32")
        instrument.write("*OPC")
        equal(instrument.query("*OPC?").strip(), "1")
        equal(instrument.read_stb() & 0x60, 0x60)
        instrument.assert_trigger()
        equal(instrument.query("*OPC?").strip(), "1")
        if service in WITH_EVENTS:
            instrument.write("*IDN?")
            instrument.clear()
            equal(instrument.query("*OPC?").strip(), "1")
        else:
            instrument.clear()
            equal(instrument.query("*OPC?").strip(), "1")
        if service == "gpib":
            equal(instrument.control_ren(constants.RENLineOperation.asrt), StatusCode.success)
            instrument.close()
            interface = resources.open_resource("GPIB0::INTFC", open_timeout=PATIENCE, timeout=PATIENCE)
            interface.send_ifc()
            equal(interface.send_command(b"?_")[0], 2)  # UNL, UNT
            interface.control_atn(constants.ATNLineOperation.deassert)
            interface.close()
        else:
            instrument.close()
    resources.close()


@case
def fails_with_the_right_status(simulator):
    resources = manager()
    for service in SERVICES:
        instrument = open_service(resources, simulator, service)
        instrument.timeout = 100
        fails(StatusCode.error_timeout, instrument.read)
        instrument.timeout = PATIENCE
        equal(instrument.query("*OPC?").strip(), "1")
        instrument.close()
        try:
            instrument.query("*OPC?")
            raise AssertionError("a closed session answered")
        except pyvisa.InvalidSession:
            pass
    fails(StatusCode.error_invalid_resource_name, resources.open_resource, "nonsense")
    fails(StatusCode.error_invalid_access_mode, resources.open_resource, simulator.resources["hislip"], access_mode=2)
    equal(resources.last_status, StatusCode.error_invalid_access_mode)
    port = simulator.resources["socket"].split("::")[2]
    session = resources.open_bare_resource(simulator.resources["hislip"], open_timeout=PATIENCE)[0]
    resources.visalib.close(session)
    fails(StatusCode.error_invalid_object, resources.visalib.close, session)
    fails(StatusCode.error_invalid_object, resources.visalib.write, session, b"*CLS\n")
    simulator.process.terminate()
    equal(simulator.process.wait(60), 0)
    fails(StatusCode.error_resource_not_found, resources.open_resource, f"TCPIP::127.0.0.1::{port}::SOCKET", open_timeout=PATIENCE)
    resources.close()


@case
def uses_buffers_and_files(simulator):
    resources = manager()
    library = resources.visalib
    for service in ("hislip", "socket"):
        instrument = open_service(resources, simulator, service)
        session = instrument.session
        equal(library.set_buffer(session, constants.BufferType.io_in | constants.BufferType.io_out, 4096) >= 0, True)
        with tempfile.TemporaryDirectory() as folder:
            command = pathlib.Path(folder, "command")
            command.write_bytes(b"*IDN?\n")
            count, status = library.write_from_file(session, str(command).encode(), 6)
            equal((count.value, status), (6, StatusCode.success))
            answer = pathlib.Path(folder, "answer")
            status = library.read_to_file(session, str(answer).encode(), 1000)
            equal(len(answer.read_text().split(",")), 4)
        equal(instrument.query("*OPC?").strip(), "1")
        instrument.flush(constants.BufferOperation.discard_receive_buffer)
        instrument.close()
    equal(library.parse_resource(resources.session, "GPIB3::5::INSTR")[0].interface_board_number, 3)
    expect(resources.visalib.status_description(resources.session, StatusCode.error_timeout)[0])
    resources.close()


@case
def leaves_nothing_after_many_sessions(simulator):
    def descriptors():
        return len(os.listdir("/proc/self/fd"))

    resources = manager()

    def cycle(service):
        instrument = open_service(resources, simulator, service)
        if service in WITH_EVENTS:
            instrument.enable_event(EventType.service_request, EventMechanism.queue)
        equal(instrument.query("*OPC?").strip(), "1")
        instrument.close()
        resources.list_resources("?*")

    for service in SERVICES:
        cycle(service)
    before = descriptors()
    for _ in range(40):
        for service in SERVICES:
            cycle(service)
    equal(descriptors(), before)
    resources.close()
    manager().close()
    expect(descriptors() <= before, descriptors(), before)


if __name__ == "__main__":
    LIBRARY, SIMULATOR, name, *rest = sys.argv[1:]
    if name == "--neighbour":
        neighbour(*rest)
    elif name == "--are":
        equal(sorted(rest), sorted(cases))
    else:
        run = cases[name]
        if hasattr(run, "own_simulator"):
            run(None)
        else:
            instruments = Simulator()
            try:
                run(instruments)
            finally:
                if instruments.process.poll() is None:
                    instruments.close()
                else:
                    instruments.configuration.unlink()
                    instruments.configuration.parent.rmdir()
        print(f"{name}: as expected")
