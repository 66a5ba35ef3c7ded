"""What differs when a request is built once more."""

import re
import unittest

import messages
from messages import SIGNED, UNSIGNED

UUID = "[0-9a-f]{8}-[0-9a-f]{4}-4[0-9a-f]{3}-[89ab][0-9a-f]{3}-[0-9a-f]{12}"
VALUE = r"[^<>]+(?=</ds:{}>)"
# Of the signature of the request, which stands at the end of the header.
SIGNATURE = r'<ds:Signature xmlns:ds="[^"]+" Id="holderOfKeyProofSignature">.*?</ds:Signature>'
TIME = r"\d{4}-\d\d-\d\dT\d\d:\d\d:\d\d\.\d{3}Z(?=</wsu:(?:Created|Expires)>)"


def signature_of(text):
    return re.search(SIGNATURE, text, re.DOTALL)[0]


def contexts(text):
    """The name of the negotiation that a request begins."""
    return re.findall(f'(?<= Context="urn:uuid:){UUID}(?=")', text)


def values(text):
    """Every value that may differ: two ids, two digests, the signature over them, and a context."""
    signature = signature_of(text)
    return (contexts(text)
            + re.findall(f'(?<= wsu:Id="){UUID}(?=")', text)
            + re.findall(VALUE.format("DigestValue"), signature)
            + re.findall(VALUE.format("SignatureValue"), signature))


def without(found, text):
    for value in found:
        text = text.replace(value, "")
    return text


class Repeat(unittest.TestCase):
    def test_at_the_same_time_nothing_differs_in_unsigned_requests(self):
        first, second = messages.write(), messages.write()
        for name in UNSIGNED:
            with self.subTest(request=name):
                one, other = contexts(first[name]), contexts(second[name])
                self.assertEqual(name == "negotiation-first", one != other)
                self.assertEqual(without(one, first[name]), without(other, second[name]))

    def test_at_the_same_time_ids_digests_and_signature_value_differ(self):
        first, second = messages.write(), messages.write()
        for name in SIGNED:
            with self.subTest(request=name):
                one, other = values(first[name]), values(second[name])
                count = 6 if name.startswith("negotiation") else 5
                self.assertEqual([count, count, 2 * count],
                                 [len(one), len(other), len({*one, *other})])
                self.assertEqual(without(one, first[name]), without(other, second[name]))

    def test_at_another_time_created_and_expires_differ_too(self):
        first, second = messages.write(), messages.write("2026-06-15T12:34:56.789Z")
        for name in SIGNED + UNSIGNED:
            with self.subTest(request=name):
                one, other = first[name], second[name]
                find = values if name in SIGNED else contexts
                one, other = without(find(one), one), without(find(other), other)
                times, later = re.findall(TIME, one), re.findall(TIME, other)
                count = 2 if name in ("validate", "negotiation-next") else 4
                self.assertEqual([count] * 2, [len(times), len(later)])
                self.assertTrue(set(times).isdisjoint(later))
                self.assertEqual(re.sub(TIME, "", one), re.sub(TIME, "", other))


if __name__ == "__main__":
    unittest.main()
