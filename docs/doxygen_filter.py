#!/usr/bin/env python3
"""Prints a Markdown page or the header in the form that Doxygen needs.

usage: doxygen_filter.py FILE

In a page, Mermaid's sequence diagrams become PlantUML's; only the lines of participants differ.
Headings get names, to which links then lead, and names of functions become links. A link to a file
that is not in the reference becomes plain text.

In the header, two paragraphs are added to each function: what its caller frees, from the table of
docs/interface.md, and "see also" with the other functions of its section.
"""

import collections
import os
import re
import sys

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
    """The sources in the reference: the header, and the examples."""
    with open("docs/examples.dox", encoding="utf-8") as file:
        examples = re.findall(r"@example (\S+)", file.read())
    return ["proto-lib/qel-message-serialize.h"] + [f"examples/{name}" for name in examples]


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


def owners():
    """What the caller of each function frees, by the function."""
    with open("docs/interface.md", encoding="utf-8") as file:
        rows = [re.split(r" *\| *", line.strip("| \n")) for line in file if line.startswith("|")]
    column = rows[0].index("Caller frees")
    return {row[0].strip("`"): row[column] for row in rows[1:]}


def header(text, name):
    frees = owners()

    def section(match):
        functions = re.findall(r"^(?:int|void) (\w+)\(", match[0], flags=re.MULTILINE)

        def end_of_comment(match):
            others = [function for function in functions if function != match[1]]
            # All in one line, so that line numbers stay the same.
            return (
                f" * @par Who frees what @newline The caller frees {frees[match[1]]}."
                f" What holds for all functions is in {name}."
                f" @newline @see {', '.join(others + [name])} */\n"
            )

        return re.sub(
            r"^ \*/\n(?=(?:int|void) (\w+)\()", end_of_comment, match[0], flags=re.MULTILINE
        )

    return re.sub(r"@defgroup.*?@}", section, text, flags=re.DOTALL)


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
        sys.stdout.write(header(text, os.path.basename(path)))


main(os.path.relpath(sys.argv[1]))
