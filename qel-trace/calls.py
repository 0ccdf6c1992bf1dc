#!/usr/bin/python3
"""calls.py HEADER CONTRACT.json OUTPUT: the functions that stand before those of the header."""

import json
import re
import sys

CALL = "  const __typeof__(&{name}) real = (__typeof__(&{name}))function_behind(&traced_functions[{index}]);\n"

SENT = """{result} {name}({parameters}) {{
""" + CALL + """  {status}real({arguments});
  trace_sent("{name}", {message}, size, {token});{end}
}}
"""

RECEIVED = """void {name}({parameters}) {{
""" + CALL + """  received_t call __attribute__((cleanup(trace_received_end)));
  trace_received(&call, "{name}", data, size, requestId, {is_shared});
  real({arguments});
}}
"""


def prototypes(header):
    """Result, name and parameters of each function."""
    text = re.sub(r"/\*.*?\*/", "", header, flags=re.S)
    return re.findall(r"^(int|void) (\w+)\((.*?)\);", text, flags=re.M | re.S)


def definition(index, result, name, parameters):
    names = [re.search(r"\w+$", parameter)[0] for parameter in parameters.split(",")]
    values = {"result": result, "name": name, "parameters": parameters, "index": index}
    if name.endswith("_deserialize"):
        arguments = ["call.request_id" if each == "requestId" else each for each in names]
        others = re.findall(r"int64_t\* (?!requestId\b)(\w+)", parameters)
        is_shared = " || ".join(f"requestId == {other}" for other in others) or "false"
        return RECEIVED.format(arguments=", ".join(arguments), is_shared=is_shared, **values)
    has_status = result == "int"
    return SENT.format(arguments=", ".join(names), status="const int status = " if has_status else "",
                       message="status == 0 ? serialized_data : NULL" if has_status else "serialized_data",
                       token="accessToken" if "accessToken" in names else "NULL",
                       end="\n  return status;" if has_status else "", **values)


def main(header, contract, output):
    with open(header, encoding="utf-8") as file:
        functions = prototypes(file.read())
    with open(contract, encoding="utf-8") as file:
        messages = json.load(file)["messages"]
    functions = [function for function in functions if function[1] in messages]
    table = "".join(f'  {{"{name}", (void*){name}, NULL}},\n' for _, name, _ in functions)
    with open(output, "w", encoding="utf-8") as file:
        file.write('#include "library.h"\n#include "qel-message-serialize.h"\n#include "recorder.h"\n\n' +
                   "\n".join(definition(index, *function) for index, function in enumerate(functions)) +
                   f"\ntraced_function_t traced_functions[] = {{\n{table}}};\n\n"
                   "const size_t traced_function_count = sizeof traced_functions / sizeof traced_functions[0];\n")


main(*sys.argv[1:])
