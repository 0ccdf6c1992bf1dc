#!/usr/bin/python3
"""functions.py CONTRACT.json OUTPUT: the functions of the C interface and their messages, as lines of a C++ table."""

import json
import sys

with open(sys.argv[1], encoding="utf-8") as file:
    messages = json.load(file)["messages"]
with open(sys.argv[2], "w", encoding="utf-8") as file:
    for function, message in messages.items():
        file.write(f'{{"{function}", "{message}"}},\n')
