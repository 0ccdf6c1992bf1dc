#!/usr/bin/python3
"""session.py FILE...: the records of session files, read by their page's own words. A line for each: number,
direction, how the call ended, name, bytes in hex. Fails where a file is not a row of whole blocks."""

import struct
import sys

SECTION, PACKET, UNUSED = 0x0A0D0D0A, 6, 0x80000000
DIRECTIONS = {1: "sent", 2: "received"}
ENDS = {0: "not-ended", 1: "done", 2: "refused", 3: "untold"}


def blocks(data):
    at = 0
    while at < len(data):
        kind, size = struct.unpack_from("<II", data, at)
        end = at + size
        if size < 12 or end > len(data) or struct.unpack_from("<I", data, end - 4)[0] != size:
            # A process may be killed between the two stores of an unused block's lengths.
            if kind != UNUSED:
                sys.exit(f"no whole block at {at}")
            size = (at // (len(data) // 2) + 1) * (len(data) // 2) - at
        yield kind, data[at + 8:at + size - 4]
        at += size


def record(packet):
    _, _, _, captured, original = struct.unpack_from("<IIIII", packet)
    data = packet[20:20 + captured]
    magic, number, direction, end, name_size = struct.unpack_from("<4sIBBH", data)
    assert magic == b"qel\1", magic
    name = data[12:12 + name_size].decode()
    cut = f" of {original}" if original > captured else ""
    return number, f"{DIRECTIONS[direction]} {ENDS[end]} {name} {data[12 + name_size:].hex()}{cut}".rstrip()


for file in sys.argv[1:]:
    with open(file, "rb") as opened:
        found = list(blocks(opened.read()))
    assert [kind for kind, _ in found].count(SECTION) == 2
    for number, text in sorted(record(content) for kind, content in found if kind == PACKET):
        print(number, text)
