#!/usr/bin/env python3
"""Whether two runs' merged results give the same verdicts: for every application found, the
folder it was found in, its name and the version settled on (or none, or several)."""
import sys
import xml.etree.ElementTree as ET


def verdicts(path):
    found = set()
    for folder in ET.parse(path).getroot().iter("d"):
        for application in folder.findall("a"):
            found.add((folder.get("d_text"), application.get("a_name"), application.get("v_id"),
                       application.get("v_name"), application.get("v_seq")))
    return found


def main():
    linux, windows = verdicts(sys.argv[1]), verdicts(sys.argv[2])
    for verdict in sorted(linux - windows):
        print("only on Linux:  ", *verdict)
    for verdict in sorted(windows - linux):
        print("only on Windows:", *verdict)
    if not linux or linux != windows:
        print("the verdicts differ" if linux else "the Linux run found nothing")
        return 1
    print(f"same verdicts on {len(linux)} applications")
    return 0


if __name__ == "__main__":
    sys.exit(main())
