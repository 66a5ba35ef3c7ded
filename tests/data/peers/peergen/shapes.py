"""The documents that the peers are asked for: the shapes of the other table, unsigned."""

import copy
import re
import sys
from pathlib import Path

DATA = Path(__file__).resolve().parents[2]
sys.path.append(str(DATA / "assertions"))

from assertiongen import assertion, hostile, names, producers  # noqa: E402

_RSA, _PSS, _EC = producers._KEYS
_LONG = [("pss512", "sts-second", names.pss(512)), ("ec384", "sts-p384", names.ecdsa(384))]

# What each peer can sign: xmlsec1, which pysaml2 signs with, knows no PSS.
SIGNATURES = {"opensaml": [_RSA, _PSS, _EC], "pysaml2": [_RSA, _EC]}
LONG_SIGNATURES = {"opensaml": _LONG, "pysaml2": []}

# These are signed with longer hashes, too.
LONG_SHAPES = ("adfs", "azure", "shibboleth", "okta", "simplesamlphp", "cxf-bearer",
               "cxf-holder-of-key")

_TYPES_OF_ELEMENTS = re.compile(r' xsi:type="saml2:[A-Za-z]+"')


def shapes():
    """(name, about, specification) of each shape."""
    for name, about, _, spec in producers.documents():
        if name.endswith("-rsa"):
            yield name.removesuffix("-rsa"), about, spec


def signatures(peer, shape):
    """(name, key, algorithm)"""
    return SIGNATURES[peer] + (LONG_SIGNATURES[peer] if shape in LONG_SHAPES else [])


def template(spec, peer):
    text = re.sub(r"<(\w+):Signature .*?</\1:Signature>", "", assertion.write(spec),
                  flags=re.DOTALL)
    # pysaml2 writes these attributes as they are, and another prefix.
    return _TYPES_OF_ELEMENTS.sub("", text) if peer == "pysaml2" else text


def facts(spec, text):
    """What must be read from `text`, which a peer has written: it has formats and types of its
    own where the shape has none."""
    result = assertion.facts(spec, text)
    document = assertion.signing.parse(text)
    listed = document.find(".//{%s}InclusiveNamespaces" % names.EXC_C14N)
    prefixes = [] if listed is None else listed.get("PrefixList").split()
    written = document.iterfind("{*}AttributeStatement/{*}Attribute")
    for attribute, element in zip(result["attributes"], written, strict=True):
        attribute["nameFormat"] = element.get("NameFormat")
        for value, child in zip(attribute["values"], element, strict=True):
            value["type"] = _covered_type(child, prefixes)
            value["nil"] = child.get("{%s}nil" % names.XSI) == "true"
    return result


def _covered_type(value, prefixes):
    """The type if the exclusive form is told to carry its prefix."""
    name = value.get("{%s}type" % names.XSI)
    if name is None or name.partition(":")[0] not in prefixes:
        return None
    prefix, _, local = name.partition(":")
    return "{%s}%s" % (value.nsmap[prefix], local)


# -------------------------------------------------------------------------- hostile neighbours

def _sha1_of(algorithm):
    return (names.RSA_PSS_SHA1 if "MGF1" in algorithm else
            names.ECDSA_SHA1 if "ecdsa" in algorithm else names.RSA_SHA1)


def _without_signature(text):
    return re.sub(r"<(\w+:)?Signature[ >].*?</\1Signature>", "", text, flags=re.DOTALL)


def _wrapped(text):
    """Another assertion that carries the genuine signature, and the genuine one as advice."""
    text = re.sub(r"^<\?xml[^>]*\?>\s*", "", text)
    forged = re.sub(r' ID="[^"]*"', ' ID="_forged"', text, count=1)
    end = re.search(r"</(\w+:)?Conditions>", forged)
    p = end[1] or ""
    return (f"{forged[:end.end()]}<{p}Advice>{_without_signature(text)}</{p}Advice>"
            f"{forged[end.end():]}")


# name: (change of the written text, class, text)
_CHANGED_TEXTS = {
    "value-changed": (lambda text: re.sub(r'( IssueInstant="2024-05-06T11:5)9', r"\g<1>8", text),
                      hostile.SIGNATURE, "token might have been tampered with"),
    "comment-in-name": (lambda text: re.sub(r"(<(?:\w+:)?NameID[^>]*>.)", r"\1<!-- -->", text,
                                            count=1), hostile.PARSE, "cuts the value of"),
    "unsigned": (_without_signature, hostile.PARSE, " is not signed"),
    "wrapped": (_wrapped, hostile.SIGNATURE,
                "does not name the element that encloses the signature"),
}

# name: (change of how it is signed, class, text)
_CHANGED_SIGNATURES = {
    "foreign-key": (lambda plan: {**plan, "key": "foreign", "algorithm": names.rsa(256)},
                    hostile.SIGNATURE, "is not one of the"),
    "sha1": (lambda plan: {**plan, "algorithm": _sha1_of(plan["algorithm"])},
             hostile.SIGNATURE, "is not accepted"),
    "sha1-digest": (lambda plan: {**plan, "digest": names.SHA1},
                    hostile.SIGNATURE, "is not accepted"),
}

_CHANGED_ASSERTIONS = ("expired", "no-end", "second-audience", "no-audience", "sender-vouches",
                       "confirmation-ended", "session-ended", "saml-1")
_ONLY_WITH = {"other-recipient": "recipient", "later-request": "request"}

_ROTATION = [*_CHANGED_TEXTS, *_CHANGED_ASSERTIONS, *_CHANGED_SIGNATURES, *_ONLY_WITH]


def neighbour(index, spec, plan):
    """(name, specification, plan, change of the text, class, text) of the one for that index."""
    confirmation = spec["confirmations"][0]
    name = _ROTATION[index % len(_ROTATION)]
    if name in _ONLY_WITH and not confirmation.get(_ONLY_WITH[name]):
        name = "expired"
    if name in _CHANGED_TEXTS:
        change, error, text = _CHANGED_TEXTS[name]
        return name, spec, plan, change, error, text
    if name in _CHANGED_SIGNATURES:
        change, error, text = _CHANGED_SIGNATURES[name]
        return name, spec, change(plan), None, error, text
    change, error, text = hostile.CHANGES[name]
    return name, change(copy.deepcopy(spec)), plan, None, error, text
