#!/usr/bin/python3
"""render.py OUTPUT FAMILY.yaml...

Writes the contract as one JSON file: the same cases, with repeated values written out and bytes as
hexadecimal digits without blanks. The result is checked against schema.json beside this file."""

import json
import pathlib
import re
import sys

import jsonschema
import yaml

FORMAT = 1


def repeated(value):
    """A value, or a list of such, with every {repeat: ..., times: ...} written out."""
    if isinstance(value, dict):
        if "repeat" in value:
            piece = repeated(value["repeat"])
            return piece * value["times"] if isinstance(piece, str) else [piece] * value["times"]
        return {key: repeated(each) for key, each in value.items()}
    if isinstance(value, list):
        return [repeated(each) for each in value]
    return value


def digits(value):
    """The hexadecimal digits of bytes such as "58 07 (6a 00)*3"."""
    text = str(value)
    text = re.sub(r"\(([^()]*)\)\*(\d+)", lambda found: found[1] * int(found[2]), text)
    text = re.sub(r"\s", "", text)
    if not re.fullmatch(r"([0-9a-f]{2})*", text):
        raise ValueError(f"no bytes (in quotes, if they are digits alone): {value}")
    return text


def plain(value):
    """With the bytes of every message as digits, and a text in pieces as one."""
    if isinstance(value, dict):
        value = {key: plain(each) for key, each in value.items()}
        if set(value) == {"hex"}:
            value["hex"] = digits(value["hex"])
        if "bytes" in value:
            value["bytes"] = digits(value["bytes"])
            if isinstance(value.get("text"), list):
                value["text"] = "".join(value["text"])
        return value
    return [plain(each) for each in value] if isinstance(value, list) else value


def main():
    output, *families = map(pathlib.Path, sys.argv[1:])
    contract = {"format": FORMAT, "messages": {}, "cases": []}
    for family in families:
        for function in yaml.load_all(family.read_text(), yaml.CSafeLoader):
            call = function["call"]
            if function["message"]:
                contract["messages"][call] = function["message"]
            names = [case["case"] for case in function["cases"]]
            for case in function["cases"]:
                if names.count(case["case"]) > 1:
                    sys.exit(f"{family}: {call} has two cases: {case['case']}")
                try:
                    contract["cases"].append({"family": family.stem, "call": call, **plain(repeated(case))})
                except ValueError as error:
                    sys.exit(f"{family}: {case['case']}: {error}")
    schema = json.loads((pathlib.Path(__file__).parent / "schema.json").read_text())
    validator = jsonschema.Draft7Validator(schema)
    for error in validator.iter_errors(contract):
        place = list(error.absolute_path)
        case = contract["cases"][place[1]]["case"] if place[:1] == ["cases"] and len(place) > 1 else ""
        sys.exit(f"render.py: {case}: {'/'.join(map(str, place))}: {error.message[:300]}")
    output.write_text(json.dumps(contract, indent=1, ensure_ascii=False) + "\n")


main()
