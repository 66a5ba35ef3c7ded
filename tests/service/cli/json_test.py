"""What `--json` prints, judged by the schema that comes with the program."""

import hashlib
import json
import pathlib
import ssl
import unittest

import jsonschema

from programs import (BAD_CREDENTIALS, COMMUNICATION, DATA, DONE, OUT_OF_VALIDITY, REFUSED, USAGE,
                      ServiceTest, ssoclient)

TOKENS = DATA / "tokens"
SCHEMA = json.loads((pathlib.Path(__file__).parents[3] / "tools" / "ssoclient" / "schema"
                     / "output.schema.json").read_text("utf-8"))


def judged(text):
    """The JSON that `text` is; it is ASCII and as the schema says."""
    text.encode("ascii")
    document = json.loads(text)
    jsonschema.Draft7Validator(SCHEMA).validate(document)
    return document


class Schema(unittest.TestCase):
    def test_is_one(self):
        jsonschema.Draft7Validator.check_schema(SCHEMA)

    def test_refuses_what_lacks_a_key_or_has_another_kind_of_value(self):
        validator = jsonschema.Draft7Validator(SCHEMA)
        error = {"class": "X", "message": "", "hint": None, "exitCode": 1}
        self.assertTrue(validator.is_valid({"error": error}))
        for wrong in ({}, {"error": {}}, {"error": {**error, "exitCode": 0}},
                      {"error": {**error, "hint": 1}}, {"valid": "true"}, [],
                      {"error": error, "valid": True}):
            with self.subTest(wrong=wrong):
                self.assertFalse(validator.is_valid(wrong))


class Tokens(ServiceTest):
    def test_facts_of_a_bearer_token(self):
        token = self.folder / "token.xml"
        facts = judged(self.acquire("--json", "--out", token, "--audience", "urn:b", "urn:a",
                                    "--advice", "urn:s", "urn:n=é").out)
        self.assertIsNone(facts["confirmationCertificate"])
        self.assertEqual(["urn:a", "urn:b"], facts["audience"])
        self.assertEqual([{"source": "urn:s",
                           "attributes": [{"name": "urn:n", "values": ["é"]}]}], facts["advice"])
        text = token.read_text("utf-8")
        self.assertIn(f'ID="{facts["id"]}"', text)
        self.assertIn(f'>{facts["issuer"]}</saml:Issuer>', text)
        self.assertNotEqual("", facts["issuer"])

    def test_certificate_of_a_holder_of_key_token(self):
        facts = judged(self.acquire_by_certificate("--json").out)
        der = ssl.PEM_cert_to_DER_cert(self.sts.certificate.read_text("ascii"))
        self.assertEqual(hashlib.sha256(der).hexdigest(),
                         facts["confirmationCertificate"]["sha256"])
        self.assertIn("CN=", facts["confirmationCertificate"]["subject"])

    def test_goes_to_standard_error_when_the_assertion_is_printed(self):
        result = self.acquire("--json", "--out", "-")
        self.assertEqual("alice", judged(result.err)["subject"]["name"])
        self.assertTrue(result.out.startswith("<saml:Assertion "))

    def test_validation(self):
        token = self.token_file(self.acquire)
        result = ssoclient("validate", *self.sts.service_options, "--token", token, "--json")
        self.assertEqual((DONE, ""), (result.code, result.err))
        self.assertEqual({"valid": True}, judged(result.out))


class Failures(ServiceTest):
    def assert_failure(self, result, code, class_name, pattern):
        self.assertEqual(("", code), (result.out, result.code))
        self.assertEqual(1, result.err.count("\n"))
        error = judged(result.err)["error"]
        self.assertEqual((class_name, code), (error["class"], error["exitCode"]))
        self.assertRegex(error["message"], pattern)

    def test_of_every_exit_code(self):
        self.assert_failure(
            ssoclient("inspect", "-", "--trust", self.sts.trust, "--json", stdin="<a/>"),
            REFUSED, "ParseException", ".+")
        self.assert_failure(self.acquire("--json", service=self.nowhere, user="a\n"),
                            USAGE, "UsageError", "--user: must not hold control characters .*")
        self.assert_failure(self.acquire("--json", user="nobody@example.test"),
                            BAD_CREDENTIALS, "InvalidCredentialsException", ".+")
        self.assert_failure(self.acquire("--json", service=self.nowhere),
                            COMMUNICATION, "HttpException", ".+")
        token = TOKENS / "accepted" / "clock-start-equals-now.xml"
        self.assert_failure(
            ssoclient("inspect", token, "--trust", DATA / "keys" / "sts-cert.pem", "--json"),
            OUT_OF_VALIDITY, "ParseException", "The token has expired at: ")

    def test_of_a_command_line_that_is_not_understood(self):
        for arguments in (("inspect", "--json", "--wish"), ("inspect", "--wish", "--json"),
                          ("--json",), ("inspect", "--json", "--clock-tolerance", "x")):
            with self.subTest(arguments=arguments):
                self.assert_failure(ssoclient(*arguments), USAGE, "UsageError", r".+--help\)")

    def test_text_that_is_not_utf8(self):
        result = ssoclient("inspect", "\udcff\u009b", "--trust", self.sts.trust, "--json")
        self.assert_failure(result, USAGE, "UsageError", "cannot open `\ufffd\u009b': .+")


if __name__ == "__main__":
    unittest.main()
