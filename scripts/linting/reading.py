"""Has clang-tidy read a group of sources."""

import pathlib
import re
import subprocess
import tempfile

from groups import alone

ROOT = pathlib.Path(__file__).resolve().parents[2]
FINDING = re.compile(r"^\S+:\d+:\d+: (?:warning|error): .*", re.MULTILINE)


class Report:
    def __init__(self, clean, text):
        self.clean = clean
        self.text = text
        self.findings = set(FINDING.findall(text))

    def drop(self, sources):
        """Leaves out what is said of these sources."""
        self.findings = {finding for finding in self.findings if not any(str(name) in finding for name in sources)}
        self.clean = not self.findings
        self.text = "\n".join(sorted(self.findings))


def run(group, path):
    return subprocess.run(
        ["clang-tidy", "--quiet", f"--config-file={group.settings / '.clang-tidy'}", str(path), "--", *group.command()],
        capture_output=True, text=True, check=False)


def read_source(group):
    done = run(group, group.sources[0])
    told = FINDING.search(done.stdout)
    return Report(done.returncode == 0, done.stdout if told else done.stdout + done.stderr)


def read_text(group, folder):
    """The reports on sources read as one text; none if they do not compile as one."""
    text, places = group.text()
    path = folder / "sources.cpp"
    path.write_text(text)
    done = run(group, path)
    if "[clang-diagnostic-error" in done.stdout or (done.returncode and not FINDING.search(done.stdout)):
        return None

    def place(match):
        source, line = places[int(match[1]) - 1]
        return f"{source}:{line}"

    report = Report(done.returncode == 0, re.sub(rf"{re.escape(str(path))}:(\d+)", place, done.stdout))
    # Two sources may disagree about what a header of the system's declares.
    if any(not finding.startswith(f"{ROOT}/") for finding in report.findings):
        return None
    suspects = {source for source in group.sources if any(str(source) in finding for finding in report.findings)}
    if not suspects:
        return [report]
    # A name in one source may hide one of another: what such a source says alone counts.
    report.drop(suspects)
    return [report] + [read_source(single) for single in alone(group) if single.sources[0] in suspects]


def read(group, folder):
    """The reports on a group's sources."""
    reports = None
    if len(group.sources) > 1:
        with tempfile.TemporaryDirectory(dir=folder) as name:
            reports = read_text(group, pathlib.Path(name))
    return reports or [read_source(single) for single in alone(group)]
