"""Sources that clang-tidy can read as one text, and that text."""

import collections
import json
import re
import shlex

LARGEST = 16  # sources of one text: with more of them, less is read twice, but one processor ends long before the other

# What may clash with the same in another source: what is declared at the beginning of a line, and the tests.
DECLARED = re.compile(r"^(?:class|struct|enum class|enum) (\w+)|^using (\w+) =", re.MULTILINE)
DEFINED = re.compile(
    r"^(?!TEST|INSTANTIATE|class |struct |enum |using |namespace |template )[A-Za-z][^\n(={;]*?(?<!::)\b(\w+)\s*[(={;\[]",
    re.MULTILINE)
TESTS = re.compile(r"^(?:TEST\w*|INSTANTIATE\w*)\((\w+),\s*(\w+)", re.MULTILINE)
MACROS = re.compile(r"^#define (\w+)", re.MULTILINE)
INCLUDED = re.compile(r"#include (\S+)")
# What asks for definitions, which another source of a group may have: read alone, and with all of its own.
TESTED = re.compile(r"^\s*#\s*(if|elif)", re.MULTILINE)
BORROWED = re.compile(r"^using (?!namespace\b)[^=\n]*?(\w+);|^namespace (\w+) =", re.MULTILINE)


class Group:
    """Sources with the same settings and flags whose names do not clash."""

    def __init__(self, settings, flags):
        self.settings = settings
        self.flags = flags
        self.definitions = {}
        self.names = set()
        self.sources = []
        self.closed = False

    def takes(self, settings, flags, definitions, names):
        return (
            not self.closed
            and (self.settings, self.flags) == (settings, flags)
            and len(self.sources) < LARGEST
            and not self.names & names
            and all(self.definitions.get(name, value) == value for name, value in definitions.items())
        )

    def add(self, source, definitions, names):
        self.sources.append(source)
        self.definitions.update(definitions)
        self.names |= names

    def command(self):
        """The arguments that the compiler needs to read the text."""
        return self.flags + [f"-D{name}={value}" for name, value in self.definitions.items()]

    def text(self):
        """The sources' texts one after the other, and which line of which source each of its lines is."""
        lines, places = [], []
        included = set()
        for source in self.sources:
            text = source.read_text()
            own = set()
            for number, line in enumerate(text.splitlines(), 1):
                header = INCLUDED.match(line)
                if header:
                    # Drop includes that an earlier source has; keep a source's own duplicates, which are findings.
                    line = "" if header[1] in included else line
                    own.add(header[1])
                lines.append(line)
                places.append((source, number))
            included |= own
            for macro in MACROS.findall(text):
                lines.append(f"#undef {macro}")
                places.append((source, number))
        return "\n".join(lines) + "\n", places


def alone(group):
    """A group for each source of a group."""
    for source in group.sources:
        single = Group(group.settings, group.flags)
        single.add(source, group.definitions, set())
        yield single


def flags_and_definitions(entry):
    """What of a compile command decides about the reading: not the output, the optimiser or a precompiled header."""
    flags, definitions = [], {}
    words = iter(shlex.split(entry["command"])[1:])
    for word in words:
        if word in ("-o", "-MF", "-MT", "-include", "-Xclang"):
            next(words)
        elif word == "-isystem":
            flags += [word, next(words)]
        elif word.startswith("-D"):
            name, given, value = word[2:].partition("=")
            definitions[name] = value if given else "1"
        elif re.match(r"-(I|std=|W(?!invalid-pch))", word):
            flags.append(word)
    return flags, definitions


def commands(build):
    """The flags and definitions that each source is compiled with, more than once if they differ."""
    known = collections.defaultdict(list)
    for entry in json.loads((build / "compile_commands.json").read_text()):
        way = flags_and_definitions(entry)
        if way not in known[entry["file"]]:
            known[entry["file"]].append(way)
    return known


def settings_folder(root, source):
    """The nearest folder above a source with settings for clang-tidy."""
    return next(folder for folder in source.parents if folder == root or (folder / ".clang-tidy").exists())


def names_of(text):
    names = {name for names in DECLARED.findall(text) for name in names if name}
    names |= {f"{suite}_{test}" for suite, test in TESTS.findall(text)}
    return names | set(DEFINED.findall(text)) | set(MACROS.findall(text))


def borrows_in_vain(text):
    """Whether a text does not use a name that it borrows from a namespace: in a group, another source could use it."""
    names = (using or alias for using, alias in BORROWED.findall(text))
    return any(len(re.findall(rf"\b{name}\b", text)) < 2 for name in names)


def ways_that_matter(ways, text):
    """One way of compiling is enough for a source that does not ask for definitions."""
    return ways if TESTED.search(text) else ways[:1]


def make(root, build, names):
    """The named sources in groups, and those of them that no target compiles."""
    known = commands(build)
    groups, unknown = [], []
    for name in sorted(names):
        source = root / name
        if str(source) not in known:
            unknown.append(name)
            continue
        text = source.read_text()
        settings = settings_folder(root, source)
        ways = ways_that_matter(known[str(source)], text)
        declared = names_of(text)
        single = source.suffix == ".c" or borrows_in_vain(text) or TESTED.search(text)
        for flags, definitions in ways:
            takers = (group for group in groups if group.takes(settings, flags, definitions, declared))
            group = None if single else next(takers, None)
            if not group:
                group = Group(settings, flags)
                group.closed = single
                groups.append(group)
            group.add(source, definitions, declared)
    return groups, unknown
