#!/usr/bin/env python3
"""Prints CHANGELOG.md in the form of Debian's changelogs.

usage: debian_changelog.py SECONDS [changed]

The version on top is the project's, with the SECONDS of the last commit as its date, since the epoch. With
unreleased entries it is a snapshot, whose version has this date, and with 'changed' that it has changes
which are in no commit. A snapshot comes after the last release, or before the one that it has the
version of.
"""

import datetime
import email.utils
import pathlib
import re
import sys
import textwrap

ROOT = pathlib.Path(__file__).resolve().parent.parent
SOURCE = re.search(r"^Source: (.*)", (ROOT / "packaging/debian/control").read_text(), re.M)[1]
MAINTAINER = re.search(r"^Maintainer: (.*)", (ROOT / "packaging/debian/control").read_text(), re.M)[1]

PROJECT_VERSION = re.search(r"^ +VERSION ([\d.]+)$", (ROOT / "CMakeLists.txt").read_text(), re.M)[1]


def releases():
    """Name, date and text of each section of CHANGELOG.md."""
    text = (ROOT / "CHANGELOG.md").read_text(encoding="utf-8")
    text = re.sub(r"^\[[^]]+\]: .*\n", "", text, flags=re.M)
    parts = re.split(r"^## \[(.*?)\](?: - ([\d-]+))?\n", text, flags=re.M)
    return list(zip(parts[1::3], parts[2::3], parts[3::3]))


def entries(text):
    """The items of a section, in plain text."""
    text = re.sub(r"\[([^]]+)\]\([^)]*\)", r"\1", text).replace("`", "")
    for item in re.findall(r"^- (.*(?:\n  .*)*)", text, re.M):
        yield textwrap.fill(" ".join(item.split()), 79, initial_indent="  * ", subsequent_indent="    ",
                            break_on_hyphens=False)


def print_section(version, text, time):
    print(f"{SOURCE} ({version}-1) unstable; urgency=medium\n", *entries(text),
          f"\n -- {MAINTAINER}  {email.utils.format_datetime(time)}\n", sep="\n")


def main(seconds, changed=""):
    time = datetime.datetime.fromtimestamp(int(seconds), datetime.timezone.utc)
    sections = releases()
    unreleased = sections.pop(0)[2] + ("\n- Changes that are in no commit." if changed else "")
    if list(entries(unreleased)):
        sign = "+" if PROJECT_VERSION == sections[0][0] else "~"
        print_section(f"{PROJECT_VERSION}{sign}{time:%Y%m%d%H%M}{changed and '.changed'}", unreleased, time)
    else:
        name, _, text = sections.pop(0)
        print_section(name, text, time)
    for name, date, text in sections:
        print_section(name, text, datetime.datetime.fromisoformat(f"{date}T00:00:00+00:00"))


main(*sys.argv[1:])
