"""Tokens whose signature verifies, except that one element of it says more than it may, or that
the digest is not quite the one. All are signed as they stand, so that only the named rule can
refuse them."""

import base64

from . import names
from .accepted import LEAN, good_reference, listed, listed_prefixes
from .catalogue import TAMPERED, outside, signed, syntax, value_of
from .forgery import no_parameter, only_text

C14N_LIST = f'<ds:CanonicalizationMethod Algorithm="{names.EXC_C14N}"'
TRANSFORM_LIST = f'<ds:Transform Algorithm="{names.EXC_C14N}"'
NOT_EMPTY = syntax("'InclusiveNamespaces' must be empty")


def add_all(catalogue):
    _foreign_children(catalogue)
    _many_references(catalogue)
    _misplaced_lists(catalogue)
    _two_lists(catalogue)
    _bad_lists(catalogue)
    _long_lists(catalogue)
    _digests(catalogue)


def _refuse(c, name, about, refusals, token, *edits, xmlsec1="none", **forms):
    c.refuse(name, about, signed(token, *edits, **forms), refusals, xmlsec1)


def _foreign_children(c):
    about = "an algorithm with a parameter that it does not have"
    for element, algorithm in (("SignatureMethod", names.RSA_SHA256), ("DigestMethod", names.SHA256)):
        bare = f'<ds:{element} Algorithm="{algorithm}"/>'
        for name, child, told in (
                ("length", "<ds:HMACOutputLength>0</ds:HMACOutputLength>", "ds:HMACOutputLength"),
                ("foreign", '<x:a xmlns:x="urn:x"></x:a>', "x:a"),
                ("list", listed("xs"), "InclusiveNamespaces")):
            _refuse(c, f"algorithm-parameters/parameter-{element.lower()}-{name}", about,
                    no_parameter(algorithm, told),
                    LEAN, (bare, bare[:-2] + f">{child}</ds:{element}>"), xmlsec1="valid")
    _refuse(c, "algorithm-parameters/parameter-canonicalizationmethod-foreign", about,
            no_parameter(names.EXC_C14N, "x:a"), LEAN,
            (C14N_LIST + "/>", C14N_LIST + '><x:a xmlns:x="urn:x"/></ds:CanonicalizationMethod>'))


def _many_references(c):
    one = good_reference(LEAN)
    _refuse(c, "signature-coverage/references-nine", "one more good reference than is looked at",
            outside("The signature has 9 references; 1 to 8 are accepted"), LEAN,
            (one, one * 9), xmlsec1="valid")
    wrong = one.replace("@DIGEST@", base64.b64encode(bytes(32)).decode())
    for name, pair in (("first", wrong + one), ("second", one + wrong)):
        _refuse(c, f"tampering/references-two-{name}-wrong", "one of two references has another digest",
                TAMPERED, LEAN, (one, pair), xmlsec1="invalid")


def _misplaced_lists(c):
    about = "a prefix list for a canonicalization that takes none"
    refused = no_parameter(names.C14N, "InclusiveNamespaces")
    for name, element, token in (
            ("c14n", "CanonicalizationMethod", LEAN.signed_as(c14n=names.C14N)),
            ("transform", "Transform", LEAN.signed_as(transforms=(names.ENVELOPED, names.C14N)))):
        bare = f'<ds:{element} Algorithm="{names.C14N}"/>'
        _refuse(c, f"prefix-lists/prefix-list-inclusive-{name}", about, refused, token,
                (bare, bare[:-2] + f">{listed('xs')}</ds:{element}>"), xmlsec1="valid")
    bare = f'<ds:Transform Algorithm="{names.ENVELOPED}"/>'
    _refuse(c, "prefix-lists/prefix-list-enveloped", about,
            no_parameter(names.ENVELOPED, "InclusiveNamespaces"),
            LEAN, (bare, bare[:-2] + f">{listed('xs')}</ds:Transform>"), xmlsec1="valid")


def _two_lists(c):
    refused = no_parameter(names.EXC_C14N, "ec:InclusiveNamespaces")
    for name, lists in (("first", ("xs", "xsi")), ("last", ("xsi", "xs"))):
        digest = value_of(signed(LEAN.signed_as(transform_prefixes="xs")), "DigestValue")
        _refuse(c, f"prefix-lists/prefix-list-twice-{name}-verifies",
                "which of two prefix lists holds?", refused,
                LEAN, ("@DIGEST@", digest),
                (TRANSFORM_LIST + "/>",
                 TRANSFORM_LIST + ">" + "".join(map(listed, lists)) + "</ds:Transform>"))
    # In CanonicalizationMethod the lists are signed themselves, by the first of them.
    _refuse(c, "prefix-lists/prefix-list-twice-c14n", "which of two prefix lists holds?", refused, LEAN,
            (C14N_LIST + "/>",
             C14N_LIST + f">{listed('xs')}{listed('xsi')}</ds:CanonicalizationMethod>"))


def _bad_lists(c):
    good = listed("xs")

    def attribute(name):
        return syntax(f"Unexpected attribute '{name}' on 'InclusiveNamespaces'")
    for name, refusals, bad in (
            ("element", NOT_EMPTY, good[:-2] + "><ec:a></ec:a></ec:InclusiveNamespaces>"),
            ("text", NOT_EMPTY, good[:-2] + ">xsi</ec:InclusiveNamespaces>"),
            ("attribute", attribute("a"), good[:-2] + ' a="b"/>'),
            ("prefixed-attribute", attribute("ec:PrefixList"), good[:-2] + ' ec:PrefixList="xsi"/>'),
            ("absent", syntax("'InclusiveNamespaces' has no attribute 'PrefixList'"),
             good.replace(' PrefixList="xs"', ""))):
        for place, element, start in (("c14n", "CanonicalizationMethod", C14N_LIST),
                                      ("transform", "Transform", TRANSFORM_LIST)):
            _refuse(c, f"prefix-lists/prefix-list-{name}-{place}",
                    "a prefix list that is more or less than one",
                    refusals, LEAN, (start + "/>", f"{start}>{bad}</ds:{element}>"),
                    xmlsec1="none" if name == "absent" else "valid")


def _long_lists(c):
    prefixes = " ".join(listed_prefixes(65))
    for place, token in (("c14n", LEAN.signed_as(c14n_prefixes=prefixes)),
                         ("transform", LEAN.signed_as(transform_prefixes=prefixes))):
        _refuse(c, f"prefix-lists/prefix-list-65-{place}", "one more prefix than is looked up",
                outside("More than 64 prefixes in a PrefixList"), token, xmlsec1="valid")


def _digests(c):
    def changed(change):
        return lambda text: base64.b64encode(change(base64.b64decode(text))).decode()

    def add(name, refusals, form):
        _refuse(c, "signature-values/digest-" + name,
                "SignedInfo is genuine, the digest in it is not", refusals,
                LEAN, digest_form=form, xmlsec1="invalid")
    add("byte-short", TAMPERED, changed(lambda digest: digest[:-1]))
    add("one-byte", TAMPERED, changed(lambda digest: digest[:1]))
    add("byte-long", TAMPERED, changed(lambda digest: digest + b"\0"))
    add("twice", TAMPERED, changed(lambda digest: digest * 2))
    add("last-bit", TAMPERED, changed(lambda digest: digest[:-1] + bytes([digest[-1] ^ 1])))
    add("blank", TAMPERED, lambda text: " ")
    add("empty", only_text("DigestValue"), lambda text: "")
