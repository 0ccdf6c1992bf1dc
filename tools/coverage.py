#!/usr/bin/env python3
"""Checks that the tests execute all lines and branches of the module, except for listed ones.

usage: coverage.py BUILD TESTS

BUILD is the folder of the preset coverage, TESTS that of release, both built. Runs the tests with the
library of BUILD, and writes BUILD/coverage.txt and BUILD/html/index.html. Branches that the compiler
adds for exceptions are not counted.
"""

import concurrent.futures
import json
import os
import pathlib
import re
import subprocess
import sys

import programs

ROOT = pathlib.Path(__file__).resolve().parent.parent
LISTED = ROOT / "tools" / "uncovered.txt"
SOURCES = ["encode-and-parse.h", "log-line.h", "qel-message-serialize.cc"]


def run_tests(build, tests):
    for counters in build.rglob("*.gcda"):  # of an earlier run
        counters.unlink()
    environment = programs.with_library(build / "proto-lib" / "libqel-message-protosvc.so")

    def run(program):
        return subprocess.run([program, "--gtest_brief=1"], env=environment, stdout=subprocess.PIPE,
                              stderr=subprocess.STDOUT, text=True, errors="replace")

    with concurrent.futures.ThreadPoolExecutor(os.cpu_count()) as pool:
        runs = list(pool.map(run, programs.test_programs(tests)))
    failed = [run for run in runs if run.returncode != 0]
    for run in failed:
        print(run.stdout)
    if failed or not runs:
        sys.exit(f"coverage: {len(failed)} of {len(runs)} test programs failed")


def gcovr(build, *report):
    filters = [f"--filter=proto-lib/{re.escape(file)}$" for file in SOURCES]
    command = ["gcovr", "--root", ROOT, *filters, "--exclude-throw-branches",
               build / "proto-lib", *report]
    return subprocess.run(command, check=True, stdout=subprocess.PIPE, text=True).stdout


def measured(build):
    """What was not executed, as 'file | function | line | what', and how many lines and
    branches there are."""
    found, lines, branches = [], 0, 0
    files = json.loads(gcovr(build, "--json"))["files"]
    if sorted(pathlib.Path(f["file"]).name for f in files) != SOURCES:
        sys.exit(f"coverage: no counters of {', '.join(SOURCES)} in {build}")
    for file in files:
        source = (ROOT / file["file"]).read_text().splitlines()
        functions = sorted((f["lineno"], f["name"]) for f in file["functions"])
        for line in file["lines"]:
            if line["gcovr/noncode"] or line["gcovr/excluded"]:
                continue
            lines += 1
            branches += len(line["branches"])
            number = line["line_number"]
            name = [name for first, name in functions if first <= number][-1]
            place = " | ".join([pathlib.Path(file["file"]).name,
                                re.search(r"(\w+)(\(|<|$)", name).group(1),
                                source[number - 1].strip()])
            missed = sum(branch["count"] == 0 for branch in line["branches"])
            if line["count"] == 0:
                found.append(f"{place} | not executed")
            elif missed:
                found.append(f"{place} | {missed} of {len(line['branches'])} branches not taken")
    return found, lines, branches


def listed():
    """The entries of the list, without the comments that give their reasons."""
    return [line for line in LISTED.read_text().splitlines() if line and not line.startswith("#")]


def main():
    if len(sys.argv) != 3:
        sys.exit(__doc__)
    build, tests = (pathlib.Path(folder).resolve() for folder in sys.argv[1:])
    run_tests(build, tests)
    found, lines, branches = measured(build)
    known = listed()
    (build / "coverage.txt").write_text(
        gcovr(build) + gcovr(build, "--branches") + "\n".join(found) + "\n")
    (build / "html").mkdir(exist_ok=True)
    gcovr(build, "--html-details", build / "html" / "index.html")

    wrong = [f"not covered: {entry}" for entry in found if entry not in known]
    wrong += [f"covered or gone, but listed in {LISTED.name}: {entry}"
              for entry in known if entry not in found]
    print("".join(f"{line}\n" for line in wrong), end="")
    print(f"coverage: {lines} lines and {branches} branches, {len(found)} places not covered, "
          f"{len(wrong)} not as listed; see {build}/coverage.txt and html/index.html")
    sys.exit(1 if wrong else 0)


if __name__ == "__main__":
    main()
