"""An encrypted assertion as a dictionary, written as XML."""

import base64
import copy

from . import ciphers, names

KEY = {"to": "client", "method": names.OAEP_MGF1P, "digest": None, "mask": None, "place": "inside",
       "attributes": "", "parameters": "", "key_info": "", "after": ""}

BASE = {
    "plain": "adfs-rsa",  # of ../assertions/accepted
    "make_plain": lambda text: text,  # what becomes of its text before it is encrypted
    "content": names.gcm(256),
    "bits": 256,
    "data_attributes": f' Type="{names.ELEMENT}"',
    "key_info": "",  # more in the KeyInfo of the data
    "keys": [KEY],
    "change": lambda octets: octets,  # of the encrypted octets
    "layout": lambda base64_text: base64_text,  # of the encrypted octets' text
    "edit": [],  # (from, to) in the document
}


def document(**changes):
    return changed(BASE, **changes)


def changed(base, **changes):
    result = copy.deepcopy(base)
    result.update(changes)
    return result


def key(**changes):
    return {**KEY, **changes}


def write(spec, plain):
    """The document with `plain` in it, and what stands there unencrypted besides."""
    content_key = ciphers.make_content_key(spec["bits"])
    text = spec["make_plain"](plain).encode("utf-8", "surrogateescape")
    octets = spec["change"](ciphers.encrypt_content(spec["content"], content_key, text))
    keys = [(each["place"], _key(each, content_key)) for each in spec["keys"]]
    inside = "".join(text for place, text in keys if place == "inside")
    beside = "".join(text for place, text in keys if place == "beside")
    key_info = spec["key_info"] + inside
    if key_info:
        key_info = f'<ds:KeyInfo xmlns:ds="{names.DS}">{key_info}</ds:KeyInfo>'
    result = (
        f'<saml:EncryptedAssertion xmlns:saml="{names.SAML}">'
        f'<xenc:EncryptedData xmlns:xenc="{names.XENC}"{spec["data_attributes"]}>'
        f'<xenc:EncryptionMethod Algorithm="{spec["content"]}"/>{key_info}'
        f'{_cipher_data(spec["layout"](_base64(octets)))}</xenc:EncryptedData>'
        f"{beside}</saml:EncryptedAssertion>")
    for old, new in spec["edit"]:
        if result.count(old) != 1:
            raise ValueError(f"{old} stands {result.count(old)} times in the document")
        result = result.replace(old, new)
    return result


def _key(each, content_key):
    parameters = each["parameters"]
    if each["digest"]:
        parameters += f'<ds:DigestMethod xmlns:ds="{names.DS}" Algorithm="{each["digest"]}"/>'
    if each["mask"]:
        parameters += f'<e11:MGF xmlns:e11="{names.XENC11}" Algorithm="{each["mask"]}"/>'
    key_info = each["key_info"]
    if key_info:
        key_info = f'<ds:KeyInfo xmlns:ds="{names.DS}">{key_info}</ds:KeyInfo>'
    data = _cipher_data(_base64(ciphers.encrypt_key(each, content_key)))
    return (f'<xenc:EncryptedKey xmlns:xenc="{names.XENC}"{each["attributes"]}>'
            f'<xenc:EncryptionMethod Algorithm="{each["method"]}">{parameters}'
            f"</xenc:EncryptionMethod>{key_info}{data}{each['after']}</xenc:EncryptedKey>")


def _cipher_data(value):
    return f"<xenc:CipherData><xenc:CipherValue>{value}</xenc:CipherValue></xenc:CipherData>"


def _base64(octets):
    return base64.b64encode(octets).decode()
