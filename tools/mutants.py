"""The small ways in which tools/mutate.py changes the module, made by rules from its source.

A rule is a generator: it is given a function's part of a source and yields edits, each a span and
what replaces it. Edits keep the number of lines, so that the rest still stands where it did.
"""

import collections
import re

# The span that is replaced, by what; the name is 'function | kind | line => line', for people.
Mutant = collections.namedtuple("Mutant", "file function kind start end text name")

RULES = []


def rule(kind):
    def add(function):
        RULES.append((kind, function))
        return function

    return add


def code_view(source):
    """The source with its comments, literals and attributes blanked; every place stays the same."""

    def blank(match):
        return re.sub(r"[^\n]", " ", match.group())

    return re.sub(
        r'//[^\n]*|/\*.*?\*/|"(?:\\.|[^"\\\n])*"|\'(?:\\.|[^\'\\\n])*\'|#(?:include|error)[^\n]*'
        r'|extern "C"|__attribute__\(\([^\n]*\)\)',
        blank, source, flags=re.S)


class Part:
    """A function's definition, or what stands between two of them, in a source."""

    def __init__(self, source, code, name, start, end):
        self.source, self.code, self.name, self.start, self.end = source, code, name, start, end
        self.text = code[start:end]
        self.units = list(self._units(self._body())) if name else []

    def find(self, pattern):
        """Every place where the pattern stands in the code."""
        return re.compile(pattern).finditer(self.code, self.start, self.end)

    def literals(self):
        for match in re.compile(r'"(?:\\.|[^"\\\n])+"').finditer(self.source, self.start, self.end):
            line = self.source[self.source.rfind("\n", 0, match.start()) + 1:match.start()]
            if not re.match(r"\s*#(include|error)|extern\b", line) and "//" not in line:
                yield match

    def closing(self, at):
        """The place of the bracket that closes the one at this place."""
        depth = 0
        for i in range(at, self.end):
            depth += (self.code[i] in "([{") - (self.code[i] in ")]}")
            if depth == 0:
                return i
        raise ValueError(f"{self.name}: a bracket is not closed")

    def _body(self):
        opening = self.code.find("{", self.code.find(")", self.start))
        return opening + 1, self.closing(opening)

    def _units(self, span):
        """The statements of a block, those of inner blocks included: start, end, block, condition
        (its span, of an if or a for)."""
        at, end = span
        while at < end:
            if self.code[at].isspace() or self.code[at] in "{}":
                at += 1
                continue
            start, condition = at, None
            keyword = re.compile(r"(if|for|else if|else)\b").match(self.code, at)
            if keyword:
                at = keyword.end()
                if keyword.group() != "else":
                    opening = self.code.find("(", at)
                    at = self.closing(opening)
                    condition = (opening + 1, at)
                opening = self.code.find("{", at)
                closing = self.closing(opening)
                yield start, closing + 1, span, condition
                yield from self._units((opening + 1, closing))
                at = closing + 1
                continue
            while self.code[at] != ";":
                at = self.closing(at) if self.code[at] in "([{" else at
                at += 1
            at += 1
            yield start, at, span, None

    def statements(self):
        """The simple ones: text, start, end."""
        for start, end, _, _ in self.units:
            if self.code[end - 1] == ";":
                yield self.code[start:end], start, end

    def conditions(self):
        for start, _, _, condition in self.units:
            if condition and self.code.startswith("for", start):
                first = self.code.find(";", start) + 1
                yield first, self.code.find(";", first)
            elif condition:
                yield condition
        for match in self.find(r"(?:=|return) ([^=;]*?) \?|\((\w+\([^()]*\)) \?"):
            yield match.span(1) if match.group(1) else match.span(2)


def parts(source):
    """Functions and macros, and what stands between."""
    code = code_view(source)
    at = 0
    heads = re.compile(r"^[a-zA-Z][\w:*&<> ]*?[ *](\w+)\([^;{}]*?\) *\{", re.M)
    for match in heads.finditer(code):
        yield Part(source, code, "", at, match.start())
        at = re.compile(r"^\}|\{ *\}$", re.M).search(code, match.end() - 1).end()
        yield Part(source, code, match.group(1), match.start(), at)
    yield Part(source, code, "", at, len(code))


DECLARATION = re.compile(r"(const|constexpr|auto\*?|[A-Z]\w*|int|qel_\w+\*?)\s[^=]*;|"
                         r"(const|constexpr|auto\*?|qel_\w+\*)\s|static_assert|using\s", re.S)
SETTER = r"(\w+)(\.|->)(set|add)_(\w+)\(([^;]*)\);"
ASSIGNMENT = r"[\w*()\[\]>-]+(?:->|\.)?\w* = [^;]*;"


def is_scalar(part, name):
    return name.isidentifier() and re.search(rf"\b(int64_t|int|bool) {name}\b", part.text)


# ---- Log lines


@rule("level")
def _(part):
    for match in part.find(r"QEL_LOG(?:_AT)?\((kLog\w+)"):
        levels = ["kLogDebug", "kLogInfo", "kLogWarn", "kLogError"]
        other = levels[levels.index(match.group(1)) - 1]
        yield *match.span(1), other


@rule("text letter")
def _(part):
    for match in part.literals():
        letters = re.search(r"(?:%(?:lld|[sd])|\\0\d\d|\\.|[^a-zA-Z])*([a-zA-Z])", match.group())
        if letters:
            at = match.start() + letters.start(1)
            yield at, at + 1, letters.group(1).swapcase()


@rule("text blank")
def _(part):
    for match in part.literals():
        if " " in match.group():
            at = match.start() + match.group().rindex(" ")
            yield at, at + 1, ""
        elif not match.group().endswith('.cc"'):
            yield match.end() - 1, match.end(), ' "'


@rule("text digit")
def _(part):
    for match in part.literals():
        digit = re.search(r"\d(?=\D*$)", match.group())
        if digit:
            at = match.start() + digit.start()
            yield at, at + 1, str((int(digit.group()) + 1) % 8)


@rule("argument")
def _(part):
    for text, start, end in part.statements():
        match = re.match(r"QEL_LOG(?:_AT)?\(.*, +([^,]+?)\);$", text, re.S)
        if match and match.group(1).strip() and not match.group(1).startswith("kLog"):
            yield start + match.start(1), start + match.end(1), match.group(1) + " + 1"


# ---- Numbers, operators, conditions


@rule("number")
def _(part):
    for match in part.find(r"(?<![\w.\"])\d+(?![\w.\"])"):
        yield *match.span(), str(int(match.group()) + 1)
        if int(match.group()) > 0:
            yield *match.span(), str(int(match.group()) - 1)


@rule("comparison")
def _(part):
    others = {"<": "<=", "<=": "<", ">": ">=", ">=": ">", "==": "!=", "!=": "=="}
    for match in part.find(r" (<=?|>=?|==|!=) "):
        yield *match.span(1), others[match.group(1)]


@rule("logic")
def _(part):
    for match in part.find(r"&&|\|\||!(?=[\w(])"):
        yield *match.span(), {"&&": "||", "||": "&&", "!": ""}[match.group()]


@rule("condition")
def _(part):
    for start, end in part.conditions():
        for forced in ("true", "false"):
            yield start, end, forced


@rule("operand")
def _(part):
    def operands(start, end):
        """Those of the chain in this span, and of chains in brackets."""
        depth, begin, found = 0, start, []
        for i in range(start, end):
            depth += (part.code[i] in "([") - (part.code[i] in ")]")
            if depth == 0 and part.code[i:i + 2] in ("&&", "||"):
                found.append((begin, i, part.code[i:i + 2]))
                begin = i + 2
        if found:
            found.append((begin, end, found[-1][2]))
        for begin, finish, operator in found:
            text = part.code[begin:finish]
            begin += len(text) - len(text.lstrip())
            finish -= len(text) - len(text.rstrip())
            yield begin, finish, "true" if operator == "&&" else "false"
            if part.code[begin] == "(":
                yield from operands(begin + 1, finish - 1)

    for start, end in part.conditions():
        yield from operands(start, end)
    for match in part.find(r"const bool \w+ = ([^;]*&&[^;]*);"):
        yield from operands(*match.span(1))


@rule("presence dropped")
def _(part):
    for match in part.find(r"\w+(?:\.\w+\(\))*\.has_\w+\(\)"):
        yield *match.span(), "true"


@rule("presence asked")
def _(part):
    for text, start, end in part.statements():
        match = re.match(r"[\w*()\[\]>-]+ = (\w+)\.(\w+)\(\);", text)
        if match and f"has_{match.group(2)}" not in part.text and not re.search("_size|Byte", text):
            yield start, end, f"if ({match.group(1)}.has_{match.group(2)}()) {{ {text} }}"


@rule("null asked")
def _(part):
    for text, start, end in part.statements():
        match = re.match(r"\*(\w+) = |\w+(?:\.|->)set_\w+\((\w+)\);", text)
        name = match and (match.group(1) or match.group(2))
        if not name or "allocate" in text or f"{name} != nullptr" in part.text:
            continue  # a block is filled by what follows, which faults as well
        follows = re.compile(r"[^;{]*").match(part.code, end).group()
        if re.search(rf"\* ?{name}\b", part.text) and f"*{name}" not in follows:
            yield start, end, f"if ({name} != nullptr) {{ {text} }}"


@rule("zero dropped")
def _(part):
    for text, start, end in part.statements():
        match = re.match(SETTER, text)
        if match and match.group(3) == "set" and is_scalar(part, match.group(5)):
            yield start, end, f"if ({match.group(5)}) {{ {text} }}"


# ---- Statements


@rule("statement")
def _(part):
    for text, start, end in part.statements():
        depth_of_two = part.code[start - 3:start] == "\n  "
        if not DECLARATION.match(text) and not (text.startswith("return") and depth_of_two):
            yield start, end, ";"


@rule("order")
def _(part):
    """Neighbours swapped, but not two that only fill fields or outputs, whose order nobody sees."""
    fills = re.compile(rf"{SETTER}|{ASSIGNMENT}|\w+\* \w+ = \w+\.add_|copy_result(_msg)?\(|delete ",
                       re.S)

    def is_quiet(text):
        inside = re.sub(r"(if|else|for)\b[^{]*\{|\}", "", text)
        return all(fills.match(s.strip() + ";") and "allocate" not in s
                   for s in inside.split(";") if s.strip())

    blocks = collections.defaultdict(list)
    for start, end, block, _ in part.units:
        if part.code.startswith("else", start):
            blocks[block][-1] = (blocks[block][-1][0], end)
        else:
            blocks[block].append((start, end))
    for units in blocks.values():
        for (a, b), (c, d) in zip(units, units[1:]):
            first, second = part.code[a:b], part.code[c:d]
            if DECLARATION.match(first) or second.startswith("return"):
                continue
            if DECLARATION.match(second) and not re.search(r"\(.*\)", second):
                continue
            if not (is_quiet(first) and is_quiet(second)):
                yield a, d, part.source[c:d] + part.source[b:c] + part.source[a:b]


@rule("kept state")
def _(part):
    for match in part.find(r"(?m)^  ([A-Z]\w+) (\w+);"):
        yield match.start(1), match.start(1), "static "


@rule("status")
def _(part):
    for match in part.find(r"return encode\([^;]*\);"):
        yield match.end() - 1, match.end(), ", 0;"


# ---- Fields and outputs


@rule("other field")
def _(part):
    """The next field of the same message, or the next argument."""
    fields, arguments = collections.defaultdict(list), collections.defaultdict(list)
    gets = list(part.find(r"\b(\w+)\.(?!has_|mutable_|c_str|ByteSize)(\w+)\(\)"))
    sets = [m for m in part.find(SETTER) if m.group(3) == "set"]
    for match in gets:
        fields[match.group(1)].append(match.group(2))
    for match in sets:
        arguments[match.group(1)].append(match.group(5))
    for match in gets:
        names = list(dict.fromkeys(fields[match.group(1)]))
        if len(names) > 1:
            yield *match.span(2), names[(names.index(match.group(2)) + 1) % len(names)]
    for match in sets:
        names = list(dict.fromkeys(arguments[match.group(1)]))
        if len(names) > 1:
            yield *match.span(5), names[(names.index(match.group(5)) + 1) % len(names)]


@rule("width")
def _(part):
    for match in part.find(r"(?:set|add)_\w+\((\w+(?:\[i\])?)\)|lld\(([^;]*?)\)\);|"
                           r"\*(\w+) = (\w+\.\w+\(\));"):
        group = 1 if match.group(1) else 2 if match.group(2) else 4
        name = match.group(3) or match.group(group).split("[")[0]
        if group == 2 or re.search(rf"\bint64_t\*? {name}\b", part.text):
            yield *match.span(group), f"static_cast<int>({match.group(group)})"


@rule("index")
def _(part):
    for match in part.find(r"[\[(](i)[\])]"):
        yield *match.span(1), "0"


@rule("text copy")
def _(part):
    for match in part.find(r"(?<![*\w] )(copy_text|strdup)\((?!const)"):
        end = part.closing(match.end() - 1) + 1
        yield match.start(), end, "nullptr"
        yield match.start(), end, 'strdup("")'


# ---- Memory


@rule("zeroing")
def _(part):
    for match in part.find(r"\b(allocate_zeroed|allocate)<"):
        others = {"allocate": "allocate_zeroed", "allocate_zeroed": "allocate"}
        yield *match.span(1), others[match.group(1)]


@rule("count")
def _(part):
    for match in part.find(r"\ballocate(?:_zeroed)?<[^;]*>\(([^;]*)\);|"
                           r"[mc]alloc\((static_cast<size_t>\(count\))"):
        group = 1 if match.group(1) else 2
        if not match.group(group).isdigit():
            for change in (" + 1", " - 1"):
                yield *match.span(group), match.group(group) + change


@rule("stream released")
def _(part):
    for match in part.find(r"if \((parse\([^;{]*\)) == nullptr\)"):
        yield *match.span(), (f"if (const CodedInputStream* stream = {match.group(1)};"
                              " delete stream, stream == nullptr)")


@rule("cast")
def _(part):
    for match in part.find(r"static_cast<unsigned>"):
        yield *match.span(), ""


def one_line(text):
    return " ".join(text.split())


def mutants_of(file, source):
    """All mutants of a source, each with a name of its own; one that equals another is left out."""
    seen = set()
    names = collections.Counter()
    for part in parts(source):
        for kind, edits in RULES:
            for start, end, text in edits(part):
                text += "\n" * (source.count("\n", start, end) - text.count("\n"))
                if (start, end, text) in seen or source[start:end] == text:
                    continue
                seen.add((start, end, text))
                first = source.rfind("\n", 0, start) + 1
                last = source.find("\n", end)
                before = one_line(source[first:last])
                after = one_line(source[first:start] + text + source[end:last])
                name = f"{part.name or file} | {kind} | {before} => {after}"
                names[name] += 1
                if names[name] > 1:
                    name += f" #{names[name]}"
                yield Mutant(file, part.name, kind, start, end, text, name)
