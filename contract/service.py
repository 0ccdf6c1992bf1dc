#!/usr/bin/python3
"""service.py CONTRACT.json SCHEMA-FOLDER

Plays the service: decodes every request of the contract and encodes every reply, with Debian's
python3-protobuf, and says where it does not agree. An example of another reader of the contract."""

import importlib
import json
import pathlib
import subprocess
import sys
import tempfile

from google.protobuf import text_format


def load_schema(folder):
    """The schema's classes, made by the protoc of the same implementation."""
    with tempfile.TemporaryDirectory() as made:
        subprocess.run(["protoc", f"--proto_path={folder}", f"--python_out={made}", "msgspec_frontend.proto"],
                       check=True, stderr=subprocess.DEVNULL)
        sys.path.insert(0, made)
        return importlib.import_module("msgspec_frontend_pb2")


def disagreement(message_class, part, is_request, flags):
    wanted = text_format.Parse(part["text"], message_class())
    got = message_class()
    got.ParseFromString(bytes.fromhex(part["bytes"]))
    if flags:
        got.DiscardUnknownFields()
    if got != wanted:
        return f"the bytes are {text_format.MessageToString(got, as_one_line=True)[:300]}"
    if not is_request and not flags and wanted.SerializeToString(deterministic=True).hex() != part["bytes"]:
        return f"the reply is encoded as {wanted.SerializeToString(deterministic=True)[:300].hex(' ')}"
    return None


def main():
    contract = json.loads(pathlib.Path(sys.argv[1]).read_text())
    schema = load_schema(sys.argv[2])
    agreed = problems = 0
    for case in contract["cases"]:
        requests = [step["encode"] for step in case["does"] if "encode" in step]
        replies = [case["received"]] if "text" in case.get("received", {}) else []
        if "no-utf8" in case.get("flags", []):  # which this implementation does not take
            continue
        for part in requests + replies:
            message_class = getattr(schema, contract["messages"][case["call"]])
            problem = disagreement(message_class, part, part in requests, case.get("flags"))
            if problem:
                print(f"{case['call']}, {case['case']}: {problem}")
                problems += 1
            else:
                agreed += 1
    print(f"{agreed} messages agree, {problems} do not")
    sys.exit(problems > 0)


if __name__ == "__main__":
    main()
