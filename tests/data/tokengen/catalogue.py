"""Collects the tokens and their expected results, and writes both, folder by folder."""

import json
import re

from . import keys, signing
from .assertion import Token, micros
from .rules import RULES

DEFAULTS = {
    "trust": ["sts"],
    "now": "2026-06-15T12:00:00Z",
    "nowMicros": micros("2026-06-15T12:00:00Z"),
    "toleranceSec": 600,
    "xmlsec1": "none",
}

# For `about`, where a token is not more special than the rule that it breaks and its name say.
RULE_SAYS_IT = None

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
    """Tokens by folder. A refused one lies in the folder of the rule that it breaks."""

    def __init__(self, directory):
        self._directory = directory
        self._folders = {"accepted": []} | {f"refused/{rule}": [] for rule in RULES}
        self._made = set()

    def accept(self, name, about, text, facts, **conditions):
        entry = self._entry("accepted", name, about, text, conditions)
        entry["xmlsec1"] = "valid"
        entry["facts"] = facts

    def refuse(self, place, about, text, refusals, xmlsec1="none", **conditions):
        """place: the rule and the name, with a slash between them.
        xmlsec1: what that program must say of the bare signature, or "none" for not asked."""
        rule, name = place.split("/")
        entry = self._entry(f"refused/{rule}", name, about, text, conditions)
        if xmlsec1 != "none":
            entry["xmlsec1"] = xmlsec1
        entry["refusals"] = refusals

    def save(self):
        _write_json(self._directory / "defaults.json", DEFAULTS.items())
        written = {self._directory / "defaults.json"}
        for folder, entries in self._folders.items():
            if not entries:
                raise ValueError(f"no token in {folder}")
            table = self._directory / folder / "expected.json"
            _write_json(table, _head(folder), entries)
            written |= {table} | {table.with_name(entry["file"]) for entry in entries}
        _delete_all_but(written, self._directory)
        return sum(map(len, self._folders.values()))

    def _entry(self, folder, name, about, text, conditions):
        file = f"{name}.xml"
        # Tests are named after verdict and file alone, so no two rules may share a file's name.
        verdict_and_file = (folder.split("/")[0], file)
        if verdict_and_file in self._made:
            raise ValueError(f"{file} is made twice")
        self._made.add(verdict_and_file)
        entry = {"file": file}
        if about is not RULE_SAYS_IT:
            entry["about"] = about
        if "trust" in conditions:
            entry["trust"] = conditions["trust"]
        if "now" in conditions:
            entry["now"] = conditions["now"]
            entry["nowMicros"] = micros(conditions["now"])
        if "tolerance" in conditions:
            entry["toleranceSec"] = conditions["tolerance"]
        self._folders[folder].append(entry)
        data = text if isinstance(text, bytes) else text.encode()
        _write_unless_same_but_signature(self._directory / folder / file, data)
        return entry


def _head(folder):
    """What a table says of all its tokens: the rule that they break, and where it comes from."""
    if folder == "accepted":
        return []
    rule, standard = RULES[folder.removeprefix("refused/")]
    return [("rule", rule)] + ([("standard", standard)] if standard else [])


def _write_json(path, head, entries=()):
    """One member a line, so that a change of one is a change of one line."""
    members = [f"{json.dumps(k)}: {json.dumps(v)}" for k, v in head]
    if entries:
        blocks = [",\n".join(f"  {json.dumps(k)}: {json.dumps(v)}" for k, v in entry.items())
                  for entry in entries]
        members.append('"tokens": [\n{\n' + "\n},\n{\n".join(blocks) + "\n}\n]")
    path.write_text("{\n" + ",\n".join(members) + "\n}\n")


def _delete_all_but(kept, directory):
    for path in sorted(directory.rglob("*"), reverse=True):
        if path.is_file() and path not in kept:
            path.unlink()
        elif path.is_dir() and not any(path.iterdir()):
            path.rmdir()


def _write_unless_same_but_signature(path, data):
    # ECDSA signatures differ from run to run; a file that says the same is left alone.
    path.parent.mkdir(parents=True, exist_ok=True)
    if path.exists() and b"ecdsa" in data and _unsigned(path.read_bytes()) == _unsigned(data):
        return
    path.write_bytes(data)


def _unsigned(data):
    return re.sub(rb"SignatureValue>[^<]*<", b"SignatureValue><", data)
