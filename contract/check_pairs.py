#!/usr/bin/python3
"""check_pairs.py CONTRACT.json PROTOC SCHEMA-FOLDER

Compares the text form of every message of the contract with its bytes, by an implementation of
Protocol Buffers that is not the library's. Where flags say that the bytes are written in an unusual
way, they are decoded and compared instead."""

import concurrent.futures
import json
import subprocess
import sys


def main():
    contract_file, protoc, schema = sys.argv[1:]
    with open(contract_file, encoding="utf-8") as file:
        contract = json.load(file)

    def run(option, message, data):
        done = subprocess.run([protoc, f"--proto_path={schema}", f"--{option}={message}", "msgspec_frontend.proto"],
                              input=data, stdout=subprocess.PIPE, stderr=subprocess.PIPE, check=False)
        if done.returncode != 0:
            raise ValueError(done.stderr.decode(errors="replace").splitlines()[-1])
        return done.stdout

    def problem(case):
        name = contract["messages"].get(case["call"])
        parts = [case.get("received", {})] + [step["encode"] for step in case["does"] if "encode" in step]
        for part in parts:
            if "text" not in part:
                continue
            wanted = bytes.fromhex(part["bytes"])
            try:
                made = run("encode", name, part["text"].encode())
                same = made == wanted
                if case.get("flags"):
                    same = run("decode", name, made) == run("decode", name, wanted)
            except ValueError as error:
                return f"{error}"
            if not same:
                return f"the text form is encoded as {made[:200].hex(' ')}, not as {wanted[:200].hex(' ')}"
        return None

    with concurrent.futures.ThreadPoolExecutor() as pool:
        problems = list(pool.map(problem, contract["cases"]))
    for case, found in zip(contract["cases"], problems):
        if found:
            print(f"{case['call']}, {case['case']}: {found}")
    print(f"{len(problems)} cases")
    sys.exit(any(problems))


main()
