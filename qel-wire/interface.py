#!/usr/bin/python3
"""interface.py CONTRACT.json: the functions of the C interface and their messages, as lines of a C++ table."""

import json
import sys

with open(sys.argv[1], encoding="utf-8") as file:
    for function, message in json.load(file)["messages"].items():
        use = "Sends" if function.endswith("_serialize") else "Receives"
        print(f'{{"{function}", "{message}", Use::k{use}}},')
