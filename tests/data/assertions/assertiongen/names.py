"""Namespaces, identifiers and times of the documents."""

SAML = "urn:oasis:names:tc:SAML:2.0:assertion"
DS = "http://www.w3.org/2000/09/xmldsig#"
DS11 = "http://www.w3.org/2009/xmldsig11#"
DEL = "urn:oasis:names:tc:SAML:2.0:conditions:delegation"
RSA = "http://www.rsa.com/names/2009/12/std-ext/SAML2.0"
XS = "http://www.w3.org/2001/XMLSchema"
XSI = "http://www.w3.org/2001/XMLSchema-instance"

C14N = "http://www.w3.org/TR/2001/REC-xml-c14n-20010315"
EXC_C14N = "http://www.w3.org/2001/10/xml-exc-c14n#"
ENVELOPED = DS + "enveloped-signature"

_MORE = "http://www.w3.org/2001/04/xmldsig-more#"
_PSS = "http://www.w3.org/2007/05/xmldsig-more#%s-rsa-MGF1"
RSA_SHA1 = DS + "rsa-sha1"
ECDSA_SHA1 = _MORE + "ecdsa-sha1"
RSA_PSS_SHA1 = _PSS % "sha1"
SHA1 = DS + "sha1"
SHA256 = "http://www.w3.org/2001/04/xmlenc#sha256"

BEARER = "urn:oasis:names:tc:SAML:2.0:cm:bearer"
HOLDER_OF_KEY = "urn:oasis:names:tc:SAML:2.0:cm:holder-of-key"
SENDER_VOUCHES = "urn:oasis:names:tc:SAML:2.0:cm:sender-vouches"

_FORMAT_1 = "urn:oasis:names:tc:SAML:1.1:nameid-format:"
_FORMAT_2 = "urn:oasis:names:tc:SAML:2.0:nameid-format:"
UNSPECIFIED = _FORMAT_1 + "unspecified"
EMAIL = _FORMAT_1 + "emailAddress"
X509_SUBJECT = _FORMAT_1 + "X509SubjectName"
WINDOWS = _FORMAT_1 + "WindowsDomainQualifiedName"
ENTITY = _FORMAT_2 + "entity"
PERSISTENT = _FORMAT_2 + "persistent"
TRANSIENT = _FORMAT_2 + "transient"
CLAIMS = "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/"
UPN = CLAIMS + "upn"

BASIC = "urn:oasis:names:tc:SAML:2.0:attrname-format:basic"
URI = "urn:oasis:names:tc:SAML:2.0:attrname-format:uri"
PASSWORD = "urn:oasis:names:tc:SAML:2.0:ac:classes:PasswordProtectedTransport"

# method: (hash, whether it is PSS); the key decides between RSA and ECDSA.
SIGNATURES = {
    **{f"{_MORE}{kind}-sha{bits}": (f"sha{bits}", False)
       for kind in ("rsa", "ecdsa") for bits in (256, 384, 512)},
    **{_PSS % f"sha{bits}": (f"sha{bits}", True) for bits in (256, 384, 512)},
    RSA_SHA1: ("sha1", False),
    ECDSA_SHA1: ("sha1", False),
    RSA_PSS_SHA1: ("sha1", True),
}


def rsa(bits):
    return f"{_MORE}rsa-sha{bits}"


def ecdsa(bits):
    return f"{_MORE}ecdsa-sha{bits}"


def pss(bits):
    return _PSS % f"sha{bits}"


# The time at which every document is judged, and times around it.
NOW = "2024-05-06T12:00:00Z"
ISSUED = "2024-05-06T11:59:00Z"
START = "2024-05-06T11:55:00Z"
END = "2024-05-06T13:00:00Z"
SOON = "2024-05-06T12:04:00Z"
PAST = "2024-05-06T11:58:30Z"
LONG_PAST = "2024-05-06T11:00:00Z"

AUDIENCE = "https://app.example.com/service"
RECIPIENT = "https://app.example.com/acs"
REQUEST = "_request-4711"
