"""Signs a document: canonical forms by libxml2 through lxml, digests and signatures by OpenSSL."""

import base64
import copy
import hashlib

from cryptography.hazmat.primitives import hashes
from cryptography.hazmat.primitives.asymmetric import ec, padding, rsa
from cryptography.hazmat.primitives.asymmetric.utils import decode_dss_signature
from lxml import etree

from . import keys, names

_HASHES = {"sha1": hashes.SHA1, "sha256": hashes.SHA256, "sha384": hashes.SHA384,
           "sha512": hashes.SHA512}
_SIGNATURE = "{%s}Signature" % names.DS


def parse(text):
    return etree.fromstring(
        text.encode(), etree.XMLParser(resolve_entities=False, no_network=True, strip_cdata=False))


def signature_element(how):
    """A `ds:Signature` with marks where the two values go."""
    p = how["ds_prefix"]
    inclusive = ""
    if how["prefix_list"]:
        inclusive = (f'<ec:InclusiveNamespaces xmlns:ec="{names.EXC_C14N}" '
                     f'PrefixList="{how["prefix_list"]}"/>')
    transforms = (f'<{p}:Transform Algorithm="{names.ENVELOPED}"/>'
                  f'<{p}:Transform Algorithm="{how["c14n"]}">{inclusive}</{p}:Transform>')
    return (f'<{p}:Signature xmlns:{p}="{names.DS}"><{p}:SignedInfo>'
            f'<{p}:CanonicalizationMethod Algorithm="{names.EXC_C14N}"/>'
            f'<{p}:SignatureMethod Algorithm="{how["algorithm"]}"/>'
            f'<{p}:Reference URI="{how["uri"]}"><{p}:Transforms>{transforms}</{p}:Transforms>'
            f'<{p}:DigestMethod Algorithm="{how["digest"]}"/>'
            f'<{p}:DigestValue>@DIGEST@</{p}:DigestValue></{p}:Reference></{p}:SignedInfo>'
            f'<{p}:SignatureValue>@VALUE@</{p}:SignatureValue>{_key_info(how)}</{p}:Signature>')


def _key_info(how):
    p = how["ds_prefix"]
    if not how["key_info"]:
        return ""
    certificates = "".join(
        f"<{p}:X509Certificate>{keys.certificate_base64(name)}</{p}:X509Certificate>"
        for name in how["key_info"])
    return f"<{p}:KeyInfo><{p}:X509Data>{certificates}</{p}:X509Data></{p}:KeyInfo>"


def sign(text, how):
    """Fills in the two values."""
    unsigned = copy.deepcopy(parse(text))
    signature = unsigned.find(_SIGNATURE)
    # What follows the signature belongs to the assertion.
    previous, tail = signature.getprevious(), signature.tail or ""
    previous.tail = (previous.tail or "") + tail
    unsigned.remove(signature)
    data = _canonical(unsigned, how["c14n"], how["prefix_list"])
    digest = hashlib.new("sha1" if how["digest"] == names.SHA1 else "sha256", data).digest()
    text = text.replace("@DIGEST@", base64.b64encode(digest).decode(), 1)
    signed_info = parse(text).find(f"{_SIGNATURE}/{{{names.DS}}}SignedInfo")
    value = _signature_value(_canonical(signed_info, names.EXC_C14N, ""), how)
    return text.replace("@VALUE@", base64.b64encode(value).decode(), 1)


def _canonical(element, algorithm, prefix_list):
    exclusive = algorithm.startswith(names.EXC_C14N)
    return etree.tostring(
        element, method="c14n", exclusive=exclusive, with_tail=False,
        inclusive_ns_prefixes=prefix_list.split() if exclusive and prefix_list else None,
        with_comments=algorithm.endswith("WithComments"))


def _signature_value(data, how):
    name, is_pss = names.SIGNATURES[how["algorithm"]]
    algorithm = _HASHES[name]()
    key = keys.private_key(how["key"])
    if isinstance(key, rsa.RSAPrivateKey):
        if not is_pss:
            return key.sign(data, padding.PKCS1v15(), algorithm)
        salt = how.get("salt", algorithm.digest_size)
        return key.sign(data, padding.PSS(padding.MGF1(algorithm), salt), algorithm)
    r, s = decode_dss_signature(key.sign(data, ec.ECDSA(algorithm)))
    size = (key.curve.key_size + 7) // 8
    return r.to_bytes(size, "big") + s.to_bytes(size, "big")
