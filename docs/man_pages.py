#!/usr/bin/env python3
"""Rewrites the man pages that Doxygen makes in the usual form of man pages.

usage: man_pages.py FOLDER-OF-DOXYGENS FOLDER

Doxygen writes one page for each section of the header. Here each function gets a page of its own.
The Markdown pages get none.
"""

import pathlib
import re
import sys


def include(name):
    """The line that brings what has this name."""
    below = "serialize" in name or name.startswith("qel_message_")
    tests = re.match(r"qel[-_](test[a-z]+)", name)
    header = (f"qel\\-{tests[1]}.h" if tests else
              "qel\\-message\\-serialize.h" if below else "qel\\-message.h")
    return f".nf\n.B #include <{header}>\n.fi\n"


def description(body):
    """A function's text, with sections and tagged paragraphs for bold and italic words."""
    body = re.sub(r"^\n\.PP\n\\fC#include .*\n\.PP\n", "", body)
    body = re.sub(r"\.PP\n\\fBExamples\\fP\n.*\n.*\n", "", body)  # they are web pages
    body = re.sub(r"^(\\fI.*?\\fP) (.*?) *\n(\.br\n)?", r".TP\n\1\n\2\n", body, flags=re.M)
    body = re.sub(
        r"\.PP\n\\fB(Who frees what|See also) *\\fP\n\.RS 4\n(.*?) *\n\.RE\n",
        lambda match: f'.SH "{match[1].upper()}"\n{match[2]}\n',
        body,
        flags=re.S,
    )
    body = re.sub(
        r"\\fB([\w-]+(_serialize|_deserialize|_read|_write|_release|\\&\.h)\\fP)",
        lambda match: match[0].replace("-", r"\-") + "(3)",
        body,
    )
    return re.sub(r"(\.PP)?\s*$", "", body) + "\n"


def functions(page):
    """Name and page of each function on a section's page."""
    version, project = re.match(r'\.TH ".*?" 3 ".*?" "Version (.*?)" "(.*?)"', page).groups()
    blocks = re.split(r'^\.SS ".*?(\w+) \(.*"\n', page, flags=re.M)
    for name, body in zip(blocks[1::2], blocks[2::2]):
        result, arguments, brief = re.search(
            rf'^\.RI "(.*) \\fB{name}\\fP \((.*)\)"\n'
            r'\.br\n\.RI "(.*?)(?:\\&\.)? "', page, re.M
        ).groups()
        result = re.sub(r"\\f[BP]", "", result)
        arguments = arguments.replace(" ", r"\ ").replace(r",\ ", ", ")  # break at commas only
        yield name, (
            f'.TH "{name}" 3 "" "{project} {version}" " "\n.ad l\n.nh\n'
            f".SH NAME\n{name} \\- {brief}\n"
            f".SH SYNOPSIS\n{include(name)}.HP\n{result} \\fB{name}\\fP({arguments});\n"
            f".SH DESCRIPTION\n{description(body)}"
        )


def without_functions(page):
    """What a section's page has beside its functions: enumerations and macros."""
    return re.sub(r'^\.S[HS] "Function.*?(?=^\.SH |\Z)', "", page, flags=re.M | re.S)


def main(source, target):
    target.mkdir(parents=True)
    for path in source.glob("qel*"):
        page = path.read_text(encoding="utf-8")
        if "Function Documentation" in page:
            for name, text in functions(page):
                (target / f"{name}.3").write_text(text, encoding="utf-8")
            page = without_functions(page)
            if '.SH "' not in page:
                continue
        page = page.replace(".SH SYNOPSIS\n.br\n.PP\n.SH", f".SH SYNOPSIS\n{include(path.stem)}.SH")
        (target / path.name).write_text(page, encoding="utf-8")


main(*map(pathlib.Path, sys.argv[1:]))
