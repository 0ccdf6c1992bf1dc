#!/usr/bin/env python3
"""session_file.py FILE [SIZE]: makes a session file of lines on standard input, a record for each:

    DIRECTION NAME END BYTES [MISSING]

"> chat_request_serialize 1 5807": DIRECTION is ">" if the plug-in sent it, "<" if it received it, END
how the call ended, BYTES hex or "-", MISSING how many bytes behind these were not recorded. The
records come a second after each other. A line "at NUMBER" gives the next record that number. With
SIZE, the file has two sections of half of it, which are filled in turn. The bytes of a file that is
there are replaced in place."""

import os
import struct
import sys

BEGIN = 1795428000  # 2026-11-23 10:00:00 UTC
ROOM = 0x80000000


def block(kind, body):
    body += bytes(-len(body) % 4)
    size = len(body) + 12
    return struct.pack("<II", kind, size) + body + struct.pack("<I", size)


def beginning():
    nanoseconds = struct.pack("<HHB3xHH", 9, 1, 9, 0, 0)
    return (block(0x0A0D0D0A, struct.pack("<IHHq", 0x1A2B3C4D, 1, 0, -1)) +
            block(1, struct.pack("<HHI", 147, 0, 0) + nanoseconds))


def record(number, second, line):
    direction, name, end, text, missing = (line.split() + ["0"])[:5]
    data = b"qel\1" + struct.pack("<IBBH", number, "> <".index(direction) // 2 + 1, int(end), len(name))
    data += name.encode() + (b"" if text == "-" else bytes.fromhex(text))
    time = (BEGIN + second) * 10**9 + 123456789
    return block(6, struct.pack("<IIIII", 0, time >> 32, time & 0xFFFFFFFF, len(data), len(data) + int(missing)) + data)


def records(lines):
    number, second = 1, 0
    for line in lines:
        if line.startswith("at "):
            number = int(line[3:])
        else:
            yield record(number, second, line)
            number, second = number + 1, second + 1


def main():
    name, size = sys.argv[1], int((sys.argv + ["0"])[2])
    sections = [beginning(), beginning()] if size else [beginning()]
    now = 0
    for each in records(sys.stdin):
        if size and len(sections[now]) + len(each) + 12 > size // 2:
            now = 1 - now
            sections[now] = beginning()
        sections[now] += each
    if size:
        sections = [each + block(ROOM, bytes(size // 2 - len(each) - 12)) for each in sections]
    content = b"".join(sections)
    with open(os.open(name, os.O_WRONLY | os.O_CREAT, 0o644), "wb") as file:
        file.write(content)
        if file.seekable():
            file.truncate()


main()
