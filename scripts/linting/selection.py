"""Which sources a change touches."""

import collections
import os
import re
import subprocess

# What decides how every source is read.
CONFIGURATION = re.compile(r"(^|/)\.clang-tidy$|^cmake/|^CMakeLists\.txt$|^CMakePresets\.json$|^scripts/lint(ing/|$)")
# A line of a build file that names a source and nothing else.
SOURCE_LINE = re.compile(r"^[+-]\s*[\w./-]+\.(cpp|c)\)?$")
NOT_IGNORED = ["--cached", "--others", "--exclude-standard"]
INCLUDE = re.compile(r'^\s*#\s*include\s*"([^"]+)"', re.MULTILINE)


def git(root, *arguments):
    done = subprocess.run(["git", "-C", str(root), *arguments], capture_output=True, text=True, check=False)
    return done.stdout.splitlines() if done.returncode == 0 else None


def sources(root):
    return [name for name in git(root, "ls-files", *NOT_IGNORED, "*.cpp", "*.c") if (root / name).exists()]


def uncommitted(root):
    return bool(git(root, "status", "--porcelain"))


def includers(root):
    """For each file, the files that include it."""
    found = collections.defaultdict(set)
    for name in git(root, "ls-files", *NOT_IGNORED, "*.cpp", "*.c", "*.h"):
        if not (root / name).exists():
            continue
        for header in INCLUDE.findall((root / name).read_text()):
            beside = os.path.normpath(os.path.join(os.path.dirname(name), header))
            found[beside if (root / beside).exists() else header].add(name)
    return found


def touched(root, changed):
    """The changed files, and all that include one of them, however indirectly."""
    including = includers(root)
    reached = set()
    waiting = list(changed)
    while waiting:
        name = waiting.pop()
        if name not in reached:
            reached.add(name)
            waiting.extend(including[name])
    return reached


def says_more_than_sources(root, base, name):
    """Whether a build file changed by more than which sources there are: what it says may hold for other folders."""
    lines = git(root, "diff", "--unified=0", "--no-renames", base, "--", name)
    changes = [line for line in lines if re.match(r"[+-](?!\+\+|--)", line)]
    return not lines or any(not SOURCE_LINE.match(line) for line in changes)


def changed_sources(root, stamp):
    """The sources that the changes since the recorded commit touch, and in a few words why these."""
    everything = sources(root)
    base = stamp.read_text().strip() if stamp.exists() else ""
    if not base or git(root, "merge-base", "--is-ancestor", base, "HEAD") is None:
        return everything, "all, since the commit in .ci/linted is not known here"
    changed = git(root, "diff", "--name-only", "--no-renames", base, "--")
    changed += git(root, "ls-files", "--others", "--exclude-standard")
    decisive = [name for name in changed if CONFIGURATION.search(name)]
    if decisive:
        return everything, f"all, since {decisive[0]} changed"
    builds = [name for name in changed if name.endswith("/CMakeLists.txt") and says_more_than_sources(root, base, name)]
    if builds:
        return everything, f"all, since {builds[0]} may compile them differently"
    reached = touched(root, changed)
    chosen = [name for name in everything if name in reached]
    return chosen, f"those that the changes since {base[:12]} touch, of {len(everything)}"
