#!/usr/bin/env python3
"""A client program of trlLocator in Python: registers the library, runs an asynchronous Locate on
the example documents of this folder while printing the progress it relays, cancels a second run
halfway through its search, and prints the verdicts of the first.

    examples/client.py --library build/libtrllocator.so
"""
import argparse
import pathlib
import sys
import xml.etree.ElementTree as ElementTree

HERE = pathlib.Path(__file__).resolve().parent
sys.path.insert(0, str(HERE.parent / "python"))
import trllocator  # noqa: E402

STAGES = {0: "locate", 1: "search", 2: "compare", 3: "filter", 4: "merge", 5: "locate"}
STATUS = {1: "started", 2: "running", 3: "complete", 255: "cancelled"}
ALL_FILTER_RULES = 63


class Run:
    """Follows one asynchronous run of a Locate object through its events."""

    def __init__(self, locate, cancel_at_folder=None):
        self.locate = locate
        self.cancel_at_folder = cancel_at_folder
        self.folders = 0  # progress reports of the search: one per folder walked
        self.progress = 0
        self.last = None  # (mode, status, results text) of the last status report
        self.cookie = locate.connect(status_update=self.status_update,
                                     progress_update=self.progress_update)

    def status_update(self, update, results):
        e = ElementTree.fromstring(update)
        mode, status = int(e.get("e_mode")), int(e.get("e_status"))
        counters = " ".join(f"{k}={v}" for k, v in e.attrib.items() if k not in ("e_mode", "e_status"))
        print(f"  {STAGES[mode]:8} {STATUS.get(status, status):9} {counters}")
        self.last = (mode, status, results)

    def progress_update(self, update):
        e = ElementTree.fromstring(update)
        self.progress += 1
        if e.get("e_mode") == "1":
            self.folders += 1
            if self.folders == self.cancel_at_folder:
                print(f"  cancelling at folder {self.folders}")
                self.locate.Cancel()
        if self.progress % 250 == 0:
            print(f"  {STAGES[int(e.get('e_mode'))]:8} progress  {self.progress} reports so far")

    def finished(self):
        return self.last is not None and (self.last[1] == 255 or self.last[:2] == (5, 3))

    def wait(self):
        while not self.finished():
            trllocator.pump(50)
        self.locate.disconnect(self.cookie)


def main():
    parser = argparse.ArgumentParser(description=__doc__.split("\n\n")[0])
    parser.add_argument("--library", required=True, help="the library to register and use")
    args = parser.parse_args()

    trllocator.register(args.library)
    locate = trllocator.create("trlLocator.Locate")
    documents = [trllocator.Document.from_file(HERE / "search-options.xml"),
                 trllocator.Document.from_file(HERE / "application-options.xml"),
                 ALL_FILTER_RULES,
                 trllocator.Document.from_file(HERE / "fingerprint.xml")]
    print(f"{locate.Asynchronous=} {locate.Status=} {locate.Mode=}")

    print("first run:")
    first = Run(locate)
    assert locate.Start(*documents) == "", "an asynchronous Start returns at once"
    first.wait()
    print(f"  {first.progress} progress reports, {first.folders} of them folders searched; "
          f"Status {locate.Status}, Mode {locate.Mode}")

    print("second run, cancelled halfway through the search:")
    second = Run(locate, cancel_at_folder=max(1, first.folders // 2))
    locate.Start(*documents)
    second.wait()
    print(f"  Status {locate.Status}, Mode {locate.Mode}")

    print("verdicts of the first run:")
    merged = ElementTree.fromstring(first.last[2])
    for d in merged.iter("d"):
        for a in d.findall("a"):
            print(f"  {a.get('a_name'):12} {a.get('v_name'):20} {d.get('d_text')}")

    ok = first.last[:2] == (5, 3) and second.last[1] == 255 and locate.Status == 255
    locate.release()
    return 0 if ok else 1


if __name__ == "__main__":
    sys.exit(main())
