"""Where `ssoclient` puts a token: `--out`, and what stands there already."""

import fcntl
import os
import pathlib
import resource
import signal
import socket
import struct
import subprocess
import termios
import unittest

from programs import (DESCRIPTION, DONE, SSOCLIENT, USAGE, DevelopmentSts, Result, ServiceTest,
                      ssoclient)
from terminals import TerminalTest

NOT_KEPT = b"ssoclient: the token is not kept: use --out FILE to keep it\r\n"


class WhatStandsThere(ServiceTest):
    """Nothing but a regular file is replaced, and none by half a token."""

    def assert_refused(self, out, why):
        """Before anything is sent."""
        before = os.lstat(out)
        self.assert_fails(self.acquire("--out", out, service=self.nowhere), USAGE, "UsageError",
                          f"`{out}' is {why}")
        self.assertEqual((before.st_ino, before.st_mode),
                         (os.lstat(out).st_ino, os.lstat(out).st_mode))

    def link_to(self, target):
        link = self.folder / "link"
        link.unlink(missing_ok=True)
        link.symlink_to(target)
        return link

    def test_link(self):
        target = self.write("target", "older")
        for to in (target, self.folder, "/dev/null", self.folder / "nothing", "link"):
            with self.subTest(to=to):
                self.assert_refused(self.link_to(to), "a link: name the file itself")
        self.assertEqual("older", target.read_text())
        self.assertFalse((self.folder / "nothing").exists())

    def test_name_of_standard_output(self):
        for name in ("/dev/stdout", "/dev/fd/1", "/proc/self/fd/1"):
            with self.subTest(name=name):
                before = os.lstat("/dev/stdout").st_ino
                self.assert_fails(self.acquire("--out", name, service=self.nowhere), USAGE,
                                  "UsageError", f"`{name}' is a link: name the file itself")
                self.assertEqual(before, os.lstat("/dev/stdout").st_ino)

    def test_folder(self):
        self.assert_refused(self.folder, "not a regular file")

    def test_device(self):
        self.assert_refused(pathlib.Path("/dev/null"), "not a regular file")

    def test_pipe(self):
        pipe = self.folder / "pipe"
        os.mkfifo(pipe)
        self.assert_refused(pipe, "not a regular file")

    def test_socket(self):
        path = self.folder / "socket"
        with socket.socket(socket.AF_UNIX) as listener:
            listener.bind(str(path))
            self.assert_refused(path, "not a regular file")

    def test_link_in_the_way_to_the_file_is_followed(self):
        link = self.link_to(self.folder / "real")
        (self.folder / "real").mkdir()
        self.assert_done(self.acquire("--out", link / "token.xml"))
        self.assertTrue((self.folder / "real" / "token.xml").is_file())

    def test_folder_that_cannot_be_written_to(self):
        folder = self.folder / "closed"
        folder.mkdir()
        old = folder / "token.xml"
        old.write_text("older")
        folder.chmod(0o555)
        self.addCleanup(folder.chmod, 0o755)
        # Root writes anywhere unless it is deprived of that.
        humbly = [] if os.geteuid() else ["setpriv", "--bounding-set=-dac_override"]
        command = [*humbly, SSOCLIENT, "acquire", "password", *self.nowhere, "--user", "u",
                   "--password-file", self.password, "--out", old]
        result = subprocess.run(list(map(str, command)), capture_output=True, text=True,
                                timeout=120, check=False)
        self.assert_fails(Result(result.returncode, result.stdout, result.stderr), USAGE,
                          "UsageError", f"cannot write `{old}': Permission denied")
        self.assertEqual("older", old.read_text())

    def test_disk_without_room_leaves_the_older_file(self):
        """A file system of its own, of two pages, one of which the older file takes."""
        script = """mount -t tmpfs -o size=8k tmpfs "$1" && cd "$1" && printf older >token.xml || exit 99
            shift
            "$@" --out token.xml; code=$?
            cat token.xml && ls -A && exit "$code" """
        command = ["unshare", "--map-root-user", "--mount", "sh", "-c", script, "sh",
                   self.folder, SSOCLIENT, "acquire", "password", *self.sts.service_options,
                   "--user", DevelopmentSts.USER, "--password-file", "/dev/stdin"]
        result = subprocess.run(list(map(str, command)), capture_output=True, text=True,
                                input=DevelopmentSts.PASSWORD + "\n", timeout=120, check=False)
        if result.returncode == 99 or "unshare failed" in result.stderr:
            self.skipTest("this host lets nobody mount: " + result.stderr)
        self.assert_fails(Result(result.returncode, "", result.stderr), USAGE, "UsageError",
                          "cannot write `token.xml': No space left on device")
        self.assertEqual("oldertoken.xml\n", result.stdout)

    def test_full_disk_leaves_the_older_file(self):
        # A limit on the size of files fails a write as a full disk does, or by a signal.
        out = self.write("token.xml", "older")
        command = [SSOCLIENT, "acquire", "password", *self.sts.service_options, "--user",
                   DevelopmentSts.USER, "--password-file", self.password, "--out", out]
        result = subprocess.run(
            list(map(str, command)), capture_output=True, text=True, timeout=120, check=False,
            preexec_fn=lambda: resource.setrlimit(resource.RLIMIT_FSIZE, (1000, 1000)))
        self.assert_fails(Result(result.returncode, result.stdout, result.stderr), USAGE,
                          "UsageError", f"cannot write `{out}': File too large")
        self.assertEqual("older", out.read_text())
        self.assertEqual({out, self.password}, set(self.folder.iterdir()))


class StandardOutput(ServiceTest):
    def test_gets_the_assertion_alone_and_standard_error_the_description(self):
        result = self.acquire("--out", "-")
        self.assertEqual(DONE, result.code)
        self.assertRegex(result.err, DESCRIPTION)
        self.assertRegex(result.out, r"\A<saml:Assertion [\s\S]+</saml:Assertion>\Z")
        inspected = ssoclient("inspect", "-", "--trust", self.sts.trust, stdin=result.out)
        self.assertEqual((DONE, "", result.err), (inspected.code, inspected.err, inspected.out))
        self.assertEqual({self.password}, set(self.folder.iterdir()))

    def test_a_file_of_that_name_has_a_path(self):
        before = os.getcwd()
        self.addCleanup(os.chdir, before)
        os.chdir(self.folder)
        self.assert_done(self.acquire("--out", "./-"))
        self.assertTrue((self.folder / "-").is_file())

    def test_that_is_full(self):
        command = [SSOCLIENT, "acquire", "password", *self.sts.service_options, "--user",
                   DevelopmentSts.USER, "--password-file", self.password]
        for options in ([], ["--out", "-"]):
            with self.subTest(options=options), open("/dev/full", "wb") as full:
                result = subprocess.run(list(map(str, [*command, *options])), stdout=full,
                                        stderr=subprocess.PIPE, text=True, timeout=120,
                                        check=False)
                self.assertEqual(
                    (USAGE, "ssoclient: UsageError: cannot write to standard output\n"),
                    (result.returncode, result.stderr))

    def test_whose_reader_is_gone_ends_the_program_silently(self):
        ours, theirs = os.pipe()
        os.close(ours)
        with open(theirs, "wb") as gone:
            result = subprocess.run(
                [SSOCLIENT, "--help"], stdout=gone, stderr=subprocess.PIPE, timeout=120,
                check=False, preexec_fn=lambda: signal.signal(signal.SIGPIPE, signal.SIG_DFL))
        self.assertEqual((-signal.SIGPIPE, b""), (result.returncode, result.stderr))


class NoArguments(TerminalTest):
    def test_show_a_terminal_the_help(self):
        process = self.start_with_terminal_error()
        self.assertEqual("", process.communicate(timeout=120)[0])
        self.assertEqual(USAGE, process.returncode)
        self.assertEqual(
            ssoclient("--help").out + ssoclient().err,
            self.read_what_is_there().decode().replace("\r\n", "\n"))


class HelpAtATerminal(TerminalTest):
    def widths(self, columns):
        fcntl.ioctl(self.far_end, termios.TIOCSWINSZ, struct.pack("HHHH", 24, columns, 0, 0))
        process = self.start_with_terminal_output("acquire", "password", "--help")
        process.wait(timeout=120)
        lines = self.read_what_is_there().decode().splitlines()
        # An example is copied, not read, and stays as it is.
        example = lines.index("Example:")
        return [len(line) for line in lines[:example] + lines[lines.index("", example):]]

    def test_fits(self):
        for columns in (60, 80, 100):
            with self.subTest(columns=columns):
                self.assertLessEqual(max(self.widths(columns)), columns)
                self.assertGreater(max(self.widths(columns)), columns - 15)

    def test_has_bounds(self):
        self.assertLessEqual(max(self.widths(300)), 120)
        self.assertGreater(max(self.widths(10)), 30)


class KeptOrNot(TerminalTest):
    """A terminal is told when there will be nothing left of a token."""

    def shown(self, *options):
        process = self.start_with_terminal_error(
            "acquire", "password", *self.sts.service_options, "--user", DevelopmentSts.USER,
            "--password-file", self.password, *options)
        out, _ = process.communicate(timeout=120)
        self.assertEqual(DONE, process.returncode)
        return out, self.read_what_is_there()

    def test_without_a_file(self):
        out, shown = self.shown()
        self.assertRegex(out, DESCRIPTION)
        self.assertEqual(NOT_KEPT, shown)

    def test_with_a_file(self):
        self.assertEqual(b"", self.shown("--out", self.folder / "token.xml")[1])

    def test_on_standard_output(self):
        self.assertNotIn(NOT_KEPT, self.shown("--out", "-")[1])

    def test_inspected_tokens_are_not_spoken_of(self):
        token = self.token_file(self.acquire)
        process = self.start_with_terminal_error("inspect", token, "--trust", self.sts.trust)
        self.assertRegex(process.communicate(timeout=120)[0], DESCRIPTION)
        self.assertEqual(b"", self.read_what_is_there())


if __name__ == "__main__":
    unittest.main()
