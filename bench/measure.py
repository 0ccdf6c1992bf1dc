"""How the benchmark's programs are run, and what they count."""

import dataclasses
import os
import pathlib
import platform
import re
import subprocess

# The cases of the report's tables.
CASES = ["echo_reply", "chat_request/100", "chat_request/40000", "chat_reply/1", "chat_reply/50",
         "message_page/500", "chatroom_entry/500"]
# The most instructions that a call may execute on ARM: the ratio to the baseline, to two decimals.
INSTRUCTION_THRESHOLDS = {"echo_reply": 1.11, "chat_request/100": 1.02, "chat_request/40000": 1.02,
                          "chat_reply/1": 1.08, "chat_reply/50": 0.98, "message_page/500": 0.98,
                          "chatroom_entry/500": 0.98}
# The most that a call through qel-message.h may take: the ratio to the plain call.
HEADER_THRESHOLD = 1.02
# Those of small messages, in which qel-message.h is compared with the functions below it.
SMALL = ["echo", "end_of_chats", "invitation"]
LISTS = ["chat_reply/50", "message_page/500", "chatroom_entry/500"]

# The cases that show how a call grows with its work.
AMOUNTS = {"chat_request": [10, 100, 1000, 10000, 40000], "chat_reply": [1, 10, 100, 500, 5000],
           "message_page": [1, 10, 100, 500, 5000], "chatroom_entry": [1, 10, 100, 500, 5000]}
GROWTH = [f"{call}/{amount}" for call, amounts in AMOUNTS.items() for amount in amounts]

ALL_CASES = list(dict.fromkeys([*CASES, *GROWTH]))

PUBLISHED = pathlib.Path(__file__).resolve().parent.parent / "docs" / "benchmark"


def is_parser(case):
    return case.split("/")[0] in ("chat_reply", "message_page", "chatroom_entry")


def kept_blocks(case):
    """The blocks that a call keeps: a parser keeps its input stream."""
    return 1 if is_parser(case) else 0


@dataclasses.dataclass
class Build:
    """The benchmark as one preset builds it, with its library or with that of another preset."""

    folder: pathlib.Path
    emulator: list  # the command that runs a program of another machine
    other: pathlib.Path = None  # the folder of that preset

    @property
    def name(self):
        return (self.other or self.folder).name

    @property
    def library(self):
        return (self.other or self.folder) / "proto-lib" / "libqel-message-protosvc.so"

    @property
    def compiler(self):
        found, = self.folder.glob("CMakeFiles/*/CMakeCXXCompiler.cmake")
        path = re.search(r'set\(CMAKE_CXX_COMPILER "(.+)"\)', found.read_text())[1]
        return self.run([path, "--version"]).stdout.splitlines()[0]

    def setting(self, name):
        cache = (self.folder / "CMakeCache.txt").read_text()
        return re.search(rf"^{name}:\w+=(.+)$", cache, re.MULTILINE)[1]

    def run(self, command, **settings):
        done = subprocess.run(command, stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True,
                              env={**os.environ, **settings})
        if done.returncode != 0:
            raise RuntimeError(f"{command}: exit status {done.returncode}\n{done.stderr}")
        return done

    def program(self, name, implementation):
        return str(self.folder / "bench" / f"{name}-{implementation}")

    def blocks(self, implementation, case, calls=10):
        """The blocks that a call allocates, those that it keeps, and its log lines."""
        command = [*self.emulator, self.program("count_blocks", implementation), case, str(calls)]
        counts = [int(word) for word in self.run(command).stdout.split()]
        if any(count % calls for count in counts):
            raise RuntimeError(f"{implementation}, {case}: not the same in each call: {counts}")
        return [count // calls for count in counts]

    def instructions(self, implementation, case):
        """The instructions of a call, from the difference of a longer and a shorter run."""
        few, many = (10, 30) if case in LISTS else (100, 1100)
        return (self._executed(implementation, case, many) -
                self._executed(implementation, case, few)) / (many - few)

    def _executed(self, implementation, case, calls):
        emulator = self.emulator or [f"qemu-{platform.machine()}"]
        libraries = {"LD_LIBRARY_PATH": str(self.library.parent)} if self.other else {}
        command = [*emulator, "-plugin", str(self.folder / "bench" / "count_instructions.so"),
                   self.program("count_calls", implementation), case, str(calls)]
        # The C library has variants for newer processors. Without them all machines count the same.
        out = self.run(command, GLIBC_TUNABLES="glibc.cpu.hwcaps=-AVX2,-AVX512F,-AVX512VL,-ERMS,-FSRM",
                       **libraries).stderr
        return int(re.search(r"^instructions (\d+)$", out, re.MULTILINE)[1])


def build_of(folder, other=None):
    """The build in a preset's folder, with the library of another's."""
    emulator = folder / "emulate"
    return Build(folder, [str(emulator)] if emulator.exists() else [], other)
