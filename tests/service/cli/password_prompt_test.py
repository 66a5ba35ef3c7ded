"""The password prompt of `ssoclient acquire password`, at a terminal of the test's own."""

import fcntl
import os
import pty
import signal
import subprocess
import sys
import termios
import unittest

from acquire_password_test import DESCRIPTION, ServiceTest
from programs import DONE, SSOCLIENT, USAGE, DevelopmentSts

PROMPT = b"Password: "

# Runs a program as a shell would: as the terminal's foreground job, told of its stops.
JOB_CONTROL = """
import os, signal, sys
terminal = int(sys.argv[1])
job = os.fork()
if job == 0:
    os.setpgid(0, 0)
    signal.signal(signal.SIGTTOU, signal.SIG_IGN)
    os.tcsetpgrp(terminal, os.getpid())
    signal.signal(signal.SIGTTOU, signal.SIG_DFL)
    os.execv(sys.argv[2], sys.argv[2:])
_, status = os.waitpid(job, os.WUNTRACED)
if os.WIFSTOPPED(status):
    print("stopped", flush=True)
    sys.stdin.readline()
    os.killpg(job, signal.SIGCONT)
    _, status = os.waitpid(job, 0)
sys.exit(os.waitstatus_to_exitcode(status))
"""


class PasswordPrompt(ServiceTest):
    def setUp(self):
        super().setUp()
        self.terminal, self.far_end = pty.openpty()
        self.addCleanup(os.close, self.terminal)
        self.addCleanup(os.close, self.far_end)

    def start(self, *launcher, stdin=subprocess.DEVNULL):
        """Starts the program with the terminal as its controlling one, not as its output."""
        def take_terminal():
            os.setsid()
            fcntl.ioctl(self.far_end, termios.TIOCSCTTY, 0)

        process = subprocess.Popen(
            [*launcher, SSOCLIENT, "acquire", "password", *map(str, self.sts.service_options),
             "--user", DevelopmentSts.USER],
            stdin=stdin, stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True,
            preexec_fn=take_terminal, pass_fds=[self.far_end])
        self.addCleanup(self.end, process)
        return process

    @staticmethod
    def end(process):
        if process.poll() is None:
            process.kill()
        process.wait()
        process.stdout.close()
        process.stderr.close()

    def read_until(self, text):
        """What the terminal shows, up to and including the text."""
        shown = b""
        while not shown.endswith(text):
            shown += os.read(self.terminal, 1)
        return shown

    def echoes(self):
        return bool(termios.tcgetattr(self.far_end)[3] & termios.ECHO)

    def test_reads_without_echo(self):
        process = self.start()
        self.assertEqual(PROMPT, self.read_until(PROMPT))
        self.assertFalse(self.echoes())
        os.write(self.terminal, DevelopmentSts.PASSWORD.encode() + b"\n")
        out, err = process.communicate(timeout=120)
        self.assertEqual((DONE, ""), (process.returncode, err))
        self.assertRegex(out, DESCRIPTION)
        self.assertEqual(b"\r\n", os.read(self.terminal, 100))
        self.assertTrue(self.echoes())

    def test_signals_find_the_terminal_echoing(self):
        for number in (signal.SIGINT, signal.SIGTERM, signal.SIGHUP, signal.SIGQUIT):
            with self.subTest(signal=number):
                process = self.start()
                self.read_until(PROMPT)
                os.write(self.terminal, b"half a pass")
                process.send_signal(number)
                self.assertEqual(-number, process.wait(timeout=120))
                self.assertTrue(self.echoes())

    def test_asks_again_after_a_stop(self):
        process = self.start(sys.executable, "-c", JOB_CONTROL, str(self.far_end),
                             stdin=subprocess.PIPE)
        self.addCleanup(process.stdin.close)
        self.read_until(PROMPT)
        os.write(self.terminal, b"half a pass\x1a")  # the terminal's stop character
        self.assertEqual("stopped\n", process.stdout.readline())
        self.assertTrue(self.echoes())
        process.stdin.write("continue\n")
        process.stdin.flush()
        self.read_until(PROMPT)
        self.assertFalse(self.echoes())
        os.write(self.terminal, DevelopmentSts.PASSWORD.encode() + b"\n")
        self.assertRegex(process.stdout.readline(), DESCRIPTION)
        self.assertEqual(DONE, process.wait(timeout=120))

    def test_end_of_input_is_an_empty_password(self):
        process = self.start()
        self.read_until(PROMPT)
        os.write(self.terminal, b"\x04")
        _, err = process.communicate(timeout=120)
        self.assertEqual((USAGE, "ssoclient: UsageError: the password is empty\n"),
                         (process.returncode, err))
        self.assertTrue(self.echoes())


if __name__ == "__main__":
    unittest.main()
