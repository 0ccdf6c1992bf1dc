"""reference.py CHECK SOURCE [CONTRACT.json]: qel-wire and other programs agree: on every message of the
schema, with all its fields, Debian's python3-protobuf; on conditions and differences jq, by the JSON
form. And qel-wire agrees with itself on many messages in one file. Prints on what they disagree."""

import json
import pathlib
import random
import re
import subprocess
import sys
import tempfile

from google.protobuf import json_format, text_format

check, source = sys.argv[1], pathlib.Path(sys.argv[2])
sys.path.insert(0, str(source / "tests" / "support"))
import schema  # pylint: disable=wrong-import-position

CHANCE = random.Random(20261123)


def run(*command, data=b"", status=0):
    done = subprocess.run(command, input=data, check=False, stdout=subprocess.PIPE)
    if done.returncode != status:
        raise SystemExit(f"{command}: status {done.returncode}")
    return done.stdout


def qel_wire(*arguments, data=b""):
    return run("qel-wire", *arguments, data=data)


def wire_types(message):
    """What tells messages apart that have all their fields."""
    return {field.number: field.type in (field.TYPE_STRING, field.TYPE_BYTES, field.TYPE_MESSAGE)
            for field in message.fields}


def is_record(message):
    return any(field.message_type == message for other in types for field in other.fields)


def agrees(message):
    name, data = message.DESCRIPTOR.name, message.SerializeToString()
    text = text_format.MessageToString(message, as_utf8=True).encode()
    if check == "text":
        return qel_wire("decode", "--show-token", name, data=data) == text
    if check == "json":
        printed = qel_wire("decode", "--show-token", "--json", name, data=data)
        return json.loads(printed) == json.loads(json_format.MessageToJson(message))
    if check == "bytes":
        as_json = json_format.MessageToJson(message).encode()
        return qel_wire("encode", name, data=text) == data == qel_wire("encode", name, data=as_json)
    if check == "back":
        return all(comes_back(type(message), written(message.DESCRIPTOR)) for _ in range(4))
    lines = [line.split("doubtful ")[1].split("broken ")[-1].strip().split(", ")
             for line in qel_wire("guess", "--all", data=data).decode().splitlines()]
    first = next(names for names in lines if is_record(message.DESCRIPTOR) in map(is_record, map(type_of, names)))
    alike = {other.name for other in types if wire_types(other) == wire_types(message.DESCRIPTOR)}
    return name in first and set(first) <= alike and sum(map(len, lines)) == len(types)


# ---- There and back

# A group, 4 and 8 bytes, a text, a varint, as unknown fields.
UNKNOWN = [bytes.fromhex(each) for each in ("c33e0801c43e", "7d01020304", "810101ff030405060708", "c20603616263", "b80c11")]


def written(descriptor, depth=0):
    """Bytes of the message with fields in any order, again and again, and unknown ones."""
    return b"".join(written_field(CHANCE.choice(descriptor.fields), depth) if CHANCE.random() < 0.8
                    else CHANCE.choice(UNKNOWN) for _ in range(CHANCE.randrange(12)))


def written_field(field, depth):
    if field.message_type:
        value = written(field.message_type, depth + 1) if depth < 3 else b""
    elif field.type == field.TYPE_STRING:
        value = "".join(CHANCE.choices('a"\'\\\n\0\x7f\x85é안😀', k=CHANCE.randrange(6))).encode()
    elif field.type == field.TYPE_BYTES:
        value = CHANCE.randbytes(CHANCE.randrange(6))
    else:
        most = {field.TYPE_BOOL: 1, field.TYPE_ENUM: 2**31 - 1}.get(field.type, 2**64 - 1)
        return varint(field.number << 3) + varint(CHANCE.randrange(1 << CHANCE.randrange(65)) & most)
    return varint(field.number << 3 | 2) + varint(len(value)) + value


def comes_back(kind, data):
    """Whether the text form of the bytes, and their JSON form without what it has no place for, become
    what the class makes of them."""
    read, name = kind.FromString(data), kind.DESCRIPTOR.name
    text = qel_wire("decode", "--show-token", name, data=data)
    is_same = qel_wire("encode", name, data=text) == read.SerializeToString()
    read.DiscardUnknownFields()
    as_json = qel_wire("decode", "--show-token", "--json", name, data=data)
    return is_same and qel_wire("encode", name, data=as_json) == read.SerializeToString()


def type_of(name):
    return next(each for each in types if each.name == name)


# ---- Questions, also to jq

EACH = "| if type == \"array\" then .[] else . end | select(. != null)"
LEAVES = """[paths(type != "array" and (type != "object" or length == 0)) as $path |
  [($path | map(if type == "number" then "[\\(.)]" else ".\\(.)" end) | add | ltrimstr(".")),
   (getpath($path) | tostring)]]"""


def jq_path(path):
    return " | ".join(f".{name} {EACH}" for name in path.split("."))


def leaves(value, path=""):
    """The path and the value of each field of a message's JSON form."""
    if isinstance(value, (dict, list)):
        for key, part in value.items() if isinstance(value, dict) else ((None, part) for part in value):
            yield from leaves(part, path if key is None else f"{path}.{key}" if path else key)
    else:
        yield path, value


def captures():
    """The bytes of the contract's cases, for each message that has several."""
    with open(sys.argv[3], encoding="utf-8") as file:
        contract = json.load(file)
    found = {}
    for case in contract["cases"]:
        messages_of_it = [step["encode"] for step in case["does"] if "encode" in step] + [case.get("received", {})]
        # Bytes that are broken have no text form.
        data = messages_of_it[0].get("bytes", "") if "text" in messages_of_it[0] else ""
        if data and len(data) < 2000 and case["call"] in contract["messages"]:
            found.setdefault(contract["messages"][case["call"]], []).append(bytes.fromhex(data))
    return {name: data for name, data in found.items() if len(data) > 3}


def documents(text):
    """The JSON documents that follow each other."""
    text, decoder, found = text.decode(), json.JSONDecoder(), []
    while text:
        document, end = decoder.raw_decode(text)
        found.append(document)
        text = text[end:].lstrip()
    return found


def quoted(value):
    return value if isinstance(value, str) else json.dumps(value)


def is_number(value):
    return not isinstance(value, bool) and (isinstance(value, int) or re.fullmatch(r"-?[0-9]+", value))


def is_text(name, path):
    descriptor = type_of(name)
    for part in path.split("."):
        field = descriptor.fields_by_name[part]
        descriptor = field.message_type
    return field.type in (field.TYPE_STRING, field.TYPE_BYTES)


def some_condition(name, forms):
    """A random condition on the messages, for qel-wire and for jq."""
    path, value = CHANCE.choice([(path, value) for form in forms for path, value in leaves(form)
                                 if "\0" not in str(value)])
    values = [each for form in forms for at, each in leaves(form) if at == path]
    # jq has no whole numbers beyond 53 bits.
    is_small = all(is_number(each) and abs(int(each)) < 2**53 for each in values)
    sign = CHANCE.choice(["", "!", "=", "!="] + ["<", "<=", ">", ">="] * is_small + ["~"] * is_text(name, path))
    if sign in ("", "!"):
        return sign + path, f"any({jq_path(path)}; true)" + " | not" * (sign == "!")
    if sign == "~":
        part = value[:CHANCE.randrange(len(value) + 1)]
        return f"{path}~{part}", f"any({jq_path(path)}; contains({json.dumps(part)}))"
    number = "tonumber" if sign in ("<", "<=", ">", ">=") else "."
    compared = f"{number} {'==' if sign == '=' else sign} ({json.dumps(value)} | {number})"
    return path + sign + quoted(value), f"any({jq_path(path)}; {compared})"


def where_agrees(name, data):
    """One or two conditions."""
    with tempfile.NamedTemporaryFile() as file:
        file.write(b"".join(len(each).to_bytes(4, "big") + each for each in data))
        file.flush()
        decode = ["decode", name, "--show-token", "--json", "--frames=u32"]
        forms = documents(qel_wire(*decode, file.name))
        conditions, tests = zip(*(some_condition(name, forms) for _ in range(CHANCE.randrange(1, 3))))
        ours = qel_wire(*decode, *(f"--where={condition}" for condition in conditions), file.name)
    chosen = " and ".join(f"({test})" for test in tests)
    theirs = run("jq", "-c", f"select({chosen})", data="\n".join(map(json.dumps, forms)).encode())
    return documents(ours) == documents(theirs) or conditions


def diff_agrees(name, data):
    """The places at which two random messages differ, by qel-wire and by jq."""
    pair = [CHANCE.choice(data), CHANCE.choice(data)]
    forms = [qel_wire("decode", name, "--show-token", "--json", data=each) for each in pair]
    first, second = ({path: value for path, value in json.loads(run("jq", "-c", LEAVES, data=form))} for form in forms)
    different = {path for path in {**first, **second} if first.get(path) != second.get(path)}
    with tempfile.TemporaryDirectory() as folder:
        files = [pathlib.Path(folder, side) for side in "ab"]
        for file, each in zip(files, pair):
            file.write_bytes(each)
        printed = run("qel-wire", "diff", "--show-token", f"--message={name}", *map(str, files), status=int(bool(different))).decode()
    # Unknown fields have no place in JSON.
    ours = {line[2:].split(": ")[0] for line in printed.splitlines()}
    return {path for path in ours if not re.search(r"(^|\.)[0-9]", path)} == different or f"{name} {pair}"


def question(kind):
    found = sorted(captures().items())
    for _ in range(100):
        yield kind(*CHANCE.choice(found))


# ---- Many messages

def varint(number):
    return bytes([number]) if number < 128 else bytes([number & 127 | 128]) + varint(number >> 7)


FRAMES = {
    "varint": lambda name, data: varint(len(data)),
    "u16": lambda name, data: len(data).to_bytes(2, "big"),
    "u16le": lambda name, data: len(data).to_bytes(2, "little"),
    "u32": lambda name, data: len(data).to_bytes(4, "big"),
    "u32le": lambda name, data: len(data).to_bytes(4, "little"),
    "grpc": lambda name, data: b"\0" + len(data).to_bytes(4, "big"),
    "example": lambda name, data: bytes([len(name)]) + name.encode() + len(data).to_bytes(4, "big"),
}


def disagreements_on_frames():
    """Ten thousand messages of each kind in one file, and what each of them is alone."""
    found = sorted(captures().items())
    for kind, head in FRAMES.items():
        name, data = CHANCE.choice(found)
        alone = {each: qel_wire("decode", name, data=each) for each in data}
        many = CHANCE.choices(data, k=10000)
        printed = qel_wire("decode", name, f"--frames={kind}", data=b"".join(head(name, each) + each for each in many))
        messages_alone = re.split(rb"# message [0-9]+: .*\n", printed)
        if messages_alone != [b""] + [alone[each] for each in many]:
            yield f"{kind} {name}"


# ---- The page's table of hex

def wrong_examples():
    """Examples that are not read, or not refused, as their row says."""
    page = (source / "docs" / "qel-wire.md").read_text(encoding="utf-8")
    rows = re.findall(r"^\| (.+?) \| (.+) \| (read|refused)", page, re.M)
    for form, examples, outcome in rows:
        for quotes, example in re.findall(r"(`+)(.+?)\1", examples.replace("\\|", "|")):
            done = subprocess.run(["qel-wire", "guess", "--hex"], input=example.encode(), check=False, stdout=subprocess.PIPE,
                                  stderr=subprocess.PIPE)
            is_refused = b"the input is no hex" in done.stderr
            if is_refused != (outcome == "refused") and "…" not in examples:
                yield f"{form}: {example}"
    if len(rows) < 23:
        yield "the table is not found"


# ---- Memory

def takes_little(limit, *arguments):
    """Whether the command never has so many times the input's memory, besides what it takes for nothing: for
    small fields, and for a text of which each byte is escaped."""
    size = 1 << 20
    def most(data):
        probe = ("import resource, subprocess, sys; subprocess.run(sys.argv[1:], stdin=sys.stdin, check=True, "
                 "stdout=subprocess.DEVNULL); print(resource.getrusage(resource.RUSAGE_CHILDREN).ru_maxrss)")
        return 1024 * int(run(sys.executable, "-c", probe, "qel-wire", *arguments, data=data))
    fields = [each * (size // len(each)) for each in (b"\x08\x07", b"\x6a\x02\x08\x01", b"\x60\x07\x58\x07")]
    text = b"\x12" + varint(size) + b"\x01" * size
    return all(most(data) - most(b"") < limit * size for data in [*fields, b"\x6a" + varint(len(text)) + text])


messages = schema.messages(source / "proto-lib")
types = [message.DESCRIPTOR for message in messages]
if check in ("where", "diff"):
    different = [answer for answer in question(where_agrees if check == "where" else diff_agrees) if answer is not True]
elif check == "hex":
    different = list(wrong_examples())
elif check == "frames":
    different = list(disagreements_on_frames())
elif check == "memory":
    commands = [(2, "decode", "ChatReply"), (15, "decode", "ChatReply", "--json"), (2, "guess"), (2, "session"),
                (2, "explain", "ChatReply", "--all"), (15, "explain", "ChatReply", "--json")]
    different = [command for command in commands if not takes_little(*command)]
else:
    different = [message.DESCRIPTOR.name for message in messages if not agrees(schema.fill(message))]
print(*different, sep="\n")
sys.exit(different != [])
