"""The example programs do what the documents say of them."""

import os
import unittest

from programs import DESCRIPTION, DONE, DevelopmentSts, ServiceTest, run
from realm import KerberosTest


class Examples(ServiceTest):
    def test_acquire_with_password(self):
        result = run(os.environ["ACQUIRE_EXAMPLE"], self.sts.url, self.sts.ca, self.sts.trust,
                     DevelopmentSts.USER, stdin=DevelopmentSts.PASSWORD + "\n")
        self.assertEqual((DONE, ""), (result.code, result.err))
        self.assertRegex(result.out, DESCRIPTION)

    def test_acquire_with_wrong_password(self):
        result = run(os.environ["ACQUIRE_EXAMPLE"], self.sts.url, self.sts.ca, self.sts.trust,
                     DevelopmentSts.USER, stdin="wrong\n")
        self.assertEqual((1, ""), (result.code, result.out))
        self.assertRegex(result.err, r"\AInvalidCredentialsException: .+\n\Z")

    def acquire_at_once(self, **passwords):
        users = [f"{name}@example.test" for name in passwords]
        return run(os.environ["ASYNC_EXAMPLE"], self.sts.url, self.sts.ca, self.sts.trust, *users,
                   stdin="".join(f"{password}\n" for password in passwords.values()))

    def test_acquire_async(self):
        result = self.acquire_at_once(alice="alice-secret", bob="bob-secret",
                                      service="service-secret")
        self.assertEqual((DONE, ""), (result.code, result.err))
        self.assertRegex(result.out, "\\A" + "".join(
            rf"{name}@example\.test: SamlToken \[subject=\{{Name: {name}; .+\]\n"
            for name in ("alice", "bob", "service")) + "\\Z")

    def test_acquire_async_shows_each_failure_in_its_place(self):
        result = self.acquire_at_once(alice="alice-secret", bob="wrong", nobody="wrong")
        self.assertEqual((1, ""), (result.code, result.err))
        self.assertRegex(
            result.out,
            r"\Aalice@example\.test: SamlToken \[subject=\{Name: alice; .+\]\n"
            r"bob@example\.test: InvalidCredentialsException: .+\n"
            r"nobody@example\.test: InvalidCredentialsException: .+\n\Z")

    def keep_token(self, password):
        path = self.folder / "password"
        path.write_text(password + "\n", "utf-8")
        return run(os.environ["KEEP_EXAMPLE"], self.sts.url, self.sts.ca, self.sts.trust,
                   DevelopmentSts.USER, path, stdin="one\ntwo\n")

    def test_keep_token(self):
        result = self.keep_token(DevelopmentSts.PASSWORD)
        self.assertEqual(DONE, result.code)
        self.assertRegex(result.err, r"\Aa token, good until \S+Z\n\Z")
        first, second = result.out.splitlines(keepends=True)
        self.assertEqual(first, second)
        self.assertRegex(first, DESCRIPTION)

    def test_keep_token_asks_once_with_a_wrong_password(self):
        result = self.keep_token("wrong")
        self.assertEqual(DONE, result.code)
        self.assertEqual(1, result.err.count("no new token: "))
        self.assertRegex(result.out, r"\A(There is no token; attempts have failed since \S+, the next"
                                     r" one is at \S+: InvalidCredentialsException: .+\n){2}\Z")

    def test_inspect_file(self):
        out = self.folder / "token.xml"
        self.assert_done(self.acquire("--out", out))
        result = run(os.environ["INSPECT_EXAMPLE"], out, self.sts.trust)
        self.assertEqual((DONE, ""), (result.code, result.err))
        self.assertRegex(result.out, DESCRIPTION)


class WithKerberos(KerberosTest):
    def run_example(self, *arguments, **environment):
        return run(os.environ["KERBEROS_EXAMPLE"], self.sts.url, self.sts.ca, self.sts.trust,
                   *arguments, environment={**self.realm.environment, **environment})

    def test_acquires_with_the_default_cache(self):
        self.assert_done(self.run_example(KRB5CCNAME=f"FILE:{self.ccache}"))

    def test_acquires_with_a_keytab(self):
        self.assert_done(self.run_example(self.realm.alice_keytab, "alice"))

    def test_says_that_there_is_no_ticket(self):
        result = self.run_example(KRB5CCNAME="FILE:/no/such/cache")
        self.assertEqual((1, ""), (result.code, result.out))
        self.assertRegex(result.err,
                         r"\ANegotiationException: Cannot use the default credentials: .+\n\Z")


if __name__ == "__main__":
    unittest.main()
