#!/usr/bin/env python3
"""Prints a Markdown page or a header in the form that Doxygen needs.

usage: doxygen_filter.py FILE

In a page, Mermaid's sequence diagrams become PlantUML's; only the lines of participants differ.
Headings get names, to which links then lead, and names of functions become links. A link to a file
that is not in the reference becomes plain text.

In a header, "see also" is added to each function, with the other functions of its section. To those
of qel-message-serialize.h, what the caller frees is added, from the table of docs/interface.md; to
those of qel-message.h, the arguments, from the functions that they stand on.
"""

import collections
import functools
import os
import re
import sys

FUNCTIONS = "proto-lib/qel-message-serialize.h"
RECORDS = "proto-lib/qel-message.h"
IMAGE_OR_LINK = re.compile(r"(!?)\[((?:[^][]|\[[^][]*\])*)\]\(([^()\s]+)\)")


def slug(heading):
    """The anchor that viewers of Markdown give a heading that is on the page once."""
    plain = IMAGE_OR_LINK.sub(r"\2", heading).lower()
    return re.sub(r"[^\w\- ]", "", plain).replace(" ", "-")


def name_of(page, anchor=""):
    """The name by which all pages can link to a page, or to a heading on it."""
    name = re.sub(r"\W", "_", os.path.splitext(page)[0])
    name = "mainpage" if name == "README" else f"page_{name}"  # Doxygen's name of the first page
    return f"{name}_{anchor}" if anchor else name


def sources():
    """The sources in the reference: the headers, and the examples."""
    with open("docs/examples.dox", encoding="utf-8") as file:
        examples = re.findall(r"@example (\S+)", file.read())
    return [RECORDS, FUNCTIONS, "testkit/qel-testkit.h", "testkit/qel-testlog.h"] + [f"examples/{name}" for name in examples]


def link(match, page):
    image, text, target = match.groups()
    if image or re.match(r"\w+:", target):
        return match[0]
    plain = " ".join(text.replace("`", "").split())  # Doxygen needs a link's text so
    path, _, anchor = target.partition("#")
    path = os.path.normpath(os.path.join(os.path.dirname(page), path)) if path else page
    if path.endswith(".md") or not os.path.exists(path):  # then Doxygen complains of its name
        return f"[{plain}](@ref {name_of(path, anchor)})"
    if path in sources():
        return f"[{plain}](@ref {os.path.basename(path)})"
    return text


def prose(text, page, slugs):
    def heading(match):
        anchor = "" if match[1] == "#" else slug(match[2])
        slugs[anchor] += 1
        if slugs[anchor] > 1:
            anchor += f"-{slugs[anchor] - 1}"
        return f"{match[0]} {{#{name_of(page, anchor)}}}"

    text = re.sub(r"^(#+) (.*)$", heading, text, flags=re.MULTILINE)
    text = IMAGE_OR_LINK.sub(lambda match: link(match, page), text)
    text = re.sub(r"(?<!\[)`(\w+_(?:de)?serialize)`", r"[\1](@ref \1)", text)
    return re.sub(r"`([\w-]*)(::[\w-]+)`", r"<code>\1\\\2</code>", text)  # no name to Doxygen


def diagram(block):
    block = re.sub(r"^```mermaid\nsequenceDiagram$", "\n@startuml", block, flags=re.MULTILINE)
    block = re.sub(r"^```$", "@enduml", block, flags=re.MULTILINE)
    block = re.sub(r"participant (\w+) as (.+)", r'participant "\2" as \1', block)
    return f"<center>{block}\n</center>"  # scrolls in a narrow window


@functools.cache
def owners():
    """What the caller of each function frees, by the function."""
    with open("docs/interface.md", encoding="utf-8") as file:
        rows = [re.split(r" *\| *", line.strip("| \n")) for line in file if line.startswith("|")]
    column = rows[0].index("Caller frees")
    return {row[0].strip("`"): row[column] for row in rows[1:]}


def described(comment):
    """The comment's words about each argument, by the names of the arguments."""
    words = " ".join(comment.replace("\n *", "\n").split())
    return dict(re.findall(r"@param (\S+) (.*?) *(?=@|$)", words))


def about_function(function, _comment, _names):
    frees = owners()[function]
    return f"@par Who frees what @newline The caller frees {frees}. What holds for all functions is in", []


def about_record(function, comment, names):
    """The arguments of a function of qel-message.h, in the words of the function that it stands on
    unless its own comment has others. Also says which function that is."""
    stem, _, kind = function.partition("qel_")[2].rpartition("_")
    below = {"write": [f"{stem}_serialize"], "read": [f"{stem}_deserialize"]}.get(kind, [])
    first = {"release": "what to release", "type": "any number"}
    words = {names[0]: first.get(kind, "receives the message; begins zeroed"),
             "data,size": "the received bytes"}
    if kind == "write":
        with open(FUNCTIONS, encoding="utf-8") as file:
            match = re.search(rf"/\*\*((?:(?!\*/).)*)\*/\n(?:int|void) {below[0]}\(", file.read(), re.DOTALL)
        words.update(described(match[1]))
    told = [f"@param {name} {text}" for name, text in words.items()
            if set(name.split(",")) <= set(names) and name not in described(comment)]
    if kind != "release":
        told.append("@return " + ("QEL_OK, or why there is no message" if below else "whether it is"))
    return " @newline ".join([*told, "@par What holds for all @newline It is in"]), below


def header(text, name, about):
    """The header with what is known about each function, in one line, so that line numbers stay the
    same."""
    text = re.sub(r"^(QEL_MUST_USE )?static inline ", "", text, flags=re.MULTILINE)
    text = re.sub(r"/\*\* @cond \*/.*?/\*\* @endcond \*/",
                  lambda match: "\n" * match[0].count("\n"), text, flags=re.DOTALL)

    def section(match):
        functions = re.findall(r"^\w+ (\w+)\(", match[0], flags=re.MULTILINE)

        def end_of_comment(match):
            comment, declared, function, names = match.groups()
            told, below = about(function, comment, re.findall(r"(\w+)(?=,|$)", names))
            others = below + [other for other in functions if other != function] + [name]
            return (
                f"/**{comment.rstrip(' ')}{'' if comment.endswith(chr(10)) else ' @newline'}"
                f" {told} {name}. @newline @see {', '.join(others)} */{declared}"
            )

        return re.sub(r"/\*\*((?:(?!\*/).)*)\*/(\n\w+ (\w+)\(([^)]*)\))", end_of_comment, match[0],
                      flags=re.DOTALL)

    return re.sub(r"@(?:defgroup|addtogroup).*?@}", section, text, flags=re.DOTALL)


def page(text, name):
    parts = re.split(r"^(```.*?^```$)", text, flags=re.MULTILINE | re.DOTALL)
    slugs = collections.Counter()
    for i, part in enumerate(parts):
        if i % 2 == 0:
            parts[i] = prose(part, name, slugs)
        elif part.startswith("```mermaid\n"):
            parts[i] = diagram(part)
    return "".join(parts)


def main(path):
    with open(path, encoding="utf-8") as file:
        text = file.read()
    if path.endswith(".md") or not os.path.exists(path):  # then Doxygen complains of its name
        sys.stdout.write(page(text, path))
    else:
        about = about_record if path == RECORDS else about_function
        sys.stdout.write(header(text, os.path.basename(path), about))


main(os.path.relpath(sys.argv[1]))
