"""reference.py CHECK SOURCE: every message of the schema, with all its fields, by qel-wire and by the
reference encoder, Debian's python3-protobuf. Prints the messages on which they disagree."""

import json
import pathlib
import subprocess
import sys
import tempfile

from google.protobuf import descriptor_pb2, descriptor_pool, json_format, message_factory, text_format

check, source = sys.argv[1], pathlib.Path(sys.argv[2])


def qel_wire(*arguments, data=b""):
    return subprocess.run(["qel-wire", *arguments], input=data, check=True, stdout=subprocess.PIPE).stdout


def messages_of_schema():
    with tempfile.NamedTemporaryFile() as descriptors:
        subprocess.run(
            ["protoc", f"--proto_path={source}/proto-lib", f"--descriptor_set_out={descriptors.name}",
             "msgspec_frontend.proto"], check=True, stderr=subprocess.DEVNULL)
        schema = descriptor_pb2.FileDescriptorSet.FromString(descriptors.read()).file[0]
    pool = descriptor_pool.DescriptorPool()
    pool.Add(schema)
    return [pool.FindMessageTypeByName(message.name) for message in schema.message_type]


def value(field, n):
    if field.enum_type:
        return field.enum_type.values[-1].number
    return {field.TYPE_STRING: 'é안"\\\n', field.TYPE_BYTES: b"\0\xff", field.TYPE_BOOL: True}.get(
        field.type, -100 * field.number - n)


def fill(message):
    for field in message.DESCRIPTOR.fields:
        repeated = field.label == field.LABEL_REPEATED
        of_message = getattr(message, field.name)
        if field.message_type:
            for part in [of_message.add(), of_message.add()] if repeated else [of_message]:
                fill(part)
        elif repeated:
            of_message.extend([value(field, 0), value(field, 1)])
        else:
            setattr(message, field.name, value(field, 0))
    return message


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


types = messages_of_schema()
different = [message.name for message in types
             if not agrees(fill(message_factory.MessageFactory().GetPrototype(message)()))]
print(*different)
sys.exit(not types or different != [])
