#!/usr/bin/env python3
"""A Markdown page as Doxygen takes it, while viewers of Markdown have it as it is.

usage: doxygen_filter.py PAGE

Mermaid's sequence diagrams become PlantUML's, whose language is the same but for the participants.
Headings get names, and links go to these; functions are links. A file that is not in the reference
is named, not linked.
"""

import collections
import os
import re
import sys

IMAGE_OR_LINK = re.compile(r"(!?)\[((?:[^][]|\[[^][]*\])*)\]\(([^()\s]+)\)")

# The sources in the reference: the header, and those of docs/examples.dox.
SOURCES = ["proto-lib/qel-message-serialize.h", "examples/plugin_session.c", "examples/pushes.c",
           "examples/framing.h"]


def slug(heading):
    """The anchor that viewers of Markdown give a heading, if it is the first of its kind."""
    plain = IMAGE_OR_LINK.sub(r"\2", heading).lower()
    return re.sub(r"[^\w\- ]", "", plain).replace(" ", "-")


def name_of(page, anchor=""):
    """The name of a page, or of a heading on it, among those of all pages."""
    name = re.sub(r"\W", "_", os.path.splitext(page)[0])
    name = "mainpage" if name == "README" else f"page_{name}"  # which is Doxygen's for the first
    return f"{name}_{anchor}" if anchor else name


def link(match, page):
    image, text, target = match.groups()
    if image or re.match(r"\w+:", target):
        return match[0]
    plain = " ".join(text.replace("`", "").split())  # as Doxygen wants the text of a link to a name
    path, _, anchor = target.partition("#")
    path = os.path.normpath(os.path.join(os.path.dirname(page), path)) if path else page
    if path.endswith(".md"):
        return f"[{plain}](@ref {name_of(path, anchor)})"
    if path in SOURCES:
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
    return re.sub(r"`([\w-]*)(::[\w-]+)`", r"<code>\1\\\2</code>", text)  # or Doxygen looks for it


def diagram(block):
    block = re.sub(r"^```mermaid\nsequenceDiagram$", "\n@startuml", block, flags=re.MULTILINE)
    block = re.sub(r"^```$", "@enduml", block, flags=re.MULTILINE)
    return re.sub(r"participant (\w+) as (.+)", r'participant "\2" as \1', block)


def main(page):
    with open(page, encoding="utf-8") as file:
        parts = re.split(r"^(```.*?^```$)", file.read(), flags=re.MULTILINE | re.DOTALL)
    slugs = collections.Counter()
    for i, part in enumerate(parts):
        if i % 2 == 0:
            part = prose(part, page, slugs)
        elif part.startswith("```mermaid\n"):
            part = diagram(part)
        sys.stdout.write(part)


main(os.path.relpath(sys.argv[1]))
