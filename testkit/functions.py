#!/usr/bin/python3
"""functions.py CONTRACT.json: the functions of the C interface, each with its message, for C++."""

import json
import sys

with open(sys.argv[1], encoding="utf-8") as file:
    for function, message in json.load(file)["messages"].items():
        print(f'{{"{function}", "{message}"}},')
