#!/usr/bin/env python3
"""counts_test.py CASE BUILD [OTHER]: compares the blocks and instructions of the calls with thresholds and
with the published numbers.

BUILD is the folder of a preset that has the benchmark, OTHER that of one whose library is counted.
"""

import json
import pathlib
import sys

import measure

SKIPPED = 77  # SKIP_RETURN_CODE of CMakeLists.txt

build = measure.build_of(*map(pathlib.Path, sys.argv[2:]))
wrong = []


def expect(holds, text):
    if not holds:
        wrong.append(text)


def compare_blocks(check):
    for case in measure.ALL_CASES:
        check(case, build.blocks("ours", case), build.blocks("baseline", case))


def allocations(case, ours, baseline):
    expected = baseline[0] + measure.kept_blocks(case)
    expect(ours[0] == expected, f"{case}: {ours[0]} allocations instead of {expected}")


def kept_blocks(case, ours, baseline):
    expected = measure.kept_blocks(case)
    expect(ours[1] == expected, f"{case}: {ours[1]} blocks kept instead of {expected}")
    expect(baseline[1] == 0, f"{case}: the baseline keeps {baseline[1]}")


def published_results():
    return json.loads((measure.PUBLISHED / "results.json").read_text())


def published_instructions():
    """Those of each case, which another compiler would not have."""
    results = published_results()
    compiler = results["compilers"][build.name]
    if build.compiler != compiler:
        print(f"published for {compiler}, not {build.compiler}")
        sys.exit(SKIPPED)
    return results["instructions"][build.name]


def instructions_are_those_published():
    for case, listed in published_instructions().items():
        counted = build.instructions("ours", case)
        expect(abs(counted - listed["ours"]) <= 0.03 * listed["ours"],
               f"{case}: {counted:.0f} instructions, published are {listed['ours']:.0f}")


def instructions_are_within_the_thresholds():
    published = published_instructions()
    for case, threshold in measure.INSTRUCTION_THRESHOLDS.items():
        ours, listed = build.instructions("ours", case), published[case]
        expect(round(ours / listed["baseline"], 2) <= threshold,
               f"{case}: {ours:.0f} instructions, more than {threshold} of {listed['baseline']:.0f}")


def instructions_through_the_header_are_within_the_threshold():
    for case in [*measure.CASES, *measure.SMALL]:
        ours, header = (build.instructions(program, case) for program in ("ours", "message"))
        expect(header <= measure.HEADER_THRESHOLD * ours,
               f"{case}: {header:.0f} instructions through qel-message.h, {ours:.0f} without it")


def blocks_are_those_published():
    results = published_results()
    for case, listed in results["blocks"].items():
        counted = build.blocks("ours", case)
        expect(counted == listed["ours"], f"{case}: {counted} blocks and lines, published are {listed['ours']}")
    for case, listed in results["allocations"].items():
        counted = build.blocks("ours", case, 1)[0]
        expect(counted == listed, f"{case}: {counted} allocations, published are {listed}")


# Each further entry takes the same number of blocks, apart from the arrays whose size the classes
# double when they are full.
def allocations_grow_with_the_entries():
    for call, amounts in measure.AMOUNTS.items():
        taken = [build.blocks("ours", f"{call}/{amount}", 1)[0] for amount in amounts]
        if not measure.is_parser(call):
            # The shortest text fits into the string object and takes no block.
            expect(len(set(taken[1:])) == 1, f"{call}: {taken} blocks for texts of {amounts} bytes")
            continue
        slopes = [(after - before) / (more - fewer) for before, after, fewer, more
                  in zip(taken, taken[1:], amounts, amounts[1:])]
        expect(max(slopes) <= 1.25 * min(slopes) and max(slopes[2:]) <= 1.02 * min(slopes[2:]),
               f"{call}: {taken} blocks for {amounts} entries")


CASES = {
    "allocations_are_those_of_the_classes_and_the_stream":
        lambda: compare_blocks(allocations),
    "parsers_keep_the_stream_alone":
        lambda: compare_blocks(kept_blocks),
    "allocations_grow_with_the_entries": allocations_grow_with_the_entries,
    "blocks_are_those_published": blocks_are_those_published,
    "instructions_are_those_published": instructions_are_those_published,
    "instructions_are_within_the_thresholds": instructions_are_within_the_thresholds,
    "instructions_through_the_header_are_within_the_threshold":
        instructions_through_the_header_are_within_the_threshold,
}

CASES[sys.argv[1]]()
print("\n".join(wrong))
sys.exit(1 if wrong else 0)
