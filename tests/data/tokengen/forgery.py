"""Tokens whose signature is missing its point: tampered, forged, wrapped, or outside the profile."""

import base64

from cryptography.hazmat.primitives.serialization import Encoding

from . import keys, names
from .accepted import DELEGATES, LEAN, LEAN_HOLDER, rsa_key_value
from .assertion import ID, key_info
from .catalogue import (
    MALFORMED, NOT_COVERED, OUTSIDE_PROFILE, RULE_SAYS_IT, SIGNATURE_SYNTAX, TAMPERED, outside,
    replaced, says, signed, syntax, value_of)

SYNTAX_OR_OUTSIDE = SIGNATURE_SYNTAX + OUTSIDE_PROFILE
BASE64_DIGITS = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/"
OTHER_ID = "_00000000-aaaa-bbbb-cccc-dddddddddddd"
XPATH = "http://www.w3.org/TR/1999/REC-xpath-19991116"
XPATH_FILTER2 = "http://www.w3.org/2002/06/xmldsig-filter2"
XSLT = "http://www.w3.org/TR/1999/REC-xslt-19991116"
BASE64_TRANSFORM = names.DS + "base64"
DECRYPT = "http://www.w3.org/2002/07/decrypt#XML"
STR_TRANSFORM = ("http://docs.oasis-open.org/wss/2004/01/"
                 "oasis-200401-wss-soap-message-security-1.0#STR-Transform")
MOVED_WHOLE = "the signed assertion is moved aside, with its signature"
TWICE = outside(f"Reference '#{ID}' names 2 elements of the document")
WSU = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd"


def add_all(catalogue):
    _tampering(catalogue)
    _other_keys(catalogue)
    _hmac(catalogue)
    _weak_algorithms(catalogue)
    _references(catalogue)
    _transforms(catalogue)
    _signature_shape(catalogue)
    _comments(catalogue)
    _duplicate_ids(catalogue)
    _wrapping(catalogue)


def expected(child, parent, found):
    return syntax(f"Expected element '{child}' in '{parent}', found {found}")


def surplus(child, parent):
    return syntax(f"Unexpected '{child}' in '{parent}'")


def only_text(element):
    return syntax(f"'{element}' must hold text and nothing else")


def no_algorithm(element):
    return syntax(f"'{element}' has no attribute 'Algorithm'")


def no_parameter(algorithm, parameter):
    return outside(f"Algorithm '{algorithm}' does not take the parameter '{parameter}'")


def no_signature_algorithm(algorithm):
    return outside(f"Signature algorithm '{algorithm}' is not accepted")


def no_canonicalization(algorithm):
    return outside(f"Canonicalization '{algorithm}' is not accepted")


def follows(algorithm):
    return outside(f"Transform '{algorithm}' follows a canonicalization")


def elsewhere(uri):
    return outside(f"Reference '{uri}' does not name the element that encloses the signature")


def _changed_digit(value, position):
    old = value[position]
    new = BASE64_DIGITS[(BASE64_DIGITS.index(old) + 1) % 64]
    return value[:position] + new + value[position + 1:]


def _tampering(c):
    good = signed(LEAN.but(renew_count="1"))

    def add(name, *edits, refusals=TAMPERED, text=good, rule="tampering"):
        for edit in edits:
            text = replaced(text, *edit)
        c.refuse(f"{rule}/tampered-{name}", RULE_SAYS_IT, text, refusals, "invalid")

    def add_value(name, *edits, refusals=OUTSIDE_PROFILE + TAMPERED + SIGNATURE_SYNTAX):
        add(name, *edits, refusals=refusals, rule="signature-values")
    digest, value = value_of(good, "DigestValue"), value_of(good, "SignatureValue")
    for name, position in (("first", 0), ("middle", 20)):
        add(f"digest-{name}-digit", (digest, _changed_digit(digest, position)))
    for name, position in (("first", 0), ("middle", 170), ("last", 340)):
        add(f"signature-{name}-digit", (value, _changed_digit(value, position)))
    add("digest-of-another", (digest, base64.b64encode(bytes(32)).decode()))
    add("signature-of-another", (value, value_of(signed(LEAN), "SignatureValue")))
    add_value("digest-empty", (digest, ""))
    add_value("digest-cut", (digest, digest[:40]))
    add_value("digest-longer",
              (digest, base64.b64encode(base64.b64decode(digest) + b"\0").decode()))
    add_value("signature-empty", (value, ""))
    add_value("signature-cut", (value, value[:-4]))
    longer = base64.b64encode(base64.b64decode(value) + b"\0").decode()
    add_value("signature-longer", (value, longer))
    zero_led = base64.b64encode(b"\0" + base64.b64decode(value)).decode()
    add_value("signature-zero-led", (value, zero_led))
    add_value("signature-zeros", (value, base64.b64encode(bytes(256)).decode()),
              refusals=TAMPERED)
    add_value("signature-ones", (value, base64.b64encode(b"\xff" * 256).decode()),
              refusals=TAMPERED)
    for name, bad in (("bad-digit", "*" + value[1:]), ("url-alphabet", "-_" + value[2:]),
                      ("padding-inside", value[:100] + "=" + value[101:])):
        add_value(f"signature-{name}", (value, bad))
    add("subject", ("user@example.com", "admin@example.com"))
    add("group", ("example.com\\Users", "example.com\\Administrators"))
    add("issuer", ("https://sts.example.com/STS", "https://sts.example.com/STT"))
    add("one-attribute", ('Count="1"', 'Count="2"'))
    add("attribute-added", ("<saml:AuthnContextClassRef>", '<saml:AuthnContextClassRef a="b">'))
    add("end", ('NotOnOrAfter="2026-12-31', 'NotOnOrAfter="2036-12-31', 2))
    add("element-removed", (LEAN.attribute(names.GIVEN_NAME, ["Ada"]), ""))
    add("element-added", ("</saml:AttributeStatement>",
                          LEAN.attribute(names.SOLUTION, ["true"]) + "</saml:AttributeStatement>"))
    add("blank-added", ("<saml:Subject>", "<saml:Subject> "))
    add("line-ends", ("\n<saml:Subject>", "&#13;\n<saml:Subject>"))
    add("prefix-renamed", ("<saml:Subject>", f'<s:Subject xmlns:s="{names.SAML}">'),
        ("</saml:Subject>", "</s:Subject>"))
    add("confirmation-certificate",
        (keys.certificate_base64("client"), keys.certificate_base64("foreign")),
        text=signed(LEAN_HOLDER))
    add("attribute-in-signed-info", ("<ds:SignedInfo>", '<ds:SignedInfo Id="a">'))
    add("blank-in-signed-info", ("<ds:SignedInfo>", "<ds:SignedInfo> "))
    add("reference-made-empty", (f'URI="#{ID}"', 'URI=""'))
    add("digest-method", (names.SHA256 + '"', names.SHA512 + '"'),
        refusals=OUTSIDE_PROFILE + TAMPERED)
    add("signature-method", (names.RSA_SHA256, names.RSA_SHA512))
    add("canonicalization",
        (f'<ds:CanonicalizationMethod Algorithm="{names.EXC_C14N}"',
         f'<ds:CanonicalizationMethod Algorithm="{names.C14N}"'))
    add("transform", (f'<ds:Transform Algorithm="{names.EXC_C14N}"',
                      f'<ds:Transform Algorithm="{names.C14N}"'))
    inclusive = LEAN.signed_as(c14n=names.C14N, transforms=(names.ENVELOPED, names.C14N))
    add("unused-declaration-inclusive", ("<saml:Subject>", '<saml:Subject xmlns:a="urn:a">'),
        text=signed(inclusive))
    add("declaration-changed-inclusive", (names.XS + '"', 'urn:xs"'), text=signed(inclusive))
    listed = signed(LEAN.signed_as(transform_prefixes="xs"))
    add("listed-declaration", (names.XS + '"', 'urn:xs"'), text=listed)
    add("prefix-list", ('PrefixList="xs"', 'PrefixList="xsi"'), text=listed)
    whole = signed(LEAN.signed_as(uri=""))
    add("instruction-before-root", ("<saml:Assertion ", "<?a b?><saml:Assertion "), text=whole,
        refusals=TAMPERED + OUTSIDE_PROFILE + MALFORMED)
    add("instruction-after-root", ("</saml:Assertion>", "</saml:Assertion><?a b?>"), text=whole,
        refusals=TAMPERED + OUTSIDE_PROFILE + MALFORMED)


def _other_keys(c):
    def add(name, about, text, refusals, rule="signing-key", **conditions):
        c.refuse(f"{rule}/key-{name}", about, text, refusals, "invalid", **conditions)
    any_way = TAMPERED + OUTSIDE_PROFILE
    add("foreign", "another key of the same name signed", signed(LEAN, key="foreign"), TAMPERED)
    add("foreign-own-certificate", "the signer brings its own certificate",
        signed(LEAN.signed_as(key_info=key_info("foreign")), key="foreign"), OUTSIDE_PROFILE)
    add("foreign-trusted-certificate", "another key signed, KeyInfo shows the trusted certificate",
        signed(LEAN.signed_as(key_info=key_info("sts")), key="foreign"), TAMPERED)
    add("foreign-both-certificates", "KeyInfo shows the trusted certificate and its own",
        signed(LEAN.signed_as(key_info=key_info("sts", "foreign")), key="foreign"), TAMPERED)
    add("foreign-key-value", "the signer brings its bare key",
        signed(LEAN.signed_as(key_info=rsa_key_value("foreign")), key="foreign"), any_way)
    add("client", "the holder of the key signed for itself", signed(LEAN_HOLDER, key="client"), TAMPERED)
    c.refuse("signing-key/key-info-untrusted",
             "a trusted key signed, but KeyInfo shows another certificate",
             signed(LEAN.signed_as(key_info=key_info("foreign"))), OUTSIDE_PROFILE, "valid")
    c.refuse("signing-key/key-info-picks-another",
             "a trusted key signed, KeyInfo picks another trusted one",
             signed(LEAN.signed_as(key_info=key_info("sts-second"))), TAMPERED, "valid",
             trust=["sts", "sts-second"])
    almost = keys.certificate_base64("sts")
    almost = almost[:-8] + _changed_digit(almost[-8:], 0)
    c.refuse("signing-key/key-info-almost-trusted", "one bit of the certificate in KeyInfo differs",
             signed(LEAN.signed_as(key_info=key_info("sts"))).replace(
                 keys.certificate_base64("sts"), almost), OUTSIDE_PROFILE)
    c.refuse("signing-key/key-none-trusted", "nobody is trusted", signed(LEAN),
             outside("There are no trusted certificates"), trust=[])
    add("other-kind", "an RSA signature where an elliptic curve is trusted", signed(LEAN),
        OUTSIDE_PROFILE, trust=["sts-p256"])
    add("other-curve", "the same algorithm by a key of another curve",
        signed(LEAN.signed_as(method=names.ECDSA_SHA256), key="sts-p256"), any_way,
        trust=["sts-p384"])
    add("method-of-other-kind", "an ECDSA method where RSA is trusted",
        signed(LEAN.signed_as(method=names.ECDSA_SHA256), key="sts-p256"), OUTSIDE_PROFILE)
    c.refuse("signing-key/key-weak", "a trusted RSA key of 1024 bits", signed(LEAN, key="weak"),
             OUTSIDE_PROFILE, "valid", trust=["weak"])
    c.refuse("signing-key/key-weak-picked", "the weak key among strong ones",
             signed(LEAN.signed_as(key_info=key_info("weak")), key="weak"), OUTSIDE_PROFILE,
             "valid", trust=["sts", "weak"])
    ecdsa = signed(LEAN.signed_as(method=names.ECDSA_SHA256), key="sts-p256")
    value = value_of(ecdsa, "SignatureValue")
    for name, forged in (("zeros", bytes(64)), ("odd-length", base64.b64decode(value)[:-1]),
                         ("longer", base64.b64decode(value) + b"\0"),
                         ("der", _der(base64.b64decode(value)))):
        add(f"ecdsa-{name}", "an ECDSA value of a wrong form",
            ecdsa.replace(value, base64.b64encode(forged).decode()), any_way, "signature-values",
            trust=["sts-p256"])


def _der(plain):
    from cryptography.hazmat.primitives.asymmetric.utils import encode_dss_signature
    half = len(plain) // 2
    return encode_dss_signature(
        int.from_bytes(plain[:half], "big"), int.from_bytes(plain[half:], "big"))


def _hmac(c):
    certificate = keys.certificate("sts")
    for name, secret in (
            ("public-key-pem", keys.public_key_bytes("sts", Encoding.PEM)),
            ("public-key-der", keys.public_key_bytes("sts", Encoding.DER)),
            ("certificate-pem", certificate.public_bytes(Encoding.PEM)),
            ("certificate-der", certificate.public_bytes(Encoding.DER)),
            ("modulus", keys.modulus_bytes("sts")), ("empty", b"")):
        c.refuse(f"algorithms/hmac-{name}", "HMAC keyed with what everybody knows",
                 signed(LEAN.signed_as(method=names.HMAC_SHA256), hmac_key=secret),
                 no_signature_algorithm(names.HMAC_SHA256))
    method = f'<ds:SignatureMethod Algorithm="{names.HMAC_SHA256}"/>'
    c.refuse("algorithms/hmac-cut-to-nothing", "HMACOutputLength of zero",
             signed(LEAN.signed_as(method=names.HMAC_SHA256),
                    (method, method.replace("/>", "><ds:HMACOutputLength>0</ds:HMACOutputLength>"
                                            "</ds:SignatureMethod>")),
                    hmac_key=b"", value_form=lambda text: ""), SYNTAX_OR_OUTSIDE)


def _weak_algorithms(c):
    def add(name, refusals, token, key="sts", trust=None, xmlsec1="none"):
        c.refuse("algorithms/algorithm-" + name, RULE_SAYS_IT, signed(token, key=key), refusals,
                 xmlsec1, trust=trust or ["sts"])

    def add_method(name, method, *signer, **opinion):
        add(name, no_signature_algorithm(method), LEAN.signed_as(method=method), *signer, **opinion)

    def add_digest(name, digest, **opinion):
        add(name, outside(f"Digest algorithm '{digest}' is not accepted"),
            LEAN.signed_as(digest=digest), **opinion)
    add_method("rsa-sha1", names.RSA_SHA1, xmlsec1="valid")
    add_method("rsa-md5", names.RSA_MD5)
    add_method("ecdsa-sha1", names.ECDSA_SHA1, "sts-p256", ["sts-p256"], xmlsec1="valid")
    add_method("hmac-sha1-named", names.HMAC_SHA1.replace("hmac", "rsa") + "x")
    add_digest("digest-sha1", names.SHA1, xmlsec1="valid")
    add_digest("digest-md5", names.MD5)
    for name, method in (("unknown", "urn:unknown"), ("empty", ""), ("blank", names.RSA_SHA256 + " "),
                         ("upper-case", names.RSA_SHA256.upper()), ("digest", names.SHA256),
                         ("pss", "http://www.w3.org/2007/05/xmldsig-more#sha256-rsa-MGF1")):
        add_method(f"method-{name}", method)
        add_digest(f"digest-{name}", method if name != "digest" else names.RSA_SHA256)
    for name, method in (
            ("unknown", "urn:unknown"), ("empty", ""), ("c14n11", "http://www.w3.org/2006/12/xml-c14n11"),
            ("with-comments", names.C14N + "#WithComments"),
            ("exclusive-with-comments", names.EXC_C14N + "WithComments"),
            ("enveloped", names.ENVELOPED)):
        add(f"c14n-{name}", no_canonicalization(method), LEAN.signed_as(c14n=method),
            xmlsec1="valid" if "comments" in name else "none")


def _references(c):
    def add(name, refusals, *edits, token=LEAN, rule="signature-coverage"):
        c.refuse(f"{rule}/reference-{name}", RULE_SAYS_IT, signed(token, *edits), refusals)

    def uri(value):
        return LEAN.signed_as(uri=value)
    for name, value in (
            ("http", "http://attacker.example/token.xml"), ("file", "file:///etc/passwd"),
            ("relative-file", "token.xml"), ("absolute-path", "/etc/passwd"),
            ("xpointer-root", "#xpointer(/)"), ("xpointer-id", f"#xpointer(id('{ID}'))"),
            ("element-scheme", "#element(/1)"), ("other-id", "#_other"), ("hash-only", "#"),
            ("id-without-hash", ID),
            ("letter-for-hash", "x" + ID), ("longer-id", f"#{ID}2"), ("shorter-id", f"#{ID[:-1]}"),
            ("id-in-other-case", "#" + ID.upper()),
            ("id-with-blank", f"#{ID} "), ("id-percent-encoded", "#%5f" + ID[1:]),
            ("document-and-id", f"token.xml#{ID}"), ("query-and-id", f"?#{ID}"),
            ("two-hashes", f"##{ID}"), ("blank", " "), ("cid", "cid:token")):
        add(name, NOT_COVERED, token=uri(value))
    add("absent-uri", syntax("'Reference' has no attribute 'URI'"), (f' URI="#{ID}"', ""),
        rule="signature-structure")
    child = ("<saml:AuthnContextClassRef>", '<saml:AuthnContextClassRef ID="_child">')
    add("child", NOT_COVERED, child, token=uri("#_child"))
    value = ("<ds:SignatureValue>", '<ds:SignatureValue ID="_child">')
    add("signature-value", NOT_COVERED, value, token=uri("#_child"))
    info = ("<ds:KeyInfo>", '<ds:KeyInfo Id="_child">')
    add("key-info", NOT_COVERED, info,
        token=LEAN.signed_as(uri="#_child", key_info="<ds:KeyInfo></ds:KeyInfo>"))
    reference = LEAN.signature.text()
    reference = reference[reference.index("<ds:Reference "):]
    reference = reference[:reference.index("</ds:SignedInfo>")]
    for name, other in (("http", "http://attacker.example/a"), ("file", "file:///dev/zero"),
                        ("unknown-id", "#_nowhere"), ("child", "#_child"),
                        ("xpointer", "#xpointer(/)")):
        second = replaced(reference, f"#{ID}", other)
        add(f"second-{name}", elsewhere(other), child, (reference, reference + second))
        add(f"first-{name}", elsewhere(other), child, (reference, second + reference))
    add("none", NOT_COVERED, (reference, ""))
    second_info = expected("SignatureValue", "Signature", "'ds:SignedInfo'")
    add("two-signed-infos", second_info,
        ("</ds:SignedInfo>", f"</ds:SignedInfo><ds:SignedInfo>{reference}</ds:SignedInfo>"),
        rule="signature-structure")
    # The second, genuine SignedInfo stands where a careless search finds it first.
    good = signed(LEAN)
    info = good[good.index("<ds:SignedInfo>"):good.index("<ds:SignatureValue>")]
    forged = replaced(info, value_of(good, "DigestValue"), base64.b64encode(bytes(32)).decode())
    for name, order in (("genuine-first", info + forged), ("forged-first", forged + info)):
        c.refuse(f"signature-structure/reference-two-signed-infos-{name}", "a second SignedInfo",
                 replaced(good, info, order), second_info)
    hidden = replaced(good, info, forged).replace(
        "</ds:Signature>", f"<ds:Object>{info}</ds:Object></ds:Signature>")
    c.refuse("signature-structure/reference-signed-info-in-object",
             "the genuine SignedInfo hides in an Object", hidden, surplus("ds:Object", "Signature"))


def _transforms(c):
    end = "</ds:Transforms>"
    enveloped = f'<ds:Transform Algorithm="{names.ENVELOPED}"/>'
    exclusive = f'<ds:Transform Algorithm="{names.EXC_C14N}"/>'

    def add(name, refusals, *edits, token=LEAN, xmlsec1="none"):
        c.refuse("transforms/transform-" + name, RULE_SAYS_IT, signed(token, *edits),
                 refusals, xmlsec1)

    def transform(algorithm, content=""):
        return f'<ds:Transform Algorithm="{algorithm}">{content}</ds:Transform>'
    not_signature = transform(XPATH, "<ds:XPath>not(ancestor-or-self::ds:Signature)</ds:XPath>")
    third = follows(names.EXC_C14N)
    add("xpath", no_canonicalization(XPATH), (enveloped, enveloped + not_signature), xmlsec1="valid")
    add("xpath-everything", no_canonicalization(XPATH),
        (enveloped, enveloped + transform(XPATH, "<ds:XPath>true()</ds:XPath>")), xmlsec1="valid")
    add("xpath-nothing", no_canonicalization(XPATH),
        (enveloped, enveloped + transform(XPATH, "<ds:XPath>false()</ds:XPath>")))
    add("xpath-filter2", no_canonicalization(XPATH_FILTER2),
        (enveloped, enveloped + transform(
            XPATH_FILTER2, f'<f:XPath xmlns:f="{XPATH_FILTER2}" Filter="intersect">/</f:XPath>')))
    stylesheet = ('<x:stylesheet xmlns:x="http://www.w3.org/1999/XSL/Transform" version="1.0">'
                  '<x:template match="/"><x:copy-of select="."/></x:template></x:stylesheet>')
    add("xslt", no_canonicalization(XSLT), (exclusive, transform(XSLT, stylesheet) + exclusive))
    add("base64", no_canonicalization(BASE64_TRANSFORM), (exclusive, transform(BASE64_TRANSFORM)))
    add("decrypt", no_canonicalization(DECRYPT), (exclusive, transform(DECRYPT) + exclusive))
    add("str", no_canonicalization(STR_TRANSFORM), (exclusive, transform(STR_TRANSFORM)))
    add("unknown", no_canonicalization("urn:unknown"), (exclusive, transform("urn:unknown")))
    add("empty-name", no_canonicalization(""), (exclusive, transform("")))
    add("no-name", no_algorithm("Transform"), (exclusive, "<ds:Transform></ds:Transform>"))
    c14n11 = "http://www.w3.org/2006/12/xml-c14n11"
    add("c14n11", no_canonicalization(c14n11),
        token=LEAN.signed_as(transforms=(names.ENVELOPED, c14n11)))
    first = outside(
        f"Transform '{names.EXC_C14N}' stands where enveloped-signature must")
    add("c14n-before-enveloped", first, token=LEAN.signed_as(
        transforms=(names.EXC_C14N, names.ENVELOPED)))
    add("c14n-twice", third, token=LEAN.signed_as(
        transforms=(names.ENVELOPED, names.EXC_C14N, names.EXC_C14N)))
    add("c14n-two-kinds", follows(names.C14N), token=LEAN.signed_as(
        transforms=(names.ENVELOPED, names.EXC_C14N, names.C14N)))
    add("enveloped-twice", no_canonicalization(names.ENVELOPED), token=LEAN.signed_as(
        transforms=(names.ENVELOPED, names.ENVELOPED, names.EXC_C14N)))
    # Without removing the signature first no digest can match either.
    add("c14n-only", first, token=LEAN.signed_as(transforms=(names.EXC_C14N,)))
    for name, algorithm in (("inclusive", names.C14N + "#WithComments"),
                            ("exclusive", names.EXC_C14N + "WithComments")):
        add(f"{name}-with-comments", no_canonicalization(algorithm),
            token=LEAN.signed_as(transforms=(names.ENVELOPED, algorithm)), xmlsec1="valid")
    add("none", expected("Transform", "Transforms", "nothing"), (enveloped + exclusive, ""))
    add("no-list", outside("The reference has no enveloped-signature transform"),
        (f"<ds:Transforms>{enveloped}{exclusive}{end}", ""))
    add("list-twice", expected("DigestMethod", "Reference", "'ds:Transforms'"), (end, end + f"<ds:Transforms>{exclusive}{end}"))
    add("other-child", expected("Transform", "Transforms", "'ds:Other'"), (end, f"<ds:Other></ds:Other>{end}"))
    add("many", third, (exclusive, exclusive * 50))
    add("enveloped-with-content", no_parameter(names.ENVELOPED, "ds:XPath"),
        (enveloped, transform(names.ENVELOPED, "<ds:XPath>1</ds:XPath>")))
    add("c14n-with-xpath", no_parameter(names.EXC_C14N, "ds:XPath"),
        (exclusive, transform(names.EXC_C14N, "<ds:XPath>1</ds:XPath>")))


def _signature_shape(c):
    good = signed(LEAN)
    info = good[good.index("<ds:SignedInfo>"):good.index("<ds:SignatureValue>")]
    value = good[good.index("<ds:SignatureValue>"):good.index("</ds:Signature>")]
    method = f'<ds:SignatureMethod Algorithm="{names.RSA_SHA256}"/>'
    c14n = (f'<ds:CanonicalizationMethod Algorithm="{names.EXC_C14N}"/>')
    digest_method = f'<ds:DigestMethod Algorithm="{names.SHA256}"/>'
    digest = "<ds:DigestValue>@DIGEST@</ds:DigestValue>"

    def add(name, refusals, *edits):
        c.refuse("signature-structure/shape-" + name, RULE_SAYS_IT, signed(LEAN, *edits), refusals)

    def add_changed(name, refusals, *edits):
        text = good
        for edit in edits:
            text = replaced(text, *edit)
        c.refuse("signature-structure/shape-" + name, RULE_SAYS_IT, text, refusals)
    no_object = surplus("ds:Object", "Signature")
    add_changed("empty", expected("SignedInfo", "Signature", "nothing"), (info + value, ""))
    add_changed("no-signed-info", expected("SignedInfo", "Signature", "'ds:SignatureValue'"), (info, ""))
    add_changed("no-value", expected("SignatureValue", "Signature", "nothing"), (value, ""))
    add_changed("value-first", expected("SignedInfo", "Signature", "'ds:SignatureValue'"),
                (info + value, value + info))
    add_changed("value-twice", surplus("ds:SignatureValue", "Signature"), (value, value * 2))
    add_changed("key-info-twice", surplus("ds:KeyInfo", "Signature"),
                (value, value + key_info("sts") * 2))
    add_changed("key-info-first", expected("SignedInfo", "Signature", "'ds:KeyInfo'"),
                (info, key_info("sts") + info))
    add_changed("text", syntax("Unexpected text in 'Signature'"), (value, value + "text"))
    add_changed("unknown-last", surplus("ds:Other", "Signature"), (value, value + "<ds:Other/>"))
    add_changed("foreign-last", surplus("x:Other", "Signature"),
                (value, value + '<x:Other xmlns:x="urn:x"/>'))
    add_changed("value-with-element", only_text("SignatureValue"),
                (value, value.replace("</ds:SignatureValue>", "<ds:a/></ds:SignatureValue>")))
    add_changed("key-info-empty-certificate", only_text("X509Certificate"),
                (value, value + "<ds:KeyInfo><ds:X509Data><ds:X509Certificate/></ds:X509Data>"
                 "</ds:KeyInfo>"))
    add_changed("key-info-bad-base64",
                syntax("'X509Certificate' is not Base64: Base64 text has a character that is no "
                       "digit at position 0"),
                (value, value + "<ds:KeyInfo><ds:X509Data><ds:X509Certificate>*?*"
                 "</ds:X509Certificate></ds:X509Data></ds:KeyInfo>"))
    add_changed("object-empty", no_object, (value, value + "<ds:Object/>"))
    add_changed("object-twice", no_object, (value, value + "<ds:Object>a</ds:Object><ds:Object/>"))
    manifest = ('<ds:Manifest Id="m">'
                + good[good.index("<ds:Reference "):good.index("</ds:SignedInfo>")]
                + "</ds:Manifest>")
    add_changed("manifest-in-object", no_object, (value, value + f"<ds:Object>{manifest}</ds:Object>"))
    add_changed("properties-in-object", no_object,
                (value, value + "<ds:Object><ds:SignatureProperties/></ds:Object>"))
    add("manifest-reference", no_object,
        (f'URI="#{ID}"', 'URI="#m" Type="' + names.DS + 'Manifest"'),
        ("</ds:Signature>", f"<ds:Object>{manifest}</ds:Object></ds:Signature>"))
    no_c14n = expected("CanonicalizationMethod", "SignedInfo", "'ds:SignatureMethod'")
    add("no-c14n", no_c14n, (c14n, ""))
    add("no-method", expected("SignatureMethod", "SignedInfo", "'ds:Reference'"), (method, ""))
    no_digest_method = expected("DigestMethod", "Reference", "'ds:DigestValue'")
    add("no-digest-method", no_digest_method, (digest_method, ""))
    add("c14n-after-method", no_c14n, (c14n + method, method + c14n))
    add("method-twice", expected("Reference", "SignedInfo", "'ds:SignatureMethod'"),
        (method, method * 2))
    add("c14n-twice", expected("SignatureMethod", "SignedInfo", "'ds:CanonicalizationMethod'"),
        (c14n, c14n * 2))
    add("digest-method-twice", expected("DigestValue", "Reference", "'ds:DigestMethod'"),
        (digest_method, digest_method * 2))
    add("digest-first", no_digest_method, (digest_method + digest, digest + digest_method))
    add("method-no-algorithm", no_algorithm("SignatureMethod"), (method, "<ds:SignatureMethod/>"))
    add("digest-no-algorithm", no_algorithm("DigestMethod"), (digest_method, "<ds:DigestMethod/>"))
    add("digest-in-two-elements", surplus("ds:DigestValue", "Reference"),
        (digest, digest + "<ds:DigestValue>AAAA</ds:DigestValue>"))
    add("digest-with-element", only_text("DigestValue"),
        (digest, digest.replace("</", "<ds:a></ds:a></")))
    add("text-in-signed-info", syntax("Unexpected text in 'SignedInfo'"),
        ("<ds:SignedInfo>", "<ds:SignedInfo>text"))
    add("text-in-reference", syntax("Unexpected text in 'Reference'"),
        ("<ds:Transforms>", "text<ds:Transforms>"))
    add("other-in-signed-info", expected("Reference", "SignedInfo", "'ds:Other'"),
        (method, method + "<ds:Other></ds:Other>"))
    add_changed("signed-info-other-namespace", expected("SignedInfo", "Signature", "'x:SignedInfo'"),
                ("<ds:SignedInfo>", '<x:SignedInfo xmlns:x="urn:x">'),
                ("</ds:SignedInfo>", "</x:SignedInfo>"))


def _comments(c):
    good = signed(LEAN)

    def add(name, element, text=good):
        position = text.index(f"<ds:{element}>") + len(f"<ds:{element}>") + 10
        c.refuse("signature-structure/comment-in-" + name, "a comment inside a value of the signature",
                 text[:position] + "<!-- -->" + text[position:], only_text(element))
    add("digest-value", "DigestValue")
    add("signature-value", "SignatureValue")
    with_certificate = signed(LEAN.signed_as(key_info=key_info("sts")))
    position = with_certificate.index("<ds:X509Certificate>") + 60
    c.refuse("signature-structure/comment-in-key-info-certificate",
             "a comment inside KeyInfo's certificate",
             with_certificate[:position] + "<!-- -->" + with_certificate[position:],
             only_text("X509Certificate"))
    for name, element in (("digest-value", "DigestValue"), ("signature-value", "SignatureValue")):
        c.refuse(f"signature-structure/instruction-in-{name}",
                 "a processing instruction inside a value",
                 replaced(good, f"</ds:{element}>", f"<?a?></ds:{element}>"), only_text(element))


def _duplicate_ids(c):
    def add(name, *edits, token=LEAN):
        c.refuse("duplicate-ids/duplicate-" + name, RULE_SAYS_IT, signed(token, *edits), TWICE)
    value = '<saml:AttributeValue xsi:type="xs:string">Ada'
    for name, attribute in (
            ("id", f'ID="{ID}"'), ("id-mixed-case", f'Id="{ID}"'), ("id-lower-case", f'id="{ID}"'),
            ("wsu-id", f'xmlns:wsu="{WSU}" wsu:Id="{ID}"'), ("xml-id", f'xml:id="{ID}"'),
            ("foreign-id", f'xmlns:x="urn:x" x:Id="{ID}"'),
            ("odd-case", f'iD="{ID}"')):
        add(name, (value, value.replace(" xsi:", f" {attribute} xsi:")))
    add("id-in-class-ref",
        ("<saml:AuthnContextClassRef>", f'<saml:AuthnContextClassRef ID="{ID}">'))
    add("id-in-signature", ("<ds:Signature ", f'<ds:Signature Id="{ID}" '))
    add("id-in-key-info", ("<ds:KeyInfo>", f'<ds:KeyInfo Id="{ID}">'),
        token=LEAN.signed_as(key_info=key_info("sts")))
    add("id-in-signature-value",
        ("<ds:SignatureValue>", f'<ds:SignatureValue Id="{ID}">'))


def _wrapping(c):
    """The well known permutations: the signed assertion is moved aside, another takes its place."""
    _wrap_all(c, "other-id", OTHER_ID, "#" + ID, whole_too=False)
    _wrap_all(c, "same-id", ID, "#" + ID, whole_too=True)
    _wrap_all(c, "empty-reference", ID, "", whole_too=False)


def _wrap_all(c, name, evil_id, uri, whole_too):
    """whole_too: the assertion is moved with its signature as well as without."""
    original = signed(LEAN.signed_as(uri=uri))
    start, end = original.index("<ds:Signature "), original.index("</ds:Signature>") + 15
    signature = original[start:end]
    bare = original[:start] + original[end:]
    evil = LEAN.but(id=evil_id, subject=("admin", "example.com"), delegates=DELEGATES[:1],
                    audience=["urn:a"]).text()
    evil_start = evil.index("<ds:Signature ")
    evil = evil[:evil_start] + "@SIGNATURE@" + evil[evil.index("</ds:Signature>") + 15:]
    not_covered = evil_id != ID and uri != ""
    if not_covered:
        judged = NOT_COVERED
    else:
        judged = TWICE if uri else TAMPERED

    def add(place, refusals, before, after):
        text = replaced(evil, before, after).replace("@SIGNATURE@", signature)
        c.refuse(f"wrapping/wrapped-{place}-{name}", RULE_SAYS_IT, text,
                 NOT_COVERED if not_covered else refusals)

    def in_signature(place, refusals, open_tag, close_tag, content):
        inside = signature.replace("</ds:Signature>", open_tag + content + close_tag
                                   + "</ds:Signature>")
        text = evil.replace("@SIGNATURE@", inside)
        c.refuse(f"wrapping/wrapped-{place}-{name}", RULE_SAYS_IT, text, refusals)
    in_signature("signature-child", surplus("saml:Assertion", "Signature"), "", "", bare)
    for form, moved in (("", bare), ("-with-signature", original))[:1 + whole_too]:
        in_signature("object" + form, surplus("ds:Object", "Signature"),
                     "<ds:Object>", "</ds:Object>", moved)
        # Nothing of KeyInfo is looked at but certificates, so only the reference can tell.
        in_signature("key-info" + form, judged, "<ds:KeyInfo>", "</ds:KeyInfo>", moved)
        add("delegate" + form, says("Unexpected elements after NameID"),
            "</del:Delegate>", f"{moved}</del:Delegate>")
        if uri:
            _wrap_where_structure_forbids(add, form, moved)
    if not uri:
        return
    text = replaced(evil, "<saml:Issuer ", original + "<saml:Issuer ").replace("@SIGNATURE@", "")
    c.refuse(f"wrapping/wrapped-first-child-{name}", MOVED_WHOLE, text,
             says("Expected element 'Issuer' not found."))
    text = evil.replace("@SIGNATURE@", original)
    c.refuse(f"wrapping/wrapped-in-place-of-signature-{name}", MOVED_WHOLE, text,
             syntax("Expected element 'Signature', found 'saml:Assertion'"))
    response = '<samlp:Response xmlns:samlp="urn:oasis:names:tc:SAML:2.0:protocol">'
    c.refuse(f"wrapping/wrapped-in-response-{name}", "both assertions stand in a response",
             response + evil.replace("@SIGNATURE@", "") + original + "</samlp:Response>",
             says("Expected element 'Assertion' not found."))


def _wrap_where_structure_forbids(add, form, moved):
    add("advice" + form, says("Expected element 'RSAAdvice' not found."),
        "<saml:AuthnStatement ", f"<saml:Advice>{moved}</saml:Advice><saml:AuthnStatement ")
    add("attribute-value" + form,
        says("Element 'AttributeValue' must only have textual content (but has extra children "
             "or is empty)."), ">Ada</saml:AttributeValue>", f">{moved}</saml:AttributeValue>")
    add("subject" + form, says("Unexpected elements after SubjectConfirmation"),
        "</saml:Subject>", f"{moved}</saml:Subject>")
    add("conditions" + form,
        says("Unknown or duplicate restriction node under Conditions: Assertion"),
        "</saml:Conditions>", f"{moved}</saml:Conditions>")
    add("last-child" + form, says("Unexpected elements under Assertion"),
        "</saml:Assertion>", f"{moved}</saml:Assertion>")
    add("class-ref" + form,
        says("Element 'AuthnContextClassRef' must only have textual content (but has extra "
             "children or is empty)."),
        f">{names.PASSWORD_CONTEXT}<", f">{moved}<")
    add("audience" + form,
        says("Element 'Audience' must only have textual content (but has extra children or is "
             "empty)."), ">urn:a<", f">{moved}<")
