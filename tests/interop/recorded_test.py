"""Requests are, byte for byte, those that services have been getting since they were recorded."""

import pathlib
import sys
import unittest

import messages
from messages import SIGNED
from repeat_test import contexts, values, without

RECORDED = pathlib.Path(__file__).with_name("requests")


def without_what_is_made_anew(name, text):
    """Without ids, and the digests and the signature that follow from them."""
    return without((values if name in SIGNED else contexts)(text), text)


def record():
    RECORDED.mkdir(exist_ok=True)
    for name, text in messages.write().items():
        (RECORDED / f"{name}.xml").write_text(without_what_is_made_anew(name, text), "utf-8")


class Recorded(unittest.TestCase):
    def assert_as_recorded(self, requests):
        recorded = {path.stem: path.read_text("utf-8") for path in RECORDED.iterdir()}
        self.assertEqual(sorted(recorded), sorted(requests))
        for name, text in requests.items():
            with self.subTest(request=name):
                self.assertEqual(recorded[name], without_what_is_made_anew(name, text))

    def test_without_a_dialect(self):
        self.assert_as_recorded(messages.write())

    def test_in_the_default_dialect(self):
        self.assert_as_recorded(messages.write(dialect=["default"]))


if __name__ == "__main__":
    if sys.argv[1:] == ["record"]:
        record()
    else:
        unittest.main()
