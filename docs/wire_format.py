#!/usr/bin/python3
"""wire_format.py CONTRACT.json QEL-WIRE

Prints docs/wire-format.md: the first case of each function in the contract, and its bytes as qel-wire
explains them."""

import json
import pathlib
import subprocess
import sys

HEAD = """\
# The wire format by examples

What goes over the wire are the messages of [the schema](../proto-lib/msgspec_frontend.proto) in the
encoding of Protocol Buffers, without framing: each field is a tag (its number, and how its value is
written) and a value. A number is a varint, seven bits a byte, the lowest first; a text and an embedded
message begin with their length. What a message does not have is not there.

One example for each function: what it is given or receives, what it does in order, and the bytes as
[`qel-wire explain`](qel-wire.md) shows them. D, I, W and E are the levels of log lines. The examples
are the first cases of [the contract](contract.md); `./dev docs` writes this page, and a test compares.
"""


def shown(value):
    return "NULL" if value is None else json.dumps(value, ensure_ascii=False)


def named(values):
    return ", ".join(f"{name} = {shown(value)}" for name, value in values.items())


def block(step, what):
    between = ", " if step == "calloc" else " * "
    return f"asks for {step}({what['count']}{between}{what['size']}): {what['for']}"


def course(case):
    """What the call does, a line for each step."""
    for entry in case["does"]:
        (step, what), = entry.items()
        if step in ("debug", "info", "warn", "error"):
            text, *arguments = what if isinstance(what, list) else [what]
            text = text.replace("%lld", "%d") % tuple(arguments) if arguments else text
            yield f"logs {step[0].upper()}: {text}".replace("\n", "\\n")
        elif step == "encode":
            length = len(what["bytes"]) // 2
            yield f"writes size = {length}"
            yield f"asks for calloc({length}, 1): serialized_data"
            yield "encodes the message there"
        elif step == "parse":
            yield f"parses what was received; the stream is {what['stream']}"
        elif step == "copy":
            yield f"copies {what} for itself"
        elif step == "write":
            yield f"writes {named(what)}"
        elif step == "strdup":
            yield f"copies {shown(what['text'])}: {what['for']}"
        else:
            yield block(step, what)
    if "returns" in case:
        yield f"returns {case['returns']}"


def example(case, message, explain):
    parts = [f"### {case['call']}\n", case["case"] + ".\n"]
    if case.get("given"):
        parts += ["Given", f"```text\n{named(case['given'])}\n```\n"]
    parts += ["It", "```text\n" + "".join(line + "\n" for line in course(case)) + "```\n"]
    encoded = [step["encode"]["bytes"] for step in case["does"] if "encode" in step]
    if encoded or "received" in case:
        data = bytes.fromhex(encoded[0] if encoded else case["received"]["bytes"])
        explained = subprocess.run([explain, "explain", message], input=data, stdout=subprocess.PIPE, check=True)
        parts += [f"The `{message}` that it {'sends' if encoded else 'receives'}:",
                  f"```text\n{explained.stdout.decode()}```\n"]
    return parts


def main():
    contract = json.loads(pathlib.Path(sys.argv[1]).read_text())
    parts = [HEAD]
    family = call = None
    for case in contract["cases"]:
        if case["family"] != family:
            family = case["family"]
            parts.append(f"## {family.replace('-', ' ').capitalize()}\n")
        if case["call"] != call and case["does"]:
            parts += example(case, contract["messages"].get(case["call"]), sys.argv[2])
        call = case["call"]
    print("\n".join(parts).rstrip("\n"))


main()
