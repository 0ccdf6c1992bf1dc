#!/usr/bin/env python3
"""Measures the library and its alternatives, and writes docs/benchmark.

usage: report.py BUILD [ARM_BUILD...] [--small FOLDER] [--rounds N] [--to FOLDER]

BUILD is the folder of the preset release, ARM_BUILD those of the presets for ARM, and --small that of
the preset small, whose library the first of these runs too. In each round all programs run each case
in turn, so that a disturbance of the machine slows them all. Times are medians of the rounds, ratios
the medians of the rounds' ratios.
"""

import argparse
import dataclasses
import datetime
import json
import os
import pathlib
import platform
import re
import shutil
import statistics
import subprocess
import sys

import measure

ROOT = pathlib.Path(__file__).resolve().parent.parent
PAGE = ROOT / "docs" / "performance.md"
RECORDED = str(ROOT / "build" / "recorded.pcapng")

# The programs, and what they are called in the report.
NAMES = {"ours": "this library", "baseline": "generated classes", "by_hand": "by hand",
         "protobuf3": "Protocol Buffers 3.21", "protobuf_c": "protobuf-c", "nanopb": "nanopb"}
# What is timed: also the library with a thread id that costs nothing, and with the recorder.
TIMED = {"ours": NAMES["ours"], "ours_no_kernel": "this library, thread id for free",
         "ours_recorded": "this library, recorded", **NAMES}
BY_HAND = ["echo_reply", "chat_request/100", "chat_request/40000"]

CASE_NAMES = {
    "echo_reply": "echo reply",
    "chat_request/100": "chat request, 100 bytes",
    "chat_request/40000": "chat request, 40,000 bytes",
    "chat_reply/1": "chat reply, 1 entry",
    "chat_reply/50": "chat reply, 50 entries",
    "message_page/500": "page, 500 messages",
    "chatroom_entry/500": "room, 500 members",
    "echo": "echo",
    "end_of_chats": "end of chats, a result",
    "invitation": "invitation, no lists",
}
PRESETS = {"release": "x86-64", "armhf": "ARM, hard float", "armel": "ARM, soft float",
           "small": "ARM, hard float, MinSizeRel"}
ROUNDS, FEWEST_PUBLISHED = 21, 11
SINGLE = [case for case in measure.CASES if case not in measure.LISTS]

# The thresholds of times, in nanoseconds for each log line and each call. On the machine where they
# were set, asking the kernel for a thread id takes 72 ns and a stream 48 ns.
LIST_RATIO = 1.00
LINE_NS, CALL_NS = 80, 50
THREAD_ID_NS, STREAM_NS = 72, 48
LOADING_RATIOS = {"ours, plain runtime": 0.85, "ours": 0.65}


def say(text):
    print(f"bench: {text}", flush=True)


# The cases that depend on the allocator most.
ALLOCATOR_CASES = ["chat_request/100", "message_page/500", "chatroom_entry/500"]

# Allocators that a process can choose by its environment.
ALLOCATORS = {"glibc's": {},
              "glibc's, caching 10,000 blocks of a size":
                  {"GLIBC_TUNABLES": "glibc.malloc.tcache_count=10000"},
              "jemalloc": {"LD_PRELOAD": "libjemalloc.so.2"}}

# What the recorder may take of a call. Of long messages, copying takes more.
RECORDER_NS = 1000
LONG_CASES = ["chat_request/40000", "message_page/500", "chatroom_entry/500"]


def benchmark(program, case="", counter="cpu_time", seconds=0.02, settings=None):
    """The nanoseconds of the program's benchmarks by name: of all, or of those of a case."""
    pattern = f"^{re.escape(case)}(/real_time/threads:.*)?$" if case else "."
    out = subprocess.run([program, f"--benchmark_filter={pattern}", "--benchmark_format=json",
                          f"--benchmark_min_time={seconds}"],
                         stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True,
                         env={**os.environ, "QEL_TRACE_FILE": RECORDED, **(settings or {})})
    if out.returncode != 0 or "cannot be preloaded" in out.stderr:
        sys.exit(f"{program}, {case}: {out.stderr}")
    return {run["name"]: run[counter] for run in json.loads(out.stdout)["benchmarks"]}


class Rounds:
    """The values measured in each round, by name."""

    def __init__(self):
        self.values = {}

    def add(self, name, value):
        self.values.setdefault(name, []).append(value)

    def median(self, name):
        return statistics.median(self.values[name])

    def difference(self, name, to):
        return statistics.median(a - b for a, b in zip(self.values[name], self.values[to]))

    def ratio(self, name, to):
        return statistics.median(a / b for a, b in zip(self.values[name], self.values[to]))


def in_turn(programs, number):
    """The programs in the order of this round: each round begins with another."""
    first = number % len(programs)
    return programs[first:] + programs[:first]


def time_calls(build, rounds):
    """Times all programs in all cases, and the parts of a call."""
    times = Rounds()
    for number in range(rounds):
        say(f"round {number + 1} of {rounds}")
        for case in measure.CASES:
            for program in in_turn(list(TIMED), number):
                if program != "by_hand" or case in BY_HAND:
                    time = benchmark(build.program("time_calls", program), case)[case]
                    times.add((program, case), time)
        for case in measure.ALL_CASES[len(measure.CASES):]:
            for program in in_turn(["ours", "baseline"], number):
                times.add((program, case), benchmark(build.program("time_calls", program), case)[case])
        for case in ("chat_request/100", "chat_reply/1"):
            for name, time in benchmark(build.program("time_calls", "ours"), f"at_once/{case}",
                                        counter="real_time").items():
                times.add(("at_once", case, int(name.rsplit(":", 1)[1])), time)
        for name, time in benchmark(str(build.folder / "bench" / "time_parts")).items():
            times.add(("part", name), time)
        for allocator, settings in ALLOCATORS.items():
            for case in ALLOCATOR_CASES:
                time = benchmark(build.program("time_calls", "ours"), case, settings=settings)[case]
                times.add(("allocator", allocator, case), time)
    return times


def time_loading(build, rounds):
    baseline_runtime = pathlib.Path(build.setting("QEL_BASELINE_RUNTIME"))
    libraries = {
        "plain": (build.folder / "bench" / "libplain-protosvc.so", {}),
        "ours, plain runtime": (build.library, {"LD_LIBRARY_PATH": str(baseline_runtime.parent)}),
        "ours": (build.library, {}),
    }
    times = Rounds()
    for _ in range(rounds):
        for name, (library, settings) in libraries.items():
            program = str(build.folder / "bench" / "time_loading")
            times.add(name, int(build.run([program, str(library)], **settings).stdout))
    return times


def size_of(build, scratch):
    """The bytes of the stripped library, and its relocations."""
    stripped = scratch / f"{build.name}.so"
    build.run([build.setting("CMAKE_STRIP"), "-o", stripped, build.library])
    listed = build.run(["readelf", "-rW", build.library]).stdout
    relocations = [line for line in listed.splitlines() if re.match(r"^[0-9a-f]{8,} ", line)]
    return {"bytes": stripped.stat().st_size, "relocations": len(relocations)}


def machine():
    with open("/proc/cpuinfo") as file:
        model = re.search(r"^model name\s*: (.+)$", file.read(), re.MULTILINE)
    return {"processor": f"{model[1] if model else platform.machine()}, {os.cpu_count()} cores",
            "system": f"{platform.system()} {platform.machine()}, {' '.join(platform.libc_ver())}"}


def measure_all(build, arm_builds, rounds):
    builds = [build, *arm_builds]
    times = time_calls(build, rounds)
    say("loading, sizes, blocks and instructions")
    loading = time_loading(build, 5 * rounds)
    scratch = build.folder / "bench" / "stripped"
    shutil.rmtree(scratch, ignore_errors=True)
    scratch.mkdir()
    return {
        "date": datetime.date.today().isoformat(),
        "command": "./dev bench" + (f" --rounds {rounds}" if rounds != ROUNDS else ""),
        "machine": machine(),
        "compilers": {each.name: each.compiler for each in builds},
        "rounds": rounds,
        "time": {case: {program: times.median((program, case)) for program in TIMED
                        if (program, case) in times.values} for case in measure.ALL_CASES},
        "ratio": {case: {program: times.ratio((program, case), ("baseline", case))
                         for program in TIMED if (program, case) in times.values}
                  for case in measure.ALL_CASES},
        "at_once": {case: {threads: times.median(("at_once", case, threads)) for threads in (1, 2)}
                    for case in ("chat_request/100", "chat_reply/1")},
        "parts": {name[1]: times.median(name) for name in times.values if name[0] == "part"},
        "allocators": {name: {case: times.median(("allocator", name, case)) for case in ALLOCATOR_CASES}
                       for name in ALLOCATORS},
        "recorder": {case: times.difference(("ours_recorded", case), ("ours", case))
                     for case in measure.CASES},
        "loading": {name: {"ns": loading.median(name), "ratio": loading.ratio(name, "plain")}
                    for name in loading.values},
        "size": {each.name: size_of(each, scratch) for each in builds},
        "blocks": {case: {program: build.blocks(program, case) for program in NAMES
                          if program != "by_hand" or case in BY_HAND} for case in measure.CASES},
        "allocations": {case: build.blocks("ours", case, 1)[0] for case in measure.GROWTH},
        "instructions": {each.name: {case: {program: round(each.instructions(program, case))
                                                   for program in ("ours", "message", "baseline")
                                                   if program != "baseline" or case in measure.CASES}
                                            for case in [*measure.CASES, *measure.SMALL]}
                         for each in builds},
    }


@dataclasses.dataclass
class Threshold:
    name: str
    measured: float
    at_most: float
    is_ratio: bool = False
    is_exact: bool = False

    def is_met(self):
        measured, at_most = self.shown(self.measured), self.shown(self.at_most)
        return measured == at_most if self.is_exact else measured <= at_most

    def shown(self, value):
        """The value, rounded as thresholds are."""
        return round(value, 2 if self.is_ratio else None)

    def row(self):
        form = ",.2f" if self.is_ratio else ",d"
        return [self.name, format(self.shown(self.measured), form),
                ("exactly " if self.is_exact else "") + format(self.shown(self.at_most), form),
                "met" if self.is_met() else "**not met**"]


def thresholds(results):
    for case in measure.LISTS:
        ratios = results["ratio"][case]
        yield Threshold(f"{CASE_NAMES[case]}: time, ratio", ratios["ours"], LIST_RATIO,
                        is_ratio=True)
        yield Threshold(f"{CASE_NAMES[case]}: time with a thread id for free, ratio",
                        ratios["ours_no_kernel"], LIST_RATIO, is_ratio=True)
    for case in SINGLE:
        lines = results["blocks"][case]["ours"][2]
        time = results["time"][case]
        allowed = lines * LINE_NS + CALL_NS
        yield Threshold(f"{CASE_NAMES[case]}: ns, with {lines} log lines", time["ours"],
                        time["baseline"] + allowed)
        allowed -= lines * THREAD_ID_NS
        if measure.is_parser(case):
            allowed += results["parts"]["kept_stream"] - STREAM_NS
        yield Threshold(
            f"{CASE_NAMES[case]}: ns, with a thread id for free and this machine's stream",
            time["ours_no_kernel"], time["baseline"] + allowed)
    for case in measure.CASES:
        blocks = results["blocks"][case]
        kept = measure.kept_blocks(case)
        yield Threshold(f"{CASE_NAMES[case]}: blocks allocated", blocks["ours"][0],
                        blocks["baseline"][0] + kept, is_exact=True)
        yield Threshold(f"{CASE_NAMES[case]}: blocks kept", blocks["ours"][1], kept, is_exact=True)
    for preset in ("armhf", "armel"):
        for case, counted in results["instructions"].get(preset, {}).items():
            if case in measure.INSTRUCTION_THRESHOLDS:
                threshold = measure.INSTRUCTION_THRESHOLDS[case]
                yield Threshold(f"{CASE_NAMES[case]}: instructions on {PRESETS[preset]}, ratio",
                                counted["ours"] / counted["baseline"], threshold, is_ratio=True)
            yield Threshold(
                f"{CASE_NAMES[case]}: instructions on {PRESETS[preset]} through qel-message.h, ratio",
                counted["message"] / counted["ours"], measure.HEADER_THRESHOLD, is_ratio=True)
    for case, time in results["recorder"].items():
        if case not in LONG_CASES:
            yield Threshold(f"{CASE_NAMES[case]}: ns that the recorder takes", time, RECORDER_NS)
    for name, threshold in LOADING_RATIOS.items():
        yield Threshold(f"loading {name}, ratio", results["loading"][name]["ratio"], threshold,
                        is_ratio=True)


def number(value):
    return f"{value:,.0f}" if value >= 100 else f"{value:.3g}"


def table(head, rows):
    lines = [head, ["---", *["---:"] * (len(head) - 1)], *rows]
    return "\n".join("| " + " | ".join(row) + " |" for row in lines)


def time_table(results):
    def cell(case, program):
        if program not in results["time"][case]:
            return ""
        return f"{number(results['time'][case][program])} ({results['ratio'][case][program]:.2f})"

    return table(["ns a call (ratio to the generated classes)", *TIMED.values()],
                 [[CASE_NAMES[case], *(cell(case, program) for program in TIMED)]
                  for case in measure.CASES])


def count_tables(results):
    presets = {preset: name for preset, name in PRESETS.items() if preset in results["instructions"]}

    def instructions(program, to, cases):
        for case in cases:
            counts = [results["instructions"][preset][case] for preset in presets]
            yield [CASE_NAMES[case],
                   *(f"{counted[program]:,} ({counted[program] / counted[to]:.3f})" for counted in counts)]

    yield table(["instructions a call (ratio to the generated classes)", *presets.values()],
                instructions("ours", "baseline", measure.CASES))
    yield table(["through qel-message.h (ratio to the plain call)", *presets.values()],
                instructions("message", "ours", [*measure.CASES, *measure.SMALL]))
    yield table(["blocks allocated a call", *NAMES.values(), "kept by this library"],
                [[CASE_NAMES[case], *(f"{blocks[program][0]:,}" if program in blocks else ""
                                      for program in NAMES), f"{blocks['ours'][1]}"]
                 for case, blocks in results["blocks"].items()])
    yield table(["library", *presets.values()],
                [[what, *(f"{results['size'][preset][key]:,}" for preset in presets)]
                 for what, key in (("bytes, stripped", "bytes"), ("relocations", "relocations"))])
    yield table(["loading", "µs", "ratio"],
                [[name, number(value["ns"] / 1000), f"{value['ratio']:.2f}"]
                 for name, value in results["loading"].items()])


def parts_table(results):
    parts = results["parts"]
    steps = ["object", "fields", "length", "block", "encoding"]
    texts = {"object": "the message object, made and destroyed",
             "fields": "its fields, of which the text is copied into blocks of its own",
             "length": "the length of its encoding", "block": "the block for the caller, and free",
             "encoding": "the encoding, with the check of the text for UTF-8"}
    rows, before = [], 0
    for step in steps:
        rows.append([texts[step], number(parts[step] - before)])
        before = parts[step]
    rows.append(["two thread ids, asked of the kernel", number(2 * parts["thread_id"])])
    whole = parts["whole"]
    rest = whole - before - 2 * parts["thread_id"]
    rows.append(["the rest: two calls of the log service, the call itself, checks",
                 f"{rest:.0f}" + (", which is within the noise" if abs(rest) < whole / 20 else "")])
    rows.append(["**in all**", number(whole)])
    return table(["a chat request of 100 bytes", "ns"], rows)


def thresholds_table(results):
    return table(["threshold (ratios to two decimals)", "measured", "at most", ""],
                 [threshold.row() for threshold in thresholds(results)])


def report(results):
    about = results["machine"]
    threads = table(["calls at once", "1 thread, ns a call", "2 threads, ns a call and thread"],
                    [[CASE_NAMES[case], number(times[1]), number(2 * times[2])]
                     for case, times in results["at_once"].items()])
    allocators = table(["ns a call, by allocator", *(CASE_NAMES[case] for case in ALLOCATOR_CASES)],
                       [[name, *(number(times[case]) for case in ALLOCATOR_CASES)]
                        for name, times in results["allocators"].items()])
    recorded = table(["ns that the recorder takes", *CASE_NAMES.values()][:len(measure.CASES) + 1],
                     [["", *(number(results["recorder"][case]) for case in measure.CASES)]])
    return f"""# Benchmark

Written by `{results['command']}` on {results['date']}. {about['processor']}; {about['system']};
{results['compilers']['release']}. Medians of {results['rounds']} rounds. The columns and the
numbers are explained in [performance.md](../performance.md).

{time_table(results)}

![Time of calls and of their alternatives, and how it grows with their work](benchmark.svg)

""" + "\n\n".join(count_tables(results)) + f"""

{threads}

{allocators}

{recorded}

{parts_table(results)}

## Thresholds

{thresholds_table(results)}
"""


def plot(results, folder):
    data = folder / "plot"
    data.mkdir(exist_ok=True)
    with open(data / "cases.txt", "w") as file:
        for case in measure.CASES:
            ratios = results["ratio"][case]
            words = [f"{ratios[program]:.4f}" if program in ratios else "NaN" for program in NAMES]
            print(f'"{CASE_NAMES[case].replace(", ", chr(92) + "n")}"', *words, file=file)
    for call, amounts in measure.AMOUNTS.items():
        with open(data / f"{call}.txt", "w") as file:
            for amount in amounts:
                case = f"{call}/{amount}"
                print(amount, results["time"][case]["ours"], results["time"][case]["baseline"],
                      results["allocations"][case], file=file)
    subprocess.run(["gnuplot", "-c", ROOT / "bench" / "plot.gp", data, folder / "benchmark.svg"],
                   check=True)
    shutil.rmtree(data)


def main():
    arguments = argparse.ArgumentParser(usage=__doc__)
    arguments.add_argument("builds", nargs="+", type=pathlib.Path)
    arguments.add_argument("--small", type=pathlib.Path)
    arguments.add_argument("--rounds", type=int, default=ROUNDS)
    arguments.add_argument("--to", type=pathlib.Path, default=measure.PUBLISHED)
    given = arguments.parse_args()
    if given.to == measure.PUBLISHED:
        if given.rounds < FEWEST_PUBLISHED:
            sys.exit(f"bench: not published with fewer than {FEWEST_PUBLISHED} rounds")
        for mark in EMBEDDED:  # fails now, not after the measuring, if a mark is missing
            embed(None, PAGE, mark)
    builds = [measure.build_of(folder) for folder in given.builds]
    if given.small:
        builds.append(measure.build_of(given.builds[1], given.small))
    results = measure_all(builds[0], builds[1:], given.rounds)
    given.to.mkdir(parents=True, exist_ok=True)
    (given.to / "results.json").write_text(json.dumps(results, indent=1) + "\n")
    results = json.loads((given.to / "results.json").read_text(), object_hook=numbers_as_keys)
    (given.to / "README.md").write_text(report(results))
    plot(results, given.to)
    if given.to == measure.PUBLISHED:
        for mark, table_of in EMBEDDED.items():
            embed(table_of(results), PAGE, mark)
    missed = [threshold.name for threshold in thresholds(results) if not threshold.is_met()]
    say(f"written to {given.to}; thresholds not met: {'; '.join(missed) or 'none'}")


EMBEDDED = {"table": time_table, "parts": parts_table}


def embed(text, page, mark):
    """Puts the text, unless it is None, between the page's comments of this mark."""
    begin, end = f"<!-- {mark} of ./dev bench -->\n", f"<!-- end of {mark} -->"
    head, rest = page.read_text().split(begin)
    _, tail = rest.split(end)
    if text is not None:
        page.write_text(head + begin + text + "\n" + end + tail)


def numbers_as_keys(mapping):
    """The mapping with its numbers as numbers: JSON writes every key as a text."""
    return {int(key) if key.isdigit() else key: value for key, value in mapping.items()}


if __name__ == "__main__":
    sys.exit(main())
