"""The messages of the schema in Debian's python3-protobuf, and each with all its fields."""

import subprocess
import tempfile

from google.protobuf import descriptor_pb2, descriptor_pool, message_factory


def messages(folder):
    """An empty message of each type, in the schema's order. FOLDER is that of the schema."""
    with tempfile.NamedTemporaryFile() as descriptors:
        subprocess.run(
            ["protoc", f"--proto_path={folder}", f"--descriptor_set_out={descriptors.name}", "msgspec_frontend.proto"],
            check=True, stderr=subprocess.DEVNULL)
        schema = descriptor_pb2.FileDescriptorSet.FromString(descriptors.read()).file[0]
    pool = descriptor_pool.DescriptorPool()
    pool.Add(schema)
    factory = message_factory.MessageFactory()
    return [factory.GetPrototype(pool.FindMessageTypeByName(message.name))() for message in schema.message_type]


def value(field, n):
    if field.enum_type:
        return field.enum_type.values[-1].number
    return {field.TYPE_STRING: 'é안"\\\n', field.TYPE_BYTES: b"\0\xff", field.TYPE_BOOL: True}.get(
        field.type, -100 * field.number - n)


def fill(message):
    """Sets every field, two elements of each list, as deep as it goes."""
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
