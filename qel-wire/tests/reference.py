"""reference.py CHECK SOURCE: every message of the schema, with all its fields, by qel-wire and by the
reference encoder, Debian's python3-protobuf. Prints the messages on which they disagree."""

import json
import pathlib
import subprocess
import sys

from google.protobuf import json_format, text_format

check, source = sys.argv[1], pathlib.Path(sys.argv[2])
sys.path.insert(0, str(source / "tests" / "support"))
import schema  # pylint: disable=wrong-import-position


def qel_wire(*arguments, data=b""):
    return subprocess.run(["qel-wire", *arguments], input=data, check=True, stdout=subprocess.PIPE).stdout


def wire_types(message):
    """What tells messages apart that have all their fields."""
    return {field.number: field.type in (field.TYPE_STRING, field.TYPE_BYTES, field.TYPE_MESSAGE)
            for field in message.fields}


def agrees(message):
    name, data = message.DESCRIPTOR.name, message.SerializeToString()
    text = text_format.MessageToString(message, as_utf8=True).encode()
    if check == "text":
        return qel_wire("decode", "--show-token", name, data=data) == text
    if check == "json":
        printed = qel_wire("decode", "--show-token", "--json", name, data=data)
        return json.loads(printed) == json.loads(json_format.MessageToJson(message))
    if check == "bytes":
        return qel_wire("encode", name, data=text) == data
    ranks = [line.split() for line in qel_wire("guess", "--all", data=data).decode().splitlines()]
    first = {other for rank, other, *_ in ranks if rank == "1"}
    alike = {other.name for other in types if wire_types(other) == wire_types(message.DESCRIPTOR)}
    return name in first <= alike and len(ranks) == len(types)


messages = schema.messages(source / "proto-lib")
types = [message.DESCRIPTOR for message in messages]
different = [message.DESCRIPTOR.name for message in messages if not agrees(schema.fill(message))]
print(*different)
sys.exit(not types or different != [])
