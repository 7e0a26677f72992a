#!/usr/bin/env python3
"""Checks of what trllocator installs: the library's exported symbols, the manual pages and the
bash completion against what --help says, and an installed tree that runs its own example.

Usage: install_test.py CHECK BUILD_DIR   (CHECK: exports, manual, completion, installed)
"""
import gzip
import re
import subprocess
import sys
import tempfile
from pathlib import Path

PUBLIC = r"(Worker|Search|Compare|Filter|Merge|Locate|xml::Node|xml::Document)"


def Run(args, **kwargs):
    return subprocess.run(args, capture_output=True, text=True, check=True, **kwargs).stdout


class Help:
    """What `trllocator PATH --help` shows: the usage line, and each section's entries (the lines
    that begin one, which hold its label and, where the label is short enough, its description)."""

    def __init__(self, program, path):
        self.text = Run([program, *path, "--help"])
        self.usage = re.search(r"^Usage: (.*)$", self.text, re.M).group(1)
        self.sections = {}
        for heading, body in re.findall(r"^(\w+):\n((?:  .*\n)+)", self.text, re.M):
            self.sections[heading] = [line[2:] for line in body.splitlines()
                                      if not line.startswith("   ")]

    def Options(self):
        return {name for entry in self.sections.get("Options", [])
                for name in entry.split()[0].split(",")}

    def Names(self, section):
        return [entry.split()[0] for entry in self.sections.get(section, [])]


def Commands(program, path=()):
    """Every subcommand path, the program's own () first."""
    yield path
    for sub in Help(program, path).Names("Subcommands"):
        yield from Commands(program, (*path, sub))


def Exports(build):
    library = next(build.glob("libtrllocator.so.*.*.*"))
    symbols = Run(["nm", "-D", "--defined-only", "-C", library]).splitlines()
    names = [line.split(" ", 2)[2] for line in symbols]
    own = [re.sub(r"^(typeinfo name for |typeinfo for |vtable for )", "", n) for n in names]
    # Members of the public classes themselves, not of their private nested types.
    member = re.compile(rf"trl::{PUBLIC}(::~?\w+(\[abi:cxx11\])?\(|$)")
    leaked = [n for n in own if n.startswith("trl::") and not member.match(n)]
    assert not leaked, "exported beyond the interface:\n" + "\n".join(leaked)
    for cls in re.findall(r"[\w:]+", PUBLIC):
        assert any(n.startswith(f"trl::{cls}::") for n in own), f"{cls} is not exported"


def Manual(build, program):
    pages = {p.name for p in (build / "share/man/man1").iterdir()}
    commands = list(Commands(program))
    assert pages == {"-".join(("trllocator", *c)) + ".1.gz" for c in commands}, pages
    for command in commands:
        help = Help(program, command)
        page = gzip.decompress((build / "share/man/man1" /
                                ("-".join(("trllocator", *command)) + ".1.gz")).read_bytes()).decode()
        text = re.sub(r"\\f[BR]", "", page).replace("\\-", "-").replace("\\e", "\\")
        # Each entry of the page is the label of the same entry of the help, in the same order.
        labels = re.findall(r"^\.TP\n(.*)$", text, re.M)
        entries = [entry for section in help.sections.values() for entry in section]
        assert len(labels) == len(entries), (command, labels, entries)
        for label, entry in zip(labels, entries):
            assert entry == label or entry.startswith(label + " "), (command, label, entry)
        synopsis = re.search(r"^\.SH SYNOPSIS\n(.*)$", text, re.M).group(1)
        assert synopsis == help.usage, (synopsis, help.usage)


def Complete(script, *words):
    """The completions bash offers for the last of `words` (after "trllocator")."""
    line = " ".join(f"'{w}'" for w in words)
    out = Run(["bash", "-c", f'source "{script}"; compopt() {{ :; }}\n'
               f"COMP_WORDS=(trllocator {line}); COMP_CWORD={len(words)}; _trllocator\n"
               'printf "%s\\n" "${COMPREPLY[@]}"'])
    return set(out.split())


def Completion(build, program):
    script = build / "share/bash-completion/completions/trllocator"
    for command in Commands(program):
        help = Help(program, command)
        subs = set(help.Names("Subcommands"))
        offered = Complete(script, *command, "-")
        assert offered == help.Options(), (command, offered, help.Options())
        if subs:
            assert subs <= Complete(script, *command, ""), command
        for entry in help.sections.get("Options", []):
            names = entry.split()
            # After a flag (no type follows its names) come more options, not a value.
            if len(names) > 1 and not re.match(r"(TEXT|INT|UINT|FLOAT)\b", names[1]):
                flag = names[0].split(",")[-1]
                assert Complete(script, *command, flag, "-") == help.Options(), (command, flag)
            choices = re.search(r"\{(.*?)\}", entry)
            if choices:
                option = entry.split()[0].split(",")[-1]
                assert Complete(script, *command, option, "") == set(choices.group(1).split(","))
        if "--filter" in help.Options():
            listed = re.search(r"comma list of (.*?), or all", help.text.replace("\n", " "))
            names = {n.strip() for n in listed.group(1).split(",")} | {"all"}
            assert Complete(script, *command, "--filter", "") == names, command
            assert Complete(script, *command, "--filter", "=", "") == names, command
            assert Complete(script, *command, "--filter", "low-weights,m") == {
                "low-weights,missing-files"}, command


def Installed(build):
    with tempfile.TemporaryDirectory() as scratch:
        scratch = Path(scratch)
        prefix = scratch / "prefix"
        Run(["cmake", "--install", build, "--prefix", prefix])
        # The installed example, replaced by one that finds a file of this test: a run that read
        # the source tree's example instead would not name it.
        (scratch / "tree").mkdir()
        (scratch / "tree/tool.bin").write_text("installed")
        folder = str(scratch / "tree").replace("/", "\\") + "\\"
        example = prefix / "share/trllocator/examples"
        (example / "search-options.xml").write_text(
            "<trl_searchoptions><c c_id='1' c_text='localhost' c_name='localhost' c_local='1'>"
            f"<m m_id='1' m_text='' m_name='' m_type='3'><d d_id='1' d_text='{folder}' "
            "d_search='1' d_search_recurse='True' d_search_d_attributes='35' "
            "d_search_f_attributes='35' d_search_f_properties='0'><d_search_mask/></d></m></c>"
            "</trl_searchoptions>")
        (example / "fingerprint.xml").write_text(
            "<trl_fingerprint><a a_id='1' a_name='Installed'><v v_id='3' v_name='3.1' v_seq='3'>"
            "<f f_id='1' f_name='tool.bin' f_relpath='' f_weight='1'>"
            "<p p_type='2' p_weight='1' p_value='9'/></f></v></a></trl_fingerprint>")
        table = Run([prefix / "bin/trllocator", "locate", "--sync", "--no-cache", "--format",
                     "table"], cwd=scratch)
        assert re.search(r"Installed +3\.1 ", table), table


def main():
    check, build = sys.argv[1], Path(sys.argv[2])
    program = str(build / "trllocator")
    {"exports": lambda: Exports(build), "manual": lambda: Manual(build, program),
     "completion": lambda: Completion(build, program), "installed": lambda: Installed(build)}[check]()


if __name__ == "__main__":
    main()
