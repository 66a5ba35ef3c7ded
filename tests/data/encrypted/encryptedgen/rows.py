"""What is accepted, each with its section and hostile neighbours that must be refused."""

import re

from . import names
from .document import changed, document, key

PARSE = "SsoClient::ParseException"
SIGNATURE = "SsoClient::InvalidSignatureException"
XML = "Quillon::Xml::XMLParseException"

# One text for everything that only somebody without the key does not know already.
CLOSED = "The assertion cannot be decrypted with the keys of the rules"
INSIDE = "In what was encrypted: "

_ROWS = []


def _row(name, about, section, spec, *neighbours, keys=("client",)):
    """Each of `neighbours` is (name, spec, text of the refusal, and if it is another, the class)."""
    _ROWS.append({"name": name, "about": about, "section": section, "spec": spec,
                  "keys": list(keys), "neighbours": neighbours})


def rows():
    return _ROWS


def _flip(index):
    def change(octets):
        changed_octets = bytearray(octets)
        changed_octets[index] ^= 1
        return bytes(changed_octets)
    return change


def _with_key(**changes):
    return document(keys=[key(**changes)])


def _inside(make):
    return document(make_plain=make)


def _contents():
    section = "XMLENC11 5.2.4"
    _row("aes128-gcm", "the shortest key", section,
         document(content=names.gcm(128), bits=128),
         ("tag-changed", document(content=names.gcm(128), bits=128, change=_flip(-1)), CLOSED),
         ("longer-key-than-said", document(edit=[("aes256-gcm", "aes128-gcm")]), CLOSED))
    _row("aes192-gcm", "the middle key", section,
         document(content=names.gcm(192), bits=192),
         ("vector-changed", document(content=names.gcm(192), bits=192, change=_flip(0)), CLOSED))
    _row("aes256-gcm", "the longest key", section, document(),
         ("octet-changed", document(change=_flip(1000)), CLOSED),
         ("octets-cut", document(change=lambda octets: octets[:-1]), CLOSED),
         ("tag-alone", document(change=lambda octets: octets[:27]), CLOSED),
         ("nothing", document(change=lambda octets: b""), CLOSED))
    _row("line-breaks", "the text in lines, as Java and .NET write it", "XMLENC11 3.3",
         document(layout=lambda text: "\n" + "&#13;\n".join(re.findall(".{1,76}", text)) + "\n"),
         ("comment-in-the-text", document(
             layout=lambda text: text[:40] + "<!-- -->" + text[40:]), "cuts the value of"),
         ("no-base64", document(layout=lambda text: text + "=*"), "is not Base64: "),
         ("reference-to-the-text", document(edit=[(
             "</ds:KeyInfo><xenc:CipherData><xenc:CipherValue>",
             '</ds:KeyInfo><xenc:CipherData><xenc:CipherReference URI="http://example.com/"/>'
             "<xenc:CipherValue>")]), "Expected element 'CipherValue' in"))
    cbc = document(content=names.cbc(256))
    _row("type-and-id", "what else may stand on the data", "XMLENC11 3.1",
         document(data_attributes=f' Id="_d" Type="{names.ELEMENT}" MimeType="text/xml"'),
         ("cbc", cbc, "without a signature around what is encrypted, CBC lets others decrypt it"),
         ("cbc-128", document(content=names.cbc(128), bits=128), "CBC lets others decrypt it"),
         ("tripledes", changed(document(), edit=[(names.gcm(256), names.XENC + "tripledes-cbc")]),
          "CBC lets others decrypt it"),
         ("other-cipher", document(edit=[(names.gcm(256), "urn:example:cipher")]),
          "Algorithm 'urn:example:cipher' of 'xenc:EncryptionMethod' at 1,"),
         ("encoding", document(data_attributes=' Encoding="base64"'),
          "Unexpected attribute 'Encoding' of 'xenc:EncryptedData' at 1,"))
    _row("no-type", "it should say that it is an element, and need not", "SAML-CORE 2.2.4",
         document(data_attributes=""),
         ("type-of-content", document(data_attributes=f' Type="{names.CONTENT}"'),
          f"is '{names.CONTENT}', expected '{names.ELEMENT}'"))


def _key_transport():
    section = "XMLENC11 5.5.2"
    wrapped = {"method": names.OAEP_MGF1P}
    newer = {"method": names.OAEP}
    _row("oaep-without-digest", "SHA-1 where nothing is said", section, _with_key(**wrapped),
         ("oaep-other-digest-than-said", _with_key(**wrapped, used_digest=names.SHA256), CLOSED),
         ("for-somebody-else", _with_key(to="foreign"), CLOSED),
         ("for-a-longer-key", _with_key(to="sts-second"), CLOSED),
         ("rsa-1-5", _with_key(method=names.RSA_1_5), "rsa-1_5' of 'xenc:EncryptionMethod' at 1,"),
         ("aes-key-wrap", _with_key(method=names.AES_KW), "is not accepted, expected RSA-OAEP"))
    _row("oaep-sha1", "SHA-1 by name", section, _with_key(**wrapped, digest=names.SHA1),
         ("oaep-md5", _with_key(**wrapped, digest=names.MD5),
          "is not accepted, expected SHA-1 or SHA-2"),
         ("oaep-two-digests", _with_key(
             **wrapped, digest=names.SHA1,
             parameters=f'<ds:DigestMethod xmlns:ds="{names.DS}" Algorithm="{names.SHA1}"/>'),
          "Unexpected element 'ds:DigestMethod' at 1,"))
    _row("oaep-sha256-mask-sha1", "the older name: the mask stays SHA-1", section,
         _with_key(**wrapped, digest=names.SHA256),
         ("oaep-mask-of-the-older-name", _with_key(
             **wrapped, digest=names.SHA256, mask=names.mgf("sha256")),
          "Unexpected element 'e11:MGF' at 1,"))
    _row("oaep-of-1-1", "the newer name without parameters", section, _with_key(**newer),
         ("label", _with_key(
             **newer, label=b"label",
             parameters='<xenc:OAEPparams>bGFiZWw=</xenc:OAEPparams>'),
          "Unexpected element 'xenc:OAEPparams' at 1,"),
         ("label-not-told", _with_key(**newer, label=b"label"), CLOSED))
    _row("oaep-sha256", "both on SHA-256", section,
         _with_key(**newer, digest=names.SHA256, mask=names.mgf("sha256")),
         ("oaep-other-mask-than-said", _with_key(
             **newer, digest=names.SHA256, mask=names.mgf("sha256"), used_mask=names.mgf("sha1")),
          CLOSED),
         ("oaep-mask-sha224", _with_key(
             **newer, digest=names.SHA256, mask=names.mgf("sha224")),
          "is not accepted, expected MGF1 with SHA-1 or SHA-2"))
    _row("oaep-sha384", "both on SHA-384, in the spelling of XML Signature", section,
         _with_key(**newer, digest=names.SHA384, mask=names.mgf("sha384")),
         ("oaep-two-masks", _with_key(
             **newer, digest=names.SHA384, mask=names.mgf("sha384"),
             parameters=f'<e11:MGF xmlns:e11="{names.XENC11}" Algorithm="{names.mgf("sha384")}"/>'),
          "Unexpected element 'e11:MGF' at 1,"))
    _row("oaep-sha384-of-xenc", "SHA-384 in the spelling of XML Encryption", "XMLENC11 5.8",
         _with_key(**newer, digest=names.SHA384_OF_XENC),
         ("oaep-digest-with-content", _with_key(**newer, parameters=(
             f'<ds:DigestMethod xmlns:ds="{names.DS}" Algorithm="{names.SHA384}"><x/>'
             "</ds:DigestMethod>")), "Unexpected element 'x' at 1,"))
    _row("oaep-sha512", "both on SHA-512", section,
         _with_key(**newer, digest=names.SHA512, mask=names.mgf("sha512")),
         ("key-octet-changed", changed(
             _with_key(**newer, digest=names.SHA512, mask=names.mgf("sha512")),
             edit=[("</xenc:EncryptionMethod><xenc:CipherData><xenc:CipherValue>",
                    "</xenc:EncryptionMethod><xenc:CipherData><xenc:CipherValue>AAAA")]), CLOSED))


def _key_places():
    section = "SAML-CORE 2.3.4"
    beside = {"place": "beside"}
    _row("key-inside", "in the KeyInfo of the data, with what tells whose it is", section,
         _with_key(attributes=' Id="_k" Recipient="https://app.example.com/entity"',
                   key_info="<ds:X509Data><ds:X509IssuerSerial/></ds:X509Data>"),
         ("no-key", document(keys=[]), "'saml:EncryptedAssertion' at 1,1 has no EncryptedKey"),
         ("agreement-instead-of-a-key", document(
             keys=[], key_info=f'<xenc:AgreementMethod Algorithm="{names.XENC11}ECDH-ES"/>'),
          "has no EncryptedKey"))
    retrieval = f'<ds:RetrievalMethod Type="{names.KEY_TYPE}" URI="#_k"/>'
    _row("key-beside", "next to the data, which refers to it, and it to the data", section,
         document(data_attributes=f' Id="_d" Type="{names.ELEMENT}"', key_info=retrieval, keys=[key(
             **beside, attributes=' Id="_k" Recipient="https://app.example.com/entity"',
             after='<xenc:ReferenceList><xenc:DataReference URI="#_d"/></xenc:ReferenceList>'
                   "<xenc:CarriedKeyName>k</xenc:CarriedKeyName>")]),
         ("key-elsewhere", document(keys=[], key_info=(
             f'<ds:RetrievalMethod Type="{names.KEY_TYPE}" URI="http://127.0.0.1/key"/>')),
          "has no EncryptedKey"),
         ("two-data", document(keys=[key(**beside)], edit=[(
             "</saml:EncryptedAssertion>",
             "<xenc:EncryptedData xmlns:xenc=\"" + names.XENC + "\"/></saml:EncryptedAssertion>")]),
          "Expected element 'EncryptedKey' in"))
    _row("key-beside-without-reference", "next to the data, and nothing says so", section,
         document(keys=[key(**beside)]),
         ("key-before-the-data", document(
             keys=[], edit=[("<xenc:EncryptedData", "<xenc:EncryptedKey xmlns:xenc=\"" + names.XENC
                             + "\"/><xenc:EncryptedData")]),
          "Expected element 'EncryptedData' in 'saml:EncryptedAssertion' at 1,1"),
         ("attribute-of-the-whole", document(edit=[(
             "<saml:EncryptedAssertion ", '<saml:EncryptedAssertion Id="x" ')]),
          "Unexpected attribute 'Id' of 'saml:EncryptedAssertion' at 1,1"))
    many = [key(to="foreign", **beside)] * 2 + [key(**beside)]
    _row("keys-for-several", "the same content for three, the last of whom we are", section,
         document(keys=many),
         ("keys-for-others", document(keys=many[:2]), CLOSED),
         ("seventeen-keys", document(keys=[many[0]] * 16 + [many[2]]),
          "More than 16 encrypted keys for one element"))
    _row("keys-at-both-places", "inside for another, beside for us", section,
         document(keys=[key(to="sts-second"), key(**beside)]),
         ("one-of-the-keys-by-rsa-1-5", document(
             keys=[key(to="sts-second", method=names.RSA_1_5), key(**beside)]),
          "is not accepted, expected RSA-OAEP"))
    alone = [(f'<saml:EncryptedAssertion xmlns:saml="{names.SAML}">', ""),
             ("</saml:EncryptedAssertion>", "")]
    _row("data-alone", "in a reply of WS-Trust, the data in the place of the assertion", "WST13 4.4",
         document(edit=alone),
         ("data-alone-without-key", document(edit=alone, keys=[]),
          "'xenc:EncryptedData' at 1,1 has no EncryptedKey"),
         ("data-alone-tag-changed", document(edit=alone, change=_flip(-1)), CLOSED))
    _row("key-info-of-web-services", "a reference of WS-Security is a hint like any", "WSS-CORE 7",
         _with_key(key_info=f'<wsse:SecurityTokenReference xmlns:wsse="{names.WSSE}"/>'),
         ("key-with-properties", _with_key(after="<xenc:EncryptionProperties/>"),
          "Unexpected element 'xenc:EncryptionProperties' at 1,"))
    _row("old-and-new-key", "two keys of ours, the second of which it is for", section, document(),
         ("neither-old-nor-new-key", _with_key(to="weak"), CLOSED), keys=("sts-second", "client"))


def _contents_of_the_text():
    section = "SAML-CORE 6.2"
    first = re.compile(r">")
    _row("pss-inside", "the signature of the assertion is inside", section,
         document(plain="okta-pss"),
         ("unsigned-inside", _inside(lambda text: re.sub(
             r"<ds:Signature.*</ds:Signature>", "", text, flags=re.DOTALL)),
          INSIDE + "'Assertion' at 1,1 is not signed"),
         ("tampered-inside", _inside(lambda text: text.replace("alice@", "admin@")),
          "token might have been tampered with", SIGNATURE),
         ("expired-inside", document(plain="/refused/opensaml-rsa-expired"),
          INSIDE + "The assertion has expired at"))
    _row("blanks-around", "what may stand around the element", "XML 2.1",
         _inside(lambda text: '<?xml version="1.0" encoding="UTF-8"?>\n <!-- x -->' + text + "\n"),
         ("doctype-inside", _inside(lambda text: "<!DOCTYPE a []>" + text), INSIDE, XML),
         ("two-inside", _inside(lambda text: text + text), INSIDE, XML),
         ("text-behind-it-inside", _inside(lambda text: text + "x"), INSIDE, XML),
         ("nothing-inside", _inside(lambda text: ""), INSIDE, XML),
         ("nul-inside", _inside(lambda text: text + "\0"), INSIDE, XML),
         ("not-utf-8-inside", _inside(
             lambda text: first.sub("><!-- \udcff -->", text, count=1)), INSIDE, XML))
    _row("its-own-declarations", "what is inside declares all its prefixes", "XMLENC11 4",
         document(plain="shibboleth-rsa"),
         ("declared-outside", document(
             plain="shibboleth-rsa",
             make_plain=lambda text: text.replace(f' xmlns:saml2="{names.SAML}"', "", 1),
             edit=[("<saml:EncryptedAssertion",
                    f'<saml:EncryptedAssertion xmlns:saml2="{names.SAML}"')]),
          INSIDE + "Expected element 'Assertion' of SAML 2.0, found 'saml2:Assertion' at 1,1"),
         ("other-element-inside", _inside(lambda text: "<a/>"),
          INSIDE + "Expected element 'Assertion' of SAML 2.0, found 'a' at 1,1"),
         ("wrapped-inside", _inside(lambda text: f"<a>{text}</a>"),
          INSIDE + "Expected element 'Assertion' of SAML 2.0, found 'a' at 1,1"))
    _row("holder-of-key-inside", "what it confirms does not matter", "SAML-CORE 2.3.4",
         document(plain="cxf-holder-of-key-ec"),
         ("encrypted-inside", _inside(lambda text: (
             f'<s:EncryptedAssertion xmlns:s="{names.SAML}">{text}</s:EncryptedAssertion>')),
          INSIDE + "Expected element 'Assertion' of SAML 2.0, found 's:EncryptedAssertion' at 1,1"),
         ("encrypted-name-inside", document(plain="/refused/auth0-rsa-encrypted-id"),
          "is not accepted, expected a NameID"))


_contents()
_key_transport()
_key_places()
_contents_of_the_text()
