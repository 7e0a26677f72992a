#!/usr/bin/env python3
"""Counts the small faults in src/ that the test suite catches.

Each mutant is one edit to one line of src/**/*.cpp: a flipped comparison or logical operator, a
changed constant, or a deleted statement. Mutants are drawn in an order fixed by --order; each is
applied to a scratch copy of the tree, built incrementally and tested, then reverted. The tree
given is never touched.

  Draw a sample:  mutation_check.py --save-sample sample.txt
  Reuse it:       mutation_check.py --sample sample.txt --tree OTHER [--tests-from TESTS_TREE]

A sampled mutant is found again by its line's text (the nearest match to its old line number), so
it survives code moving around; one whose line is gone is reported and left out of the counts.
"""
import argparse
import fnmatch
import json
import os
import random
import re
import shutil
import subprocess
import sys
import time
from dataclasses import dataclass
from pathlib import Path

FLIPS = {"==": "!=", "!=": "==", "<": ">=", ">=": "<", ">": "<=", "<=": ">", "&&": "||", "||": "&&"}
# Operators stand between spaces in formatted code; that keeps templates, -> and << out.
FLIP_RE = re.compile(r"(?<=\s)(==|!=|<=|>=|<|>|&&|\|\|)(?=\s|$)")
INT_RE = re.compile(r"(?<![\w.'])(0[xX][0-9a-fA-F]+|\d+)(?![\w.'])")
BOOL_RE = re.compile(r"\b(true|false)\b")
# A call, assignment, increment or jump with nothing before it that could be a type.
STATEMENT_RE = re.compile(
    r"^(\+\+|--)?[\w*][\w:.\->\[\]*]*(\s*(\(|[-+*/%|&^]?=(?!=)|<<=|>>=|\+\+|--)|;$)")
NOT_STATEMENT_RE = re.compile(r"^((if|else|for|while|do|switch|case|default|static_assert|using|"
                              r"typedef)\b|return\s*[^\s;])|= (default|delete);$")
DIGITS_BEFORE_RE = re.compile(r"(?<![\w'])\d[\w']*$")
RAW_OPEN_RE = re.compile(r'(?<![\w])(?:u8|u|U|L)?R"([^(\s]*)\(')
SAMPLE_FIELDS = 8  # id file line kind col orig repl text


@dataclass
class Mutant:
    id: int
    file: str
    line: int
    kind: str  # flip, constant, delete
    col: int  # offset in the line's stripped text
    orig: str
    repl: str
    text: str  # the line's stripped text before the edit

    def Describe(self):
        edit = "delete line" if self.kind == "delete" else f"{self.orig} -> {self.repl}"
        return f"{self.id:5} {self.file}:{self.line} {self.kind} [{edit}]"


def Mask(lines):
    """Blanks comments, literal contents and preprocessor lines, keeping every column."""
    out, inBlock, rawEnd, continued = [], False, None, False
    for line in lines:
        if continued or line.lstrip().startswith("#"):
            continued = line.endswith("\\")
            out.append(" " * len(line))
            continue
        chars, i, n = list(line), 0, len(line)

        def Blank(a, b):
            chars[a:b] = " " * (b - a)

        while i < n:
            if inBlock or rawEnd:
                end = line.find("*/" if inBlock else rawEnd, i)
                stop = n if end < 0 else end + (2 if inBlock else len(rawEnd))
                Blank(i, stop)
                if end >= 0:
                    inBlock, rawEnd = False, None
                i = stop
                continue
            raw = RAW_OPEN_RE.match(line, i)
            if line.startswith("//", i):
                Blank(i, n)
                break
            if line.startswith("/*", i):
                inBlock = True
            elif raw:
                rawEnd, i = ")" + raw.group(1) + '"', raw.end()
            elif line[i] == "'" and DIGITS_BEFORE_RE.search(line, 0, i):
                i += 1  # digit separator
            elif line[i] in "\"'":
                j = i + 1
                while j < n and line[j] != line[i]:
                    j += 2 if line[j] == "\\" else 1
                Blank(i + 1, min(j, n))
                i = j + 1
            else:
                i += 1
        out.append("".join(chars))
    return out


def Bumped(literal):
    if literal in ("0", "1"):
        return "1" if literal == "0" else "0"
    if literal[:2] in ("0x", "0X"):
        return literal[:2] + format(int(literal, 16) + 1, "X" if literal[2:].isupper() else "x")
    if literal.startswith("0"):
        return "0" + format(int(literal, 8) + 1, "o")
    return str(int(literal) + 1)


def IsStatement(code, previous):
    """A whole simple statement on its own line, deletable without breaking the build."""
    s = code.strip()
    balanced = all(s.count(a) == s.count(b) for a, b in ("()", "{}", "[]"))
    afterEnd = previous == "" or previous[-1] in ";{}:"
    return (s.endswith(";") and balanced and afterEnd and STATEMENT_RE.match(s) is not None and
            NOT_STATEMENT_RE.search(s) is None)


def Candidates(srcRoot, only):
    found = []
    for path in sorted(srcRoot.glob("src/**/*.cpp")):
        rel = path.relative_to(srcRoot).as_posix()
        if only and not fnmatch.fnmatch(rel, only):
            continue
        lines = path.read_text().split("\n")
        previous = ""
        for no, (line, code) in enumerate(zip(lines, Mask(lines)), 1):
            lead, text = len(line) - len(line.lstrip()), line.strip()

            def Add(kind, col, orig, repl):
                found.append(Mutant(0, rel, no, kind, col - lead, orig, repl, text))

            for m in FLIP_RE.finditer(code):
                Add("flip", m.start(), m.group(1), FLIPS[m.group(1)])
            for m in INT_RE.finditer(code):
                Add("constant", m.start(), m.group(1), Bumped(m.group(1)))
            for m in BOOL_RE.finditer(code):
                Add("constant", m.start(), m.group(1), "false" if m.group(1) == "true" else "true")
            if IsStatement(code, previous):
                Add("delete", lead, "", "")
            previous = code.strip() or previous
    return found


def ReadSample(path):
    mutants = []
    for row in Path(path).read_text().splitlines():
        if row and not row.startswith("#"):
            f = row.split("\t", SAMPLE_FIELDS - 1)
            mutants.append(Mutant(int(f[0]), f[1], int(f[2]), f[3], int(f[4]), f[5], f[6], f[7]))
    return mutants


def WriteSample(path, mutants, order):
    rows = [f"# mutation sample, order {order}: id file line kind col orig repl text (tab-separated)"]
    for m in mutants:
        fields = (m.id, m.file, m.line, m.kind, m.col, m.orig, m.repl, m.text)
        rows.append("\t".join(map(str, fields)))
    Path(path).write_text("\n".join(rows) + "\n")


def Mutated(m, lines):
    """The file's lines with the mutant applied (m.line becomes where), or None when it is gone."""
    hits = [i for i, line in enumerate(lines) if line.strip() == m.text]
    if not hits:
        return None
    i = min(hits, key=lambda h: abs(h + 1 - m.line))
    m.line, line = i + 1, lines[i]
    lead, text = line[:len(line) - len(line.lstrip())], line.strip()
    if text[m.col:m.col + len(m.orig)] != m.orig:
        return None
    edited = "" if m.kind == "delete" else lead + text[:m.col] + m.repl + text[m.col + len(m.orig):]
    return lines[:i] + [edited] + lines[i + 1:]


def Run(args, env=None):
    return subprocess.run(args, env=env, text=True, stdout=subprocess.PIPE,
                          stderr=subprocess.STDOUT)


class Scratch:
    """A copy of the tree with a fast build: no debug info, a fast linker, no benchmarks."""

    def __init__(self, tree, testsFrom, work, jobs):
        self.src, self.build, self.jobs = work / "tree", work / "build", str(jobs)
        # Paths relative to the scratch folder let every scratch copy share compiled objects.
        self.env = dict(os.environ, CCACHE_BASEDIR=str(work))
        marker = work / ".mutation-check"
        if work.exists() and not marker.exists():
            sys.exit(f"{work} exists and is not a mutation-check folder; pick another --work")
        shutil.rmtree(work, ignore_errors=True)
        work.mkdir(parents=True)
        marker.touch()
        topLevel = lambda d, names: [n for n in names if n == ".git" or
                                     (Path(d) == tree and n.startswith("build"))]
        shutil.copytree(tree, self.src, ignore=topLevel)
        if testsFrom:
            shutil.rmtree(self.src / "tests")
            shutil.copytree(testsFrom / "tests", self.src / "tests", ignore=topLevel)
        linker = next((f"-fuse-ld={ld}" for ld in ("lld", "gold") if shutil.which(f"ld.{ld}")), "")
        self.Check(["cmake", "-S", self.src, "-B", self.build, "-G", "Ninja",
                    "-DCMAKE_BUILD_TYPE=Release", "-DCMAKE_CXX_FLAGS_RELEASE=-O1 -g0 -DNDEBUG",
                    f"-DCMAKE_EXE_LINKER_FLAGS={linker}", "-DCMAKE_CXX_COMPILER_LAUNCHER=ccache",
                    "-DCMAKE_GTEST_DISCOVER_TESTS_DISCOVERY_MODE=PRE_TEST",
                    "-DBUILD_TESTING=ON"])
        self.Check(["ninja", "-C", self.build, "-j", self.jobs])
        self.Check(["ctest", "--test-dir", self.build, "-j", self.jobs, "--timeout", "30"], False)
        failedLog = self.build / "Testing/Temporary/LastTestsFailed.log"
        failed = failedLog.read_text().splitlines() if failedLog.exists() else []
        failed = dict(f.split(":", 1) for f in failed)  # number -> name
        self.failing = [f"#{n} {name}" for n, name in failed.items()]
        listing = json.loads(self.Check(["ctest", "--test-dir", self.build, "--show-only=json-v1"]))
        # ctest numbers tests in this order; a test belongs to the program it runs.
        self.tests = [(n, Path(t["command"][0]).resolve()) for n, t in
                      enumerate(listing["tests"], 1) if str(n) not in failed]
        self.users = {}  # source file -> the programs it is linked into
        programs = {exe for _, exe in self.tests} | {(self.build / "trllocator").resolve()}
        for exe in programs:
            target = exe.relative_to(self.build.resolve()).as_posix()
            for item in self.Check(["ninja", "-C", self.build, "-t", "inputs", target]).split():
                source = (self.build / item).resolve()
                if source.suffix == ".cpp" and source.is_relative_to(self.src.resolve()):
                    rel = source.relative_to(self.src.resolve()).as_posix()
                    self.users.setdefault(rel, set()).add(target)

    def Check(self, args, mustPass=True):
        done = Run(args, self.env)
        if done.returncode != 0 and mustPass:
            sys.exit(f"failed: {' '.join(map(str, args))}\n{done.stdout[-4000:]}")
        return done.stdout

    def Try(self, m):
        path = self.src / m.file
        if not path.exists():
            return "gone"
        original = path.read_text()
        mutated = Mutated(m, original.split("\n"))
        if mutated is None:
            return "gone"
        targets = sorted(self.users.get(m.file, {"all"}))
        try:
            path.write_text("\n".join(mutated))
            if Run(["ninja", "-C", self.build, "-j", self.jobs] + targets, self.env).returncode:
                return "no-compile"
            wanted = {(self.build / t).resolve() for t in targets}
            numbers = [str(n) for n, exe in self.tests if exe in wanted]
            if not numbers:
                return "survived"
            (self.build / "mutant-tests").write_text("0,0,0," + ",".join(numbers))
            run = Run(["ctest", "--test-dir", self.build, "-I", self.build / "mutant-tests",
                       "--stop-on-failure", "--timeout", "30", "-j", self.jobs], self.env)
            if run.returncode == 0:
                return "survived"
            return "timeout" if "***Timeout" in run.stdout else "killed"
        finally:
            path.write_text(original)


def main():
    here = Path(__file__).resolve().parent.parent
    p = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawTextHelpFormatter)
    p.add_argument("--tree", type=Path, default=here, help="source tree to mutate (not modified)")
    p.add_argument("--tests-from", type=Path, help="take tests/ from this tree instead")
    p.add_argument("--work", type=Path, help="scratch folder (default /tmp/trl-mutation-<tree>)")
    p.add_argument("--only", help="limit mutants to src paths matching this glob")
    p.add_argument("--count", type=int, default=100, help="mutants that compile (default 100)")
    p.add_argument("--order", type=int, default=20240611, help="draw order (default 20240611)")
    p.add_argument("--jobs", type=int, default=2, help="build and test jobs (default 2)")
    g = p.add_mutually_exclusive_group()
    g.add_argument("--save-sample", type=Path, help="write the drawn mutants here")
    g.add_argument("--sample", type=Path, help="apply the mutants saved here")
    a = p.parse_args()
    tree = a.tree.resolve()
    work = (a.work or Path(f"/tmp/trl-mutation-{tree.name}")).resolve()

    if a.sample:
        mutants = [m for m in ReadSample(a.sample) if not a.only or fnmatch.fnmatch(m.file, a.only)]
        mutants = mutants[:a.count]
    else:
        mutants = Candidates(tree, a.only)
        random.Random(a.order).shuffle(mutants)
        for i, m in enumerate(mutants, 1):
            m.id = i
    drawn = f"sample {a.sample.resolve()}" if a.sample else f"order {a.order}"
    print(f"# tree {tree}, tests from {(a.tests_from or tree).resolve()}, {drawn}", flush=True)
    start = time.monotonic()
    scratch = Scratch(tree, a.tests_from and a.tests_from.resolve(), work, a.jobs)
    print(f"# set-up {time.monotonic() - start:.0f}s; {len(scratch.tests)} tests; failing on the "
          f"unmutated tree, excluded: {', '.join(scratch.failing) or 'none'}", flush=True)

    tally, kept, seconds = {}, [], []
    for m in mutants:
        if len(kept) >= a.count:
            break
        began = time.monotonic()
        outcome = scratch.Try(m)
        seconds += [time.monotonic() - began] if outcome != "gone" else []
        tally[outcome] = tally.get(outcome, 0) + 1
        if outcome not in ("no-compile", "gone"):
            kept.append(m)
            if a.save_sample:
                WriteSample(a.save_sample, kept, a.order)
        took = f" ({seconds[-1]:.1f}s)" if outcome != "gone" else ""
        print(f"{m.Describe()} {outcome}{took}", flush=True)

    caught = tally.get("killed", 0) + tally.get("timeout", 0)
    mean = sum(seconds) / len(seconds) if seconds else 0.0
    print(f"# drawn {sum(tally.values())}, gone {tally.get('gone', 0)}, no-compile "
          f"{tally.get('no-compile', 0)}, compiled {len(kept)}, killed {caught} (timeout "
          f"{tally.get('timeout', 0)}), survived {tally.get('survived', 0)}; score "
          f"{100.0 * caught / max(len(kept), 1):.1f}%; mean {mean:.1f}s per mutant, total "
          f"{time.monotonic() - start:.0f}s")
    return 0


if __name__ == "__main__":
    sys.exit(main())
