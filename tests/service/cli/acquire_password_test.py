"""`ssoclient acquire password` against the development STS."""

import os
import re
import stat
import unittest

from programs import (BAD_CREDENTIALS, COMMUNICATION, DATA, DESCRIPTION, DONE, REFUSED, USAGE,
                      DevelopmentSts, ServiceTest, operation_lines, ssoclient)

class Acquire(ServiceTest):
    def test_prints_the_redacted_description(self):
        self.assert_done(self.acquire())

    def test_prints_the_same_facts_as_json(self):
        facts = self.facts(self.acquire("--json"))
        self.assertEqual(
            ["subject", "groups", "delegationChain", "startTime", "expirationTime", "renewable",
             "delegable", "isSolution", "confirmationType", "id", "issuer", "audience", "advice",
             "confirmationCertificate"], list(facts))
        self.assertEqual({"name": "alice", "domain": "example.test"}, facts["subject"])
        self.assertIn("Administrators", [group["name"] for group in facts["groups"]])
        self.assertEqual("bearer", facts["confirmationType"])
        self.assertIs(False, facts["renewable"])
        self.assertIs(False, facts["delegable"])
        self.assertIs(False, facts["isSolution"])
        self.assertEqual([], facts["delegationChain"])
        self.assertLess(facts["startTime"], facts["expirationTime"])

    def test_asks_for_what_the_options_say(self):
        facts = self.facts(self.acquire("--json", "--renewable", "--delegable"))
        self.assertIs(True, facts["renewable"])
        self.assertIs(True, facts["delegable"])

    def test_refuses_a_lifetime_that_is_not_positive(self):
        for lifetime in ("0", "-1"):
            with self.subTest(lifetime=lifetime):
                self.assert_fails_matching(
                    self.acquire("--lifetime", lifetime), USAGE, "InvalidArgumentException",
                    "Invalid argument : .+")

    def test_longest_lifetime_that_is_taken(self):
        # The service shortens it.
        self.assert_done(self.acquire("--lifetime", "3153600000"))

    def test_asks_for_audiences(self):
        out = self.folder / "token.xml"
        result = self.acquire("--audience", "urn:a", "urn:b", "--audience", "urn:c", "--out", out)
        self.assert_done(result)
        text = out.read_text()
        for audience in ("urn:a", "urn:b", "urn:c"):
            self.assertIn(f">{audience}<", text)
            self.assertNotIn(audience, result.out)

    def test_first_line_of_the_password_file_counts(self):
        for text in ("alice-secret", "alice-secret\r\n", "alice-secret\nsecond line\n"):
            with self.subTest(text=text):
                self.assert_done(self.acquire(password=self.write("other", text)))

    def test_password_that_xml_cannot_hold(self):
        for password, message in ((b"gr\xfc\xdf\n", "is not UTF-8"),
                                  (b"a\x00b\n", "holds a character that XML does not allow"),
                                  (b"a\x1b", "holds a character that XML does not allow")):
            with self.subTest(password=password):
                file = self.folder / "other"
                file.write_bytes(password)
                self.assert_fails_matching(
                    self.acquire(password=file), USAGE, "UsageError",
                    re.escape(f"--password-file: the password {message}"))

    def test_blanks_belong_to_the_password(self):
        self.assert_fails_matching(
            self.acquire(password=self.write("other", "alice-secret \n")),
            BAD_CREDENTIALS, "InvalidCredentialsException", ".+")

    def test_password_from_standard_input(self):
        self.assert_done(self.acquire(password="-", stdin=DevelopmentSts.PASSWORD + "\n"))


class WithAKey(ServiceTest):
    def test_acquires_a_holder_of_key_token(self):
        facts = self.facts(self.acquire("--json", *self.sts.identity))
        self.assertEqual({"name": "alice", "domain": "example.test"}, facts["subject"])
        self.assertEqual("holder-of-key", facts["confirmationType"])

    def test_bearer_is_what_the_token_becomes_if_it_is_asked_for(self):
        facts = self.facts(self.acquire("--json", *self.sts.identity, "--bearer"))
        self.assertEqual("bearer", facts["confirmationType"])

    def test_bearer_changes_nothing_without_a_key(self):
        facts = self.facts(self.acquire("--json", "--bearer"))
        self.assertEqual("bearer", facts["confirmationType"])

    def test_key_and_certificate_need_each_other(self):
        self.assert_misused(self.acquire("--key", self.sts.key, service=self.nowhere),
                            "acquire password", "--key requires --cert")
        self.assert_misused(self.acquire("--cert", self.sts.certificate, service=self.nowhere),
                            "acquire password", "--cert requires --key")

    def test_passphrase_and_password_may_follow_each_other_on_standard_input(self):
        key = self.encrypted_key("key-secret")
        result = self.acquire("--json", "--key", key, "--cert", self.sts.certificate,
                              "--key-passphrase-file", "-", password="-",
                              stdin=f"key-secret\n{DevelopmentSts.PASSWORD}\n")
        self.assertEqual("holder-of-key", self.facts(result)["confirmationType"])


class OutputFiles(ServiceTest):
    def mode(self, path):
        return stat.S_IMODE(os.stat(path).st_mode)

    def test_is_the_owners_alone_and_holds_the_assertion(self):
        out = self.folder / "token.xml"
        old_mask = os.umask(0)
        try:
            self.assert_done(self.acquire("--out", out))
        finally:
            os.umask(old_mask)
        self.assertEqual(0o600, self.mode(out))
        inspected = ssoclient("inspect", out, "--trust", self.sts.trust)
        self.assert_done(inspected)

    def test_takes_the_place_of_an_older_file(self):
        out = self.write("token.xml", "older")
        out.chmod(0o644)
        self.assert_done(self.acquire("--out", out))
        self.assertEqual(0o600, self.mode(out))
        self.assertNotIn("older", out.read_text())

    def test_is_left_alone_when_nothing_is_acquired(self):
        out = self.write("token.xml", "older")
        result = self.acquire("--out", out, user="nobody@example.test")
        self.assertEqual(BAD_CREDENTIALS, result.code)
        self.assertEqual("older", out.read_text())
        self.assertEqual({out, self.password}, set(self.folder.iterdir()))

    def test_that_cannot_be_written_is_found_before_anything_is_sent(self):
        for out, why in ((self.folder / "no" / "token.xml", "No such file or directory"),
                         (self.password / "token.xml", "Not a directory"),
                         (self.folder / ("x" * 256), "File name too long")):
            with self.subTest(why=why):
                result = self.acquire("--out", out, service=self.nowhere)
                self.assert_fails(result, USAGE, "UsageError", f"cannot write `{out}': {why}")

    def test_in_the_working_folder_needs_no_folder_name(self):
        before = os.getcwd()
        self.addCleanup(os.chdir, before)
        os.chdir(self.folder)
        self.assert_done(self.acquire("--out", "x" * 255))
        self.assertEqual({self.folder / ("x" * 255), self.password}, set(self.folder.iterdir()))

    def test_must_not_be_a_device_or_a_folder(self):
        for out in ("/dev/null", self.folder):
            with self.subTest(out=out):
                self.assert_fails(self.acquire("--out", out), USAGE, "UsageError",
                                  f"`{out}' is not a regular file")


class Refusals(ServiceTest):
    def test_wrong_password(self):
        self.assert_fails_matching(
            self.acquire(password=self.write("other", "wrong\n")),
            BAD_CREDENTIALS, "InvalidCredentialsException", ".+")

    def test_unknown_user(self):
        self.assert_fails_matching(
            self.acquire(user="nobody@example.test"),
            BAD_CREDENTIALS, "InvalidCredentialsException", ".+")

    def test_empty_password(self):
        for text in ("", "\n", "\nalice-secret\n"):
            with self.subTest(text=text):
                self.assert_fails(self.acquire(password=self.write("other", text)),
                                  USAGE, "UsageError", "the password is empty")

    def test_password_that_is_too_long(self):
        path = self.write("other", "x" * 4097)
        self.assert_fails(self.acquire(password=path), USAGE, "UsageError",
                          f"the password from `{path}' is longer than 4096 bytes")

    def test_missing_password_file(self):
        self.assert_fails(self.acquire(password="/no/such/file"), USAGE, "UsageError",
                          "cannot read the password from `/no/such/file': "
                          "No such file or directory")

    def test_no_terminal_to_ask(self):
        result = ssoclient("acquire", "password", *self.sts.service_options, "--user", "u")
        self.assert_fails(result, USAGE, "UsageError",
                          "no terminal to ask for the password: use --password-file")

    def test_token_signed_by_another_than_the_trusted(self):
        foreign = DATA / "keys" / "foreign-cert.pem"
        result = self.acquire(service=["--url", self.sts.url, "--ca", self.sts.ca,
                                       "--trust", foreign])
        self.assert_fails_matching(result, REFUSED, "InvalidSignatureException", ".+")

    def test_one_of_several_trusted_certificates_is_enough(self):
        foreign = DATA / "keys" / "foreign-cert.pem"
        self.assert_done(self.acquire(service=["--url", self.sts.url, "--ca", self.sts.ca,
                                               "--trust", foreign, self.sts.trust]))


class Tls(ServiceTest):
    def assert_no_connection(self, *service):
        self.assert_fails_matching(
            self.acquire(service=["--url", self.sts.url, "--trust", self.sts.trust, *service]),
            COMMUNICATION, "HttpException", ".+")

    def test_authority_is_not_the_servers(self):
        self.assert_no_connection("--ca", DATA / "keys" / "foreign-cert.pem")

    def test_the_systems_authorities_do_not_know_the_server(self):
        self.assert_no_connection()

    def test_peer_has_another_name(self):
        self.assert_no_connection("--ca", self.sts.ca, "--peer", "sts.example.com")

    def test_peer_has_another_key(self):
        self.assert_no_connection("--ca", self.sts.ca, "--peer", "sha256//" + "A" * 43 + "=")

    def test_peer_name_that_the_certificate_has(self):
        self.assert_done(self.acquire("--peer", "localhost"))


class NoServer(ServiceTest):
    def test_closed_port(self):
        result = self.acquire(service=self.nowhere)
        self.assert_fails_matching(result, COMMUNICATION, "HttpException", ".+")

    def test_other_path(self):
        url = self.sts.url.replace("/sts", "/elsewhere")
        result = self.acquire(service=["--url", url, "--ca", self.sts.ca,
                                       "--trust", self.sts.trust])
        self.assert_fails_matching(result, COMMUNICATION, "CommunicationException",
                                   "Server returned error: 404 .*")


class PlainHttp(ServiceTest):
    SWITCHES = ("--http",)

    def test_needs_no_authorities(self):
        self.assertRegex(self.sts.url, r"\Ahttp://")
        self.assert_done(self.acquire(service=["--url", self.sts.url, "--trust", self.sts.trust]))


class Verbose(ServiceTest):
    def test_writes_the_trace_lines_in_order_and_no_secret(self):
        out = self.folder / "token.xml"
        result = self.acquire("--verbose", "--out", out)
        self.assertEqual(DONE, result.code)
        self.assertRegex(result.out, DESCRIPTION)
        lines = operation_lines(result.err)
        patterns = [
            r"opId=(\S+) START operation SecurityTokenServiceImpl::AcquireToken",
            r"Requested token for subject `alice@example\.test', spec `TokenSpec \[.*'",
            r"SecurityTokenServiceImpl::AcquireToken sending request",
            r"SecurityTokenServiceImpl::AcquireToken processing response",
            r"Successfully acquired token: SamlToken \[.*\]",
            r"opId=(\S+) END operation SecurityTokenServiceImpl::AcquireToken"]
        self.assertEqual(len(patterns), len(lines), result.err)
        for pattern, line in zip(patterns, lines):
            self.assertRegex(line, pattern + r"\Z")
        self.assertNotIn(DevelopmentSts.PASSWORD, result.err)
        self.assertNotRegex(result.err, "<(?!unset>)")
        signature = re.search("SignatureValue>([^<]{40})", out.read_text()).group(1)
        self.assertNotIn(signature, result.err)

    def test_failure_stays_the_last_line(self):
        result = self.acquire("--verbose", password=self.write("other", "wrong-secret\n"))
        lines = result.err.splitlines()
        self.assertRegex(lines[0], "START operation")
        self.assertRegex(lines[-2], "END operation")
        self.assertRegex(lines[-1], r"\Assoclient: InvalidCredentialsException: .+\Z")
        self.assertNotIn("wrong-secret", result.err)


if __name__ == "__main__":
    unittest.main()
