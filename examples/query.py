#!/usr/bin/python3
"""Asks an instrument a question with PyVISA on libkyvisa.so.

    query.py LIBRARY [RESOURCE [QUESTION]]

LIBRARY is the path of libkyvisa.so.
"""
import sys

import pyvisa

library = sys.argv[1]
resource = sys.argv[2] if len(sys.argv) > 2 else "TCPIP::localhost::hislip0::INSTR"
question = sys.argv[3] if len(sys.argv) > 3 else "*IDN?"

with pyvisa.ResourceManager(library).open_resource(resource, timeout=5000) as instrument:
    instrument.write_termination = "\n"
    if resource.upper().endswith("::SOCKET"):
        instrument.read_termination = "\n"  # a raw socket does not tell where an answer ends
    print(instrument.query(question).strip())
