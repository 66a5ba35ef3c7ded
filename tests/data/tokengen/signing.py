"""Fills in the digests and the signature value of a token text.

Canonical forms come from libxml2 through lxml, digests and signatures from OpenSSL through
python3-cryptography. The text itself is never written out again by an XML serializer: only the
marks @DIGEST@ and @VALUE@ are replaced, so quotes, blanks, comments, CDATA sections and
character references stay as the caller wrote them.
"""

import base64
import hashlib
import hmac
import subprocess
import tempfile

from cryptography.hazmat.primitives import hashes, serialization
from cryptography.hazmat.primitives.asymmetric import ec, padding, rsa
from cryptography.hazmat.primitives.asymmetric.utils import decode_dss_signature
from lxml import etree

from . import names

DIGESTS = {
    names.SHA1: "sha1", names.SHA256: "sha256", names.SHA384: "sha384", names.SHA512: "sha512",
    names.MD5: "md5",
}
SIGNATURE_HASHES = {
    names.RSA_SHA1: hashes.SHA1, names.RSA_MD5: hashes.MD5, names.RSA_SHA256: hashes.SHA256,
    names.RSA_SHA384: hashes.SHA384, names.RSA_SHA512: hashes.SHA512,
    names.ECDSA_SHA1: hashes.SHA1, names.ECDSA_SHA256: hashes.SHA256,
    names.ECDSA_SHA384: hashes.SHA384, names.ECDSA_SHA512: hashes.SHA512,
}
HMAC_HASHES = {names.HMAC_SHA1: "sha1", names.HMAC_SHA256: "sha256"}

_NAMESPACES = {"ds": names.DS, "ec": names.EXC_C14N}


def sign(text, key, digest_form=str, value_form=str, hmac_key=None, stand_in=None):
    """Signs the first ds:Signature of the text by what its own SignedInfo asks for.

    digest_form and value_form turn the Base64 text into what is written in the token. stand_in is
    a text and what takes its place in the end, for what libxml2 would not canonicalize.
    """
    if "#default" in text:
        return sign_by_xmlsec1(text, key)
    for _ in range(text.count("@DIGEST@")):
        digest = _reference_digest(_parse(text), stand_in)
        text = text.replace("@DIGEST@", digest_form(_base64(digest)), 1)
    signed_info = _find(_parse(text), "ds:SignedInfo")
    value = _signature_value(signed_info, key, hmac_key)
    text = text.replace("@VALUE@", value_form(_base64(value)))
    return text.replace(*stand_in) if stand_in else text


def canonical(element, method):
    """The canonical form of the element, as the given CanonicalizationMethod or Transform."""
    algorithm = method.get("Algorithm")
    prefixes = None
    # Whatever is no canonicalization at all is taken for the exclusive one.
    exclusive = not algorithm.startswith(names.C14N)
    inclusive_namespaces = method.find("ec:InclusiveNamespaces", _NAMESPACES)
    if exclusive and inclusive_namespaces is not None:
        prefixes = inclusive_namespaces.get("PrefixList", "").split()
    # Written out alone, an element carries every namespace declaration of its ancestors, which
    # is the context that inclusive canonicalization must see.
    alone = _parse_bytes(etree.tostring(element, with_tail=False))
    return etree.tostring(
        alone, method="c14n", exclusive=exclusive, inclusive_ns_prefixes=prefixes,
        with_comments=algorithm.endswith("WithComments"))


def _parse(text):
    return _parse_bytes(text.encode())


def _parse_bytes(data):
    # recover: a few refused tokens use prefixes that nobody declares, and are signed all the same.
    parser = etree.XMLParser(
        resolve_entities=False, strip_cdata=False, no_network=True, huge_tree=True, recover=True)
    return etree.fromstring(data, parser)


def _find(root, path):
    signature = next(root.iter("{%s}Signature" % names.DS))
    return signature.find(path, _NAMESPACES)


def _base64(data):
    return base64.b64encode(data).decode()


def sign_by_xmlsec1(text, key):
    """For what lxml cannot canonicalize: a PrefixList with #default, and what stands beside a root."""
    pem = key.private_bytes(
        serialization.Encoding.PEM, serialization.PrivateFormat.PKCS8, serialization.NoEncryption())
    with tempfile.NamedTemporaryFile() as key_file, tempfile.NamedTemporaryFile() as template:
        key_file.write(pem)
        key_file.flush()
        template.write(text.replace("@DIGEST@", "").replace("@VALUE@", "").encode())
        template.flush()
        output = subprocess.run(
            ["xmlsec1", "--sign", "--id-attr:ID", names.SAML + ":Assertion"]
            + ["--privkey-pem", key_file.name, template.name], check=True, capture_output=True)
    root = _parse_bytes(output.stdout)
    for mark, path in (("@DIGEST@", "ds:SignedInfo/ds:Reference/ds:DigestValue"),
                       ("@VALUE@", "ds:SignatureValue")):
        text = text.replace(mark, "".join(_find(root, path).text.split()))
    return text


def _reference_digest(root, stand_in):
    # The marks are replaced in document order, so the first unfilled DigestValue is the one.
    signature = next(root.iter("{%s}Signature" % names.DS))
    reference = next(
        r for r in signature.iter("{%s}Reference" % names.DS)
        if "@DIGEST@" in "".join(r.find("ds:DigestValue", _NAMESPACES).itertext()))
    target = _target(root, reference.get("URI"))
    last = reference
    for transform in reference.iterfind("ds:Transforms/ds:Transform", _NAMESPACES):
        algorithm = transform.get("Algorithm", "")
        if algorithm == names.ENVELOPED:
            _remove(signature)
        elif algorithm.startswith((names.C14N, names.EXC_C14N)):
            last = transform
    if last is reference:
        last = etree.Element("Transform", Algorithm=names.C14N)
    method = reference.find("ds:DigestMethod", _NAMESPACES)
    algorithm = "" if method is None else method.get("Algorithm", "")
    data = canonical(target, last)
    if stand_in:
        data = data.replace(*(part.encode() for part in stand_in))
    return hashlib.new(DIGESTS.get(algorithm, "sha256"), data).digest()


def _target(root, uri):
    """The element of a same-document reference; of anything else, the root."""
    if uri and uri.startswith("#"):
        for attribute in ("ID", "Id", "{http://www.w3.org/XML/1998/namespace}id"):
            for element in root.iter("*"):
                if element.get(attribute) == uri[1:]:
                    return element
    return root


def _remove(element):
    parent, previous, tail = element.getparent(), element.getprevious(), element.tail or ""
    if parent is None:
        return
    if previous is None:
        parent.text = (parent.text or "") + tail
    else:
        previous.tail = (previous.tail or "") + tail
    element.tail = None
    parent.remove(element)


def _signature_value(signed_info, key, hmac_key):
    method = signed_info.find("ds:CanonicalizationMethod", _NAMESPACES)
    if method is None:
        method = etree.Element("CanonicalizationMethod", Algorithm=names.EXC_C14N)
    data = canonical(signed_info, method)
    signature_method = signed_info.find("ds:SignatureMethod", _NAMESPACES)
    algorithm = "" if signature_method is None else signature_method.get("Algorithm", "")
    if hmac_key is not None:
        return hmac.new(hmac_key, data, HMAC_HASHES[algorithm]).digest()
    hash_class = SIGNATURE_HASHES.get(algorithm, hashes.SHA256)
    if isinstance(key, rsa.RSAPrivateKey):
        return key.sign(data, padding.PKCS1v15(), hash_class())
    r, s = decode_dss_signature(key.sign(data, ec.ECDSA(hash_class())))
    size = (key.curve.key_size + 7) // 8
    return r.to_bytes(size, "big") + s.to_bytes(size, "big")
