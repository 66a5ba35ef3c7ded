"""`ssoclient inspect` on the test tokens, which independent tools made and signed."""

import datetime
import hashlib
import json
import os
import pathlib
import re
import ssl
import stat
import subprocess
import time
import unittest

import lxml.etree
import lxml.html

from programs import (DATA, DONE, OUT_OF_VALIDITY, REFUSED, SSOCLIENT, ProgramTest, ServiceTest,
                      ssoclient)
from terminals import TerminalTest

TOKENS = DATA / "tokens"
# The tokens are of other years; this tolerance takes the clock out of the test.
ANY_TIME = ("--clock-tolerance", "3153600000")


def entries(tables):
    """The tokens of some tables that depend neither on the time nor on an empty list of trusted
    certificates, which the command line cannot give; with what is expected of them."""
    found = [entry | {"file": table.with_name(entry["file"])}
             for table in sorted(TOKENS.glob(tables))
             for entry in json.loads(table.read_text("utf-8"))["tokens"]
             if "now" not in entry and entry.get("trust") != []
             and "The token has expired" not in str(entry.get("refusals"))]
    assert len(found) > 50
    return found


def trust(entry):
    return ["--trust", *(DATA / "keys" / f"{key}-cert.pem" for key in entry.get("trust", ["sts"]))]


def text_of(micros):
    time = datetime.datetime(1970, 1, 1) + datetime.timedelta(microseconds=micros)
    digits = 3 if micros % 1000 == 0 else 6
    return time.strftime("%Y-%m-%dT%H:%M:%S.%f")[:20 + digits] + "Z"


def principal(pair):
    return {"name": pair[0], "domain": pair[1]}


def fingerprint(name):
    der = ssl.PEM_cert_to_DER_cert((DATA / "keys" / f"{name}-cert.pem").read_text("ascii"))
    return hashlib.sha256(der).hexdigest()


def certificate(name):
    if name is None:
        return None
    subject = subprocess.run(
        ["openssl", "x509", "-in", DATA / "keys" / f"{name}-cert.pem", "-noout", "-subject",
         "-nameopt", "RFC2253"], capture_output=True, text=True, check=True).stdout
    return {"subject": subject.removeprefix("subject=").strip(), "sha256": fingerprint(name)}


def issuer(file):
    namespace = "{urn:oasis:names:tc:SAML:2.0:assertion}"
    element = lxml.etree.parse(str(file)).getroot().find(f"{namespace}Issuer")
    return "" if element is None else "".join(element.xpath("text()"))


def json_of(facts, file):
    return {
        "subject": principal(facts["subject"]),
        "groups": [principal(group) for group in facts["groups"]],
        "delegationChain": [
            {"subject": principal((name, domain)), "delegationDate": text_of(micros)}
            for name, domain, micros in facts["delegationChain"]],
        "startTime": text_of(facts["startMicros"]),
        "expirationTime": text_of(facts["endMicros"]),
        "renewable": facts["renewable"],
        "delegable": facts["delegable"],
        "isSolution": facts["solution"],
        "confirmationType": facts["confirmation"],
        "id": facts["id"],
        "issuer": issuer(file),
        "audience": facts["audience"],
        "advice": [
            {"source": advice["source"],
             "attributes": [{"name": name, "values": values}
                            for name, values in advice["attributes"]]}
            for advice in facts["advice"]],
        "confirmationCertificate": certificate(facts.get("certificate")),
    }


class AcceptedTokens(ProgramTest):
    def test_print_their_facts(self):
        for entry in entries("accepted/expected.json"):
            with self.subTest(token=entry["file"]):
                result = ssoclient("inspect", entry["file"], *trust(entry), *ANY_TIME, "--json")
                self.assertEqual((DONE, ""), (result.code, result.err))
                self.assertEqual(json_of(entry["facts"], entry["file"]), json.loads(result.out))


class RefusedTokens(ProgramTest):
    def test_name_the_class_and_the_reason(self):
        for entry in entries("refused/*/expected.json"):
            with self.subTest(token=entry["file"]):
                result = ssoclient("inspect", entry["file"], *trust(entry), *ANY_TIME)
                self.assertEqual((REFUSED, ""), (result.code, result.out))
                self.assertEqual(1, result.err.count("\n"))
                self.assertTrue(any(self.says(result.err, refusal)
                                    for refusal in entry["refusals"]), result.err)

    @staticmethod
    def says(line, refusal):
        if refusal["class"] == "Quillon::Exception":  # any class of the foundation's
            return re.match(r"ssoclient: \w+Exception: ", line) is not None
        start = f"ssoclient: {refusal['class'].rpartition('::')[2]}: "
        text = refusal.get("message", refusal.get("prefix", "")).replace("\\", "\\\\")
        if "message" in refusal:
            return line == f"{start}{text}\n"
        return line.startswith(start + text)


class Inspect(ProgramTest):
    TOKEN = TOKENS / "accepted" / "bearer.xml"
    TRUST = ("--trust", DATA / "keys" / "sts-cert.pem")

    def test_prints_the_redacted_description(self):
        result = ssoclient("inspect", self.TOKEN, *self.TRUST, *ANY_TIME)
        self.assertEqual((DONE, ""), (result.code, result.err))
        self.assertEqual(
            "SamlToken [subject={Name: user; Domain:example.com}, "
            "groups=[{Name: Users; Domain:example.com}], delegationChain=[], "
            "startTime=2026-01-01T00:00:00.000Z, expirationTime=2026-12-31T00:00:00.000Z, "
            "renewable=false, delegable=false, isSolution=false,confirmationType=0]\n", result.out)

    def test_reads_standard_input(self):
        result = ssoclient("inspect", "-", *self.TRUST, *ANY_TIME,
                           stdin=self.TOKEN.read_text("utf-8"))
        self.assertEqual((DONE, ""), (result.code, result.err))
        self.assertRegex(result.out, r"\ASamlToken \[")

    def test_file_may_stand_last(self):
        result = ssoclient("inspect", *ANY_TIME, *self.TRUST, self.TOKEN)
        self.assertEqual((DONE, ""), (result.code, result.err))

    def test_tells_a_foreign_signature(self):
        result = ssoclient("inspect", self.TOKEN, "--trust", DATA / "keys" / "foreign-cert.pem",
                           *ANY_TIME)
        self.assert_fails_matching(result, REFUSED, "InvalidSignatureException", ".+")

    def test_tells_a_changed_byte(self):
        text = self.TOKEN.read_text("utf-8")
        self.assertEqual(1, text.count("Users"))
        result = ssoclient("inspect", "-", *self.TRUST, *ANY_TIME,
                           stdin=text.replace("Users", "User5"))
        self.assert_fails(result, REFUSED, "InvalidSignatureException",
                          "Failed to verify signature: token might have been tampered with.")

    def test_the_clock_counts_unless_it_is_told_otherwise(self):
        token = TOKENS / "accepted" / "clock-start-equals-now.xml"
        self.assert_fails(ssoclient("inspect", token, *self.TRUST), OUT_OF_VALIDITY,
                          "ParseException", "The token has expired at: 2026-06-15T13:00:00.000Z")
        result = ssoclient("inspect", token, *self.TRUST, *ANY_TIME)
        self.assertEqual((DONE, ""), (result.code, result.err))

    def test_oversized_token_is_refused_by_the_library(self):
        text = f"<a>{'x' * 30_000_000}</a>"
        result = ssoclient("inspect", "-", *self.TRUST, stdin=text)
        self.assert_fails_matching(result, REFUSED, "XMLParseException", ".+")


class Confined(ProgramTest):
    """What looks at a token opens nothing any more."""

    COMMAND = ("inspect", Inspect.TOKEN, "--trust", DATA / "keys" / "sts-cert.pem", *ANY_TIME)

    def setUp(self):
        super().setUp()
        notice = ssoclient(*self.COMMAND, "--verbose").err
        if notice:
            self.assertRegex(notice, r"\Assoclient: the token is read without a filter of system "
                                     r"calls: .+\n\Z")
            self.skipTest(notice)

    def filter_of(self, *options):
        """As the system has it while the process waits for somebody to read what it writes."""
        reading, writing = os.pipe()
        os.set_blocking(writing, False)
        with self.assertRaises(BlockingIOError):
            while True:
                os.write(writing, b" " * 4096)
        os.set_blocking(writing, True)
        command = [SSOCLIENT, *self.COMMAND, *options]
        with subprocess.Popen(list(map(str, command)), stdout=writing) as process:
            os.close(writing)
            deadline = time.monotonic() + 20
            found = "0"
            while found == "0" and time.monotonic() < deadline:
                status = pathlib.Path(f"/proc/{process.pid}/status").read_text("ascii")
                found = re.search(r"^Seccomp:\s+(\d)$", status, re.MULTILINE)[1]
            with open(reading, "rb") as output:
                output.read()
        self.assertEqual(DONE, process.returncode)
        return found

    def test_by_a_filter_of_system_calls(self):
        self.assertEqual("2", self.filter_of())

    def test_also_with_other_outputs(self):
        for options in (("--json",), ("--explain",), ("--general",),
                        ("--html", self.folder / "page.html")):
            with self.subTest(options=options):
                self.assertEqual("2", self.filter_of(*options))
        self.assertTrue((self.folder / "page.html").is_file())


class Explained(ProgramTest):
    """Lines for a person follow the description."""

    TRUST = ("--trust", DATA / "keys" / "foreign-cert.pem", DATA / "keys" / "sts-cert.pem")

    def lines(self, file, *options):
        described = ssoclient("inspect", file, *self.TRUST, *ANY_TIME)
        result = ssoclient("inspect", file, *self.TRUST, *ANY_TIME, "--explain", *options)
        self.assertEqual((DONE, ""), (result.code, result.err))
        self.assertTrue(result.out.startswith(described.out))
        return dict(re.split(r":\s+", line.strip(), maxsplit=1)
                    for line in result.out.removeprefix(described.out).splitlines())

    @staticmethod
    def named(name):
        return "{subject} (SHA-256 {sha256})".format(**certificate(name))

    def test_token_with_everything(self):
        lines = self.lines(TOKENS / "accepted" / "everything.xml")
        self.assertEqual(
            ["validity", "signed by", "issuer", "confirmation", "audience", "delegation"],
            list(lines))
        self.assertEqual(self.named("sts"), lines["signed by"])
        self.assertEqual(issuer(TOKENS / "accepted" / "everything.xml"), lines["issuer"])
        self.assertEqual(f"holder of the key of {self.named('client')}", lines["confirmation"])
        self.assertEqual("https://a.example, https://b.example.com", lines["audience"])
        self.assertEqual(
            "user@example.com -> first@example.com (2026-01-01T01:00:00.000Z) -> "
            "second@example.com (2026-01-01T02:00:00.000Z) -> "
            "third@other.example (2026-01-01T03:00:00.000Z)", lines["delegation"])

    def test_bearer_token(self):
        lines = self.lines(TOKENS / "accepted" / "bearer.xml")
        self.assertEqual("bearer: whoever has the token is its subject", lines["confirmation"])
        self.assertEqual(("anyone", "none"), (lines["audience"], lines["delegation"]))

    def test_token_that_has_expired_within_the_tolerance(self):
        lines = self.lines(TOKENS / "accepted" / "clock-start-equals-now.xml")
        self.assertRegex(lines["validity"],
                         r"\Aended \d+ d \d+ h ago, which the clock tolerance allows\Z")

    def test_only_if_they_are_asked_for(self):
        file = TOKENS / "accepted" / "bearer.xml"
        for options in (("--json",), ("--quiet",)):
            with self.subTest(options=options):
                self.assertEqual(
                    ssoclient("inspect", file, *self.TRUST, *ANY_TIME, *options),
                    ssoclient("inspect", file, *self.TRUST, *ANY_TIME, "--explain", *options))


class ExplainedAtATerminal(TerminalTest):
    def test_validity_that_is_left(self):
        token = self.token_file(self.acquire)
        process = self.start_with_terminal_output("inspect", token, "--trust", self.sts.trust)
        self.assertEqual("", process.communicate(timeout=120)[1])
        self.assertRegex(
            self.read_what_is_there().decode(),
            r"\ASamlToken \[.*\]\r\n  validity:     (5 min 0 s|4 min \d+ s) left, until \S+Z\r\n"
            r"  signed by:    .+\r\n")


class Page(ServiceTest):
    def test_is_one_that_a_browser_reads(self):
        token = self.token_file(self.acquire, "--audience", "urn:a&b<c>", "urn:d")
        page = self.folder / "page.html"
        result = ssoclient("inspect", token, "--trust", self.sts.trust, "--html", page)
        self.assert_done(result)
        self.assertEqual(0o600, stat.S_IMODE(page.stat().st_mode))
        tree = lxml.html.document_fromstring(page.read_bytes())
        facts = {name.text_content(): name.getnext() for name in tree.iter("dt")}
        self.assertEqual(["urn:a&b<c>", "urn:d"],
                         [item.text_content() for item in facts["audience"].iter("li")])
        self.assertRegex(facts["validity"].text_content(), "^(4 min 5\d|5 min 0) s left")
        self.assertIn("CN=SsoClient development STS", facts["signed by"].text_content())
        self.assertEqual([], tree.xpath("//script | //link | //img | //@src | //@href"))

    def test_passage_of_a_file_that_is_refused_is_shown(self):
        for options, lines in (((), 1), (("--explain",), 3), (("--explain", "--json"), 1)):
            with self.subTest(options=options):
                result = ssoclient("inspect", "-", "--trust", self.sts.trust, *options,
                                   stdin="<a>\n  <b x=1/>\n</a>")
                self.assertEqual(REFUSED, result.code)
                self.assertEqual(lines, result.err.count("\n"))
                self.assertEqual(lines == 3, result.err.endswith(
                    "\nssoclient: passage:   <b x=[here]1/>\n"))

    def test_there_is_none_of_a_token_that_is_refused(self):
        token = self.changed(self.token_file(self.acquire_by_certificate))
        page = self.folder / "page.html"
        result = ssoclient("inspect", token, "--trust", self.sts.trust, "--html", page)
        self.assertEqual(REFUSED, result.code)
        self.assertFalse(page.exists())


if __name__ == "__main__":
    unittest.main()
