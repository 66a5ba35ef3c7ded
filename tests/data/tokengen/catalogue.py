"""Collects the tokens and their expected results, and writes both."""

import json
import re

from . import keys, signing
from .assertion import Token, micros

DEFAULTS = {
    "trust": ["sts"],
    "now": "2026-06-15T12:00:00Z",
    "nowMicros": micros("2026-06-15T12:00:00Z"),
    "toleranceSec": 600,
    "xmlsec1": "none",
}

PARSE = "SsoClient::ParseException"
SIGNATURE = "SsoClient::InvalidSignatureException"
XML = "Quillon::Xml::XMLParseException"

TAMPERED = [
    {"class": SIGNATURE,
     "message": "Failed to verify signature: token might have been tampered with."}]
OUTSIDE_PROFILE = [{"class": SIGNATURE, "prefix": "Signature verification error. "}]
SIGNATURE_SYNTAX = [{"class": PARSE, "prefix": "Signature syntax error: "}]
NOT_COVERED = [{"class": PARSE, "message": "Token's signature must cover the entire token"}]
MALFORMED = [{"class": XML}]


def says(message):
    return [{"class": PARSE, "message": message}]


def syntax(message):
    return says("Signature syntax error: " + message)


def outside(message):
    return [{"class": SIGNATURE, "message": "Signature verification error. " + message}]


def begins(prefix):
    return [{"class": PARSE, "prefix": prefix}]


def replaced(text, old, new, count=1):
    """The text with `old` replaced, which must stand there exactly `count` times."""
    if text.count(old) != count:
        raise ValueError(f"{old!r} stands {text.count(old)} times in\n{text}")
    return text.replace(old, new)


def signed(token, *edits, key="sts", **forms):
    """The signed text of a token (or of a text), edited before it is signed."""
    text = token.text() if isinstance(token, Token) else token
    for edit in edits:
        text = replaced(text, *edit)
    return signing.sign(text, keys.private_key(key), **forms)


def value_of(text, element):
    start = text.index(f"<ds:{element}>") + len(f"<ds:{element}>")
    return text[start:text.index(f"</ds:{element}>", start)]


class Catalogue:
    def __init__(self, directory):
        self._directory = directory
        self._entries = []

    def accept(self, name, about, text, facts, **conditions):
        entry = self._entry("accepted", name, about, text, conditions)
        entry["xmlsec1"] = "valid"
        entry["facts"] = facts

    def refuse(self, name, about, text, refusals, xmlsec1="none", **conditions):
        """xmlsec1: what that program must say of the bare signature, or "none" for not asked."""
        entry = self._entry("refused", name, about, text, conditions)
        if xmlsec1 != "none":
            entry["xmlsec1"] = xmlsec1
        entry["refusals"] = refusals

    def save(self):
        expected = {self._directory / e["file"] for e in self._entries}
        for folder in ("accepted", "refused"):
            for stale in set((self._directory / folder).glob("*.xml")) - expected:
                stale.unlink()
        blocks = []
        for entry in self._entries:
            lines = [f"  {json.dumps(k)}: {json.dumps(v)}" for k, v in entry.items()]
            blocks.append("{\n" + ",\n".join(lines) + "\n}")
        (self._directory / "expected.json").write_text(
            '{"defaults":\n' + json.dumps(DEFAULTS) + ',\n"tokens": [\n' + ",\n".join(blocks)
            + "\n]}\n")
        return len(self._entries)

    def _entry(self, folder, name, about, text, conditions):
        file = f"{folder}/{name}.xml"
        if any(e["file"] == file for e in self._entries):
            raise ValueError(f"{file} is made twice")
        entry = {"file": file, "about": about}
        if "trust" in conditions:
            entry["trust"] = conditions["trust"]
        if "now" in conditions:
            entry["now"] = conditions["now"]
            entry["nowMicros"] = micros(conditions["now"])
        if "tolerance" in conditions:
            entry["toleranceSec"] = conditions["tolerance"]
        self._entries.append(entry)
        data = text if isinstance(text, bytes) else text.encode()
        _write_unless_same_but_signature(self._directory / file, data)
        return entry


def _write_unless_same_but_signature(path, data):
    # ECDSA signatures differ from run to run; a file that says the same is left alone.
    path.parent.mkdir(parents=True, exist_ok=True)
    if path.exists() and b"ecdsa" in data and _unsigned(path.read_bytes()) == _unsigned(data):
        return
    path.write_bytes(data)


def _unsigned(data):
    return re.sub(rb"SignatureValue>[^<]*<", b"SignatureValue><", data)
