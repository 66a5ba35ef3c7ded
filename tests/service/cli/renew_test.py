"""`ssoclient renew` against the development STS."""

import unittest

from programs import COMMUNICATION, DATA, DONE, REFUSED, USAGE, ServiceTest, ssoclient


class Renew(ServiceTest):
    def renew(self, token, *options, service=None, identity=None, lifetime=900, stdin=""):
        return ssoclient("renew", *(service or self.sts.service_options), "--token", token,
                         "--lifetime", lifetime, *(identity or self.sts.identity), *options,
                         stdin=stdin)

    def renewable_token(self):
        return self.token_file(self.acquire_by_certificate, "--renewable")

    def test_prints_the_redacted_description(self):
        result = self.renew(self.renewable_token())
        self.assertEqual((DONE, ""), (result.code, result.err))
        self.assertRegex(
            result.out,
            r"\ASamlToken \[subject=\{Name: service; Domain:example\.test\}, groups=\[.+\], "
            r"delegationChain=\[\], startTime=\S+Z, expirationTime=\S+Z, renewable=true, "
            r"delegable=false, isSolution=true,confirmationType=1\]\n\Z")

    def test_token_lives_longer(self):
        token = self.renewable_token()
        before = self.facts(ssoclient("inspect", token, "--trust", self.sts.trust, "--json"))
        after = self.facts(self.renew(token, "--json"))
        self.assertGreater(after["expirationTime"], before["expirationTime"])

    def test_writes_another_assertion(self):
        token = self.renewable_token()
        out = self.folder / "renewed.xml"
        self.facts(self.renew(token, "--json", "--out", out))
        self.assertEqual(0o600, out.stat().st_mode & 0o777)
        self.assertNotEqual(token.read_text("utf-8"), out.read_text("utf-8"))
        self.facts(ssoclient("inspect", out, "--trust", self.sts.trust, "--json"))

    def test_token_from_standard_input(self):
        token = self.renewable_token()
        self.facts(self.renew("-", "--json", stdin=token.read_text("utf-8")))

    def test_token_that_is_not_renewable(self):
        token = self.token_file(self.acquire_by_certificate)
        self.assert_fails(self.renew(token), REFUSED, "SsoException",
                          "Unexpected SOAP fault: wst:UnableToRenew; request failed.")

    def test_key_that_the_token_is_not_bound_to(self):
        result = self.renew(self.renewable_token(), identity=[
            "--key", DATA / "keys" / "client-key.pem", "--cert", DATA / "keys" / "client-cert.pem"])
        self.assert_fails(result, REFUSED, "SsoException",
                          "Unexpected SOAP fault: wst:UnableToRenew; request failed.")

    def test_bearer_token_is_not_sent(self):
        token = self.token_file(self.acquire, "--renewable")
        self.assert_fails(
            self.renew(token, service=self.nowhere), USAGE, "InvalidArgumentException",
            "Invalid argument : Unable to renew token: the provided token must be Holder Of Key")

    def test_changed_token_is_not_sent(self):
        token = self.changed(self.renewable_token())
        self.assert_fails(self.renew(token, service=self.nowhere), REFUSED,
                          "InvalidSignatureException",
                          "Failed to verify signature: token might have been tampered with.")

    def test_lifetime_that_is_not_positive(self):
        token = self.renewable_token()
        for lifetime in (0, -1):
            with self.subTest(lifetime=lifetime):
                self.assert_fails(
                    self.renew(token, lifetime=lifetime, service=self.nowhere), USAGE,
                    "InvalidArgumentException",
                    "Invalid argument : Token lifetime must be positive")

    def test_closed_port(self):
        self.assert_fails_matching(self.renew(self.renewable_token(), service=self.nowhere),
                                   COMMUNICATION, "HttpException", ".+")


if __name__ == "__main__":
    unittest.main()
