#!/usr/bin/env python3
"""relay.py PROGRAM ARGUMENT...: runs one of the demo's programs, as an emulator would. The plug-in's
connection goes through here. Each piece of it becomes a line of the file that RECORD names: ">" to
the service or "<" from it, and the bytes in hex."""

import os
import select
import socket
import subprocess
import sys

program, *arguments = sys.argv[1:]
if os.path.basename(program) != "plugin_session":
    os.execv(program, [program, *arguments])

listener = socket.create_server(("127.0.0.1", 0))
listener.settimeout(60)  # the plug-in may fail before it connects
own_port = str(listener.getsockname()[1])
with subprocess.Popen([program, own_port, *arguments[1:]]) as plugin, \
        open(os.environ["RECORD"], "w", encoding="ascii") as record:
    service = socket.create_connection(("127.0.0.1", int(arguments[0])))
    client, _ = listener.accept()
    ways = {client: (">", service), service: ("<", client)}
    while ways:
        for end in select.select(list(ways), [], [])[0]:
            sign, other = ways[end]
            piece = end.recv(65536)
            if piece:
                other.sendall(piece)
                record.write(f"{sign} {piece.hex()}\n")
            else:
                other.shutdown(socket.SHUT_WR)
                del ways[end]
sys.exit(plugin.returncode)
