#!/usr/bin/python3
"""make_seeds.py CONTRACT.json SCHEMA-FOLDER SCENARIOS SEEDS

Writes the seeds of every fuzz target into SEEDS/TARGET: of a deserializer what its cases of the
contract receive, of the others each message of the schema with all its fields, alone or as it is found."""

import json
import pathlib
import struct
import subprocess
import sys

sys.path.insert(0, str(pathlib.Path(__file__).resolve().parent.parent / "tests" / "support"))
import schema  # pylint: disable=wrong-import-position

# Behind each message what encoders do not write: a packed list or a number where a text is, unknown
# fields and groups, an enumeration's number that is no member, a length behind the end.
UNUSUAL = bytes.fromhex("5a020063 3007 c33e0801c43e 7063 6a0308")

# A session in which every call ends in another way; the first records are overwritten by the others.
SESSION_FILE = pathlib.Path(__file__).resolve().parent.parent / "qel-wire" / "tests" / "session_file.py"
SAID = 3 * b"""> chat_request_serialize 1 5807602a
> invite_chat_request_serialize 2 -
< chat_reply_deserialize 2 58076a0208 100
< ClientEcho 3 0807
"""


def capture(data):
    """A file of tcpdump's with two packets of TCP, the second one before the first."""
    file = struct.pack("<IHHiIII", 0xA1B2C3D4, 2, 4, 0, 0, 65535, 101)  # packets begin with IP
    for begin, part in ((len(data) // 2, data[len(data) // 2:]), (0, data[:len(data) // 2])):
        tcp = struct.pack(">HHIIBBHHH", 40000, 9000, 1 + begin, 0, 5 << 4, 16, 0, 0, 0)
        ip = struct.pack(">BBHHHBBH4s4s", 0x45, 0, 40 + len(part), 0, 0, 64, 6, 0, b"\n\0\0\1", b"\n\0\0\2")
        file += struct.pack("<IIII", 1, 0, 40 + len(part), 40 + len(part)) + ip + tcp + part
    return file


def session_file(lines, *size):
    return subprocess.run([SESSION_FILE, "/dev/stdout", *size], input=lines, check=True, stdout=subprocess.PIPE).stdout


def main():
    contract, schema_folder, scenarios, folder = sys.argv[1:]
    contract = json.loads(pathlib.Path(contract).read_text())

    def seed(target, name, data):
        path = pathlib.Path(folder, target, str(name))
        path.parent.mkdir(parents=True, exist_ok=True)
        path.write_bytes(data)

    for number, case in enumerate(contract["cases"]):
        if "received" in case and case["call"] in contract["messages"]:
            seed(case["call"], number, bytes.fromhex(case["received"]["bytes"]))
    said = b""
    for number, message in enumerate(schema.messages(schema_folder)):
        name = message.DESCRIPTOR.name
        encoded = schema.fill(message).SerializeToString(deterministic=True)
        seed("round_trip", name, bytes([number]) + encoded)  # the first byte chooses the message
        seed("testkit", name, bytes([number]) + encoded)
        said += f"< {name} 1 {encoded.hex()}\n> {name} 1 {encoded.hex()}\n".encode()
        seed("qel_wire", name, bytes([number]) + encoded)
        seed("qel_wire", f"{name}_unusual", bytes([number]) + UNUSUAL)
        seed("qel_wire_input", f"{name}_run", encoded * 2)
        seed("qel_wire_input", f"{name}_frames", 2 * (len(encoded).to_bytes(4, "big") + encoded))
        seed("qel_wire_input", f"{name}_example", bytes([len(name)]) + name.encode() + len(encoded).to_bytes(4, "big") + encoded)
        seed("qel_wire_input", f"{name}_pcap", capture(encoded))
    seed("testkit", "session", session_file(said))
    seed("qel_wire_input", "session", session_file(SAID, "1024"))
    data = bytes(range(32)) + b"ab cd 12"
    for command in ("xxd", "xxd -i", "xxd -p", "hexdump -C", "hexdump", "od", "od -tx1z", "od -c", "base64"):
        dump = subprocess.run(command.split(), input=data, check=True, stdout=subprocess.PIPE).stdout
        seed("qel_wire_input", command.replace(" ", ""), dump)
    for number, text in enumerate(('"\\x08\\7`*"', "{0x08, 0x07}", '["08", "0x07"]', "08:07-60", "$1 = {8, 7}")):
        seed("qel_wire_input", f"text_{number}", text.encode())
    for scenario in pathlib.Path(scenarios).iterdir():  # without the comment that it begins with
        seed("testkit", scenario.name, scenario.read_bytes().split(b"\n\n", 1)[1])
    for number in range(len(contract["messages"])):  # the first byte chooses the function
        seed("serializers", number, bytes([number]) + bytes(range(1, 200)))
        seed("serializers", f"{number}_ones", bytes([number]) + b"\1\1" * 100)


main()
