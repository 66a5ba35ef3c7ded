"""What `ssoclient` advises after a failure, and that every piece of advice has its failure."""

import ast
import base64
import email.utils
import hashlib
import pathlib
import re
import ssl
import time
import unittest
import urllib.parse

import lxml.etree

from programs import DATA, ServiceTest, run, ssoclient
from scripted import TRUST, ScriptedAndRealTest, ScriptedTest, fault

KEYS = DATA / "keys"
SOURCE = pathlib.Path(__file__).parents[3] / "tools" / "ssoclient" / "Hints.cpp"
SITUATIONS = pathlib.Path(__file__).parents[3] / "docs" / "situations.md"
MET = set()


def rows(name):
    """A table of the program: what a message holds, or its class, and the advice."""
    table = SOURCE.read_text("utf-8").partition(f" {name}[] = {{")[2].partition("\n};")[0]
    literal = r'"(?:[^"\\]|\\.)*"'
    found = [(ast.literal_eval(first), "".join(map(ast.literal_eval, re.findall(literal, rest))))
             for first, rest in re.findall(rf"\{{({literal}),\s*((?:{literal}\s*)+)(?:,\s*&\w+)?\}}",
                                      table)]
    assert len(found) == table.count("{"), "every row is read"
    return found


ROWS = rows("Hints")
CLASS_ROWS = rows("ClassHints")


class Hints(ScriptedAndRealTest):
    """Each case is a failure that a person can mend."""

    def assert_hint(self, result, row, fact=""):
        """The failure is followed by the advice of this row, with a fact that matches a pattern,
        and by nothing else."""
        advice = dict(ROWS)[row]
        MET.add(row)
        failure, hint = result.err.splitlines()
        self.assertIn(row, failure)
        self.assertRegex(hint, rf"\Assoclient: hint: {re.escape(advice)}{fact}\Z")
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
        for code in ("UnableToRenew", "InvalidRequest"):
            with self.subTest(code=code):
                self.assert_hint(self.scripted(fault(f"wst:{code}")), f"{code}; request failed.")
        self.assert_hint(self.scripted(fault("wst:FailedAuthentication")), "Authentication failed")

    def test_clocks(self):
        for code in ("ExpiredData", "MessageExpired"):
            for days, fact in ((-2, "this one is 2 d 0 h ahead"), (2, "this one is 1 d 23 h behind"),
                               (0, "they agree")):
                with self.subTest(code=code, days=days):
                    date = email.utils.formatdate(time.time() + days * 86400, usegmt=True)
                    self.assert_hint(self.scripted(fault(f"wst:{code}"), Date=date),
                                     f"{code}; request failed.", f"; by its reply {fact}")

    def test_clocks_that_the_reply_does_not_tell(self):
        self.assert_hint(self.scripted(fault("wst:ExpiredData"), Date="noon"),
                         "ExpiredData; request failed.")

    def test_web_page(self):
        not_xml = "Response is not well-formed XML: "
        self.assert_hint(self.scripted("<!DOCTYPE html><html></html>", status=200), not_xml)
        self.assert_hint(self.scripted("<html><input disabled></html>", status=200), not_xml)
        self.assert_hint(self.scripted("<html><body/></html>", status=200), "missing SAOP Body")

    def test_status(self):
        for status in (301, 302, 303, 307, 308):
            with self.subTest(status=status):
                self.assert_hint(self.scripted("", status=status, Location="https://h/\x1b[1m"),
                                 "Server returned error: 30",
                                 re.escape("; it leads to https://h/\\x1b[1m"))
        self.assert_hint(self.scripted("", status=304), "Server returned error: 30")
        self.assert_hint(self.scripted("", status=404), "Server returned error: 404")

    def test_tls_or_not(self):
        self.assert_hint(self.acquire_scripted(self.service.url.replace("http:", "https:")),
                         "wrong version number")
        self.assert_hint(self.acquire_with(url=self.sts.url.replace("https:", "http:")),
                         "without a reply")

    def shown_certificate(self):
        """What the server of the development STS shows, as OpenSSL tells it."""
        server = urllib.parse.urlsplit(self.sts.url)
        path = self.write("server.pem",
                          ssl.get_server_certificate((server.hostname, server.port)))
        def tell(*what):
            result = run("openssl", "x509", "-in", path, "-noout", "-nameopt", "RFC2253", *what)
            return result.out.strip()
        fingerprint = hashlib.sha256(ssl.PEM_cert_to_DER_cert(path.read_text("ascii"))).hexdigest()
        return (f"; the server shows the certificate of {tell('-subject')[8:]}, issued by "
                f"{tell('-issuer')[7:]} (SHA-256 {fingerprint})")

    def shown_pin(self):
        self.shown_certificate()
        pem = run("openssl", "x509", "-in", self.folder / "server.pem", "-noout", "-pubkey").out
        der = base64.b64decode("".join(pem.splitlines()[1:-1]))
        return "sha256//" + base64.b64encode(hashlib.sha256(der).digest()).decode()

    def test_authorities(self):
        fact = re.escape(self.shown_certificate())
        for service in ((), ("--ca", KEYS / "foreign-cert.pem"), ("--ca", self.sts.trust)):
            with self.subTest(service=service):
                self.assert_hint(self.acquire_with(*service), 'It must name "', fact)
        self.assert_hint(self.acquire_with("--ca", self.sts.ca, "--peer", "sts.example.com"),
                         "is refused: hostname mismatch", fact)
        self.assert_hint(
            self.acquire_with("--ca", self.sts.ca, "--peer", "sha256//" + "A" * 43 + "="),
            "is not the pinned one",
            re.escape("; the key that the server shows has " + self.shown_pin()))

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
        """Here, or where what is said in each situation is compared with its document."""
        told = re.findall(r"^ssoclient: (\w+): (.+)\nssoclient: hint: (.+)$",
                          SITUATIONS.read_text("utf-8"), re.MULTILINE)
        self.assertGreater(len(told), 60)
        self.assertEqual([], [
            row for row, advice in ROWS if row not in MET and not any(
                row in message and hint.startswith(advice) for _, message, hint in told)])
        self.assertEqual([], [
            row for row, advice in CLASS_ROWS
            if not any((row, advice) == (name, hint) for name, _, hint in told)])


if __name__ == "__main__":
    unittest.main()
