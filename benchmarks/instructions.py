"""Counts the instructions that the libraries' own code takes for an operation, and compares them with
the recorded ones: instructions.py PROGRAM [--record].

Times differ from run to run and from machine to machine; instructions do not, if the compiler and
the input are the same. What OpenSSL, libxml2 and libc take is left out: it depends on the processor.
"""

import json
import pathlib
import re
import subprocess
import sys
import tempfile

RECORD = pathlib.Path(__file__).with_name("instructions.json")
OPERATIONS = ("verify-4k", "verify-8k", "verify-100k", "sign")
TOLERANCE = 0.05
FEW, MANY = 2, 12


def own_cost(profile, folder):
    """The instructions of callgrind's file that lie in what was built in the folder."""
    names, current, is_call, cost = {}, None, False, 0
    for line in profile.splitlines():
        named = re.fullmatch(r"ob=\((\d+)\)(?: (.*))?|cob=\((\d+)\)(?: (.*))?", line)
        if named and named[1]:
            names.setdefault(named[1], named[2])
            current = names[named[1]]
        elif named:
            names.setdefault(named[3], named[4])
        elif line.startswith("calls="):
            is_call = True
        elif re.match(r"[+\-*\d]", line):
            if not is_call and pathlib.PurePath(current).is_relative_to(folder):
                cost += int(line.split()[1])
            is_call = False
    return cost


def run(program, operation, count):
    with tempfile.TemporaryDirectory() as folder:
        out = pathlib.Path(folder, "profile")
        subprocess.run(["valgrind", "--tool=callgrind", f"--callgrind-out-file={out}", program,
                        operation, str(count)], check=True, capture_output=True)
        return own_cost(out.read_text("utf-8"), pathlib.PurePath(program).parents[1])


def count(program, operation):
    """Of one run of the operation, without what is made once."""
    return round((run(program, operation, MANY) - run(program, operation, FEW)) / (MANY - FEW))


def complaint(operation, counted, recorded):
    if counted > recorded * (1 + TOLERANCE):
        return (f"{operation} takes {counted:,} instructions of our own, recorded are {recorded:,}: "
                f"{counted / recorded - 1:+.1%}. If that is meant, record it: "
                f"benchmarks/instructions.py PROGRAM --record")
    return None


def main():
    if len(sys.argv) < 2 or sys.argv[2:] not in ([], ["--record"]):
        sys.exit("usage: instructions.py PROGRAM [--record]")
    program = str(pathlib.Path(sys.argv[1]).resolve())
    counted = {operation: count(program, operation) for operation in OPERATIONS}
    if sys.argv[2:] == ["--record"]:
        RECORD.write_text(json.dumps(counted, indent=2) + "\n", "utf-8")
    recorded = json.loads(RECORD.read_text("utf-8"))
    for operation in OPERATIONS:
        print(f"{operation:12} {counted[operation]:>9,} instructions, recorded {recorded[operation]:>9,}")
    complaints = [complaint(operation, counted[operation], recorded[operation])
                  for operation in OPERATIONS]
    for text in filter(None, complaints):
        print(text, file=sys.stderr)
    sys.exit(any(complaints))


if __name__ == "__main__":
    main()
