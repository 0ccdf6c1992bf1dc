#!/usr/bin/python3
"""functions.py CONTRACT.json: the message of each function of the C interface, as rows of a C++ map."""

import json
import sys

with open(sys.argv[1], encoding="utf-8") as file:
    for function, message in json.load(file)["messages"].items():
        print(f'{{"{function}", "{message}"}},')
