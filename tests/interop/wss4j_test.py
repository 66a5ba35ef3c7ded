"""WSS4J, an independent WS-Security stack, accepts the signed requests and nothing made of them."""

import pathlib
import re
import shutil
import subprocess
import tempfile
import unittest

import messages
from messages import SIGNED_BY_CERTIFICATE, UNSIGNED

SOURCE = pathlib.Path(__file__).with_name("WssCheck.java")
JARS = [pathlib.Path("/usr/share/java", name + ".jar")
        for name in ("wss4j", "xmlsec", "commons-logging", "slf4j-api", "slf4j-nop")]

# A bearer token names no key, so that no key could be found by it.
SIGNED_BY_HOLDER = ["exchange", "exchange-full"]
SIGNED = SIGNED_BY_CERTIFICATE + SIGNED_BY_HOLDER

BAD_SIGNATURE = "The signature or decryption was invalid"
UNTRUSTED = "The security token could not be authenticated or authorized"
BAD_TIMESTAMP = "The message has expired"


def require_java():
    missing = [name for name in ("java", "javac") if shutil.which(name) is None]
    missing += [str(jar) for jar in JARS if not jar.exists()]
    if missing:
        raise unittest.SkipTest("not installed: " + ", ".join(missing))


class Wss(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        require_java()
        cls.classes = cls.enterClassContext(tempfile.TemporaryDirectory())
        cls.class_path = ":".join(map(str, [*JARS, cls.classes]))
        subprocess.run(
            ["javac", "-Xlint:all,-path", "-Werror", "-cp", cls.class_path, "-d", cls.classes,
             SOURCE], check=True)
        # WSS4J reads the clock of the machine, and gives a message some minutes.
        cls.requests = messages.write(messages.minutes_from_now(0))

    def verdicts(self, texts):
        """What WSS4J says of each text, if only the key `client` is trusted."""
        with tempfile.TemporaryDirectory() as folder:
            files = []
            for name, text in texts.items():
                files.append(pathlib.Path(folder, name))
                files[-1].write_text(text, "utf-8")
            said = subprocess.run(
                ["java", "-cp", self.class_path, "WssCheck", messages.KEYS / "client-cert.pem",
                 *files], capture_output=True, text=True, check=True).stdout
        return dict(line.split(" ", 1) for line in said.splitlines())

    def assert_refused(self, names, reason, change, texts=None):
        texts = texts or self.requests
        verdicts = self.verdicts({name: change(texts[name]) for name in names})
        self.assertEqual(sorted(names), sorted(verdicts))
        for name, verdict in verdicts.items():
            self.assertRegex(verdict, "^refused: " + re.escape(reason), name)

    def test_accepts_signed_requests(self):
        self.assertEqual(
            {name: "accepted by DIRECT_REF" for name in SIGNED_BY_CERTIFICATE}
            | {name: "accepted by KEY_IDENTIFIER" for name in SIGNED_BY_HOLDER},
            self.verdicts({name: self.requests[name] for name in SIGNED}))

    def test_misses_the_signature_of_unsigned_requests(self):
        self.assert_refused(UNSIGNED, "no signature", lambda text: text)

    def test_refuses_changed_body(self):
        self.assert_refused(SIGNED, BAD_SIGNATURE, messages.change_body)

    def test_refuses_changed_timestamp(self):
        self.assert_refused(SIGNED, BAD_SIGNATURE, messages.change_timestamp)

    def test_finds_that_the_body_is_not_the_signed_one(self):
        self.assert_refused(
            SIGNED, "signed is something other than body and timestamp", messages.move_body)

    def test_refuses_key_nobody_trusts(self):
        foreign = messages.write(messages.minutes_from_now(0), "foreign")
        self.assert_refused(SIGNED_BY_CERTIFICATE, UNTRUSTED, lambda text: text, foreign)

    def test_refuses_key_other_than_that_of_the_certificate(self):
        foreign = messages.write(messages.minutes_from_now(0), "foreign")
        pattern = r"[^>]+(?=</wsse:BinarySecurityToken>)"
        trusted = re.search(pattern, self.requests["certificate"])[0]
        self.assert_refused(
            SIGNED_BY_CERTIFICATE, BAD_SIGNATURE,
            lambda text: messages.substitute(pattern, trusted, text), foreign)

    def test_refuses_key_other_than_that_of_the_token(self):
        foreign = messages.write(messages.minutes_from_now(0), "foreign")
        self.assert_refused(SIGNED_BY_HOLDER, BAD_SIGNATURE, lambda text: text, foreign)

    def test_refuses_key_identifier_of_another_token(self):
        self.assert_refused(
            SIGNED_BY_HOLDER, BAD_SIGNATURE,
            lambda text: messages.substitute("</wsse:KeyIdentifier>", "x</wsse:KeyIdentifier>", text))

    def test_finds_no_key_in_bearer_token(self):
        self.assert_refused(
            ["exchange-bearer"], "the assertion names no holder of a key", lambda text: text)

    def test_refuses_request_of_an_hour_ago_and_of_an_hour_ahead(self):
        for minutes in (-60, 60):
            texts = messages.write(messages.minutes_from_now(minutes))
            self.assert_refused(SIGNED, BAD_TIMESTAMP, lambda text: text, texts)


if __name__ == "__main__":
    unittest.main()
