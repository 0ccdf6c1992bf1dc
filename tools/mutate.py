#!/usr/bin/env python3
"""Changes the module in many small ways, one at a time, and checks that the tests notice.

usage: mutate.py BUILD TESTS [--list | --all] [PATTERN]

BUILD is the folder of the preset coverage, TESTS that of release, both built. Each mutant is compiled
and linked in another folder, and the test programs load that library: neither the tree nor a build
changes. With PATTERN, a regular expression, only mutants whose names match it are tried, and all of
them.
"""

import argparse
import collections
import concurrent.futures
import json
import os
import pathlib
import queue
import re
import resource
import shlex
import signal
import subprocess
import sys
import time
import zlib

import mutants
import programs

ROOT = pathlib.Path(__file__).resolve().parent.parent
MODULE = "proto-lib/qel-message-serialize.cc"
LIBRARY = "proto-lib/libqel-message-protosvc.so"  # a symbolic link
SOURCES = ["log-line.h", "encode-and-parse.h", "qel-message-serialize.cc"]
EQUIVALENT = ROOT / "tools" / "equivalent_mutants.txt"
SAMPLE = 1000  # takes two idle cores less than twenty minutes
MOST_MEMORY = 6 << 30  # so that an endless loop does not take all memory of the machine


def limit():
    resource.setrlimit(resource.RLIMIT_AS, (MOST_MEMORY, MOST_MEMORY))
    resource.setrlimit(resource.RLIMIT_CORE, (0, 0))


def run(command, seconds, **settings):
    """Whether the command succeeds within the time, and its output."""
    process = subprocess.Popen(command, stdin=subprocess.DEVNULL, stdout=subprocess.PIPE,
                               stderr=subprocess.STDOUT, start_new_session=True,
                               preexec_fn=limit, **settings)
    try:
        output = process.communicate(timeout=seconds)[0]
    except subprocess.TimeoutExpired:
        os.killpg(process.pid, signal.SIGKILL)
        process.communicate()
        return False, b"took too long"
    return process.returncode == 0, output


class Build:
    """How the preset builds the library, and which programs test it."""

    def __init__(self, folder, tests):
        self.folder = folder
        entries = json.loads((folder / "compile_commands.json").read_text())
        entry = next(e for e in entries if e["file"] == str(ROOT / MODULE))
        self.compile = shlex.split(entry["command"])
        self.object = self.compile[self.compile.index("-o") + 1]
        self.library = str((folder / LIBRARY).resolve().relative_to(folder))
        self.link = self._output("ninja", "-C", folder, "-t", "commands", self.library).splitlines()[-1]
        self.soname = re.search(r"-Wl,-soname,(\S+)", self.link)[1]
        self.tests = tests
        self.programs = programs.test_programs(tests)

    @staticmethod
    def _output(*command):
        return subprocess.run(command, check=True, stdout=subprocess.PIPE, text=True).stdout


class Worker:
    """A folder with a copy of the module, in which mutants are built and tested one by one."""

    def __init__(self, build, folder):
        self.build = build
        self.folder = folder
        self.source = folder / "proto-lib"
        self.source.mkdir(parents=True, exist_ok=True)
        for file in (ROOT / "proto-lib").glob("*.[hc]*"):
            self.restore(file.name)
        options = [o for o in build.compile if not re.match("-W|-g$|--coverage|-fprofile", o)]
        options = [o.replace(f"-I{ROOT}/proto-lib", f"-I{self.source}") for o in options]
        head = options[:options.index("-o")] + ["-w"]
        prelude = folder / "prelude.h"
        self.compile = head + ["-include", prelude, "-o", folder / "module.o", "-c",
                               self.source / os.path.basename(MODULE)]
        self.link = build.link.replace("--coverage", "")
        for path, own in [(build.object, "module.o"), (build.library, build.soname)]:
            self.link = self.link.replace(f" {path}", f" {folder / own}")
        self._precompile(head, prelude)

    def _precompile(self, head, prelude):
        """Compiles the headers that do not change, once for all mutants."""
        text = "".join((self.source / name).read_text() for name in SOURCES)
        includes = re.findall(r'^#include (?:<.*>|".*\.pb\.h")$', text, re.M)
        prelude.write_text("\n".join(dict.fromkeys(includes)) + "\n")
        subprocess.run([*head, "-x", "c++-header", prelude, "-o", f"{prelude}.gch"],
                       cwd=self.build.folder, check=True)

    def restore(self, name):
        (self.source / name).write_text((ROOT / "proto-lib" / name).read_text())

    def outcome(self, mutant, limits):
        """'caught', 'survived' or 'not compiled', and the test that caught it."""
        file = self.source / mutant.file
        text = file.read_text()
        file.write_text(text[:mutant.start] + mutant.text + text[mutant.end:])
        try:
            if not self.library():
                return "not compiled", ""
            for program, pattern in self.stages(mutant.function):
                passed, output = self.test(program, pattern, limits[program])
                if not passed:
                    failed = re.search(rb"\[  FAILED  \] ([\w./]+)", output)
                    return "caught", failed.group(1).decode() if failed else "a program's end"
            return ("survived", "") if self.keeps_nothing() else ("caught", "exports.bats")
        finally:
            self.restore(mutant.file)

    def library(self):
        built, _ = run(self.compile, 120, cwd=self.build.folder)
        return built and run(self.link, 120, cwd=self.build.folder, shell=True)[0]

    def stages(self, function):
        """The programs with patterns of tests: the function's own cases come first."""
        if function.endswith("serialize"):
            yield from ((program, f"{function}.*:{function}/*") for program in self.build.programs
                        if program.endswith("/contract_tests"))
        yield from ((p, "*") for p in self.build.programs)

    def keeps_nothing(self):
        """Whether the module has no data that can be written, which no single call shows."""
        return run(["bats", "--filter", "no data of its own", ROOT / "tests" / "exports.bats"], 120,
                   env=dict(os.environ, QEL_BUILD=str(self.build.tests),
                            QEL_MODULE=str(self.folder / "module.o")))[0]

    def test(self, program, pattern, seconds):
        return run([program, "--gtest_brief=1", "--gtest_fail_fast", f"--gtest_filter={pattern}"],
                   seconds, env=programs.with_library(self.folder / self.build.soname),
                   cwd=self.folder)


def time_limits(worker):
    """How long each program may take with a mutant. Without one all tests must pass. Sorts the
    programs: the fastest comes first."""
    if not worker.library():
        sys.exit("mutate: the module itself does not compile")
    took = {}
    for program in worker.build.programs:
        start = time.monotonic()
        passed, output = worker.test(program, "*", 1200)
        if not passed:
            print(output.decode(errors="replace"))
            sys.exit(f"mutate: {program} fails without any mutant")
        took[program] = time.monotonic() - start
    if not worker.keeps_nothing():
        sys.exit("mutate: exports.bats fails without any mutant")
    worker.build.programs.sort(key=took.get)
    return {program: 30 + 5 * seconds for program, seconds in took.items()}


def read_equivalent():
    """The names of the mutants that behave like the module."""
    lines = EQUIVALENT.read_text().splitlines()
    return {line for line in lines if line and not line.startswith("#")}


def sample(found, most):
    """A part of the mutants: the same number of each function and kind, spread evenly, at least one
    of each; no more than most in all, if that is possible."""
    groups = collections.defaultdict(list)
    for mutant in found:
        groups[mutant.function, mutant.kind].append(mutant)
    for size in range(max(map(len, groups.values())), 0, -1):
        if sum(min(size, len(group)) for group in groups.values()) <= most:
            break
    chosen = {group[i * len(group) // min(size, len(group))]
              for group in groups.values() for i in range(min(size, len(group)))}
    return [mutant for mutant in found if mutant in chosen]


def try_all(chosen, build, folder):
    """Yields each mutant with its outcome as soon as it is known."""
    workers = queue.SimpleQueue()
    first = Worker(build, folder / "1")
    limits = time_limits(first)
    workers.put(first)
    for n in range(2, os.cpu_count() + 1):
        workers.put(Worker(build, folder / str(n)))

    def try_one(mutant):
        worker = workers.get()
        try:
            return mutant, *worker.outcome(mutant, limits)
        finally:
            workers.put(worker)

    with concurrent.futures.ThreadPoolExecutor(os.cpu_count()) as pool:
        for done in concurrent.futures.as_completed(pool.submit(try_one, m) for m in chosen):
            yield done.result()


def print_table(counts):
    columns = ["caught", "equivalent", "survived", "not compiled"]
    print(f"{'kind':18}" + "".join(f"{c:>14}" for c in columns))
    for kind, _ in mutants.RULES:
        if sum(counts[kind].values()):
            print(f"{kind:18}" + "".join(f"{counts[kind][c]:14}" for c in columns))


def main():
    arguments = argparse.ArgumentParser(usage=__doc__.split("usage: ")[1].split("\n")[0])
    arguments.add_argument("build", type=pathlib.Path)
    arguments.add_argument("tests", type=pathlib.Path)
    arguments.add_argument("--list", action="store_true")
    arguments.add_argument("--all", action="store_true")
    arguments.add_argument("pattern", nargs="?")
    given = arguments.parse_intermixed_args()

    found = [mutant for file in SOURCES
             for mutant in mutants.mutants_of(file, (ROOT / "proto-lib" / file).read_text())]
    equivalent = read_equivalent()
    unknown = equivalent - {mutant.name for mutant in found}
    if given.pattern:
        chosen = [m for m in found if re.search(given.pattern, m.name)]
    else:
        chosen = found if given.all or given.list else sample(
            [mutant for mutant in found if mutant.name not in equivalent], SAMPLE)
    chosen.sort(key=lambda mutant: zlib.crc32(mutant.name.encode()))  # mixes the functions
    if not chosen:
        sys.exit(f"mutate: no mutant's name has '{given.pattern}'; see --list")
    if given.list:
        print("\n".join(mutant.name for mutant in chosen))
        return

    folder = ROOT / "build" / "mutate"
    folder.mkdir(exist_ok=True)
    build = Build(given.build.resolve(), given.tests.resolve())
    counts = collections.defaultdict(collections.Counter)
    wrong = [f"listed as equivalent, but no mutant: {name}" for name in sorted(unknown)]
    start = time.monotonic()
    with open(folder / "results.txt", "w") as results:
        for n, (mutant, outcome, by) in enumerate(try_all(chosen, build, folder), 1):
            name = mutant.name
            if name in equivalent:
                if outcome == "caught":
                    wrong.append(f"listed as equivalent, but caught by {by}: {name}")
                outcome = "equivalent" if outcome == "survived" else outcome
            counts[mutant.kind][outcome] += 1
            print(f"{outcome} | {name} | {by}", file=results, flush=True)
            if outcome == "survived":
                wrong.append(f"survived: {name}")
                print(wrong[-1], flush=True)
            if n % 25 == 0:
                minutes = (time.monotonic() - start) / 60
                print(f"{n} of {len(chosen)}, {minutes:.1f} minutes", flush=True)

    print_table(counts)
    for line in wrong:
        print(line)
    total = sum(counts.values(), collections.Counter())
    print(f"mutate: {total['caught']} of {len(chosen)} mutants caught, "
          f"{total['survived']} survived, {total['equivalent']} equivalent, "
          f"{total['not compiled']} did not compile; all of them: {folder / 'results.txt'}")
    sys.exit(1 if wrong else 0)


if __name__ == "__main__":
    main()
