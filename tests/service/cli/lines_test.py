"""What reaches the terminal of what a service says: one line, bounded, without control."""

import json
import os
import unittest

from programs import COMMUNICATION, DATA, DONE, REFUSED, USAGE, ProgramTest, ServiceTest, ssoclient
from scripted import TRUST, ScriptedTerminalTest, ScriptedTest, fault

CODE = "wst:FailedAuthentication"
START = "ssoclient: InvalidCredentialsException: Authentication failed: "
MAX_MESSAGE = 4096

# What a fault string holds, and what the line says.
TEXTS = (
    ("two\nlines", r"two\x0alines"),
    (r"two\x0alines", r"two\\x0alines"),
    ("a\tb\x7f", r"a\x09b\x7f"),
    ("\u0085\u009b31m", r"\u0085\u009b31m"),
    ("a\u2028b\u2029", r"a\u2028b\u2029"),
    ("\u061c\u200e\u200f\u202a\u202e\u2066\u2069",
     r"\u061c\u200e\u200f\u202a\u202e\u2066\u2069"),
    ("\u00a0\u200d\u2027\u202f\u2065\u206a\U0001f600é", "\u00a0\u200d\u2027\u202f\u2065\u206a\U0001f600é"),
    ("C:\\u202e", r"C:\\u202e"))


class Faults(ScriptedTest):
    def test_are_shown_with_their_controls_written_out(self):
        for text, shown in TEXTS:
            with self.subTest(text=text):
                self.service.say(fault(CODE, text))
                self.assertEqual(f"{START}{shown}\n", self.acquire().err)

    def test_are_bounded(self):
        message = len("Authentication failed: ")
        fits = MAX_MESSAGE - message
        self.service.say(fault(CODE, "x" * fits))
        self.assertEqual(f"{START}{'x' * fits}\n", self.acquire().err)
        for text in ("x" * (fits + 1), "x" * 7_000_000):
            with self.subTest(length=len(text)):
                self.service.say(fault(CODE, text))
                self.assertEqual(
                    f"{START}{'x' * fits}... ({message + len(text)} bytes in all)\n",
                    self.acquire().err)

    def test_end_with_a_whole_character(self):
        fits = MAX_MESSAGE - len("Authentication failed: ")
        self.service.say(fault(CODE, "x" * (fits - 1) + "é" * 10))
        self.assertTrue(self.acquire().err.startswith(f"{START}{'x' * (fits - 1)}... ("))

    def test_are_bounded_in_json_too(self):
        self.service.say(fault(CODE, "\u202e" * 2_000_000))
        message = json.loads(self.acquire("--json").err)["error"]["message"]
        self.assertTrue(message.startswith("Authentication failed: \u202e\u202e"))
        self.assertLess(len(message), MAX_MESSAGE)


class Arguments(ProgramTest):
    def test_are_shown_with_their_controls_written_out(self):
        for octets, shown in ((b"a\nb\r\x1b[31m", r"a\x0ab\x0d\x1b[31m"),
                              ("\u009b\u202e".encode(), r"\u009b\u202e"),
                              (b"\xff\x9b", r"\xff\x9b"), (b"a\xc3", r"a\xc3"),
                              (b"\xc0\x80", r"\xc0\x80"), (b"\xed\xa0\x80", r"\xed\xa0\x80"),
                              (b"\xf4\x90\x80\x80", r"\xf4\x90\x80\x80"),
                              (b"\xf8\x88\x80\x80\x80", r"\xf8\x88\x80\x80\x80"),
                              (b"\xe2\x82", r"\xe2\x82"), (b"\xc3\xa9\\", "é\\\\")):
            with self.subTest(octets=octets):
                result = ssoclient("inspect", os.fsdecode(octets), "--trust", TRUST)
                self.assert_fails(result, USAGE, "UsageError",
                                  f"cannot open `{shown}': No such file or directory")


class TraceLines(ScriptedTest):
    def test_hold_no_controls(self):
        self.service.say(fault(CODE))
        user = "a\u202eb"
        result = ssoclient("acquire", "password", "--url", self.service.url, "--trust", TRUST,
                           "--user", user, "--password-file", self.password, "--verbose")
        self.assertIn(r"subject `a\xe2\x80\xaeb'", result.err)
        self.assertNotIn("\u202e", result.err)


class Quiet(ServiceTest):
    def test_prints_nothing_but_failures(self):
        out = self.folder / "token.xml"
        self.assertEqual((DONE, "", ""), tuple(self.acquire("--quiet", "--out", out)))
        inspect = ("inspect", out, "--trust", self.sts.trust, "--quiet")
        self.assertEqual((DONE, "", ""), tuple(ssoclient(*inspect)))
        self.assertEqual((DONE, "", ""), tuple(ssoclient(*inspect, "--json")))
        self.assertEqual((DONE, "", ""), tuple(ssoclient(
            "validate", *self.sts.service_options, "--token", out, "--quiet")))
        self.assert_fails_matching(
            ssoclient("inspect", out, "--trust", DATA / "keys" / "foreign-cert.pem", "--quiet"),
            REFUSED, "InvalidSignatureException", ".+")

    def test_prints_the_assertion_that_is_asked_for(self):
        result = self.acquire("--quiet", "--out", "-")
        self.assertEqual((DONE, ""), (result.code, result.err))
        self.assertRegex(result.out, r"\A<saml:Assertion [\s\S]+</saml:Assertion>\Z")


class PlainHttp(ScriptedTest):
    MESSAGE = ("--url: http: would send everything in the clear; use https:, or say "
               "--insecure-http")

    def acquire_at(self, host, *options):
        return ssoclient("acquire", "password", "--url", f"http://{host}/sts", "--trust", TRUST,
                         "--user", "u", "--password-file", self.password, *options)

    def test_to_another_machine_must_be_wanted(self):
        for host in ("sts.invalid", "10.0.0.1:8080", "[2001:db8::1]", "localhost.invalid",
                     "127.0.0.1.invalid", "128.0.0.1", "[::ffff:1.2.3.4]", "0.0.0.0"):
            with self.subTest(host=host):
                self.assert_fails(self.acquire_at(host), USAGE, "UsageError", self.MESSAGE)

    def test_to_another_machine_that_is_wanted(self):
        self.assert_fails_matching(self.acquire_at("sts.invalid", "--insecure-http"),
                                   COMMUNICATION, "HttpException", ".+")

    def test_to_this_machine(self):
        for host in ("localhost:1", "LOCALHOST:1", "127.0.0.1:1", "127.255.255.254:1", "[::1]:1"):
            with self.subTest(host=host):
                self.assert_fails_matching(self.acquire_at(host), COMMUNICATION, "HttpException",
                                           ".+")


class Waiting(ScriptedTerminalTest):
    """After five seconds a terminal is told what is waited for."""

    def test_is_told_to_a_terminal_alone(self):
        self.service.say(fault(CODE))
        self.service.hold.clear()
        self.addCleanup(self.service.hold.set)
        silent = self.start(*self.command(), takes_terminal=False)
        quiet = self.start_with_terminal_error(*self.command("--quiet"))
        self.service.has_request.acquire(timeout=120)
        self.service.has_request.acquire(timeout=120)
        told = self.start_with_terminal_error(*self.command())
        line = f"ssoclient: waiting for {self.service.url[:-4]}, for up to 240 seconds an exchange"
        self.assertEqual(line.encode() + b"\r\n", self.read_until(b"\n"))
        self.service.hold.set()
        for process in (silent, quiet, told):
            out, err = process.communicate(timeout=120)
            self.assertEqual("", out)
            self.assertNotIn("waiting", err or "")
        self.assertNotIn(b"waiting", self.read_what_is_there())


if __name__ == "__main__":
    unittest.main()
