#!/usr/bin/python3
"""make_seeds.py CONTRACT.json SCHEMA-FOLDER SEEDS

Writes the seeds of every fuzz target into SEEDS/TARGET: of a deserializer what its cases of the
contract receive, of the others each message of the schema with all its fields."""

import json
import pathlib
import sys

sys.path.insert(0, str(pathlib.Path(__file__).resolve().parent.parent / "tests" / "support"))
import schema  # pylint: disable=wrong-import-position

# Behind each message what encoders do not write: a packed list or a number where a text is, unknown
# fields and groups, an enumeration's number that is no member, a length behind the end.
UNUSUAL = bytes.fromhex("5a020063 3007 c33e0801c43e 7063 6a0308")


def main():
    contract, schema_folder, folder = sys.argv[1:]
    contract = json.loads(pathlib.Path(contract).read_text())

    def seed(target, name, data):
        path = pathlib.Path(folder, target, str(name))
        path.parent.mkdir(parents=True, exist_ok=True)
        path.write_bytes(data)

    for number, case in enumerate(contract["cases"]):
        if "received" in case and case["call"] in contract["messages"]:
            seed(case["call"], number, bytes.fromhex(case["received"]["bytes"]))
    for number, message in enumerate(schema.messages(schema_folder)):
        name = message.DESCRIPTOR.name
        encoded = schema.fill(message).SerializeToString(deterministic=True)
        seed("round_trip", name, bytes([number]) + encoded)  # the first byte chooses the message
        seed("qel_wire", name, bytes([number]) + encoded)
        seed("qel_wire", f"{name}_unusual", bytes([number]) + UNUSUAL)
    for number in range(len(contract["messages"])):  # the first byte chooses the function
        seed("serializers", number, bytes([number]) + bytes(range(1, 200)))
        seed("serializers", f"{number}_ones", bytes([number]) + b"\1\1" * 100)


main()
