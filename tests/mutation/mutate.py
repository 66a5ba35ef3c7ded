#!/usr/bin/python3
"""Changes one line of the libraries at a time and sees whether the named test notices.

    mutate.py [--jobs N] [WORD...]

Every row of the tables beside this file is one change (see table.py). Given words, only rows whose
table, file or tests contain one of them are tried. The changes are made in copies of the working
tree under build/mutation, never in the tree itself.

Exit code 0: all changes were noticed, but those that are marked as equivalent. 1: one was not, or
one that is marked was. 2: a row cannot be tried, because it does not compile, or because its tests
fail without it.
"""

import argparse
import collections
import concurrent.futures
import os
import queue
import shutil
import subprocess
import sys
import time

import table

BUILD = table.ROOT / "build" / "mutation"
TEST_SECONDS = 120  # a test that takes longer has noticed by hanging
CONFIGURATION = ["--preset", "release", "-DSSOCLIENT_BUILD_TESTS=ON",
                 "-DSSOCLIENT_BUILD_BENCHMARKS=OFF", "-DCMAKE_LINK_DEPENDS_NO_SHARED=ON"]
# A changed line is compiled quickly rather than well, and may leave something unused.
FLAGS_OF_CHANGE = "-O0 -U_FORTIFY_SOURCE -w"


class Worker:
    """A copy of the tree with a build of its own."""

    def __init__(self, number):
        self.tree = BUILD / str(number)
        self.build = self.tree / "build" / "release"

    def prepare(self, programs):
        self._copy_tree()
        launcher = self.tree / "tests" / "mutation" / "compile.sh"
        self._run(["cmake", *CONFIGURATION, f"-DCMAKE_CXX_COMPILER_LAUNCHER={launcher}"],
                  check=True)
        self._build(programs, check=True)

    def _build(self, programs, **settings):
        return self._run(["cmake", "--build", self.build, "--target", *sorted(programs)],
                         **settings)

    def _run(self, command, flags="", **settings):
        """Paths are relative to the tree, so that the cache serves all workers alike."""
        environment = {**os.environ, "CCACHE_BASEDIR": str(self.tree), "MUTATION_FLAGS": flags}
        if flags:
            environment["CCACHE_DEPEND"] = "1"  # a change is new: no preprocessing to look it up
        return run(command, cwd=self.tree, env=environment, **settings)

    def _copy_tree(self):
        """Only what differs, so that a build of an earlier run stays good."""
        names = subprocess.run(["git", "ls-files", "-z", "--cached", "--others", "--exclude-standard"],
                               cwd=table.ROOT, check=True, capture_output=True,
                               text=True).stdout.split("\0")
        for name in filter(None, names):
            source, copy = table.ROOT / name, self.tree / name
            if not source.is_file():
                continue
            if not copy.is_file() or copy.read_bytes() != source.read_bytes():
                copy.parent.mkdir(parents=True, exist_ok=True)
                shutil.copyfile(source, copy)
                shutil.copymode(source, copy)

    def compiles(self, program):
        return self._build([program], flags=FLAGS_OF_CHANGE).returncode == 0

    def passes(self, change):
        program = next(path for path in self.build.rglob(change.program)
                       if path.is_file() and os.access(path, os.X_OK))
        try:
            result = run([program, f"--gtest_filter={change.filter}", "--gtest_brief=1"],
                         timeout=TEST_SECONDS, cwd=program.parent)
        except subprocess.TimeoutExpired:
            return False
        if "Running 0 tests" in result.stdout or "0 tests from 0" in result.stdout:
            raise LookupError(f"no test is named {change.filter}")
        return result.returncode == 0

    def try_change(self, change):
        """@return "noticed", "survived", or why it cannot be tried."""
        file = self.tree / change.file
        original = file.read_text("utf-8")
        try:
            file.write_text(original.replace(change.line, change.becomes), "utf-8")
            if not self.compiles(change.program):
                return "does not compile"
            return "survived" if self.passes(change) else "noticed"
        finally:
            file.write_text(original, "utf-8")


def run(command, **settings):
    return subprocess.run([str(word) for word in command], stdin=subprocess.DEVNULL,
                          stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True,
                          errors="replace", **settings)


def chosen(words):
    changes = table.changes()
    return [change for change in changes
            if not words or any(word in text for word in words
                                for text in (change.table, change.file, change.tests))]


def baseline(worker, changes):
    """Every test that is to notice something must exist and pass without the change."""
    problems = []
    for change in {change.tests: change for change in changes}.values():
        try:
            if not worker.passes(change):
                problems.append(f"{change.tests}: fails without any change")
        except LookupError as error:
            problems.append(f"{change.tests}: {error}")
    return problems


def outcome(change, result):
    """What the report says of a change, and whether it is as it should be."""
    if result == "survived" and change.equivalent:
        return "equivalent", True
    if result == "noticed" and change.equivalent:
        return "noticed, though it is marked as equivalent", False
    return result, result == "noticed"


def try_all(workers, changes):
    free = queue.SimpleQueue()
    for worker in workers:
        free.put(worker)

    def try_one(change):
        worker = free.get()
        try:
            return change, worker.try_change(change)
        finally:
            free.put(worker)

    counts = collections.Counter()
    wrong = []
    with concurrent.futures.ThreadPoolExecutor(len(workers)) as pool:
        for change, result in pool.map(try_one, changes):
            text, good = outcome(change, result)
            counts[text] += 1
            print(f"{text}: {change}", flush=True)
            if not good:
                wrong.append(f"*** {text}: {change}")
    print("", *wrong, sep="\n")
    return counts


def main():
    parser = argparse.ArgumentParser(description=__doc__.split("\n\n")[0])
    parser.add_argument("--jobs", type=int, default=os.cpu_count())
    parser.add_argument("words", nargs="*", metavar="WORD")
    arguments = parser.parse_args()
    began = time.monotonic()
    changes = chosen(arguments.words)
    if not changes:
        parser.error("no row has any of these words")
    workers = [Worker(number) for number in range(arguments.jobs)]
    programs = {change.program for change in changes}
    for worker in workers:
        try:
            worker.prepare(programs)
        except subprocess.CalledProcessError as error:
            print(error.stdout[-3000:], file=sys.stderr)
            return 2
    problems = baseline(workers[0], changes)
    if problems:
        print("\n".join(problems), file=sys.stderr)
        return 2
    counts = try_all(workers, changes)
    print(f"\n{len(changes)} changes, {int(time.monotonic() - began)} s: "
          + ", ".join(f"{count} {text}" for text, count in sorted(counts.items())))
    if "does not compile" in counts:
        return 2
    return 0 if set(counts) <= {"noticed", "equivalent"} else 1


if __name__ == "__main__":
    sys.exit(main())
