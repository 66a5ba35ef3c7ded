"""`ssoclient acquire token` against the development STS."""

import unittest

from programs import COMMUNICATION, DATA, DONE, REFUSED, USAGE, ServiceTest

SERVICE_USER = "service@example.test"


class Exchange(ServiceTest):
    def test_own_token_for_another(self):
        own = self.token_file(self.acquire_by_certificate, "--delegable")
        facts = self.facts(self.exchange(own, "--json"))
        self.assertEqual({"name": "service", "domain": "example.test"}, facts["subject"])
        self.assertEqual("holder-of-key", facts["confirmationType"])
        self.assertIs(False, facts["delegable"])

    def test_delegates_the_token_of_another(self):
        alices = self.token_file(self.acquire, "--delegable")
        result = self.exchange(alices, "--delegate-to", SERVICE_USER)
        self.assertEqual((DONE, ""), (result.code, result.err))
        self.assertRegex(
            result.out,
            r"\ASamlToken \[subject=\{Name: alice; Domain:example\.test\}, groups=\[.+\], "
            r"delegationChain=\[\{Name: service; Domain:example\.test\} at \S+Z\], "
            r"startTime=\S+Z, expirationTime=\S+Z, renewable=false, delegable=false, "
            r"isSolution=false,confirmationType=1\]\n\Z")

    def test_delegation_chain_grows(self):
        token = self.token_file(self.acquire, "--delegable")
        for length in (1, 2):
            out = self.folder / f"delegated-{length}.xml"
            facts = self.facts(self.exchange(token, "--delegate-to", SERVICE_USER, "--delegable",
                                             "--json", "--out", out))
            self.assertEqual(length, len(facts["delegationChain"]))
            self.assertIs(True, facts["delegable"])
            token = out

    def test_bearer_if_it_is_asked_for(self):
        own = self.token_file(self.acquire_by_certificate)
        facts = self.facts(self.exchange(own, "--bearer", "--json"))
        self.assertEqual("bearer", facts["confirmationType"])

    def test_token_from_standard_input(self):
        own = self.token_file(self.acquire_by_certificate)
        self.facts(self.exchange("-", "--json", stdin=own.read_text("utf-8")))

    def test_passphrase_and_token_may_follow_each_other_on_standard_input(self):
        own = self.token_file(self.acquire_by_certificate)
        identity = ["--key", self.encrypted_key("key-secret"), "--cert", self.sts.certificate,
                    "--key-passphrase-file", "-"]
        self.facts(self.exchange("-", "--json", identity=identity,
                                 stdin="key-secret\n" + own.read_text("utf-8")))


class Refusals(ServiceTest):
    def test_token_that_may_not_be_delegated(self):
        alices = self.token_file(self.acquire)
        self.assert_fails_matching(self.exchange(alices, "--delegate-to", SERVICE_USER), REFUSED,
                                   "SsoException", "Unexpected SOAP fault: .+; request failed.")

    def test_key_that_the_token_is_not_bound_to(self):
        own = self.token_file(self.acquire_by_certificate)
        result = self.exchange(own, identity=["--key", DATA / "keys" / "client-key.pem", "--cert",
                                              DATA / "keys" / "client-cert.pem"])
        self.assert_fails_matching(result, REFUSED, "SsoException",
                                   "Unexpected SOAP fault: .+; request failed.")

    def test_changed_token_is_not_sent(self):
        own = self.token_file(self.acquire_by_certificate)
        self.assert_fails(self.exchange(self.changed(own), service=self.nowhere), REFUSED,
                          "InvalidSignatureException",
                          "Failed to verify signature: token might have been tampered with.")

    def test_missing_token_file(self):
        self.assert_fails(self.exchange("/no/such/file", service=self.nowhere), USAGE,
                          "UsageError", "cannot open `/no/such/file': No such file or directory")

    def test_lifetime_that_is_not_positive(self):
        own = self.token_file(self.acquire_by_certificate)
        self.assert_fails(self.exchange(own, "--lifetime", "0", service=self.nowhere), USAGE,
                          "InvalidArgumentException",
                          "Invalid argument : Token lifetime must be positive")

    def test_closed_port(self):
        own = self.token_file(self.acquire_by_certificate)
        self.assert_fails_matching(self.exchange(own, service=self.nowhere), COMMUNICATION,
                                   "HttpException", ".+")


if __name__ == "__main__":
    unittest.main()
