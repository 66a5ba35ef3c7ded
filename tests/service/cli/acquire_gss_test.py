"""`ssoclient acquire gss` against the development STS in a Kerberos realm."""

import base64
import re
import unittest

from programs import (BAD_CREDENTIALS, COMMUNICATION, DESCRIPTION, DONE, REFUSED, USAGE,
                      DevelopmentSts, ServiceTest, operation_lines, run, ssoclient)
from realm import CredentialCache, KerberosTest

NO_CREDENTIALS = ("No credentials were supplied, or the credentials were unavailable or "
                  "inaccessible: ")
UNSPECIFIED = "Unspecified GSS failure.  Minor code may provide more information: "


class Tickets(KerberosTest):
    def test_of_a_named_cache(self):
        self.assert_done(self.acquire_by_gss("--ccache", self.ccache))

    def test_of_a_cache_with_its_type(self):
        self.assert_done(self.acquire_by_gss("--ccache", f"FILE:{self.ccache}"))

    def test_of_the_default_cache(self):
        self.assert_done(self.acquire_by_gss(environment={"KRB5CCNAME": f"FILE:{self.ccache}"}))

    def test_of_a_named_cache_whatever_the_default_is(self):
        mallory = self.realm.log_on("mallory", self.folder / "mallory")
        self.assert_done(self.acquire_by_gss("--ccache", self.ccache,
                                             environment={"KRB5CCNAME": f"FILE:{mallory}"}))

    def test_of_a_keytab(self):
        self.assert_done(self.acquire_by_gss(*self.with_keytab))

    def test_of_a_keytab_with_type_and_realm(self):
        self.assert_done(self.acquire_by_gss("--keytab", f"FILE:{self.realm.alice_keytab}",
                                             "--principal", "alice@EXAMPLE.TEST"))

    def test_of_a_keytab_stays_out_of_the_default_cache(self):
        cache = self.folder / "default"
        self.assert_done(self.acquire_by_gss(*self.with_keytab,
                                             environment={"KRB5CCNAME": f"FILE:{cache}"}))
        self.assertFalse(cache.exists())


class Services(KerberosTest):
    def test_may_be_named_in_every_form(self):
        for name in ("HTTP@localhost", "HTTP/localhost", "HTTP/localhost@EXAMPLE.TEST"):
            with self.subTest(name=name):
                ccache = self.realm.log_on("alice", self.folder / "fresh")
                self.assert_done(self.acquire_by_gss("--ccache", ccache, "--service", name))
                self.assertIn(b"localhost", ccache.read_bytes())
                self.assertNotIn(b"127.0.0.1", ccache.read_bytes())

    def test_is_that_of_the_urls_host_by_default(self):
        ccache = self.realm.log_on("alice", self.folder / "fresh")
        url = self.sts.url.replace("127.0.0.1", "localhost")
        self.assert_done(self.acquire_by_gss(
            "--ccache", ccache,
            service=["--url", url, "--ca", self.sts.ca, "--trust", self.sts.trust]))
        self.assertIn(b"localhost", ccache.read_bytes())
        self.assertNotIn(b"127.0.0.1", ccache.read_bytes())


class Tokens(KerberosTest):
    def test_has_the_facts_that_a_password_gives(self):
        by_ticket = self.facts(self.acquire_by_gss("--ccache", self.ccache, "--json"))
        by_password = self.facts(self.acquire("--json"))
        for facts in (by_ticket, by_password):
            del facts["id"], facts["startTime"], facts["expirationTime"]
        self.assertEqual(by_password, by_ticket)

    def test_asks_for_what_the_options_say(self):
        facts = self.facts(self.acquire_by_gss(
            "--ccache", self.ccache, "--json", "--renewable", "--delegable"))
        self.assertIs(True, facts["renewable"])
        self.assertIs(True, facts["delegable"])

    def test_goes_to_the_file(self):
        out = self.folder / "token.xml"
        self.assert_done(self.acquire_by_gss("--ccache", self.ccache, "--audience", "urn:a",
                                             "--out", out))
        self.assertEqual(0o600, out.stat().st_mode & 0o777)
        self.assertIn(">urn:a<", out.read_text())
        self.assert_done(ssoclient("inspect", out, "--trust", self.sts.trust))

    def test_is_bound_to_the_key_if_there_is_one(self):
        out = self.folder / "token.xml"
        facts = self.facts(self.acquire_by_gss("--ccache", self.ccache, *self.sts.identity,
                                               "--renewable", "--json", "--out", out))
        self.assertEqual({"name": "alice", "domain": "example.test"}, facts["subject"])
        self.assertEqual("holder-of-key", facts["confirmationType"])
        renewed = ssoclient("renew", *self.sts.service_options, *self.sts.identity, "--token", out,
                            "--lifetime", "600", "--json")
        self.assertEqual("holder-of-key", self.facts(renewed)["confirmationType"])

    def test_is_bearer_with_a_key_if_that_is_asked_for(self):
        facts = self.facts(self.acquire_by_gss("--ccache", self.ccache, *self.sts.identity,
                                               "--bearer", "--json"))
        self.assertEqual("bearer", facts["confirmationType"])


class Refusals(KerberosTest):
    def assert_kerberos_fails(self, message, *options, **settings):
        self.assert_fails(self.acquire_by_gss(*options, **settings), BAD_CREDENTIALS,
                          "NegotiationException", message)

    def test_service_that_the_kdc_does_not_know(self):
        self.assert_kerberos_fails(
            "Cannot negotiate with the service 'HTTP@nowhere.example.test' using the credential "
            f"cache '{self.ccache}': {UNSPECIFIED}Server HTTP/nowhere.example.test@EXAMPLE.TEST "
            "not found in Kerberos database",
            "--ccache", self.ccache, "--service", "HTTP@nowhere.example.test")

    def test_ticket_of_another_service(self):
        self.assert_fails(
            self.acquire_by_gss("--ccache", self.ccache, "--service",
                                "krbtgt/EXAMPLE.TEST@EXAMPLE.TEST"),
            BAD_CREDENTIALS, "InvalidCredentialsException",
            f"Authentication failed: The negotiation has failed: {UNSPECIFIED}Request ticket "
            "server krbtgt/EXAMPLE.TEST@EXAMPLE.TEST not found in keytab (ticket kvno 1)")

    def test_no_cache(self):
        self.assert_kerberos_fails(
            f"Cannot use the credential cache '/no/such/cache': {NO_CREDENTIALS}"
            "No credentials cache found (filename: /no/such/cache)", "--ccache", "/no/such/cache")

    def test_no_default_cache(self):
        self.assert_kerberos_fails(
            f"Cannot use the default credentials: {NO_CREDENTIALS}No Kerberos credentials "
            "available (default cache: FILE:/no/such/cache)",
            environment={"KRB5CCNAME": "FILE:/no/such/cache"})

    def test_expired_ticket(self):
        expired = CredentialCache(self.ccache).expire(self.folder / "expired")
        self.assert_kerberos_fails(
            "Cannot negotiate with the service 'HTTP@127.0.0.1' using the credential cache "
            f"'{expired}': {UNSPECIFIED}Ticket expired", "--ccache", expired)

    def test_kdc_that_cannot_be_reached(self):
        configuration = self.write(
            "krb5.conf", "[libdefaults]\n udp_preference_limit = 1\n dns_lookup_kdc = false\n"
            "[realms]\n EXAMPLE.TEST = {\n  kdc = 127.0.0.1:1\n }\n")
        keytab = self.realm.alice_keytab
        self.assert_kerberos_fails(
            f"Cannot log on as 'alice@EXAMPLE.TEST' with the keytab '{keytab}': "
            "Cannot contact any KDC for realm 'EXAMPLE.TEST'",
            "--keytab", keytab, "--principal", "alice@EXAMPLE.TEST",
            environment={"KRB5_CONFIG": str(configuration)})

    def test_client_that_the_service_does_not_know(self):
        result = self.acquire_by_gss("--keytab", self.realm.mallory_keytab,
                                     "--principal", "mallory")
        self.assert_fails(result, BAD_CREDENTIALS, "InvalidCredentialsException",
                          "Authentication failed: The principal 'mallory@EXAMPLE.TEST' belongs to "
                          "no known user")

    def test_no_keytab(self):
        self.assert_kerberos_fails(
            "Cannot log on as 'alice' with the keytab '/no/keytab': "
            "Key table file '/no/keytab' not found",
            "--keytab", "/no/keytab", "--principal", "alice")

    def test_file_that_is_no_keytab(self):
        path = self.write("keytab", "no keytab\n")
        self.assert_kerberos_fails(
            f"Cannot log on as 'alice' with the keytab '{path}': "
            "Unsupported key table format version number",
            "--keytab", path, "--principal", "alice")

    def test_principal_that_is_not_in_the_keytab(self):
        keytab = self.realm.mallory_keytab
        self.assert_kerberos_fails(
            f"Cannot log on as 'alice' with the keytab '{keytab}': "
            "No key table entry found for alice@EXAMPLE.TEST",
            "--keytab", keytab, "--principal", "alice")

    def test_key_that_is_not_the_principals(self):
        keytab = self.folder / "other.keytab"
        run("ktutil", environment=self.realm.environment, stdin=(
            "addent -password -p alice -k 1 -e aes256-cts-hmac-sha1-96\nnot alices\n"
            f"wkt {keytab}\n"))
        self.assert_kerberos_fails(
            f"Cannot log on as 'alice' with the keytab '{keytab}': Decrypt integrity check failed",
            "--keytab", keytab, "--principal", "alice")

    def test_lifetime_that_is_not_positive(self):
        result = self.acquire_by_gss("--ccache", self.ccache, "--lifetime", "0",
                                     service=self.nowhere)
        self.assert_fails(result, USAGE, "InvalidArgumentException",
                          "Invalid argument : Token lifetime must be positive")

    def test_leaves_the_output_file_alone(self):
        out = self.write("token.xml", "older")
        result = self.acquire_by_gss("--ccache", "/no/such/cache", "--out", out)
        self.assertEqual(BAD_CREDENTIALS, result.code)
        self.assertEqual("older", out.read_text())

    def test_service_without_kerberos(self):
        sts = DevelopmentSts()
        self.addCleanup(sts.stop)
        self.assert_fails(
            self.acquire_by_gss("--ccache", self.ccache, service=sts.service_options),
            REFUSED, "SsoException", "Unexpected SOAP fault: wst:InvalidRequest; request failed.")

    def test_no_server(self):
        result = self.acquire_by_gss("--ccache", self.ccache, service=self.nowhere)
        self.assert_fails(result, COMMUNICATION, "HttpException",
                          "Cannot connect to 127.0.0.1 port 1: Connection refused.")

    def test_token_signed_by_another_than_the_trusted(self):
        result = self.acquire_by_gss("--ccache", self.ccache, service=[
            "--url", self.sts.url, "--ca", self.sts.ca, "--trust", self.sts.certificate])
        certificate = r"'[^']+' \(SHA-256 [0-9a-f]{64}\)"
        self.assert_fails_matching(
            result, REFUSED, "InvalidSignatureException",
            "Signature verification error. The signing certificate is not one of the "
            f"1 trusted certificates; the signature names {certificate}; trusted: {certificate}")


class Verbose(KerberosTest):
    def assert_secretless(self, text, ccache):
        for ticket in CredentialCache(ccache).tickets:
            self.assertNotIn(base64.b64encode(ticket).decode()[:40], text)
        # Fingerprints of certificates are none.
        self.assertNotRegex(re.sub("SHA-256 [0-9a-f]{64}", "", text), "[A-Za-z0-9+/]{40}")
        self.assertNotRegex(text, "<(?!unset>)")

    def test_writes_the_trace_lines_in_order_and_no_secret(self):
        result = self.acquire_by_gss("--verbose", "--ccache", self.ccache)
        self.assertEqual(DONE, result.code)
        self.assertRegex(result.out, DESCRIPTION)
        lines = operation_lines(result.err)
        patterns = [
            r"opId=(\S+) START operation SecurityTokenServiceImpl::AcquireTokenByGSS",
            r"Requested token with spec `TokenSpec \[.*'",
            r"Successfully acquired token: SamlToken \[.*\]",
            r"opId=(\S+) END operation SecurityTokenServiceImpl::AcquireTokenByGSS"]
        self.assertEqual(len(patterns), len(lines), result.err)
        for pattern, line in zip(patterns, lines):
            self.assertRegex(line, pattern + r"\Z")
        self.assert_secretless(result.err, self.ccache)

    def test_failure_stays_the_last_line(self):
        result = self.acquire_by_gss("--verbose", "--keytab", self.realm.mallory_keytab,
                                     "--principal", "mallory")
        lines = result.err.splitlines()
        self.assertRegex(lines[0], "START operation")
        self.assertRegex(lines[-2], "END operation")
        self.assertEqual("ssoclient: InvalidCredentialsException: Authentication failed: The "
                         "principal 'mallory@EXAMPLE.TEST' belongs to no known user", lines[-1])
        self.assert_secretless(result.err, self.ccache)


class Usage(ServiceTest):
    def assert_usage_error(self, message, *options, class_name="UsageError"):
        self.assert_fails(ssoclient("acquire", "gss", *self.nowhere, *options), USAGE, class_name,
                          message)

    def assert_misuse(self, message, *options):
        self.assert_misused(ssoclient("acquire", "gss", *self.nowhere, *options), "acquire gss",
                            message)

    def test_cache_and_keytab_exclude_each_other(self):
        self.assert_misuse("--ccache excludes --keytab", "--ccache", "c", "--keytab", "k",
                           "--principal", "p")
        self.assert_misuse("--ccache excludes --keytab", "--ccache", "c", "--keytab", "k")
        self.assert_misuse("--ccache excludes --principal", "--ccache", "c", "--principal", "p")

    def test_keytab_and_principal_need_each_other(self):
        self.assert_misuse("--keytab requires --principal", "--keytab", "k")
        self.assert_misuse("--principal requires --keytab", "--principal", "p")

    def test_key_and_certificate_need_each_other(self):
        self.assert_misuse("--key requires --cert", "--key", self.sts.key)
        self.assert_misuse("--cert requires --key", "--cert", self.sts.certificate)

    def test_name_that_is_no_service(self):
        for name in ("HTTP", "HTTP@", "@localhost", "HTTP/", "/localhost", "HTTP@a@b"):
            with self.subTest(name=name):
                self.assert_usage_error(
                    f"Invalid argument : The service name '{name}' is neither 'service@host' nor "
                    "'service/host' nor 'service/host@REALM'", "--service", name,
                    class_name="InvalidArgumentException")

    def test_output_file_that_cannot_be_written(self):
        self.assert_usage_error("cannot write `/no/such/token.xml': No such file or directory",
                                "--out", "/no/such/token.xml")


if __name__ == "__main__":
    unittest.main()
