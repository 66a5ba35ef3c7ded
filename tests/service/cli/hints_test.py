"""What `ssoclient` advises after a failure, and that every piece of advice has its failure."""

import ast
import pathlib
import re
import unittest

import lxml.etree

from programs import DATA, ServiceTest, run, ssoclient
from scripted import TRUST, ScriptedAndRealTest, ScriptedTest, fault

KEYS = DATA / "keys"
SOURCE = pathlib.Path(__file__).parents[3] / "tools" / "ssoclient" / "Hints.cpp"
MET = set()


def rows():
    """The table of the program: what a message holds, and the advice."""
    table = SOURCE.read_text("utf-8").partition("Hints[] = {")[2].partition("\n};")[0]
    literal = r'"(?:[^"\\]|\\.)*"'
    found = [(ast.literal_eval(first), "".join(map(ast.literal_eval, re.findall(literal, rest))))
             for first, rest in re.findall(rf"\{{({literal}),\s*((?:{literal}\s*)+)\}}", table)]
    assert len(found) == table.count("{"), "every row is read"
    return found


ROWS = rows()


class Hints(ScriptedAndRealTest):
    """Each case is a failure that a person can mend."""

    def assert_hint(self, result, row):
        """The failure is followed by the advice of this row, and by nothing else."""
        advice = dict(ROWS)[row]
        MET.add(row)
        failure, hint = result.err.splitlines()
        self.assertIn(row, failure)
        self.assertEqual(f"ssoclient: hint: {advice}", hint)
        self.assertEqual("", result.out)
        self.assertNotEqual(0, result.code)

    def scripted(self, body, **others):
        self.service.say(body, **others)
        return self.acquire_scripted()

    def acquire_scripted(self, url=None):
        return ssoclient("acquire", "password", "--url", url or self.service.url, "--trust", TRUST,
                         "--user", "u", "--password-file", self.password, "--explain")

    def acquire_with(self, *service, trust=None, url=None):
        return ServiceTest.acquire(
            self, "--explain",
            service=["--url", url or self.sts.url, "--trust", trust or self.sts.trust, *service])

    def test_faults(self):
        for code in ("ExpiredData", "MessageExpired", "UnableToRenew", "InvalidRequest"):
            with self.subTest(code=code):
                self.assert_hint(self.scripted(fault(f"wst:{code}")), f"{code}; request failed.")
        self.assert_hint(self.scripted(fault("wst:FailedAuthentication")), "Authentication failed")

    def test_web_page(self):
        not_xml = "Response is not well-formed XML: "
        self.assert_hint(self.scripted("<!DOCTYPE html><html></html>", status=200), not_xml)
        self.assert_hint(self.scripted("<html><input disabled></html>", status=200), not_xml)
        self.assert_hint(self.scripted("<html><body/></html>", status=200), "missing SAOP Body")

    def test_status(self):
        for status in (301, 302, 303, 307, 308):
            with self.subTest(status=status):
                self.assert_hint(self.scripted("", status=status, Location="https://h/"),
                                 "Server returned error: 30")
        self.assert_hint(self.scripted("", status=404), "Server returned error: 404")

    def test_tls_or_not(self):
        self.assert_hint(self.acquire_scripted(self.service.url.replace("http:", "https:")),
                         "wrong version number")
        self.assert_hint(self.acquire_with(url=self.sts.url.replace("https:", "http:")),
                         "without a reply")

    def test_authorities(self):
        for service in ((), ("--ca", KEYS / "foreign-cert.pem"), ("--ca", self.sts.trust)):
            with self.subTest(service=service):
                self.assert_hint(self.acquire_with(*service), 'It must name "')
        self.assert_hint(self.acquire_with("--ca", self.sts.ca, "--peer", "sts.example.com"),
                         "is refused: hostname mismatch")
        self.assert_hint(
            self.acquire_with("--ca", self.sts.ca, "--peer", "sha256//" + "A" * 43 + "="),
            "is not the pinned one")

    def test_trust(self):
        self.assert_hint(self.acquire_with("--ca", self.sts.ca, trust=self.sts.ca),
                         "is not one of the")

    def openssl(self, *arguments):
        result = run("openssl", *arguments)
        self.assertEqual(0, result.code, result.err)

    def test_certificate_in_another_form(self):
        der = self.folder / "c.der"
        self.openssl("x509", "-in", TRUST, "-outform", "DER", "-out", der)
        store = self.folder / "c.p12"
        self.openssl("pkcs12", "-export", "-nokeys", "-in", TRUST, "-passout", "pass:", "-out",
                     store)
        for file in (der, store):
            with self.subTest(file=file.name):
                self.assert_hint(self.acquire_with(trust=file),
                                 "The PEM text holds no certificate")

    def with_key(self, key, *options):
        return self.acquire_by_certificate(
            "--explain", *options, service=self.nowhere,
            identity=["--key", key, "--cert", self.sts.certificate])

    def test_key(self):
        self.assert_hint(self.with_key("pkcs11:token=t"), "Cannot open 'pkcs11:")
        store = self.folder / "k.p12"
        self.openssl("pkcs12", "-export", "-in", self.sts.certificate, "-inkey", self.sts.key,
                     "-passout", "pass:", "-out", store)
        self.assert_hint(self.with_key(store), "Cannot read the private key: ")
        passphrase = self.write("passphrase", "wrong\n")
        self.assert_hint(
            self.with_key(self.encrypted_key("right"), "--key-passphrase-file", passphrase),
            "the passphrase is wrong")

    def inspect(self, text):
        return ssoclient("inspect", "-", "--trust", self.sts.trust, "--explain", stdin=text)

    def test_pretty_printed_token(self):
        token = self.token_file(lambda *options: ServiceTest.acquire(self, *options))
        tree = lxml.etree.parse(str(token))
        lxml.etree.indent(tree)
        self.assert_hint(self.inspect(lxml.etree.tostring(tree, encoding="unicode")),
                         "token might have been tampered with")
        self.assert_hint(self.inspect(token.read_text("utf-8").replace("><", ">\n<")),
                         "Signature syntax error: ")

    def test_validity(self):
        tokens = DATA / "tokens" / "accepted"
        self.assert_hint(
            ssoclient("inspect", tokens / "clock-start-equals-now.xml", "--trust", TRUST,
                      "--explain"), "The token has expired at: ")
        # The validity is looked at before the signature.
        text = (tokens / "bearer.xml").read_text("utf-8").replace('"2026-', '"2126-')
        self.assert_hint(self.inspect(text), "Token start date is in the future: ")

    def test_ticket(self):
        self.assert_hint(
            ssoclient("acquire", "gss", *self.sts.service_options, "--explain",
                      environment={"KRB5CCNAME": f"FILE:{self.folder}/none"}),
            "Cannot use the default credentials")

    def test_is_in_json(self):
        self.service.say(fault("wst:UnableToRenew"))
        result = ScriptedTest.acquire(self, "--json")
        self.assertIn(dict(ROWS)["UnableToRenew; request failed."], result.err)
        self.assertEqual(1, result.err.count("\n"))

    def test_is_kept_from_scripts(self):
        self.service.say(fault("wst:UnableToRenew"))
        self.assert_fails(ScriptedTest.acquire(self), 1, "SsoException",
                          "Unexpected SOAP fault: wst:UnableToRenew; request failed.")

    def test_zz_every_row_is_met(self):
        self.assertEqual([], [row for row, _ in ROWS if row not in MET])


if __name__ == "__main__":
    unittest.main()
