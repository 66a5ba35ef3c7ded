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


def values(text):
    """Every value that may differ: two ids, two digests, and the signature over them."""
    signature = signature_of(text)
    return (re.findall(f'(?<= wsu:Id="){UUID}(?=")', text)
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
                self.assertEqual(first[name], second[name])

    def test_at_the_same_time_ids_digests_and_signature_value_differ(self):
        first, second = messages.write(), messages.write()
        for name in SIGNED:
            with self.subTest(request=name):
                one, other = values(first[name]), values(second[name])
                self.assertEqual([5, 5, 10], [len(one), len(other), len({*one, *other})])
                self.assertEqual(without(one, first[name]), without(other, second[name]))

    def test_at_another_time_created_and_expires_differ_too(self):
        first, second = messages.write(), messages.write("2026-06-15T12:34:56.789Z")
        for name in SIGNED + UNSIGNED:
            with self.subTest(request=name):
                one, other = first[name], second[name]
                if name in SIGNED:
                    one, other = without(values(one), one), without(values(other), other)
                times, later = re.findall(TIME, one), re.findall(TIME, other)
                self.assertEqual([2 if name == "validate" else 4] * 2, [len(times), len(later)])
                self.assertTrue(set(times).isdisjoint(later))
                self.assertEqual(re.sub(TIME, "", one), re.sub(TIME, "", other))


if __name__ == "__main__":
    unittest.main()
