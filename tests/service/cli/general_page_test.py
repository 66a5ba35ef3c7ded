"""`ssoclient inspect --general --html` on assertions of many producers."""

import json
import re
import stat
import unittest
from xml.sax.saxutils import escape, quoteattr

import lxml.html

from general_test import accepted_rows, inspect, leaves, row_of
from programs import DATA, DONE, REFUSED, ProgramTest, run


def shown(text):
    """How a text of the assertion stands on a page or a line."""
    text = text.replace("\\", "\\\\").replace("\u202e", "\\u202e")
    return re.sub(r"[\x00-\x1f]", lambda control: f"\\x{ord(control[0]):02x}", text)


class Page(ProgramTest):
    def page_of(self, name, *options):
        path = self.folder / "page.html"
        result = inspect(name, "--general", "--quiet", "--html", path, *options)
        self.assertEqual((DONE, "", ""), (result.code, result.out, result.err))
        self.assertEqual(0o600, stat.S_IMODE(path.stat().st_mode))
        return lxml.html.document_fromstring(path.read_bytes())

    def rows(self, tree):
        return {row.text_content(): row.getnext().text_content() for row in tree.iter("dt")}

    def test_has_every_text_of_every_assertion(self):
        count = 0
        for row in accepted_rows():
            with self.subTest(file=row["file"]):
                told = leaves(json.loads(inspect(row["file"], "--general", "--json").out))
                page = self.page_of(row["file"]).text_content()
                for text in told:
                    self.assertIn(shown(text), page)
                    count += 1
        self.assertGreater(count, 900)

    def test_tells_the_signer_and_what_is_left_of_the_validity(self):
        for name, key in (("adfs-rsa", "sts"), ("adfs-ec", "sts-p256")):
            with self.subTest(name=name):
                rows = self.rows(self.page_of(f"accepted/{name}.xml"))
                subject = run("openssl", "x509", "-in", DATA / "keys" / f"{key}-cert.pem", "-noout",
                              "-subject", "-nameopt", "RFC2253").out.removeprefix("subject=")
                self.assertTrue(rows["signed by"].startswith(f"{subject.strip()} (SHA-256 "))
                self.assertRegex(rows["validity"], r"\A(\d+ d \d+ h left, until |ended |begins in )")

    def test_says_which_confirmation_is_accepted(self):
        page = self.page_of("accepted/two-confirmations.xml", "--recipient",
                            "https://app.example.com/acs")
        recipients = [(card.findtext("h3"), card.xpath("string(.//dt[.='recipient']/"
                                                       "following-sibling::dd[1])"))
                      for card in page.iter("article")]
        self.assertEqual([("not accepted", "https://other.example.com"),
                          ("accepted", "https://app.example.com/acs")], recipients[:2])

    def test_restrictions_stay_apart(self):
        tree = self.page_of("accepted/disjoint-audiences.xml")
        row = row_of("accepted/disjoint-audiences.xml")
        self.assertEqual(
            row["facts"]["conditions"]["audiences"],
            [[uri.text_content() for uri in restriction.iter("li") if uri is not restriction]
             for restriction in tree.xpath("//dt[.='audience restrictions']/following-sibling::dd[1]"
                                           "/ol/li")])

    def test_stands_beside_the_token_that_is_made(self):
        path = self.folder / "page.html"
        result = inspect("accepted/adfs-rsa.xml", "--subject", "upn", "--html", path)
        self.assertEqual((DONE, ""), (result.code, result.err))
        self.assertRegex(result.out, r"\ASamlToken \[")
        self.assertIn("alice", path.read_text("utf-8"))

    def test_there_is_none_of_an_assertion_that_is_refused(self):
        path = self.folder / "page.html"
        result = inspect("accepted/adfs-rsa.xml", "--audience", "urn:other", "--html", path)
        self.assertEqual(REFUSED, result.code)
        self.assertFalse(path.exists())

    def test_hostile_texts_are_shown_as_they_are(self):
        texts = []

        def hostile():
            texts.append(f"</dd><script>alert(\"{len(texts)}\")</script>'&\u202e")
            return texts[-1]

        path = self.write("hostile.xml", hostile_assertion(hostile))
        signed = self.folder / "signed.xml"
        result = run("xmlsec1", "--sign", "--privkey-pem",
                     DATA / "keys" / "sts-key.pem", "--id-attr:ID",
                     "urn:oasis:names:tc:SAML:2.0:assertion:Assertion", "--output", signed, path)
        self.assertEqual(DONE, result.code, result.err)
        tree = self.page_of(signed)
        self.assertEqual([], tree.xpath(
            "//script | //link | //img | //@src | //@href | //@style | //@*[starts-with(name(), 'on')]"))
        page = tree.text_content()
        self.assertGreater(len(texts), 25)
        for text in texts:
            with self.subTest(text=text):  # in a value with elements, XML's own markup is shown, too
                self.assertTrue(shown(text) in page or shown(escape(text)) in page)
        self.assertNotIn("\u202e", page)


def hostile_assertion(hostile):
    """An assertion to be signed with an attempt to be markup in every text that is free."""
    text = lambda: escape(hostile())
    value = lambda: quoteattr(hostile())
    name_id = lambda: (f"Format={value()} NameQualifier={value()} SPNameQualifier={value()} "
                       f"SPProvidedID={value()}>{text()}")
    ds = "http://www.w3.org/2000/09/xmldsig#"
    exclusive = "http://www.w3.org/2001/10/xml-exc-c14n#"
    bearer = "urn:oasis:names:tc:SAML:2.0:cm:bearer"
    return f"""<Assertion xmlns="urn:oasis:names:tc:SAML:2.0:assertion" ID="_1" Version="2.0"
 IssueInstant="2026-01-01T00:00:00Z"><Issuer {name_id()}</Issuer><Signature xmlns="{ds}"><SignedInfo
><CanonicalizationMethod Algorithm="{exclusive}"/><SignatureMethod
 Algorithm="http://www.w3.org/2001/04/xmldsig-more#rsa-sha256"/><Reference URI="#_1"><Transforms
><Transform Algorithm="{ds}enveloped-signature"/><Transform Algorithm="{exclusive}"/></Transforms
><DigestMethod Algorithm="http://www.w3.org/2001/04/xmlenc#sha256"/><DigestValue/></Reference
></SignedInfo><SignatureValue/></Signature><Subject><NameID {name_id()}</NameID
><SubjectConfirmation Method="{bearer}"><NameID {name_id()}</NameID><SubjectConfirmationData
 Recipient={value()} InResponseTo="_2" Address={value()}/></SubjectConfirmation></Subject><Conditions
 NotOnOrAfter="2126-01-01T00:00:00Z"><AudienceRestriction><Audience>{text()}</Audience
></AudienceRestriction><ProxyRestriction Count="1"><Audience>{text()}</Audience></ProxyRestriction
></Conditions><Advice><x xmlns="urn:x" a={value()}>{text()}<y/></x></Advice><AuthnStatement
 AuthnInstant="2026-01-01T00:00:00Z" SessionIndex={value()}><SubjectLocality Address={value()}
 DNSName={value()}/><AuthnContext><AuthnContextClassRef>{text()}</AuthnContextClassRef
><AuthnContextDeclRef>{text()}</AuthnContextDeclRef><AuthenticatingAuthority>{text()
}</AuthenticatingAuthority></AuthnContext></AuthnStatement><AttributeStatement><Attribute
 Name={value()} NameFormat={value()} FriendlyName={value()} o:a={value()} xmlns:o="urn:o"
><AttributeValue o:b={value()}>{text()}</AttributeValue><AttributeValue><x xmlns="urn:x">{text()
}</x></AttributeValue></Attribute></AttributeStatement></Assertion>"""


if __name__ == "__main__":
    unittest.main()
