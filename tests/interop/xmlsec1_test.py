"""xmlsec1 verifies the signed requests and nothing made of them."""

import subprocess
import tempfile
import unittest

import messages
from messages import SIGNED

REQUEST_SIGNATURE = '//*[@Id="holderOfKeyProofSignature"]'
TOKEN_SIGNATURE = '//*[local-name()="Assertion"]/*[local-name()="Signature"]'
WITH_TOKEN = messages.SIGNED_BY_TOKEN + ["renew", "validate"]


def verifies(text, key="client", signature=REQUEST_SIGNATURE):
    with tempfile.NamedTemporaryFile("w", suffix=".xml", encoding="utf-8") as file:
        file.write(text)
        file.flush()
        result = subprocess.run(
            ["xmlsec1", "--verify", "--pubkey-cert-pem", messages.KEYS / f"{key}-cert.pem",
             "--id-attr:Id", "Body", "--id-attr:Id", "Timestamp", "--id-attr:ID", "Assertion",
             "--node-xpath", signature, file.name], capture_output=True, text=True)
    # The word is looked for, so that a failure to read is not taken for a failure to verify.
    verdicts = {"OK", "FAIL"}.intersection(result.stderr.split("\n"))
    if len(verdicts) != 1 or (result.returncode == 0) != (verdicts == {"OK"}):
        raise AssertionError(result.stderr)
    return verdicts == {"OK"}


class XmlSec(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.requests = messages.write()

    def assert_all(self, expected, verdict):
        for name in SIGNED:
            with self.subTest(request=name):
                self.assertIs(expected, verdict(self.requests[name]))

    def test_verifies_signed_requests(self):
        self.assert_all(True, verifies)

    def test_verifies_the_token_in_the_request(self):
        for name in WITH_TOKEN:
            with self.subTest(request=name):
                self.assertTrue(verifies(self.requests[name], "sts", TOKEN_SIGNATURE))

    def test_refuses_changed_body(self):
        self.assert_all(False, lambda text: verifies(messages.change_body(text)))

    def test_refuses_changed_timestamp(self):
        self.assert_all(False, lambda text: verifies(messages.change_timestamp(text)))

    def test_refuses_foreign_key(self):
        self.assert_all(False, lambda text: verifies(text, "foreign"))


if __name__ == "__main__":
    unittest.main()
