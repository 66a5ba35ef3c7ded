"""Requests in the dialects of services that cannot run here, as a scripted service gets them: their
form follows the public documentation of Active Directory Federation Services."""

import unittest

from lxml import etree

from programs import BAD_CREDENTIALS, DATA, REFUSED, USAGE, ssoclient
from scripted import TRUST, ScriptedTest

SOAP12 = "http://www.w3.org/2003/05/soap-envelope"
WSA = "http://www.w3.org/2005/08/addressing"
TRUST13 = "http://docs.oasis-open.org/ws-sx/ws-trust/200512"
TRUST2005 = "http://schemas.xmlsoap.org/ws/2005/02/trust"
PARTY = "https://app.example.com/"
PREFIXES = {
    "s": SOAP12, "a": WSA, "p": "http://schemas.xmlsoap.org/ws/2004/09/policy",
    "i": "http://schemas.xmlsoap.org/ws/2005/05/identity",
    "o": "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd",
    "u": "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd",
    "d": "http://www.w3.org/2000/09/xmldsig#"}


def fault(subcode, namespace):
    return (f'<s:Envelope xmlns:s="{SOAP12}"><s:Body><s:Fault><s:Code><s:Value>s:Sender</s:Value>'
            f'<s:Subcode><s:Value xmlns:f="{namespace}">f:{subcode}</s:Value></s:Subcode></s:Code>'
            '<s:Reason><s:Text xml:lang="en">no</s:Text></s:Reason></s:Fault></s:Body>'
            '</s:Envelope>')


class AdFs(ScriptedTest):
    def setUp(self):
        super().setUp()
        self.service.say(fault("InvalidRequest", TRUST13), status=400)

    def texts(self, path, trust=TRUST13):
        tree = etree.fromstring(self.service.request)
        found = tree.xpath(path, namespaces={"t": trust, **PREFIXES})
        return [each.text if isinstance(each, etree._Element) else each for each in found]

    def with_key(self, *options):
        return ssoclient(
            "acquire", "certificate", "--url", self.service.url, "--trust", TRUST, "--key",
            DATA / "keys/client-key.pem", "--cert", DATA / "keys/client-cert.pem", *options)

    def test_usernamemixed_of_trust_13(self):
        result = self.acquire("--dialect", "adfs13", "--applies-to", PARTY)
        self.assertEqual(REFUSED, result.code)
        self.assertIn("Unexpected SOAP fault: s:Sender/f:InvalidRequest", result.err)
        action = TRUST13 + "/RST/Issue"
        self.assertEqual(f'application/soap+xml; charset=utf-8; action="{action}"',
                         self.service.request_headers["Content-Type"])
        self.assertNotIn("SOAPAction", self.service.request_headers)
        header = "/s:Envelope/s:Header"
        self.assertEqual([action], self.texts(f"{header}/a:Action"))
        self.assertEqual([self.service.url], self.texts(f"{header}/a:To"))
        self.assertEqual([WSA + "/anonymous"], self.texts(f"{header}/a:ReplyTo/a:Address"))
        self.assertEqual(1, len(self.texts(f"{header}/a:MessageID")))
        self.assertEqual(
            ["u", "secret"], self.texts(f"{header}/o:Security/o:UsernameToken/*"))
        request = "/s:Envelope/s:Body/t:RequestSecurityToken"
        self.assertEqual([TRUST13 + "/Issue"], self.texts(f"{request}/t:RequestType"))
        self.assertEqual([TRUST13 + "/Bearer"], self.texts(f"{request}/t:KeyType"))
        self.assertEqual(
            [PARTY], self.texts(f"{request}/p:AppliesTo/a:EndpointReference/a:Address"))
        self.assertEqual([], self.texts(f"{request}/t:Delegatable | {request}/t:Renewing"))

    def test_usernamemixed_of_2005(self):
        self.acquire("--dialect", "adfs2005", "--applies-to", PARTY)
        self.assertIn(f'action="{TRUST2005}/RST/Issue"',
                      self.service.request_headers["Content-Type"])
        request = "/s:Envelope/s:Body/t:RequestSecurityToken"
        self.assertEqual([TRUST2005 + "/Issue"], self.texts(f"{request}/t:RequestType", TRUST2005))
        self.assertEqual(["http://schemas.xmlsoap.org/ws/2005/05/identity/NoProofKey"],
                         self.texts(f"{request}/t:KeyType", TRUST2005))

    def test_certificatemixed_signs_timestamp_and_to(self):
        self.with_key("--dialect", "adfs13", "--applies-to", PARTY)
        header = "/s:Envelope/s:Header"
        signed = self.texts(f"{header}/o:Security/d:Signature/d:SignedInfo/d:Reference/@URI")
        ids = self.texts(f"{header}/o:Security/u:Timestamp/@u:Id | {header}/a:To/@u:Id")
        self.assertEqual(sorted("#" + each for each in ids), sorted(signed))
        self.assertEqual(2, len(signed))
        self.assertEqual(1, len(self.texts(f"{header}/o:Security/o:BinarySecurityToken")))
        self.assertEqual(1, len(self.texts("//t:UseKey/d:KeyInfo/d:X509Data/d:X509Certificate")))

    def test_claims_are_asked_for(self):
        self.acquire("--dialect", "adfs13", "--claim", "urn:a", "--claim", "urn:b")
        self.assertEqual(["urn:a", "urn:b"], self.texts("//t:Claims/i:ClaimType/@Uri"))

    def test_bad_credentials_are_told_as_such(self):
        for namespace in (TRUST13, PREFIXES["o"]):
            for status in (400, 500):
                self.service.say(fault("FailedAuthentication", namespace), status=status)
                result = self.acquire("--dialect", "adfs13")
                self.assertEqual(BAD_CREDENTIALS, result.code)
                self.assertIn("Authentication failed: no", result.err)

    def test_on_behalf_of_and_act_as_exclude_each_other(self):
        result = self.acquire("--on-behalf-of", "a", "--act-as", "b")
        self.assertEqual(USAGE, result.code)

    def test_without_a_dialect_it_speaks_soap_11(self):
        result = self.acquire()
        self.assertIn("400", result.err)
        self.assertEqual("text/xml", self.service.request_headers["Content-Type"])


if __name__ == "__main__":
    unittest.main()
