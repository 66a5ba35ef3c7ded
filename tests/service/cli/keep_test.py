"""`ssoclient keep`: how tokens are got, refreshed and told of."""

import datetime
import os
import re
import signal
import time
import unittest

from json_test import judged
from keeping import DEADLINE, WRITTEN, Keeping, KeepTest, wait_for
from programs import USAGE, DevelopmentSts, ssoclient
from realm import KerberosTest
from scripted import ScriptedTest, fault
from terminals import TerminalTest

OFTEN = ["--lifetime", "100", "--refresh-at", "1"]  # every second


def time_of(text):
    return datetime.datetime.fromisoformat(text.replace("Z", "+00:00"))


class Methods(KeepTest):
    def assert_keeps(self, *way):
        keeping = self.keep(way=[*way, *self.sts.service_options], file=self.file)
        keeping.find(WRITTEN)
        first = self.token_id()
        keeping.send(signal.SIGHUP)
        keeping.find(WRITTEN)
        self.assertNotEqual(first, self.token_id())
        self.assertEqual([], self.assert_ends(keeping))

    def test_password(self):
        self.assert_keeps("--method", "password", "--user", DevelopmentSts.USER,
                          "--password-file", self.password)

    def test_certificate(self):
        self.assert_keeps("--method", "certificate", *self.sts.identity)

    def test_exchange_reads_the_presented_token_each_time(self):
        presented = self.token_file(self.acquire, "--delegable")
        keeping = self.keep("--method", "exchange", *self.sts.service_options, "--token", presented,
                            *self.sts.identity, way=[])
        keeping.find(r"a new token of alice@example\.test is in")
        presented.write_bytes(self.token_file(self.acquire_by_certificate).read_bytes())
        keeping.send(signal.SIGHUP)
        keeping.find(r"a new token of service@example\.test is in")
        presented.unlink()
        keeping.send(signal.SIGHUP)
        keeping.find(r"UsageError: cannot open `.+': No such file or directory; the next attempt")
        self.assertEqual([], self.assert_ends(keeping))
        self.token_id()

    def test_renews_what_can_be_renewed(self):
        for options, operation in ((["--renewable"], "RenewToken"),
                                   ([], "AcquireTokenByCertificate")):
            with self.subTest(options=options):
                keeping = self.keep("--method", "certificate", *self.sts.service_options,
                                    *self.sts.identity, "--verbose", *options, way=[])
                keeping.find(WRITTEN)
                keeping.send(signal.SIGHUP)
                keeping.find(rf"\ASsoClient\[64\]: .*{operation}")
                keeping.find(WRITTEN)
                self.assert_ends(keeping)

    def test_refused_renewal_is_followed_by_an_acquisition_and_is_no_event(self):
        keeping = self.keep("--method", "certificate", *self.sts.service_options,
                            *self.sts.identity, "--renewable", way=[])
        keeping.find(r"a new token of service@example\.test is in")
        users = self.sts.state / "users.json"
        original = users.read_text("utf-8")
        self.addCleanup(users.write_text, original, "utf-8")
        users.write_text(original.replace("service@example.test", "renamed@example.test"), "utf-8")
        keeping.send(signal.SIGHUP)
        self.assertRegex(keeping.line(), r"a new token of renamed@example\.test is in")
        self.assertEqual([], self.assert_ends(keeping))

    def test_takes_what_it_needs_from_a_profile(self):
        (self.folder / "ssoclient").mkdir()
        self.write("ssoclient/config.toml", f"""[p]
url = "{self.sts.url}"
ca = "{self.sts.ca}"
trust = "{self.sts.trust}"
user = "{DevelopmentSts.USER}"
key = "{self.sts.key}"
cert = "{self.sts.certificate}"
""")
        for method in (["password", "--password-file", self.password], ["certificate"]):
            with self.subTest(method=method):
                keeping = self.keep("--profile", "p", "--method", *method, way=[],
                                    environment={"XDG_CONFIG_HOME": str(self.folder)})
                keeping.find(WRITTEN)
                self.assert_ends(keeping)


class WithKerberos(KerberosTest):
    def test_gss(self):
        file = self.folder / "token.xml"
        keeping = Keeping(file, "--method", "gss", *self.sts.service_options, "--ccache",
                          f"FILE:{self.ccache}", environment=self.realm.environment)
        try:
            keeping.find(WRITTEN)
            first = file.read_bytes()
            keeping.send(signal.SIGHUP)
            keeping.find(WRITTEN)
            self.assertNotEqual(first, file.read_bytes())
        finally:
            self.assertEqual((0, []), keeping.end())


class Passwords(KeepTest):
    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        cls.users = cls.sts.state / "users.json"
        cls.original = cls.users.read_text("utf-8")

    def tearDown(self):
        self.users.write_text(self.original, "utf-8")
        super().tearDown()

    def change_password(self, password):
        self.users.write_text(self.original.replace(DevelopmentSts.PASSWORD, password), "utf-8")

    def test_file_is_read_again(self):
        keeping = self.keep()
        keeping.find(WRITTEN)
        self.change_password("another")
        keeping.send(signal.SIGHUP)
        keeping.find(r"\Assoclient: InvalidCredentialsException: .+; the next attempt is at \S+Z\Z")
        self.write("password", "another\n")
        keeping.send(signal.SIGHUP)
        keeping.find(WRITTEN)
        self.assertEqual([], self.assert_ends(keeping))

    def test_file_that_is_gone_is_told(self):
        keeping = self.keep()
        keeping.find(WRITTEN)
        self.password.unlink()
        keeping.send(signal.SIGHUP)
        keeping.find(r"UsageError: cannot read the password from `.+': No such file or directory")
        self.assertEqual([], self.assert_ends(keeping))

    def test_wrong_one_is_not_hammered(self):
        self.write("password", "wrong\n")
        keeping = self.keep("--status", self.status_file)
        keeping.find(r"InvalidCredentialsException: ")
        status = self.status()
        self.assertEqual("InvalidCredentialsException", status["error"]["class"])
        wait = time_of(status["nextAttempt"]) - time_of(status["updated"])
        self.assertLess(datetime.timedelta(seconds=55), wait)
        self.assertEqual([], self.assert_ends(keeping))
        self.assertFalse(self.file.exists())

    def test_of_standard_input_is_kept(self):
        way = [*self.by_password[:-1], "-"]
        keeping = self.keep(way=way, stdin=DevelopmentSts.PASSWORD + "\n")
        keeping.find(WRITTEN)
        keeping.send(signal.SIGHUP)
        keeping.find(WRITTEN)
        self.assertEqual([], self.assert_ends(keeping))

    def test_of_a_pipe_is_kept(self):
        pipe = self.folder / "pipe"
        os.mkfifo(pipe)
        keeping = self.keep(way=[*self.by_password[:-1], pipe])
        pipe.write_text(DevelopmentSts.PASSWORD + "\n")
        keeping.find(WRITTEN)
        keeping.send(signal.SIGHUP)
        keeping.find(WRITTEN)
        self.assertEqual([], self.assert_ends(keeping))


class TypedPassword(TerminalTest):
    def test_is_asked_for_once(self):
        file = self.folder / "token.xml"
        process = self.start("keep", file, "--method", "password", *self.sts.service_options,
                             "--user", DevelopmentSts.USER)
        self.read_until(b"Password: ")
        os.write(self.terminal, DevelopmentSts.PASSWORD.encode() + b"\n")
        for _ in range(3):
            self.assertRegex(process.stderr.readline().rstrip("\n"), WRITTEN)
            process.send_signal(signal.SIGHUP)
        process.send_signal(signal.SIGTERM)
        self.assertEqual(0, process.wait(timeout=DEADLINE))
        self.assertNotIn(b"Password: ", self.read_what_is_there())


class Refreshing(KeepTest):
    def test_goes_on_by_itself(self):
        keeping = self.keep(*OFTEN)
        ids = set()
        for _ in range(3):
            keeping.find(WRITTEN)
            ids.add(self.token_id())
        self.assertLess(1, len(ids))
        self.assert_ends(keeping)

    def test_ends_well_at_either_signal_and_leaves_the_files(self):
        for number in (signal.SIGTERM, signal.SIGINT):
            with self.subTest(signal=number):
                keeping = self.keep("--status", self.status_file)
                keeping.find(WRITTEN)
                self.assertEqual([], self.assert_ends(keeping, number))
                self.assertEqual(self.token_id(), self.status()["token"]["id"])

    def test_service_that_is_away_is_waited_for(self):
        older = self.token_file(self.acquire).read_bytes()
        self.file.write_bytes(older)
        self.sts.go_down()
        keeping = self.keep("--status", self.status_file)
        keeping.find(r"\Assoclient: HttpException: .+; the next attempt is at \S+Z\Z")
        self.assertEqual(older, self.file.read_bytes())
        self.assertIsNone(self.status()["token"])
        self.sts.come_up()
        keeping.find(WRITTEN)
        self.assertNotEqual(older, self.file.read_bytes())
        self.assertIsNone(self.status()["error"])
        self.sts.go_down()
        keeping.send(signal.SIGHUP)
        keeping.find(r"\Assoclient: HttpException: ")
        self.assertEqual(self.token_id(), self.status()["token"]["id"])
        self.sts.come_up()
        keeping.send(signal.SIGHUP)
        keeping.find(WRITTEN)
        self.assert_ends(keeping)


class Held(ScriptedTest):
    def test_ends_at_once_while_the_service_does_not_answer(self):
        self.service.hold.clear()
        self.addCleanup(self.service.hold.set)
        keeping = Keeping(self.folder / "token.xml", "--method", "password", *self.command()[2:])
        self.assertTrue(self.service.has_request.acquire(timeout=DEADLINE))
        began = time.monotonic()
        self.assertEqual((0, []), keeping.end())
        self.assertLess(time.monotonic() - began, 1.5)  # a process waits two seconds for exchanges

    def test_hint_is_told_on_request(self):
        self.service.say(fault("wst:InvalidScope"))
        keeping = Keeping(self.folder / "token.xml", "--method", "password", *self.command()[2:],
                          "--explain")
        keeping.find(r"\Assoclient: \w+: .+; the next attempt is at \S+Z\Z")
        self.assertEqual("ssoclient: hint: the service does not know the audience: check "
                         "--audience", keeping.line())
        self.assertEqual((0, []), keeping.end())


class Speech(KeepTest):
    def test_is_a_line_for_each_event(self):
        keeping = self.keep("--exec", "exit 7")
        self.assertRegex(keeping.line(), WRITTEN)
        self.assertEqual("ssoclient: the command of --exec failed with exit code 7", keeping.line())
        self.write("password", "wrong\n")
        keeping.send(signal.SIGHUP)
        self.assertRegex(keeping.line(), r"\Assoclient: InvalidCredentialsException: ")
        self.assertEqual([], self.assert_ends(keeping))

    def test_is_of_failures_alone_when_it_is_to_be_quiet(self):
        keeping = self.keep("--quiet", "--exec", "exit 7", "--metrics", "127.0.0.1:0")
        self.assertEqual("ssoclient: the command of --exec failed with exit code 7", keeping.line())
        self.write("password", "wrong\n")
        keeping.send(signal.SIGHUP)
        self.assertRegex(keeping.line(), r"\Assoclient: InvalidCredentialsException: ")
        self.assertEqual([], self.assert_ends(keeping))

    def test_is_json_on_request(self):
        keeping = self.keep("--json", "--exec", "exit 7", "--metrics", "127.0.0.1:0")
        self.assertRegex(judged(keeping.line())["notice"], r"\Ametrics are at http://")
        kept = judged(keeping.line())
        self.assertEqual("alice", kept["token"]["subject"]["name"])
        self.assertIsNone(kept["error"])
        self.assertRegex(judged(keeping.line())["notice"], r"exit code 7\Z")
        self.write("password", "wrong\n")
        keeping.send(signal.SIGHUP)
        failed = judged(keeping.line())
        self.assertEqual(kept["token"], failed["token"])
        self.assertEqual("InvalidCredentialsException", failed["error"]["class"])
        self.assertEqual([], self.assert_ends(keeping))

    def test_has_nothing_secret(self):
        keeping = self.keep("--verbose", "--status", self.status_file)
        lines = [keeping.line()]
        while not re.search(WRITTEN, lines[-1]):
            lines.append(keeping.line())
        lines += self.assert_ends(keeping)
        said = "\n".join(lines) + self.status_file.read_text("utf-8")
        signature = self.file.read_text("utf-8").split("<ds:SignatureValue>")[1][:40]
        self.assertNotIn(DevelopmentSts.PASSWORD, said)
        self.assertNotIn(signature, said)


class Status(KeepTest):
    def test_says_how_it_stands(self):
        keeping = self.keep("--status", self.status_file)
        valid_until = keeping.find(WRITTEN)[1]
        status = judged(self.status_file.read_text("ascii"))
        self.assertEqual({"id": self.token_id(), "validUntil": valid_until,
                          "subject": {"name": "alice", "domain": "example.test"}}, status["token"])
        self.assertIsNone(status["error"])
        self.assertLess(time_of(status["lastSuccess"]), time_of(status["nextAttempt"]))
        self.assertLess(time_of(status["nextAttempt"]), time_of(valid_until))
        since = None
        self.write("password", "wrong\n")
        for _ in range(2):
            keeping.send(signal.SIGHUP)
            keeping.find("InvalidCredentialsException")
            failed = judged(self.status_file.read_text("ascii"))
            self.assertEqual(status["token"], failed["token"])
            self.assertEqual(status["lastSuccess"], failed["lastSuccess"])
            self.assertEqual("InvalidCredentialsException", failed["error"]["class"])
            self.assertEqual(since or failed["error"]["since"], failed["error"]["since"])
            since = failed["error"]["since"]
        self.assert_ends(keeping)

    def test_is_there_before_the_first_token(self):
        self.sts.go_down()
        self.addCleanup(self.sts.come_up)
        keeping = self.keep("--status", self.status_file)
        keeping.find("HttpException")
        status = judged(self.status_file.read_text("ascii"))
        self.assertEqual([None, None], [status["token"], status["lastSuccess"]])
        self.assert_ends(keeping)

    def test_may_be_read_by_others(self):
        before = os.umask(0o022)
        self.addCleanup(os.umask, before)
        keeping = self.keep("--status", self.status_file)
        keeping.find(WRITTEN)
        self.assertEqual(0o644, self.status_file.stat().st_mode & 0o777)
        self.assertEqual(0o600, self.file.stat().st_mode & 0o777)
        self.assert_ends(keeping)


class Commands(KeepTest):
    def test_is_run_after_each_token(self):
        out = self.folder / "out"
        os.chdir(self.folder)
        keeping = self.keep("--exec", f'echo "$SSOCLIENT_TOKEN_FILE" >>{out}', file="token.xml")
        for count in (1, 2):
            keeping.find(WRITTEN)
            wait_for(lambda: out.exists() and out.read_text().count("\n") == count, "the command")
            keeping.send(signal.SIGHUP)
        keeping.find(WRITTEN)
        self.assertEqual([], self.assert_ends(keeping))
        self.assertEqual({str(self.file)}, set(out.read_text().split()))

    def test_is_told_when_it_fails(self):
        for command, told in (("exit 3", "failed with exit code 3"),
                              ("/no/such/command 2>/dev/null", "failed with exit code 127"),
                              ("kill -9 $$", "was ended by signal 9")):
            with self.subTest(command=command):
                keeping = self.keep("--exec", command)
                keeping.find(rf"\Assoclient: the command of --exec {told}\Z")
                keeping.send(signal.SIGHUP)
                keeping.find(WRITTEN)
                self.assert_ends(keeping)

    def test_does_not_pile_up(self):
        pipe = self.folder / "pipe"
        os.mkfifo(pipe)
        out = self.folder / "out"
        keeping = self.keep("--exec", f"echo begun >>{out}; read -r line <{pipe}")
        keeping.find(WRITTEN)
        wait_for(out.exists, "the command")
        for _ in range(3):
            keeping.send(signal.SIGHUP)
            keeping.find(r"\Assoclient: the command of --exec still runs, and is run again when it "
                         r"has ended\Z")
        self.assertEqual("begun\n", out.read_text())
        pipe.write_text("go on\n")
        wait_for(lambda: out.read_text() == "begun\n" * 2, "the second run")
        pipe.write_text("go on\n")
        children = f"/proc/{keeping.process.pid}/task/{keeping.process.pid}/children"
        wait_for(lambda: not open(children, encoding="ascii").read(), "the end of the command")
        keeping.send(signal.SIGHUP)
        keeping.find(WRITTEN)
        wait_for(lambda: out.read_text() == "begun\n" * 3, "the third run")
        keeping.send(signal.SIGTERM)
        self.assertEqual(0, keeping.process.wait(timeout=DEADLINE))
        pipe.write_text("go on\n")  # the command was left alone
        self.assertEqual([], self.assert_ends(keeping))

    def test_has_the_signals_and_the_environment_of_a_shell(self):
        out = self.folder / "out"
        notify = self.folder / "notify"
        keeping = self.keep("--exec", f"grep Sig /proc/self/status >{out}; env >>{out}; echo end >>{out}",
                            environment={"NOTIFY_SOCKET": str(notify), "WATCHDOG_USEC": "1000000",
                                         "OTHER": "kept"})
        keeping.find(WRITTEN)
        wait_for(lambda: out.exists() and out.read_text().endswith("end\n"), "the command")
        text = out.read_text()
        for mask in ("SigBlk", "SigIgn"):
            signals = int(re.search(rf"{mask}:\s+([0-9a-f]+)\n", text)[1], 16)
            self.assertEqual(0, signals & 0x7fffffff, mask)  # the C library has two beyond these
        self.assertNotIn("NOTIFY_SOCKET", text)
        self.assertNotIn("WATCHDOG", text)
        self.assertIn("\nOTHER=kept\n", text)
        self.assert_ends(keeping)


class Arguments(KeepTest):
    def test_that_do_not_fit(self):
        service = ["--url", "https://127.0.0.1:1/", "--trust", self.sts.trust]
        for options, message in (
                (["password"], "--method password needs --user"),
                (["certificate"], "--method certificate needs --key and --cert"),
                (["exchange", "--token", "t"], "--method exchange needs --key and --cert"),
                (["exchange", *self.sts.identity], "--method exchange needs --token"),
                (["exchange", "--token", "-", *self.sts.identity],
                 "--token: standard input cannot be read again"),
                (["certificate", *self.sts.identity, "--token", "t"],
                 "--token is for --method exchange alone"),
                (["certificate", *self.sts.identity, "--bearer"],
                 "--bearer is not for --method certificate"),
                (["gss", "--password-file", "p"], "--password-file is for --method password alone"),
                (["password", "--user", "u", "--ccache", "c"],
                 "--service, --ccache, --keytab and --principal are for --method gss alone"),
                (["gss", "--metrics", "0.0.0.0:0"],
                 "--metrics: other machines could ask at this address; use one of 127.0.0.0/8 or "
                 "[::1], or say --metrics-anywhere"),
                (["gss", "--status", self.file], "--status: that is the file of the token")):
            with self.subTest(options=options):
                self.assert_fails(
                    ssoclient("keep", self.file, "--method", *options, *service), USAGE,
                    "UsageError", message)
        self.assert_fails(ssoclient("keep", "-", "--method", "gss", *service), USAGE, "UsageError",
                          "a token is kept in a file, not on standard output")
        self.assertEqual([self.password], list(self.folder.iterdir()))

    def test_that_have_bad_values(self):
        service = ["--url", "https://127.0.0.1:1/", "--trust", self.sts.trust]
        for option, value, wrong in (
                ("--method", "token", "is not password, certificate, gss or exchange"),
                ("--refresh-at", "0", "is not a number from 1 to 90"),
                ("--refresh-at", "91", "is not a number from 1 to 90"),
                ("--refresh-at", "70%", "is not a number from 1 to 90"),
                *(("--metrics", address,
                   "is not HOST:PORT with the address of a host, or localhost")
                  for address in ("9100", ":9100", "example.com:80", "127.0.0.1:", "127.0.0.1:65536",
                                  "127.0.0.1:-1", "127.0.0.1:+1", "127.0.0.1: 1", "::1:80", "[::1]",
                                  "[127.0.0.1]:80"))):
            with self.subTest(option=option, value=value):
                others = [] if option == "--method" else ["--method", "gss"]
                self.assert_misused(ssoclient("keep", self.file, *others, *service, option, value),
                                    "keep", f"{option}: `{value}' {wrong}")


if __name__ == "__main__":
    unittest.main()
