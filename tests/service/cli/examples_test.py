"""The example programs do what the documents say of them."""

import os
import unittest

import expositions
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

    def observe(self, example, password):
        return run(os.environ[example], self.sts.url, self.sts.ca, self.sts.trust,
                   DevelopmentSts.USER, stdin=password + "\n")

    def metrics(self, result):
        """The counts; the sums of durations differ each time."""
        return {name: value for name, value in expositions.parse(result.out).items()
                if "_seconds_sum" not in name and "_bucket" not in name}

    def test_observe_with_prometheus(self):
        result = self.observe("PROMETHEUS_EXAMPLE", DevelopmentSts.PASSWORD)
        self.assertEqual((DONE, ""), (result.code, result.err))
        self.assertEqual({
            'sso_operations_total{failure="",operation="AcquireToken"}': 1,
            'sso_exchange_seconds_count{connection="new",operation="AcquireToken"}': 1,
            'sso_refreshes_total{failure="",how="acquisition"}': 1,
            'sso_cache_look_ups_total{cache="TokenVerifier",outcome="hit"}': 1,
            'sso_cache_look_ups_total{cache="TokenVerifier",outcome="miss"}': 1,
        }, self.metrics(result))

    def test_observe_with_prometheus_a_refusal(self):
        result = self.observe("PROMETHEUS_EXAMPLE", "wrong")
        self.assertEqual(1, result.code)
        self.assertRegex(result.err, r"NoTokenException: .+InvalidCredentialsException")
        failure = 'failure="InvalidCredentialsException"'
        self.assertEqual({
            f'sso_operations_total{{{failure},operation="AcquireToken"}}': 1,
            'sso_faults_total{operation="AcquireToken"}': 1,
            'sso_exchange_seconds_count{connection="new",operation="AcquireToken"}': 1,
            f'sso_refreshes_total{{{failure},how="acquisition"}}': 1,
        }, self.metrics(result))

    def assert_lines(self, result, *patterns):
        begin = r"\[[\d-]+ [\d:.]+\] \[sso\] "
        self.assertRegex(result.err, "\\A" + "".join(f"{begin}{line}\n" for line in patterns) + "\\Z")

    def test_observe_with_spdlog(self):
        result = self.observe("SPDLOG_EXAMPLE", DevelopmentSts.PASSWORD)
        self.assertEqual(DONE, result.code)
        self.assertRegex(result.out, DESCRIPTION)
        self.assert_lines(
            result, r"\[info\] (\S+) AcquireToken begins",
            r"\[info\] \1 127\.0\.0\.1 port \d+: HTTP status 200 after \d+ us, \d{3,} octets sent, "
            r"\d{4,} received, TLSv1\.3, new connection", r"\[info\] \1 done after \d+ us")

    def test_observe_with_spdlog_a_refusal(self):
        result = self.observe("SPDLOG_EXAMPLE", "wrong")
        self.assertEqual((1, ""), (result.code, result.out))
        lines, _, last = result.err.rstrip("\n").rpartition("\n")
        self.assertRegex(last, r"\AInvalidCredentialsException: ")
        self.assertRegex(lines, r"\[warning\] \S+ fault \S+: .+\n.+\[error\] \S+ failed: "
                         r"InvalidCredentialsException\Z")

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
