"""`ssoclient inspect --general` on assertions of many producers, which other tools made."""

import json
import re
import sys
import time
import unittest

from programs import DATA, DONE, REFUSED, USAGE, ProgramTest, run, ssoclient
from scripted import ScriptedTest

ASSERTIONS = DATA / "assertions"
ENCRYPTED = DATA / "encrypted"
sys.path.append(str(ASSERTIONS))

sys.path.append(str(ENCRYPTED))

from assertiongen import assertion, names  # noqa: E402
from encryptedgen import document  # noqa: E402

KEYS = ("sts", "sts-second", "sts-p256", "sts-p384", "sts-p521")
TRUST = ["--trust", *(DATA / "keys" / f"{key}-cert.pem" for key in KEYS)]
# The assertions are of other years; this tolerance takes the clock out of the test.
ANY_TIME = ("--clock-tolerance", "3153600000")


def inspect(name, *options):
    return ssoclient("inspect", ASSERTIONS / name, *TRUST, *ANY_TIME, *options)


def all_rows():
    return json.loads((ASSERTIONS / "expected.json").read_text("utf-8"))["assertions"]


def accepted_rows():
    """Those that are accepted by any rules, or by none but the audience."""
    return [row for row in all_rows() if row["file"].startswith("accepted/")
            and set(row.get("rules", {})) <= {"audience"}]


def row_of(name):
    return next(row for row in all_rows() if row["file"] == name)


def leaves(facts):
    """Every text of the expected facts that is no time."""
    if isinstance(facts, dict):
        return [leaf for value in facts.values() for leaf in leaves(value)]
    if isinstance(facts, list):
        return [leaf for value in facts for leaf in leaves(value)]
    return [facts] if isinstance(facts, str) else []


class General(ProgramTest):
    def test_every_text_of_every_assertion_is_told(self):
        count = 0
        for row in accepted_rows():
            with self.subTest(file=row["file"]):
                result = inspect(row["file"], "--general", "--json")
                self.assertEqual((DONE, ""), (result.code, result.err))
                told = json.dumps(leaves(json.loads(result.out)))
                expected = dict(row["facts"], confirmations=[
                    dict(each, keys=[]) for each in row["facts"]["confirmations"]])
                for text in leaves(expected):
                    self.assertIn(json.dumps(text), told)
                    count += 1
        self.assertGreater(count, 300)

    def test_every_fact_has_its_line(self):
        lines = inspect("accepted/shibboleth-rsa.xml", "--general").out.splitlines()
        facts = dict(line.split(": ", 1) for line in lines)
        self.assertEqual(len(lines), len(facts))
        row = row_of("accepted/shibboleth-rsa.xml")
        self.assertEqual(row["facts"]["subject"]["spNameQualifier"],
                         facts["subject.spNameQualifier"])
        self.assertEqual(row["facts"]["confirmations"][0]["address"],
                         facts["confirmations[0].address"])
        self.assertEqual("0", facts["acceptedConfirmation"])

    def test_restrictions_stay_apart(self):
        told = json.loads(inspect("accepted/disjoint-audiences.xml", "--general", "--json").out)
        row = row_of("accepted/disjoint-audiences.xml")
        self.assertEqual(row["facts"]["conditions"]["audiences"],
                         told["conditions"]["audienceRestrictions"])
        self.assertGreater(len(told["conditions"]["audienceRestrictions"]), 1)

    def test_without_general_it_is_refused(self):
        result = inspect("accepted/adfs-rsa.xml")
        self.assertEqual((REFUSED, ""), (result.code, result.out))

    def test_audience_and_recipient_must_be_named(self):
        name = "accepted/adfs-rsa.xml"
        self.assertEqual(
            DONE, inspect(name, "--audience", "https://app.example.com/service").code)
        self.assertEqual(REFUSED, inspect(name, "--audience", "https://other.example.com").code)
        self.assertEqual(DONE, inspect(name, "--recipient", "https://app.example.com/acs").code)
        self.assertEqual(REFUSED, inspect(name, "--recipient", "https://other.example.com").code)

    def test_subject_makes_it_a_token(self):
        result = inspect("accepted/adfs-rsa.xml", "--subject", "upn", "--domain", "d",
                         "--group-attribute", "http://schemas.xmlsoap.org/claims/Group")
        self.assertEqual(DONE, result.code)
        self.assertIn("subject={Name: alice; Domain:example.com}, "
                      "groups=[{Name: Staff; Domain:d}, {Name: Admins; Domain:d}]", result.out)

    def test_subject_may_be_an_attribute(self):
        upn = "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/upn"
        result = inspect("accepted/adfs-rsa.xml", "--subject", f"upn={upn}")
        self.assertIn("subject={Name: alice; Domain:example.com}", result.out)
        self.assertEqual(REFUSED, inspect("accepted/adfs-rsa.xml", "--subject", "upn=urn:x").code)

    def test_subject_of_another_format_is_refused(self):
        result = inspect("accepted/adfs-rsa.xml", "--subject", "email")
        self.assertEqual(REFUSED, result.code)
        self.assertIn("No rule fits the subject", result.err)

    def test_unknown_format_and_dialect_are_misuse(self):
        self.assertEqual(USAGE, inspect("accepted/adfs-rsa.xml", "--subject", "uid").code)
        self.assertEqual(USAGE, ssoclient("validate", "--dialect", "x").code)

    def test_what_was_changed_behind_the_signature_is_refused(self):
        changed = [row["file"] for row in all_rows() if row.get("refusal", {}).get("class")
                   == "SsoClient::InvalidSignatureException"]
        self.assertGreater(len(changed), 10)
        for name in changed:
            with self.subTest(file=name):
                result = inspect(name, "--general")
                self.assertEqual((REFUSED, ""), (result.code, result.out))


def key(name):
    return DATA / "keys" / f"{name}-key.pem"


class Decrypting(ProgramTest):
    """`--decrypt-key`, with what other tools have encrypted for the key `client`."""

    def decrypt(self, name, *options):
        return ssoclient("inspect", ENCRYPTED / name, *TRUST, *ANY_TIME, *options)

    def test_the_facts_are_those_of_what_was_encrypted(self):
        plain = inspect("accepted/adfs-rsa.xml", "--general")
        for options in (("--general", "--decrypt-key", key("client")),
                        ("--decrypt-key", key("client")),
                        ("--decrypt-key", key("sts-second"), "--decrypt-key", key("client"))):
            with self.subTest(options=options):
                result = self.decrypt("accepted/aes256-gcm.xml", *options)
                self.assertEqual((DONE, ""), (result.code, result.err))
                self.assertEqual(plain.out, result.out)

    def test_subject_makes_it_a_token(self):
        result = self.decrypt("accepted/aes256-gcm.xml", "--decrypt-key", key("client"),
                              "--subject", "upn")
        self.assertIn("subject={Name: alice; Domain:example.com}", result.out)

    def test_without_the_key_it_is_refused(self):
        self.assert_fails(
            self.decrypt("accepted/aes256-gcm.xml", "--general"), REFUSED,
            "ParseException",
            "The assertion is encrypted, and the rules have no key to decrypt it")
        self.assert_fails(
            self.decrypt("accepted/aes256-gcm.xml", "--decrypt-key", key("foreign")), REFUSED,
            "ParseException",
            "The assertion cannot be decrypted with the keys of the rules")

    def test_a_key_may_have_a_passphrase(self):
        locked = self.folder / "locked.key"
        run("openssl", "pkcs8", "-topk8", "-in", key("client"), "-out", locked, "-passout",
            "pass:right")
        options = ["accepted/aes256-gcm.xml", "--decrypt-key", locked,
                   "--decrypt-passphrase-file"]
        right = self.decrypt(*options, self.write("right", "right\n"))
        self.assertEqual((DONE, ""), (right.code, right.err))
        wrong = self.decrypt(*options, self.write("wrong", "wrong\n"))
        self.assertEqual(USAGE, wrong.code)
        self.assertIn("the passphrase is wrong", wrong.err)

    def test_only_rsa_keys_decrypt(self):
        self.assert_fails(
            self.decrypt("accepted/aes256-gcm.xml", "--decrypt-key", key("sts-p256")), USAGE,
            "UsageError",
            "assertions are decrypted with an RSA key, not with one of type EC prime256v1")

    def test_a_key_that_is_not_there_is_misuse(self):
        result = self.decrypt("accepted/aes256-gcm.xml", "--decrypt-key", self.folder / "none")
        self.assertEqual(USAGE, result.code)
        self.assertIn("none", result.err)

    def test_no_passage_of_the_file_is_shown_for_what_was_encrypted_in_it(self):
        inside = self.decrypt("refused/unsigned-inside.xml", "--decrypt-key", key("client"),
                              "--explain")
        self.assertIn("In what was encrypted: 'Assertion' at 1,1 is not signed", inside.err)
        self.assertNotIn("passage:", inside.err)
        outside = self.decrypt("refused/no-key.xml", "--decrypt-key", key("client"), "--explain")
        self.assertIn("passage:", outside.err)


def issue(service, token):
    """Lets a scripted service issue a token."""
    service.say(
        '<s:Envelope xmlns:s="http://schemas.xmlsoap.org/soap/envelope/" '
        'xmlns:t="http://docs.oasis-open.org/ws-sx/ws-trust/200512"><s:Body>'
        "<t:RequestSecurityTokenResponseCollection><t:RequestSecurityTokenResponse>"
        f"<t:RequestedSecurityToken>{token}</t:RequestedSecurityToken>"
        "</t:RequestSecurityTokenResponse></t:RequestSecurityTokenResponseCollection>"
        "</s:Body></s:Envelope>", status=200)


def live(**changes):
    """An assertion of now, in a form that only the general reader takes."""
    def stamp(seconds):
        return time.strftime("%Y-%m-%dT%H:%M:%SZ", time.gmtime(time.time() + seconds))
    now = {"instant": stamp(-60), "confirmations": [{"method": names.BEARER, "end": stamp(3600)}],
           "conditions": {"start": stamp(-60), "end": stamp(3600), "audiences": []},
           "subject": {"value": "alice@example.com", "format": names.EMAIL}}
    return assertion.write(assertion.assertion(**{**now, **changes}))


class EncryptedReplies(ScriptedTest):
    OPTIONS = ("--subject", "email", "--domain", "d", "--lifetime", "3600")

    def test_the_token_is_what_was_encrypted(self):
        plain = live()
        out = self.folder / "token.xml"
        for unwrap in (False, True):
            token = document.write(document.document(), plain)
            if unwrap:
                token = token[token.index("<xenc:"):token.rindex("</saml:")]
            issue(self.service, token)
            result = self.acquire(*self.OPTIONS, "--decrypt-key", key("client"), "--out", out)
            self.assertEqual((DONE, ""), (result.code, result.err))
            self.assertIn("subject={Name: alice; Domain:example.com}", result.out)
            self.assertEqual(plain, out.read_text("utf-8"))

    def test_without_its_key_it_is_refused(self):
        issue(self.service, document.write(document.document(), live()))
        result = self.acquire(*self.OPTIONS)
        self.assert_fails(result, REFUSED, "SsoException", "Unexpected XML format")
        result = self.acquire(*self.OPTIONS, "--decrypt-key", key("foreign"))
        self.assert_fails(result, REFUSED, "SsoException",
                          "The assertion cannot be decrypted with the keys of the rules")


class Verbose(ScriptedTest):
    """What is said of a token that `--general` would read, and not of any other."""

    FORMAT = "; the Format of its NameID is "
    NOTE = f"ssoclient: the token would be read with --general{FORMAT}{names.EMAIL}\n"
    LINE = ("SsoClient.Exchange[64]: the token would be read as a general assertion"
            f"{FORMAT}`{names.EMAIL}'\n")

    def setUp(self):
        super().setUp()
        self.token = self.write("token.xml", live())

    def reply(self, token):
        issue(self.service, token)

    def inspect(self, token, *options):
        """Without the first line of a program that cannot be confined, for which see inspect_test."""
        result = ssoclient("inspect", token, *TRUST, *options)
        notice = r"\Assoclient: the token is read without a filter of system calls: .+\n"
        said = re.sub(notice, "", result.err) if "--verbose" in options else result.err
        return result._replace(err=said)

    def present(self, token, *options):
        return ssoclient("validate", "--url", self.service.url, *TRUST, "--token", token, *options)

    def test_a_file(self):
        result = self.inspect(self.token, "--verbose")
        self.assertEqual(REFUSED, result.code)
        self.assertTrue(result.err.startswith(self.NOTE), result.err)
        self.assertEqual(2, result.err.count("\n"))
        self.assertEqual(result.err, self.NOTE + self.inspect(self.token).err)

    def test_a_name_without_format(self):
        for subject, told in (({"value": "alice"}, "its NameID has no Format"),
                              (None, "it has no NameID")):
            token = self.write("plain.xml", live(subject=subject))
            self.assertIn(f"would be read with --general; {told}\n",
                          self.inspect(token, "--verbose").err)

    def test_a_presented_token(self):
        result = self.present(self.token, "--verbose")
        self.assertEqual(REFUSED, result.code)
        self.assertIn(self.NOTE, result.err)
        self.assertEqual(1, self.present(self.token).err.count("\n"))

    def test_a_token_of_a_reply(self):
        self.reply(self.token.read_text("utf-8"))
        result = self.acquire("--verbose")
        self.assertEqual(REFUSED, result.code)
        self.assertIn(self.LINE, result.err)
        self.assertEqual(1, self.acquire().err.count("\n"))

    def test_nothing_is_said_of_a_token_that_is_refused_anyway(self):
        for change in ({"sign": {"key": "foreign", "key_info": ["foreign"]}}, {"version": "1.1"}):
            with self.subTest(change=change):
                token = self.write("refused.xml", live(**change))
                self.reply(token.read_text("utf-8"))
                for result in (self.inspect(token, "--verbose"), self.present(token, "--verbose"),
                               self.acquire("--verbose")):
                    self.assertEqual(REFUSED, result.code)
                    self.assertNotIn("would be read", result.err)

    def test_nothing_is_said_of_a_token_that_is_read(self):
        for options in (("--general",), ("--general", "--verbose")):
            result = self.inspect(self.token, *options)
            self.assertEqual((DONE, ""), (result.code, result.err))
        self.reply(self.token.read_text("utf-8"))
        result = self.acquire("--verbose", "--subject", "email", "--domain", "d")
        self.assertNotIn("would be read", result.err)


if __name__ == "__main__":
    unittest.main()
