#!/usr/bin/env python3
"""counts_test.py CASE BUILD: do the calls take what they may, and what is published of them?

BUILD is the folder of a preset that has the benchmark. What is counted does not depend on the clock.
"""

import json
import pathlib
import sys

import measure

SKIPPED = 77  # as the build's files say it

build = measure.build_of(pathlib.Path(sys.argv[2]))
wrong = []


def expect(holds, text):
    if not holds:
        wrong.append(text)


def compare_blocks(check):
    for case in measure.ALL_CASES:
        check(case, build.blocks("ours", case), build.blocks("floor", case))


def allocations(case, ours, floor):
    expected = floor[0] + measure.kept_blocks(case)
    expect(ours[0] == expected, f"{case}: {ours[0]} allocations instead of {expected}")


def kept_blocks(case, ours, floor):
    expected = measure.kept_blocks(case)
    expect(ours[1] == expected, f"{case}: {ours[1]} blocks kept instead of {expected}")
    expect(floor[1] == 0, f"{case}: what it is compared with keeps {floor[1]}")


def instructions_are_those_published():
    results = json.loads((measure.PUBLISHED / "results.json").read_text())
    compiler = results["compilers"][build.folder.name]
    if build.compiler != compiler:
        print(f"published for {compiler}, not {build.compiler}")
        sys.exit(SKIPPED)
    published = results["instructions"][build.folder.name]
    for case in measure.CASES:
        for implementation in ("ours", "floor"):
            listed = published[case][implementation]
            counted = build.instructions(implementation, case)
            expect(abs(counted - listed) <= 0.03 * listed,
                   f"{case}, {implementation}: {counted:.0f} instructions, published are {listed:.0f}")


def instructions_are_within_the_bars():
    for case, bar in measure.INSTRUCTION_BARS.items():
        ours, floor = (build.instructions(each, case) for each in ("ours", "floor"))
        expect(round(ours / floor, 2) <= bar,
               f"{case}: {ours:.0f} instructions, more than {bar} of {floor:.0f}")


# Each further entry takes as many blocks as the one before, but for the arrays that the classes double
# now and then.
def allocations_grow_with_the_entries():
    for call, amounts in measure.AMOUNTS.items():
        taken = [build.blocks("ours", f"{call}/{amount}", 1)[0] for amount in amounts]
        if not measure.is_parser(call):
            # The least text fits into the string object.
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
    "instructions_are_those_published": instructions_are_those_published,
    "instructions_are_within_the_bars": instructions_are_within_the_bars,
}

CASES[sys.argv[1]]()
print("\n".join(wrong))
sys.exit(1 if wrong else 0)
