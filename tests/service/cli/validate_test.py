"""`ssoclient validate` against the development STS."""

import unittest

from programs import (COMMUNICATION, DATA, DONE, OUT_OF_VALIDITY, REFUSED, USAGE, ServiceTest,
                      operation_lines, ssoclient)


class Validate(ServiceTest):
    def validate(self, token, *options, service=None, stdin=""):
        return ssoclient("validate", *(service or self.sts.service_options), "--token", token,
                         *options, stdin=stdin)

    def assert_says(self, word, code, result):
        self.assertEqual((word + "\n", "", code), (result.out, result.err, result.code))

    def test_says_valid(self):
        for acquire in (self.acquire, self.acquire_by_certificate):
            with self.subTest(acquire=acquire.__name__):
                self.assert_says("valid", DONE, self.validate(self.token_file(acquire)))

    def test_says_invalid_when_the_subject_is_gone(self):
        token = self.token_file(self.acquire)
        users = self.sts.state / "users.json"
        text = users.read_text("utf-8")
        self.addCleanup(users.write_text, text, "utf-8")
        users.write_text(text.replace('"alice@example.test"', '"alicia@example.test"'), "utf-8")
        self.assert_says("invalid", REFUSED, self.validate(token))

    def test_token_from_standard_input(self):
        token = self.token_file(self.acquire)
        self.assert_says("valid", DONE, self.validate("-", stdin=token.read_text("utf-8")))

    def test_changed_token_is_not_sent(self):
        token = self.changed(self.token_file(self.acquire_by_certificate))
        self.assert_fails(self.validate(token, service=self.nowhere), REFUSED,
                          "InvalidSignatureException",
                          "Failed to verify signature: token might have been tampered with.")

    def test_token_of_another_service_is_not_sent(self):
        token = DATA / "tokens" / "accepted" / "bearer.xml"
        self.assert_fails_matching(self.validate(token, service=self.nowhere), REFUSED,
                                   "InvalidSignatureException", ".+")

    def test_token_that_has_expired_is_not_sent(self):
        token = DATA / "tokens" / "accepted" / "clock-start-equals-now.xml"
        self.assert_fails(self.validate(token, service=self.nowhere), OUT_OF_VALIDITY,
                          "ParseException", "The token has expired at: 2026-06-15T13:00:00.000Z")

    def test_missing_token_file(self):
        self.assert_fails(self.validate("/no/such/file", service=self.nowhere), USAGE,
                          "UsageError", "cannot open `/no/such/file': No such file or directory")

    def test_closed_port(self):
        token = self.token_file(self.acquire)
        self.assert_fails_matching(self.validate(token, service=self.nowhere), COMMUNICATION,
                                   "HttpException", ".+")

    def test_takes_a_key_with_its_certificate_and_a_dialect_only(self):
        key = ("--key", self.sts.key)
        self.assert_misused(self.validate("x", *key, service=self.nowhere), "validate",
                            "--key requires --cert")
        identity = (*key, "--cert", self.sts.certificate)
        self.assert_fails(self.validate("x", *identity, service=self.nowhere), USAGE, "UsageError",
                          "validate signs with --key in a --dialect only")
        self.assert_fails(self.validate("/no/such/file", *identity, "--dialect", "cxf",
                                        service=self.nowhere), USAGE, "UsageError",
                          "cannot open `/no/such/file': No such file or directory")

    def test_verbose_tells_the_result(self):
        token = self.token_file(self.acquire)
        result = self.validate(token, "--verbose")
        self.assertEqual(("valid\n", DONE), (result.out, result.code))
        lines = operation_lines(result.err)
        self.assertEqual(4, len(lines), result.err)
        self.assertRegex(lines[0], r"START operation SecurityTokenServiceImpl::ValidateSubject\Z")
        self.assertRegex(lines[1], r"Validating subject of token SamlToken \[.+\]\Z")
        self.assertRegex(lines[2], r"Result: true\Z")
        self.assertRegex(lines[3], r"END operation SecurityTokenServiceImpl::ValidateSubject\Z")


if __name__ == "__main__":
    unittest.main()
