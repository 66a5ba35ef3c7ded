"""A terminal for programs that ask."""

import fcntl
import os
import pty
import select
import subprocess
import termios

from programs import SSOCLIENT, ServiceTest


class TerminalTest(ServiceTest):
    """A test with a terminal of its own."""

    def setUp(self):
        super().setUp()
        self.terminal, self.far_end = pty.openpty()
        self.addCleanup(os.close, self.terminal)
        self.addCleanup(os.close, self.far_end)

    def start_with_terminal_error(self, *arguments, **others):
        """Starts the program with the terminal as its standard error."""
        return self.start(*arguments, stderr=self.far_end, takes_terminal=False, **others)

    def start_with_terminal_output(self, *arguments, **others):
        """Starts the program with the terminal as its standard output."""
        return self.start(*arguments, stdout=self.far_end, takes_terminal=False, **others)

    def start(self, *arguments, launcher=(), stdin=subprocess.DEVNULL, stdout=subprocess.PIPE,
              stderr=subprocess.PIPE, takes_terminal=True):
        """Starts the program with the terminal as its controlling one, not as its output."""
        def take_terminal():
            os.setsid()
            if takes_terminal:
                fcntl.ioctl(self.far_end, termios.TIOCSCTTY, 0)

        process = subprocess.Popen(
            [*launcher, SSOCLIENT, *map(str, arguments)], stdin=stdin,
            stdout=stdout, stderr=stderr, text=True, preexec_fn=take_terminal,
            pass_fds=[self.far_end])
        self.addCleanup(self.end, process)
        return process

    @staticmethod
    def end(process):
        if process.poll() is None:
            process.kill()
        process.wait()
        for stream in (process.stdout, process.stderr):
            if stream is not None:
                stream.close()

    def read_until(self, text):
        """What the terminal shows, up to and including the text."""
        shown = b""
        while not shown.endswith(text):
            shown += os.read(self.terminal, 1)
        return shown

    def read_what_is_there(self):
        """What the terminal shows by now."""
        shown = b""
        while select.select([self.terminal], [], [], 0)[0]:
            shown += os.read(self.terminal, 4096)
        return shown

    def echoes(self):
        return bool(termios.tcgetattr(self.far_end)[3] & termios.ECHO)
