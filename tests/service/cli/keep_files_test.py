"""`ssoclient keep`: the file is whole at any moment, whatever happens to the process."""

import fcntl
import json
import os
import random
import resource
import signal
import socket
import subprocess
import threading
import time
import unittest

from keeping import DEADLINE, WRITTEN, Keeping, KeepTest
from programs import DONE, SSOCLIENT, USAGE, Result, ssoclient

KILLS = 50


class Killed(KeepTest):
    def test_leaves_a_whole_file(self):
        """Each time at another moment; whoever is killed while writing leaves one file at most."""
        chance = random.Random(20261122)
        allowed = {"token.xml", ".token.xml.ssoclient", "password"}
        began = time.monotonic()
        first = self.keep()
        first.find(WRITTEN)
        until_written = time.monotonic() - began
        first.end(signal.SIGKILL)
        seen = set()
        for _ in range(KILLS):
            keeping = Keeping(self.file, *self.by_password)
            threading.Event().wait(chance.uniform(0, 1.5 * until_written))
            keeping.send(signal.SIGKILL)
            keeping.end()
            self.assertLessEqual({path.name for path in self.folder.iterdir()}, allowed)
            seen.add(self.token_id())
        self.assertLess(1, len(seen), "nobody lived long enough to write")
        self.assertLess(len(seen), KILLS, "nobody was killed early enough")

    def test_while_it_writes_is_made_good_by_the_next(self):
        self.file.write_bytes(self.token_file(self.acquire).read_bytes())
        before = self.token_id()
        draft = self.write(".token.xml.ssoclient", "<saml:Assertion half of a")
        self.assertEqual(before, self.token_id())
        keeping = self.keep()
        keeping.find(WRITTEN)
        self.assertNotEqual(before, self.token_id())
        self.assertFalse(draft.exists())
        self.assert_ends(keeping)

    def test_runs_against_each_other_leave_a_whole_file(self):
        often = ["--lifetime", "100", "--refresh-at", "1"]
        keepings = [self.keep(*often) for _ in range(4)]
        for keeping in keepings:
            for _ in range(2):
                keeping.find(WRITTEN)
                self.token_id()
        for keeping in keepings:
            keeping.end()
        self.assertFalse((self.folder / ".token.xml.ssoclient").exists())


class WhatStandsThere(KeepTest):
    """Nothing but a regular file is replaced."""

    def assert_refused(self, file, message, option="FILE"):
        files = [file] if option == "FILE" else [self.file, option, file]
        result = ssoclient("keep", *files, "--method", "gss", *self.nowhere)
        self.assert_fails(result, USAGE, "UsageError", message)

    def test_link_folder_device_pipe_and_socket(self):
        target = self.write("target", "older")
        link = self.folder / "link"
        link.symlink_to(target)
        pipe = self.folder / "pipe"
        os.mkfifo(pipe)
        path = self.folder / "socket"
        with socket.socket(socket.AF_UNIX) as listener:
            listener.bind(str(path))
            for option in ("FILE", "--status"):
                self.assert_refused(link, f"`{link}' is a link: name the file itself", option)
                for file in (self.folder, "/dev/null", pipe, path):
                    self.assert_refused(file, f"`{file}' is not a regular file", option)
        self.assertEqual("older", target.read_text())
        self.assertFalse(self.file.exists())

    def test_folder_that_is_not_there(self):
        file = self.folder / "no" / "token.xml"
        self.assert_refused(file, f"cannot write `{file}': No such file or directory")

    def test_folder_that_cannot_be_written_to(self):
        folder = self.folder / "closed"
        folder.mkdir()
        old = folder / "token.xml"
        old.write_text("older")
        folder.chmod(0o555)
        self.addCleanup(folder.chmod, 0o755)
        # Root writes anywhere unless it is deprived of that.
        humbly = [] if os.geteuid() else ["setpriv", "--bounding-set=-dac_override"]
        result = subprocess.run(
            list(map(str, [*humbly, SSOCLIENT, "keep", old, "--method", "gss", *self.nowhere])),
            capture_output=True, text=True, timeout=DEADLINE, check=False)
        self.assert_fails(Result(result.returncode, result.stdout, result.stderr), USAGE,
                          "UsageError", f"cannot write `{old}': Permission denied")
        self.assertEqual("older", old.read_text())

    def test_draft_that_is_a_link(self):
        target = self.write("target", "older")
        (self.folder / ".token.xml.ssoclient").symlink_to(target)
        draft = self.folder / ".token.xml.ssoclient"
        self.assert_refused(self.file,
                            f"cannot write `{draft}': Too many levels of symbolic links")
        self.assertEqual("older", target.read_text())

    def test_draft_of_another_process_is_left_alone(self):
        draft = self.write(".token.xml.ssoclient", "another's")
        with open(draft, "rb") as held:
            fcntl.flock(held, fcntl.LOCK_EX)
            self.assert_refused(self.file, f"another process is writing `{self.file}'")
        self.assertEqual("another's", draft.read_text())


class Later(KeepTest):
    """What stands in the way later is told, and the process goes on."""

    def test_link_is_laid_where_the_file_was(self):
        rarely = ["--lifetime", "100000", "--refresh-at", "90"]
        keeping = self.keep("--status", self.status_file, *rarely)
        keeping.find(WRITTEN)
        target = self.write("target", "older")
        self.file.unlink()
        self.file.symlink_to(target)
        keeping.send(signal.SIGHUP)
        keeping.find(rf"\Assoclient: UsageError: `{self.file}' is a link: name the file itself; "
                     r"the next attempt is at \S+Z\Z")
        self.assertEqual("older", target.read_text())
        first = self.status()["error"]
        self.assertEqual("UsageError", first["class"])
        self.file.unlink()
        keeping.find(WRITTEN)  # by itself
        self.assertEqual(self.token_id(), self.status()["token"]["id"])
        self.assertIsNone(self.status()["error"])
        self.file.unlink()
        self.file.symlink_to(target)
        keeping.send(signal.SIGHUP)
        keeping.find("UsageError")
        self.assertLess(first["since"], self.status()["error"]["since"])
        self.assert_ends(keeping)

    def test_full_disk_leaves_the_older_file(self):
        # A limit on the size of files fails a write as a full disk does, or by a signal.
        self.file.write_bytes(self.token_file(self.acquire).read_bytes())
        before = self.token_id()
        keeping = self.keep(launcher=["prlimit", "--fsize=1000:"])
        keeping.find(rf"\Assoclient: UsageError: cannot write `{self.file}': File too large; the next")
        self.assertEqual(before, self.token_id())
        self.assertFalse((self.folder / ".token.xml.ssoclient").exists())
        resource.prlimit(keeping.process.pid, resource.RLIMIT_FSIZE,
                         (resource.RLIM_INFINITY, resource.RLIM_INFINITY))
        keeping.send(signal.SIGHUP)
        keeping.find(WRITTEN)
        self.assertNotEqual(before, self.token_id())
        self.assert_ends(keeping)

    def test_status_that_cannot_be_written_is_told(self):
        keeping = self.keep("--status", self.status_file)
        keeping.find(WRITTEN)
        self.status_file.unlink()
        self.status_file.mkdir()
        keeping.send(signal.SIGHUP)
        keeping.find(rf"\Assoclient: `{self.status_file}' is not a regular file\Z")
        keeping.find(WRITTEN)
        self.assert_ends(keeping)


def may_trace():
    """Some hosts let no process look at another one."""
    return subprocess.run(["strace", "-qq", "-o", "/dev/null", "true"], capture_output=True,
                          check=False).returncode == 0


@unittest.skipUnless(may_trace(), "processes may not be traced here")
class Synced(KeepTest):
    def test_file_is_synced_before_it_has_its_name_and_the_folder_after_that(self):
        trace = self.folder / "trace"
        keeping = self.keep(launcher=["strace", "-D", "-f", "-qq", "-y", "-e",
                                      "trace=fsync,rename", "-o", trace])
        keeping.find(WRITTEN)
        keeping.end()
        calls = [line.split(maxsplit=1)[1] for line in trace.read_text().splitlines()
                 if "fsync(" in line or "rename(" in line]
        draft = self.folder / ".token.xml.ssoclient"
        self.assertRegex("\n".join(calls), rf"\Afsync\(\d+<{draft}>\) += 0\n"
                         rf'rename\("{draft}", "{self.file}"\) += 0\n'
                         rf"fsync\(\d+<{self.folder}>\) += 0\Z")


class Inspected(KeepTest):
    def test_is_what_acquire_writes(self):
        keeping = self.keep("--audience", "urn:app")
        keeping.find(WRITTEN)
        result = ssoclient("inspect", self.file, "--trust", self.sts.trust, "--json")
        self.assertEqual((DONE, ["urn:app"]), (result.code, json.loads(result.out)["audience"]))
        self.assert_ends(keeping)


if __name__ == "__main__":
    unittest.main()
