#!/usr/bin/env python3
"""wire_format.py BUILD

Prints docs/wire-format.md: the worked examples of examples/wire_format.c, run from the folder BUILD,
and their bytes as qel-wire explains them."""

import pathlib
import re
import subprocess
import sys

HEAD = """\
# The wire format by examples

What goes over the wire are the messages of [the schema](../proto-lib/msgspec_frontend.proto) in the
encoding of Protocol Buffers, without framing: each field is a tag (its number, and how its value is
written) and a value. A number is a varint, seven bits a byte, the lowest first; a text and an embedded
message begin with their length. What a message does not have is not there.

One example for each family of messages: the call, what it logs, and the bytes as
[`qel-wire explain`](../qel-wire/README.md) shows them. In log lines `...` stands for the thread. All of it is
made by running [`examples/wire_format.c`](../examples/wire_format.c) (`./dev docs`), and a test
compares.
"""

SECTION = re.compile(r"/\* ---- (?P<title>.*) ----\n(?P<text>(?: \*.*\n)+?) \*/\n")
EXAMPLE = re.compile(
    r"/\* (?P<message>[A-Z]\w+)(?P<text>(?:\n \*(?!/).*)*?)(?:\n)? \*/\n"
    r"static void (?P<function>\w+)\(.*\) \{\n(?P<body>(?:.*\n)+?)\}\n")


def block(language, text):
    return f"```{language}\n{text.rstrip()}\n```\n"


def without_stars(comment):
    return re.sub(r"^ \* ?", "", comment, flags=re.M).strip()


def run(*command, data=b""):
    done = subprocess.run(command, input=data, stdout=subprocess.PIPE, stderr=subprocess.PIPE, check=True)
    return done.stdout, done.stderr.decode()


def log_lines(log):
    """As the stand-in prints them, but for what differs from run to run."""
    lines = re.sub(r"^[0-9:.]+ (\w) (\w+) P\d+ T\d+: ", r"\1 \2: ", log, flags=re.M)
    return re.sub(r"\[\d+\]", "[...]", lines)


def example(tool, program, found):
    message, function, text = found["message"], found["function"], without_stars(found["text"])
    parts = [f"### {message}\n"]
    sent = b""
    if text:
        sent, _ = run(tool, "encode", message, data=text.encode())
    printed, log = run(program, function, data=sent)
    explained, _ = run(tool, "explain", message, data=sent if text else printed)
    if text:
        parts += ["The service sends\n", block("text", text), "which is\n", block("text", explained.decode())]
    body = re.sub(r"^  ", "", found["body"], flags=re.M)
    parts += ["The plug-in receives it as `data` and `size`:\n" if text else "The plug-in sends it:\n",
              block("c", body)]
    if text:
        parts += ["This prints\n", block("text", printed.decode())]
    parts += ["and logs\n" if text else "This logs\n", block("text", log_lines(log))]
    if not text:
        parts += ["and sends\n", block("text", explained.decode())]
    return parts


def main():
    build = pathlib.Path(sys.argv[1])
    source = (pathlib.Path(__file__).parent.parent / "examples/wire_format.c").read_text()
    tool, program = build / "qel-wire/qel-wire", build / "examples/wire_format"
    parts = [HEAD]
    found = sorted([*SECTION.finditer(source), *EXAMPLE.finditer(source)], key=lambda match: match.start())
    for match in found:
        if match.re is SECTION:
            parts += [f"## {match['title']}\n", without_stars(match["text"]) + "\n"]
        else:
            parts += example(tool, program, match)
    print("\n".join(parts), end="")


main()
