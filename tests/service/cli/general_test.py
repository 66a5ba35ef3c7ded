"""`ssoclient inspect --general` on assertions of many producers, which other tools made."""

import json
import unittest

from programs import DATA, DONE, REFUSED, USAGE, ProgramTest, ssoclient

ASSERTIONS = DATA / "assertions"
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


if __name__ == "__main__":
    unittest.main()
