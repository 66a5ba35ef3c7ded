"""Runs the programs under test."""

import collections
import json
import os
import pathlib
import re
import shutil
import subprocess
import tempfile
import unittest
import urllib.parse

SSOCLIENT = os.environ["SSOCLIENT"]
DATA = pathlib.Path(os.environ["TEST_DATA_DIR"])

DONE, REFUSED, USAGE, BAD_CREDENTIALS, COMMUNICATION, OUT_OF_VALIDITY = range(6)

# Of a token that Alice acquires with her password.
DESCRIPTION = (
    r"\ASamlToken \[subject=\{Name: alice; Domain:example\.test\}, groups=\[.+\], "
    r"delegationChain=\[\], startTime=\S+Z, expirationTime=\S+Z, renewable=false, "
    r"delegable=false, isSolution=false,confirmationType=0\]\n\Z")

Result = collections.namedtuple("Result", "code out err")


def run(*command, stdin="", environment=None):
    """Runs a program without a terminal, in this process's environment unless it is given one."""
    result = subprocess.run([str(part) for part in command], input=stdin, text=True,
                            capture_output=True, start_new_session=True, timeout=120,
                            env=environment)
    return Result(result.returncode, result.stdout, result.stderr)


def ssoclient(*arguments, stdin="", environment=None):
    return run(SSOCLIENT, *arguments, stdin=stdin, environment=environment)


EXCHANGE = (
    r"\ASsoClient\.Exchange\[64\]: (POST /\S* to \S+ port \d+ \(\S+\): HTTP status \d+"
    r"(, [A-Za-z ]+ after \d+ ms)+|TLSv1\.3 with \w+, certificate of .+, issued by .+, "
    r"SHA-256 [0-9a-f]{64}|SOAP fault with code `.+', text `.*')\Z")


def operation_lines(trace):
    """The lines about operations; those in between must be about their exchanges."""
    lines = trace.splitlines()
    exchanges = [line for line in lines if line.startswith("SsoClient.Exchange[64]: ")]
    assert exchanges and all(re.match(EXCHANGE, line) for line in exchanges), trace
    return [line for line in lines if line not in exchanges]


class ProgramTest(unittest.TestCase):
    """A test with a folder of its own."""

    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.folder = pathlib.Path(folder.name)

    def write(self, name, text):
        path = self.folder / name
        path.write_text(text, "utf-8")
        return path

    def assert_fails(self, result, code, class_name, message):
        """Exactly one line on standard error, and nothing on standard output."""
        self.assertEqual(f"ssoclient: {class_name}: {message}\n", result.err)
        self.assertEqual("", result.out)
        self.assertEqual(code, result.code)

    def assert_misused(self, result, command, message):
        """The command line itself is wrong, and the line says where its rules are."""
        self.assert_fails(result, USAGE, "UsageError",
                          f"{message} (see: {' '.join(['ssoclient', *command.split()])} --help)")

    def assert_fails_matching(self, result, code, class_name, pattern):
        self.assertRegex(result.err, rf"\Assoclient: {class_name}: {pattern}\n\Z")
        self.assertEqual(1, result.err.count("\n"))
        self.assertEqual("", result.out)
        self.assertEqual(code, result.code)


class DevelopmentSts:
    """The development STS, running on a port of its own until `stop`."""

    USER = "alice@example.test"
    PASSWORD = "alice-secret"

    def __init__(self, *switches, environment=None, like=None):
        """`like` is another one, with whose files it starts, which saves making keys."""
        self._folder = tempfile.TemporaryDirectory()
        self.state = pathlib.Path(self._folder.name)
        if like is not None:
            shutil.copytree(like.state, self.state, dirs_exist_ok=True)
        self._switches = switches
        self._environment = environment
        self._start()
        self.ca = self.state / "ca.pem"
        self.trust = self.state / "sts.pem"
        self.key = self.state / "client.key"
        self.certificate = self.state / "client.pem"

    def _start(self, *switches):
        self._process = subprocess.Popen(
            [os.environ["DEVSTS"], "--state", str(self.state), *self._switches, *switches],
            stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.DEVNULL, text=True,
            env=self._environment)
        self.url = self._read_url()

    def go_down(self):
        self._process.terminate()
        self._process.wait(timeout=60)
        self._process.stdout.close()

    def come_up(self):
        """At the same address, with the same keys."""
        self._start("--listen", urllib.parse.urlsplit(self.url).netloc)

    def _read_url(self):
        for line in self._process.stdout:
            if line.startswith("listening on "):
                return line.split()[2]
        raise AssertionError("the development STS did not start")

    @property
    def service_options(self):
        return ["--url", self.url, "--ca", self.ca, "--trust", self.trust]

    @property
    def identity(self):
        """The options of the service user that the state directory has a key for."""
        return ["--key", self.key, "--cert", self.certificate]

    def stop(self):
        self.go_down()
        self._folder.cleanup()


class ServiceTest(ProgramTest):
    """A test with a development STS, which all tests of its class share."""

    SWITCHES = ()

    @classmethod
    def setUpClass(cls):
        cls.start_sts(*cls.SWITCHES)

    @classmethod
    def start_sts(cls, *switches, environment=None):
        cls.sts = DevelopmentSts(*switches, environment=environment)
        cls.addClassCleanup(cls.sts.stop)

    def setUp(self):
        super().setUp()
        self.password = self.write("password", DevelopmentSts.PASSWORD + "\n")

    @property
    def nowhere(self):
        """Service options for failures before anything is sent: the port is closed, and had
        anything been sent, that would be the error."""
        return ["--url", "https://127.0.0.1:1/sts", "--ca", self.sts.ca, "--trust", self.sts.trust]

    def acquire(self, *options, service=None, user=DevelopmentSts.USER, password=None, stdin=""):
        return ssoclient(
            "acquire", "password", *(service or self.sts.service_options), "--user", user,
            "--password-file", password or self.password, *options, stdin=stdin)

    def acquire_by_certificate(self, *options, service=None, identity=None, stdin=""):
        return ssoclient("acquire", "certificate", *(service or self.sts.service_options),
                         *(identity or self.sts.identity), *options, stdin=stdin)

    def exchange(self, token, *options, service=None, identity=None, stdin=""):
        return ssoclient("acquire", "token", *(service or self.sts.service_options), "--token",
                         token, *(identity or self.sts.identity), *options, stdin=stdin)

    def token_file(self, acquire, *options):
        """The file of a token that `acquire` obtains."""
        path = self.folder / f"token-{len(list(self.folder.iterdir()))}.xml"
        result = acquire(*options, "--out", path)
        self.assertEqual((DONE, ""), (result.code, result.err))
        return path

    def changed(self, token):
        """The file of the same token with another group."""
        text = token.read_text("utf-8")
        self.assertEqual(1, text.count("\\SolutionUsers"))
        return self.write("changed.xml", text.replace("\\SolutionUsers", "\\Administrators"))

    def encrypted_key(self, passphrase):
        path = self.folder / "encrypted.key"
        result = run("openssl", "pkcs8", "-topk8", "-in", self.sts.key, "-out", path,
                     "-passout", f"pass:{passphrase}")
        self.assertEqual(DONE, result.code, result.err)
        return path

    def facts(self, result):
        """What a command printed as JSON."""
        self.assertEqual((DONE, ""), (result.code, result.err))
        return json.loads(result.out)

    def assert_done(self, result):
        self.assertEqual((DONE, ""), (result.code, result.err))
        self.assertRegex(result.out, DESCRIPTION)
