"""`ssoclient acquire certificate` against the development STS, and what all commands with a key
have in common."""

import re
import unittest

from programs import (BAD_CREDENTIALS, COMMUNICATION, DATA, DONE, REFUSED, USAGE, ServiceTest, run,
                      ssoclient)

DESCRIPTION = (
    r"\ASamlToken \[subject=\{Name: service; Domain:example\.test\}, "
    r"groups=\[\{Name: SolutionUsers; Domain:EXAMPLE\}\], delegationChain=\[\], startTime=\S+Z, "
    r"expirationTime=\S+Z, renewable=false, delegable=false, isSolution=true,"
    r"confirmationType=1\]\n\Z")

KEYS = DATA / "keys"


class AcquireCertificate(ServiceTest):
    def test_prints_the_redacted_description(self):
        result = self.acquire_by_certificate()
        self.assertEqual((DONE, ""), (result.code, result.err))
        self.assertRegex(result.out, DESCRIPTION)

    def test_asks_for_what_the_options_say(self):
        facts = self.facts(self.acquire_by_certificate("--json", "--renewable", "--delegable"))
        self.assertEqual({"name": "service", "domain": "example.test"}, facts["subject"])
        self.assertEqual("holder-of-key", facts["confirmationType"])
        self.assertIs(True, facts["renewable"])
        self.assertIs(True, facts["delegable"])

    def test_token_is_bound_to_the_certificate(self):
        text = self.token_file(self.acquire_by_certificate).read_text("utf-8")
        base64 = "".join(self.sts.certificate.read_text("ascii").splitlines()[1:-1])
        self.assertIn(base64, re.sub(r"\s|&#\w+;", "", text))

    def test_writes_the_assertion(self):
        token = self.token_file(self.acquire_by_certificate)
        self.assertEqual(0o600, token.stat().st_mode & 0o777)
        result = ssoclient("inspect", token, "--trust", self.sts.trust)
        self.assertEqual((DONE, ""), (result.code, result.err))
        self.assertRegex(result.out, DESCRIPTION)

    def test_certificate_that_the_service_does_not_know(self):
        result = self.acquire_by_certificate(identity=[
            "--key", KEYS / "client-key.pem", "--cert", KEYS / "client-cert.pem"])
        self.assert_fails_matching(result, BAD_CREDENTIALS, "InvalidCredentialsException",
                                   "Authentication failed: .+")

    def test_closed_port(self):
        self.assert_fails_matching(self.acquire_by_certificate(service=self.nowhere),
                                   COMMUNICATION, "HttpException", ".+")

    def test_reply_signed_by_another_than_the_trusted(self):
        result = self.acquire_by_certificate(service=[
            "--url", self.sts.url, "--ca", self.sts.ca, "--trust", KEYS / "foreign-cert.pem"])
        self.assert_fails_matching(result, REFUSED, "InvalidSignatureException", ".+")

    def test_is_never_bearer(self):
        self.assert_misused(self.acquire_by_certificate("--bearer", service=self.nowhere),
                            "acquire certificate",
                            "ssoclient acquire certificate has no option --bearer")

    def test_verbose_shows_no_key_and_no_token(self):
        out = self.folder / "token.xml"
        result = self.acquire_by_certificate("--verbose", "--out", out)
        self.assertEqual(DONE, result.code)
        lines = result.err.splitlines()
        self.assertRegex(lines[0], "START operation SecurityTokenServiceImpl::"
                                   r"AcquireTokenByCertificate\Z")
        self.assertRegex(lines[-1], "END operation SecurityTokenServiceImpl::"
                                    r"AcquireTokenByCertificate\Z")
        for secret in self.sts.key.read_text("ascii").splitlines()[1:-1]:
            self.assertNotIn(secret, result.err)
        self.assertNotRegex(result.err, "<(?!unset>)")


class Advice(ServiceTest):
    def advice_of(self, *options):
        """Pairs of source and attributes, which are pairs of name and values."""
        text = self.token_file(self.acquire_by_certificate, *options).read_text("utf-8")
        return [
            (source, [(name, re.findall(r">([^<]*)</saml:AttributeValue>", values))
                      for name, values in re.findall(
                          r'<saml:Attribute Name="([^"]*)".*?>(.*?)</saml:Attribute>', content)])
            for source, content in re.findall(
                r'<rsa:RSAAdvice AdviceSource="([^"]*)">(.*?)</rsa:RSAAdvice>', text)]

    def test_none_is_asked_for_unless_told(self):
        self.assertEqual([], self.advice_of())

    def test_entries_gather_by_source_and_name_in_order(self):
        self.assertEqual(
            [("urn:b", [("urn:n", ["1", "2"]), ("urn:m", ["4"])]), ("urn:a", [("urn:n", ["3"])])],
            self.advice_of("--advice", "urn:b", "urn:n=1", "--advice", "urn:a", "urn:n=3",
                           "--advice", "urn:b", "urn:m=4", "--advice", "urn:b", "urn:n=2"))

    def test_name_ends_at_the_first_equals_sign(self):
        self.assertEqual([("urn:a", [("urn:n", ["x=y", ""])])],
                         self.advice_of("--advice", "urn:a", "urn:n=x=y",
                                        "--advice", "urn:a", "urn:n="))

    def assert_usage_error(self, message, *options):
        self.assert_fails(self.acquire_by_certificate(*options, service=self.nowhere),
                          USAGE, "UsageError", message)

    def test_without_a_name_or_a_value(self):
        for words in ("urn:n", "=x", "="):
            with self.subTest(words=words):
                self.assert_usage_error(f"--advice: `{words}' is not NAME=VALUE",
                                        "--advice", "urn:a", words)

    def test_takes_two_words_at_a_time(self):
        self.assert_misused(
            self.acquire_by_certificate("--advice", "urn:a", service=self.nowhere),
            "acquire certificate", "--advice: 2 required SOURCE NAME=VALUE missing")
        self.assert_misused(
            self.acquire_by_certificate("--advice", "urn:a", "urn:n=1", "urn:b", "urn:n=2",
                                        service=self.nowhere),
            "acquire certificate",
            "there is an argument too many after --advice, not shown because it may be a secret")


class Keys(ServiceTest):
    def with_key(self, key, *options, certificate=None, **others):
        return self.acquire_by_certificate(
            *options, identity=["--key", key, "--cert", certificate or self.sts.certificate],
            **others)

    def assert_usage_error(self, message, key, *options, **others):
        """Before anything is sent."""
        self.assert_fails(self.with_key(key, *options, service=self.nowhere, **others),
                          USAGE, "UsageError", message)

    def assert_accepts(self, key, *options, **others):
        result = self.with_key(key, *options, **others)
        self.assertEqual((DONE, ""), (result.code, result.err))
        self.assertRegex(result.out, DESCRIPTION)

    def openssl(self, *arguments):
        result = run("openssl", *arguments)
        self.assertEqual(DONE, result.code, result.err)

    def der_key(self):
        path = self.folder / "key.der"
        self.openssl("pkey", "-in", self.sts.key, "-outform", "DER", "-out", path)
        return path

    def test_in_der_form(self):
        self.assert_accepts(self.der_key())

    def test_in_a_store(self):
        self.assert_accepts(f"file:{self.sts.key}")
        self.assert_accepts(f"file:{self.der_key()}")

    def test_encrypted(self):
        key = self.encrypted_key("key-secret")
        passphrase = self.write("passphrase", "key-secret\nsecond line\n")
        for name in (key, f"file:{key}"):
            with self.subTest(key=name):
                self.assert_accepts(name, "--key-passphrase-file", passphrase)
                self.assert_accepts(name, "--key-passphrase-file", "-", stdin="key-secret\n")

    def test_passphrase_is_not_read_if_none_is_needed(self):
        self.assert_accepts(self.sts.key, "--key-passphrase-file", "/no/such/file")

    def test_wrong_passphrase(self):
        key = self.encrypted_key("key-secret")
        passphrase = self.write("passphrase", "wrong-secret\n")
        self.assert_usage_error(
            f"cannot use the private key `{key}': Cannot read the private key: "
            "the passphrase is wrong", key, "--key-passphrase-file", passphrase)
        self.assert_usage_error(
            f"cannot use the private key: There is no private key at 'file:{key}': "
            "the passphrase is wrong", f"file:{key}", "--key-passphrase-file", passphrase)

    def test_no_passphrase(self):
        key = self.encrypted_key("key-secret")
        for name in (key, f"file:{key}"):
            with self.subTest(key=name):
                self.assert_usage_error(
                    "no terminal to ask for the key passphrase: use --key-passphrase-file", name)
                self.assert_usage_error(
                    "cannot read the key passphrase from `/no/such/file': "
                    "No such file or directory", name, "--key-passphrase-file", "/no/such/file")
                self.assert_usage_error("the key passphrase is empty",
                                        name, "--key-passphrase-file", "-", stdin="")

    def test_of_another_certificate(self):
        for key in (KEYS / "client-key.pem", f"file:{KEYS / 'client-key.pem'}"):
            with self.subTest(key=key):
                self.assert_usage_error(
                    f"the private key is not that of the certificate in `{self.sts.certificate}'",
                    key)

    def test_first_certificate_of_the_file_counts(self):
        own = self.sts.certificate.read_text("ascii")
        other = (KEYS / "client-cert.pem").read_text("ascii")
        self.assert_accepts(self.sts.key, certificate=self.write("own-first.pem", own + other))
        own_last = self.write("own-last.pem", other + own)
        self.assert_usage_error(f"the private key is not that of the certificate in `{own_last}'",
                                self.sts.key, certificate=own_last)

    def test_that_cannot_sign_requests(self):
        for name, kind in (("sts-p256", "EC prime256v1"), ("weak", "RSA-1024")):
            with self.subTest(name=name):
                self.assert_usage_error(
                    "requests are signed with an RSA key of 2048 bits or more, "
                    f"not with one of type {kind}", KEYS / f"{name}-key.pem",
                    certificate=KEYS / f"{name}-cert.pem")

    def test_missing(self):
        self.assert_usage_error("cannot open `/no/such/key': No such file or directory",
                                "/no/such/key")
        self.assert_usage_error("cannot use the private key: Cannot open 'file:/no/such/key': "
                                "No such file or directory", "file:/no/such/key")

    def test_no_key_in_the_file(self):
        for name in (self.sts.certificate, self.write("empty", "")):
            with self.subTest(name=name):
                result = self.with_key(name, service=self.nowhere)
                self.assert_fails_matching(
                    result, USAGE, "UsageError",
                    f"cannot use the private key `{name}': Cannot read the private key: .+")

    def test_unknown_scheme(self):
        self.assert_fails_matching(
            self.with_key("unknown:key", service=self.nowhere), USAGE, "UsageError",
            "cannot use the private key: Cannot open 'unknown:key': .+")

    def test_pin_in_the_uri_is_not_shown(self):
        for uri, shown in (("unknown:x?pin-value=SECRET", "unknown:x?pin-value=..."),
                           ("unknown:x?pin-value=SECRET&a=b", "unknown:x?pin-value=...&a=b"),
                           ("unknown:PIN-VALUE=SECRET;x", "unknown:PIN-VALUE=...;x"),
                           ("file:/no/such?pin-value=SECRET", "file:/no/such?pin-value=..."),
                           ("unknown:pin-value=SEC'RET", "unknown:pin-value=...")):
            with self.subTest(uri=uri):
                result = self.with_key(uri, service=self.nowhere)
                self.assert_fails_matching(
                    result, USAGE, "UsageError",
                    f"cannot use the private key: Cannot open '{re.escape(shown)}': .+")
                self.assertNotIn("RET", result.err)

    def test_name_with_a_colon_is_a_file_after_a_slash(self):
        self.assert_usage_error("cannot open `./unknown:key': No such file or directory",
                                "./unknown:key")

    def test_missing_certificate(self):
        self.assert_usage_error("cannot open `/no/such/file': No such file or directory",
                                self.sts.key, certificate="/no/such/file")


if __name__ == "__main__":
    unittest.main()
