#!/usr/bin/env python3
"""session_file.py RECORD FILE: makes a session file of what relay.py has recorded of a connection."""

import struct
import sys

SENT, RECEIVED, DONE = 1, 2, 1


def frames(pieces):
    """The direction, the name and the message of each frame, in the order of their ends."""
    rest = {">": b"", "<": b""}
    for line in pieces:
        sign, text = line.split()
        data = rest[sign] + bytes.fromhex(text)
        while data and len(data) > data[0] + 5 - 1:
            name_end = 1 + data[0]
            end = name_end + 4 + int.from_bytes(data[name_end:name_end + 4], "big")
            if len(data) < end:
                break
            yield sign, data[1:name_end], data[name_end + 4:end]
            data = data[end:]
        rest[sign] = data


def block(kind, body):
    body += bytes(-len(body) % 4)
    length = struct.pack("<I", len(body) + 12)
    return struct.pack("<I", kind) + length + body + length


with open(sys.argv[1], encoding="ascii") as record, open(sys.argv[2], "wb") as session:
    session.write(block(0x0A0D0D0A, struct.pack("<IHHq", 0x1A2B3C4D, 1, 0, -1)))
    session.write(block(1, struct.pack("<HHI", 147, 0, 0)))
    for number, (sign, name, message) in enumerate(frames(record), 1):
        if name == b"ChannelAuthRequest":
            message = message.replace(b"example-access-token", b"*" * 20)
        data = b"qel\x01" + struct.pack(
            "<IBBH", number, SENT if sign == ">" else RECEIVED, DONE, len(name)) + name + message
        session.write(block(6, struct.pack("<IIIII", 0, 0, 0, len(data), len(data)) + data))
