#!/usr/bin/env python3
"""The rules of docs/fault-matrix.md: what each operation of the tester answers while the instrument misbehaves.

    fault_rules.py write PAGE    writes the tables of the page anew
    fault_rules.py check PAGE    status 1 when the page does not say what the rules say

A cell follows from what the operation exchanges with the instrument (EXCHANGES) and from what a fault does to such an exchange
(the rule functions). A cell that is otherwise stands in EXCEPTIONS with its reason, which the page shows.
"""
import pathlib
import sys

OPERATIONS = [
    "open", "write", "read", "query", "printf", "scanf", "queryf", "read-stb", "trigger", "clear", "lock", "lock-shared", "unlock",
    "ren", "atn", "ifc", "command", "pass-control", "enable-event", "wait-event", "get-attribute", "set-attribute", "close",
]
FAULTS = [
    "none", "delay", "late", "drop-reply", "cut", "short-header", "oversized-header", "garbage", "change-byte", "stale-id", "no-end",
    "refuse-lock", "withhold-srq", "repeat-srq", "nonsense-status", "fill-errors",
]
WAYS = ["socket", "hislip", "hislip-async", "overlapped", "overlapped-async", "vxi11", "gpib", "serial"]
REFUSED = "refused"
READS = ("read", "query", "scanf", "queryf")

HEADERLESS = ("socket", "serial")
#: faults that the simulator does not take for a protocol
NOT_POSSIBLE = {
    "socket": {"short-header", "oversized-header", "stale-id", "refuse-lock", "withhold-srq", "repeat-srq", "nonsense-status"},
    "serial": {"cut", "short-header", "oversized-header", "stale-id", "refuse-lock", "withhold-srq", "repeat-srq", "nonsense-status"},
    "hislip-async": {"change-byte", "stale-id", "no-end"},
    "overlapped-async": {"change-byte", "stale-id", "no-end"},
}


def protocol(way):
    """The contract that the way follows, without the channel."""
    return way.removesuffix("-async")


def is_hislip(way):
    return protocol(way) in ("hislip", "overlapped")


def plain(way, operation):
    """Without any fault."""
    if operation in ("atn", "ifc", "command", "pass-control"):
        return "OK" if way == "gpib" else "NSUP_OPER"
    if operation == "ren" and way in HEADERLESS:
        return "NSUP_OPER"
    if operation in ("enable-event", "wait-event") and way in HEADERLESS:
        return "INV_EVENT"
    return "OK"


def exchange(way, operation):
    """What the operation waits for on the channel that the fault is on. None: for nothing that the fault touches.

    answer    data that the instrument was asked for
    status    the line that answers "*STB?"
    sync      a message of the synchronous channel without payload
    async     a message of the asynchronous channel without payload
    size      one of the asynchronous channel with a payload of 8 bytes
    notice    one that nobody asked for
    call      a reply of ONC RPC with up to two words of results: "call", of more: "long-call"; calls: the second of two is struck too
    """
    if plain(way, operation) != "OK":
        return None
    if way in HEADERLESS:
        if operation in READS:
            return "answer"
        return "status" if operation == "read-stb" else None
    if way in ("hislip", "overlapped"):
        if operation in READS:
            return "answer"
        return "sync" if operation in ("open", "clear") else None
    if way in ("hislip-async", "overlapped-async"):
        if operation in ("open", "read-stb", "clear", "lock", "lock-shared", "unlock", "ren"):
            return "async"
        return {"set-attribute": "size", "wait-event": "notice"}.get(operation)
    # VXI-11, with and without the gateway: everything but the locks and attributes of this side is a call.
    if operation in ("lock-shared", "wait-event", "close"):
        return None
    if operation == "read" or operation == "scanf":
        return "answer"
    if operation in ("query", "queryf"):
        return "write-answer"
    if operation == "open":
        return "long-call"
    if operation in ("get-attribute", "set-attribute"):
        return "long-calls" if way == "gpib" else None  # a link to the interface, then its command
    if operation in ("atn", "command", "pass-control"):
        return "long-call"  # the instrument's echo of the data
    if operation == "enable-event":
        return "call" if way == "gpib" else "calls"  # the channel is the host's, not the address's
    return "call"


def lost(operation):
    """The connection breaks off, or says what no instrument can mean."""
    return "RSRC_NFOUND" if operation == "open" else "CONN_LOST"


def struck(way, fault, operation, kind):
    """What a fault of messages does to an exchange of this kind."""
    ok = plain(way, operation)
    if kind is None or fault in ("delay", "fill-errors"):
        return ok
    if kind == "notice":  # waiting for an event hears of events alone
        return "TMO"
    if fault in ("late", "drop-reply"):
        return "TMO"
    if way in HEADERLESS:
        if fault == "cut":
            return "CONN_LOST"
        if fault == "garbage":  # a line of noise: data to a read, no number for the status byte
            return "RAW_RD_PROT_VIOL" if kind == "status" else ok
        return "TMO" if fault == "no-end" else ok
    if fault in ("cut", "garbage"):
        return lost(operation)
    has_data = kind in ("answer", "write-answer")
    if fault == "no-end":
        return "TMO" if has_data else ok
    if fault == "change-byte":
        return ok
    if is_hislip(way):
        if fault == "oversized-header":
            return lost(operation)
        if fault == "short-header":  # with a payload its bytes make a length that cannot be; without one the rest is waited for
            return lost(operation) if has_data or kind == "size" else "TMO"
        # stale-id: ids mean something to answers in synchronized mode alone
        return "TMO" if has_data and way == "hislip" else ok
    if fault == "stale-id":
        return "TMO"
    if fault == "oversized-header":  # the first call has got all that it needs, the next one waits behind what never comes
        return "TMO" if kind in ("calls", "long-calls", "write-answer") else ok
    # short-header: two words are too few to finish the header; more make a verifier that is too long
    if kind in ("call", "calls", "write-answer"):
        return "TMO"
    return lost(operation)


def rule(way, fault, operation):
    if fault in NOT_POSSIBLE.get(way, ()):
        return REFUSED
    ok = plain(way, operation)
    if fault == "none":
        return ok
    if fault == "refuse-lock":
        asks = operation == "lock" or (operation == "lock-shared" and is_hislip(way))
        return "TMO" if asks else ok
    if fault == "withhold-srq":
        return "TMO" if operation == "wait-event" else ok
    if fault in ("repeat-srq", "nonsense-status"):
        return ok
    return struck(way, fault, operation, exchange(way, operation))


#: (way, fault, operation) -> status, number of its reason
EXCEPTIONS = {}
REASONS = {
    1: "Formatted operations know a time-out and everything else (VPP-4.3): a connection that is lost is IO to them.",
}
for each in WAYS:
    for what in FAULTS:
        for formatted in ("printf", "scanf", "queryf"):
            if rule(each, what, formatted) == "CONN_LOST":
                EXCEPTIONS[each, what, formatted] = ("IO", 1)

BEGIN = "<!-- tables -->\n"


def cell(way, fault, operation):
    if (way, fault, operation) in EXCEPTIONS:
        status, reason = EXCEPTIONS[way, fault, operation]
        return f"{status} [{reason}]"
    return rule(way, fault, operation)


def tables():
    text = ""
    for way in WAYS:
        text += f"\n## {way}\n\n| operation | " + " | ".join(FAULTS) + " |\n" + "|---" * (len(FAULTS) + 1) + "|\n"
        for operation in OPERATIONS:
            text += f"| {operation} | " + " | ".join(cell(way, fault, operation) for fault in FAULTS) + " |\n"
    if REASONS:
        text += "\n## Cells that differ from their rule\n\n" + "".join(f"{n}. {REASONS[n]}\n" for n in sorted(REASONS))
    return text


def main():
    for (way, fault, operation), (status, reason) in EXCEPTIONS.items():
        if reason not in REASONS or status == rule(way, fault, operation):
            sys.exit(f"{way}, {fault}, {operation}: an exception without a reason, or that is the rule")
    page = pathlib.Path(sys.argv[2])
    head, begin, rest = page.read_text(encoding="utf-8").partition(BEGIN)
    if not begin:
        sys.exit(f"{page} has no line {BEGIN}")
    if sys.argv[1] == "write":
        page.write_text(head + begin + tables(), encoding="utf-8")
    elif rest != tables():
        sys.exit(f"{page} is not what the rules say: run {sys.argv[0]} write {page}")
    print(f"{len(WAYS) * len(FAULTS) * len(OPERATIONS)} cells, {len(EXCEPTIONS)} of them otherwise than their rule")


if len(sys.argv) != 3 or sys.argv[1] not in ("write", "check"):
    sys.exit(__doc__)
main()
