"""qel_wire_json.py QEL-WIRE SOURCE: the JSON form of every message with all its fields, beside that of
the independent peer, Debian's python3-protobuf."""

import json
import pathlib
import subprocess
import sys
import tempfile

from google.protobuf import descriptor_pb2, descriptor_pool, json_format, message_factory

tool, source = sys.argv[1], pathlib.Path(sys.argv[2])

with tempfile.NamedTemporaryFile() as descriptors:
    subprocess.run(
        ["protoc", f"--proto_path={source}/proto-lib", f"--descriptor_set_out={descriptors.name}",
         "msgspec_frontend.proto"],
        check=True, stderr=subprocess.DEVNULL)
    files = descriptor_pb2.FileDescriptorSet.FromString(descriptors.read())
pool = descriptor_pool.DescriptorPool()
for file in files.file:
    pool.Add(file)

different = 0
seeds = sorted((source / "fuzz/seeds/round_trip").iterdir())
for seed in seeds:
    data = seed.read_bytes()[1:]  # behind the byte that chooses the message
    message = message_factory.MessageFactory(pool).GetPrototype(
        pool.FindMessageTypeByName(seed.name))()
    message.ParseFromString(data)
    expected = json.loads(json_format.MessageToJson(message))
    printed = subprocess.run([tool, "decode", "--json", "--show-token", seed.name], input=data,
                             check=True, stdout=subprocess.PIPE).stdout
    if json.loads(printed) != expected:
        different += 1
        print(f"{seed.name}: {printed.decode()}\ninstead of {json.dumps(expected, indent=2)}")
sys.exit(different > 0 or len(seeds) != 81)
