#!/usr/bin/python3
"""The library in one network, an instrument in another, and a relay between them that splits, merges, delays, stalls and cuts.

Usage: two-networks.py PROTOCOL SIMULATOR CLIENT [STEP]. PROTOCOL is socket, hislip, overlapped, vxi11 or gateway. With a step of
more than 1 not every byte has its turn. Status 1 when something was not as it should be.
"""
import os
import subprocess
import sys

sys.path.insert(0, os.path.join(os.path.dirname(os.path.abspath(__file__)), "../../support"))
from netlab import Host, Switch, enter  # noqa: E402
from relay import TO_CLIENT, TO_INSTRUMENT, Relay  # noqa: E402

enter()
PROTOCOL, SIMULATOR, CLIENT = sys.argv[1:4]
STEP = int(sys.argv[4]) if len(sys.argv) > 4 else 1
CORE_PORT = 1024
VXI11 = ("--vxi11", str(CORE_PORT), "--portmapper", "111")
SERVICES = {
    "socket": (("--socket", "5025"), "::5025::SOCKET", (5025,)),
    "hislip": (("--hislip", "4880"), "::hislip0::INSTR", (4880,)),
    "overlapped": (("--hislip", "4880", "--hislip-overlap"), "::hislip0::INSTR", (4880,)),
    "vxi11": (VXI11, "::inst0::INSTR", (111, CORE_PORT)),
    "gateway": ((*VXI11, "--gpib"), "::gpib0,9,1::INSTR", (111, CORE_PORT)),
}
PORTMAPPER, CORE, ABORT, INTERRUPT = 100000, 0x0607AF, 0x0607B0, 0x0607B1
DEVICE_READ, DEVICE_ABORT = 12, 1
SUCCESS, TERM_CHAR = "00000000", "3FFF0005"
NOT_FOUND, LOST, TIMED_OUT, ENDED = "BFFF0011", "BFFF00A6", "BFFF0015", "BFFF0030"
LONGEST = 30000  # milliseconds for a call that ends at once, on a machine that is busy with something else

options, name, ports = SERVICES[PROTOCOL]
rpc = PROTOCOL in ("vxi11", "gateway")
clients, instruments = Switch(1), Switch(2)
client_host, instrument_host = Host(clients), Host(instruments)
instrument_host.start_simulator(SIMULATOR, "--listen", instrument_host.address, *options)
relay = Relay("10.1.0.1", "10.2.0.1", instrument_host.address, ports, ports if rpc else ())
resource = f"TCPIP::10.1.0.1{name}"
environment = dict(os.environ, XDG_CONFIG_HOME="/nonexistent", KYVISA_CONFIG="/nonexistent")
environment.pop("KYVISA_PORTMAPPER_PORT", None)
client = client_host.start(CLIENT, stdin=subprocess.PIPE, stdout=subprocess.PIPE, text=True, env=environment)
findings = 0


def say(*words):
    client.stdin.write(" ".join(map(str, words)) + "\n")
    client.stdin.flush()


def order(*words):
    """What the client answers, as names and values; a value alone has the name ''."""
    say(*words)
    line = client.stdout.readline()
    if not line:
        sys.exit("the client has gone")
    return dict(word.split("=", 1) if "=" in word else ("", word) for word in line.split())


def expect(what, good, told):
    global findings
    if not good:
        findings += 1
        print(f"  {what}: {told}   <-- wrong", flush=True)
    return good


def whole(told):
    end = TERM_CHAR if PROTOCOL == "socket" else SUCCESS
    return [told.get(key) for key in ("open", "write", "read", "text", "close")] == [SUCCESS, SUCCESS, end, "5", SUCCESS]


def ended_by(told, while_opening, afterwards):
    """The calls succeeded up to one, and that one and those behind it say why they did not."""
    if told["open"] != SUCCESS:
        return told["open"] == while_opening
    calls = [told["write"], told["read"]]
    good = {SUCCESS, TERM_CHAR}
    failed = [status not in good for status in calls]
    return (told["close"] == SUCCESS and failed == sorted(failed) and (not failed[0] or failed[1])
            and all(status in good or status == afterwards for status in calls) and (failed[1] or told["text"] == "5"))


def conversation(title, **manners):
    passage = relay.behave(**manners)
    print(f"{PROTOCOL}: {title}", flush=True)
    told = order("exchange", resource)
    expect("an exchange", whole(told), told)
    told = order("blocks", resource)
    expect("blocks", told.get("") == "equal", told)
    if PROTOCOL != "socket":
        told = order("service", resource)
        wanted = {"enable": SUCCESS, "write": SUCCESS, "wait": SUCCESS, "poll": SUCCESS, "requested": "yes"}
        expect("a service request", {key: told.get(key) for key in wanted} == wanted, told)
    # The library gives an abort half a second to be made: on a busy machine that may be over before it has begun.
    for _ in range(5):
        passage.calls.discard((CORE, DEVICE_READ))
        say("terminate", resource)
        if rpc:  # or there would be nothing to abort
            expect("the call to abort", passage.await_call(CORE, DEVICE_READ), passage.calls)
        told = order("now")
        wanted = (ENDED, SUCCESS, "7")
        expect("a read that is ended", (told.get("read"), told.get("clear"), told.get("text")) == wanted, told)
        if not rpc or (ABORT, DEVICE_ABORT) in passage.calls:
            break
    if rpc:
        programs = {program for program, _ in passage.calls}
        expect("channels", programs == {PORTMAPPER, CORE, ABORT, INTERRUPT}, programs)
    expect("bytes both ways", min(passage.passed.values()) > 20000, passage.passed)


conversation("as it is")
conversation("one byte at a time", piece=1)
conversation("in odd pieces, each one late", piece=1999, delay=0.001)
conversation("merged", merge=0.002)

passage = relay.behave()
told = order("exchange", resource)
expect("an exchange", whole(told), told)
lengths = dict(passage.passed)
places = [(direction, count) for direction in (TO_INSTRUMENT, TO_CLIENT) for count in range(0, lengths[direction] + 1, STEP)]
print(f"{PROTOCOL}: an exchange is {lengths}", flush=True)

print(f"{PROTOCOL}: split at every byte", flush=True)
for place in places:
    passage = relay.behave(split=place)
    told = order("exchange", resource)
    expect(f"split at {place}", whole(told) and passage.passed == lengths, (told, passage.passed))

print(f"{PROTOCOL}: cut at every byte", flush=True)
broken = longest = 0
for number, place in enumerate(places):
    relay.behave(cut=place, reset=number % 2 == 1)
    told = order("exchange", resource)
    expect(f"cut at {place}", ended_by(told, NOT_FOUND, LOST) and int(told["ms"]) < LONGEST, told)
    broken += not whole(told)
    longest = max(longest, int(told["ms"]))
    relay.behave()
    told = order("exchange", resource)
    expect(f"opened anew behind a cut at {place}", whole(told), told)
print(f"  {broken} of {len(places)} exchanges ended early, the longest after {longest} ms", flush=True)
expect("most cuts were felt", broken > len(places) * 2 // 3, broken)

print(f"{PROTOCOL}: silent from some byte on", flush=True)
for place in places[1::max(1, len(places) // 8)]:
    relay.behave(stall=place)
    told = order("exchange", resource, 150)
    expect(f"silent at {place}", ended_by(told, TIMED_OUT, TIMED_OUT) and int(told["ms"]) < LONGEST, told)
    relay.behave()
    told = order("exchange", resource)
    expect(f"opened anew behind a silence at {place}", whole(told), told)

client.stdin.close()
expect("the client's end", client.wait(60) == 0, client.returncode)
sys.exit(1 if findings else 0)
