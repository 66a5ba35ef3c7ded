"""The requests are valid against the schemas of the standards they follow.

The schemas leave room for elements of other namespaces without a schema; among the requests'
elements that is the advice alone.
"""

import os
import pathlib
import re
import unittest

from lxml import etree

import messages
import schemas
from messages import substitute

XSD = "{http://www.w3.org/2001/XMLSchema}"


class Schemas(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.schema = schemas.load(pathlib.Path(os.environ["SCHEMA_DIR"]))
        cls.requests = messages.write()

    def errors(self, text):
        self.schema.validate(etree.fromstring(text.encode()))
        return [entry.message for entry in self.schema.error_log]

    def assert_invalid(self, name, pattern, replacement, complaint):
        """The request of that name is valid no more after a substitution."""
        errors = self.errors(substitute(pattern, replacement, self.requests[name]))
        self.assertRegex("\n".join(errors), complaint)

    def test_all_requests_are_valid(self):
        for name, text in self.requests.items():
            with self.subTest(request=name):
                self.assertEqual([], self.errors(text))

    def test_requests_of_the_dialect_of_cxf_are_valid(self):
        for name, text in messages.write(dialect=["cxf"]).items():
            with self.subTest(request=name):
                self.assertEqual([], self.errors(text))

    def test_every_namespace_but_that_of_the_advice_has_its_schema(self):
        used = {etree.QName(element).namespace for text in self.requests.values()
                for element in etree.fromstring(text.encode()).iter()}
        unknown = used - set(schemas.LOCATIONS)
        self.assertEqual(1, len(unknown), unknown)
        self.assertTrue(unknown.pop().endswith("/names/2009/12/std-ext/WS-Trust1.4/advice"))

    def test_every_element_of_ws_trust_is_declared(self):
        tree = etree.parse(pathlib.Path(os.environ["SCHEMA_DIR"], "ws-trust-1.3.xsd"))
        declared = {element.get("name") for element in tree.iter(XSD + "element")}
        used = {name for text in self.requests.values() for name in re.findall(r"<wst:(\w+)", text)}
        self.assertGreater(len(used), 10)
        self.assertEqual(set(), used - declared)

    def test_soap_envelope_needs_its_body(self):
        self.assert_invalid(
            "password", "<soapenv:Body.*</soapenv:Body>", "", "Envelope.*Missing child")

    def test_timestamp_must_be_made_of_its_own_elements(self):
        self.assert_invalid("certificate", "<wsu:Expires>(?=[^<]*</wsu:Expires></wsu:Timestamp>)",
                            "<wsu:Until/><wsu:Expires>", "Until.*not expected")

    def test_binary_token_needs_an_identifier_that_is_a_name(self):
        self.assert_invalid("certificate", 'wsu:Id="holderOfKeyCertificate"', 'wsu:Id="1"',
                            "'1' is not a valid value of the atomic type 'xs:ID'")

    def test_username_token_begins_with_the_name(self):
        self.assert_invalid("password", "<wsse:Username>jdoe</wsse:Username>", "",
                            "Password.*Expected is.*Username")

    def test_signature_needs_its_value(self):
        self.assert_invalid("certificate", "<ds:SignatureValue>.*</ds:SignatureValue>", "",
                            "KeyInfo.*Expected is.*SignatureValue")

    def test_renewing_allows_or_does_not(self):
        self.assert_invalid("password", '<wst:Renewing Allow="false"', '<wst:Renewing Allow="no"',
                            "'no' is not a valid value of the atomic type 'xs:boolean'")

    def test_delegatable_is_true_or_false(self):
        self.assert_invalid("exchange", "<wst:Delegatable>false", "<wst:Delegatable>no",
                            "'no' is not a valid value of the atomic type 'xs:boolean'")

    def test_endpoint_of_a_participant_needs_an_address(self):
        self.assert_invalid("password-full", "<wsa:Address>https://one.*?</wsa:Address>", "",
                            "EndpointReference.*Missing child.*Address")

    def test_context_of_a_negotiation_has_no_namespace(self):
        self.assert_invalid("negotiation-next", ' Context="', ' wst:Context="',
                            "Context' is not allowed")

    def test_leg_says_what_it_is(self):
        self.assert_invalid("negotiation-next", ' ValueType="[^"]*"(?=>bGVn)', "",
                            "BinaryExchange.*ValueType.*required")

    def test_assertion_needs_its_issuer(self):
        self.assert_invalid("exchange", "<saml:Issuer .*</saml:Issuer>", "", "Expected is.*Issuer")


if __name__ == "__main__":
    unittest.main()
