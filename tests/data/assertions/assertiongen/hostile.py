"""Changes that make an acceptable assertion one to be refused, each with what must be said."""

import re

from . import names
from .assertion import changed

PARSE = "SsoClient::ParseException"
SIGNATURE = "SsoClient::InvalidSignatureException"


def _conditions(spec, **changes):
    return {**(spec["conditions"] or {}), **changes}


def _first_confirmation(spec, **changes):
    return [{**spec["confirmations"][0], **changes}, *spec["confirmations"][1:]]


def _with_edit(spec, old, new):
    return changed(spec, edit=spec["edit"] + [(old, new)])


def _sha1(spec):
    algorithm = spec["sign"]["algorithm"]
    weak = names.RSA_PSS_SHA1 if "MGF1" in algorithm else (
        names.ECDSA_SHA1 if "ecdsa" in algorithm else names.RSA_SHA1)
    return changed(spec, sign={"algorithm": weak})


def _comment_in_subject(spec):
    marked = re.sub(r"^(.)", r"\1<!-- -->", spec["subject"]["value"])
    return changed(spec, subject={**spec["subject"], "raw": marked})


def _p(spec):
    return spec["prefix"] + ":" if spec["prefix"] else ""


def _short_salt(spec):
    return changed(spec, sign={"algorithm": names.pss(256), "key": "sts", "key_info": ["sts"],
                               "salt": 20})


def _wrap(spec):
    """The genuine assertion inside one that says something else."""
    return changed(spec, wrap=True)


def _uncovered_type(spec):
    return changed(
        spec, declare={"x": names.SAML, "xsi": names.XSI},
        attributes_of_assertion=' xsi:type="x:AssertionType"')


# name: (change, class, text)
CHANGES = {
    "value-changed": (
        lambda s: _with_edit(s, f' IssueInstant="{names.ISSUED}"',
                             ' IssueInstant="2024-05-06T11:59:30Z"'),
        SIGNATURE, "token might have been tampered with"),
    "foreign-key": (
        lambda s: changed(s, sign={"key": "foreign", "key_info": ["foreign"],
                                   "algorithm": names.rsa(256)}),
        SIGNATURE, "is not one of the"),
    "sha1": (_sha1, SIGNATURE, "is not accepted"),
    "short-salt": (_short_salt, SIGNATURE, "token might have been tampered with"),
    "sha1-digest": (
        lambda s: changed(s, sign={"digest": names.SHA1}), SIGNATURE, "is not accepted"),
    "with-comments": (
        lambda s: changed(s, sign={"c14n": names.EXC_C14N + "WithComments"}),
        SIGNATURE, "is not accepted"),
    "expired": (
        lambda s: changed(s, conditions=_conditions(s, start=names.LONG_PAST, end=names.PAST),
                          confirmations=_first_confirmation(s, end=None, start=None)),
        PARSE, "has expired at 2024-05-06T11:58:30"),
    "no-end": (
        lambda s: changed(s, conditions=_conditions(s, end=None),
                          confirmations=_first_confirmation(s, end=None)),
        PARSE, "has no end"),
    "unknown-condition": (
        lambda s: changed(s, conditions=_conditions(
            s, xml='<o:OnlyOnMondays xmlns:o="urn:example:other"/>')),
        PARSE, "Unknown condition 'o:OnlyOnMondays' at 1,"),
    "second-audience": (
        lambda s: changed(s, conditions=_conditions(
            s, audiences=[[names.AUDIENCE], ["https://elsewhere.example.com"]])),
        PARSE, "An audience restriction names 'https://elsewhere.example.com', not"),
    "no-audience": (
        lambda s: changed(s, conditions=_conditions(s, audiences=[])),
        PARSE, "names no audience, expected 'https://app.example.com/service'"),
    "other-recipient": (
        lambda s: changed(s, confirmations=_first_confirmation(
            s, data=True, recipient="https://elsewhere.example.com/acs")),
        PARSE, "its Recipient is 'https://elsewhere.example.com/acs', expected"),
    "sender-vouches": (
        lambda s: changed(s, confirmations=_first_confirmation(s, method=names.SENDER_VOUCHES)),
        PARSE, "cm:sender-vouches' is not accepted"),
    "comment-in-name": (_comment_in_subject, PARSE, "cuts the value of"),
    "wrapped": (_wrap, SIGNATURE, "does not name the element that encloses the signature"),
    "uncovered-type": (
        _uncovered_type, PARSE,
        "does not cover what the prefix of the xsi:type 'x:AssertionType'"),
    "confirmation-ended": (
        lambda s: changed(s, confirmations=_first_confirmation(s, data=True, end=names.PAST)),
        PARSE, "has expired at 2024-05-06T11:58:30"),
    "session-ended": (
        lambda s: changed(s, statements=s["statements"] + [
            ("authn", {"session_end": names.PAST, "context": names.PASSWORD})]),
        PARSE, "has expired at 2024-05-06T11:58:30"),
    "saml-1": (lambda s: changed(s, version="1.1"), PARSE, "is '1.1', expected '2.0'"),
    "encrypted-id": (
        lambda s: changed(s, subject={"value": "", "xml": f"<{_p(s)}EncryptedID/>"}),
        PARSE, "is not accepted, expected a NameID"),
    "unknown-element": (
        lambda s: changed(s, statements=s["statements"] + [
            ("xml", '<o:Statement xmlns:o="urn:example:other"/>')]),
        PARSE, "Expected element 'AttributeStatement' in"),
    "not-yet": (
        lambda s: changed(s, conditions=_conditions(s, start=names.SOON, end=names.END)),
        PARSE, "is not valid before 2024-05-06T12:04:00"),
    "later-request": (
        lambda s: changed(s, confirmations=_first_confirmation(
            s, data=True, request="_request-1")),
        PARSE, "its InResponseTo is '_request-1', expected '_request-4711'"),
}
_ROTATION = [name for name in CHANGES if name not in ("other-recipient", "later-request")]


def rotation(index, spec):
    """The change for the document of that index: every one in turn, where it changes something."""
    confirmation = spec["confirmations"][0]
    own = {3: "other-recipient"} if confirmation.get("recipient") else {}
    if confirmation.get("request"):
        own[7] = "later-request"
    return own.get(index % 11) or _ROTATION[index % len(_ROTATION)]
