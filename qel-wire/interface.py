#!/usr/bin/python3
"""interface.py CONTRACT.json: the messages of the C interface, as lines of a C++ table."""

import json
import sys

with open(sys.argv[1], encoding="utf-8") as file:
    for function, message in json.load(file)["messages"].items():
        print(f'{{"{message}", Use::k{"Sends" if function.endswith("_serialize") else "Receives"}}},')
