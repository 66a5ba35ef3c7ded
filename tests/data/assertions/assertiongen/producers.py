"""The shapes that producers give their assertions, each with an RSA, a PSS and an EC signature."""

from . import names
from .assertion import assertion

_KEYS = [("rsa", "sts", names.rsa(256)), ("pss", "sts", names.pss(256)),
         ("ec", "sts-p256", names.ecdsa(256))]
# Some with longer digests and keys.
_OTHER = {("shibboleth", "pss"): ("sts", names.pss(384)),
          ("okta", "pss"): ("sts-second", names.pss(512)),
          ("google", "rsa"): ("sts", names.rsa(512)),
          ("onelogin", "ec"): ("sts-p384", names.ecdsa(384)),
          ("opensaml", "ec"): ("sts-p521", names.ecdsa(512))}

_XS_TYPE = {"attributes": f' xmlns:xsi="{names.XSI}" xmlns:xs="{names.XS}" xsi:type="xs:string"'}


def _typed(text):
    """A value with a type whose prefix no name uses, as most producers write it."""
    return {"text": text, **_XS_TYPE}


def _web(**more):
    return {"method": names.BEARER, "end": names.SOON, "recipient": names.RECIPIENT,
            "request": names.REQUEST, **more}


def _claims(*pairs):
    return [{"name": names.CLAIMS + name, "values": values} for name, values in pairs]


def _adfs():
    groups = {"name": "http://schemas.xmlsoap.org/claims/Group", "values": ["Staff", "Admins"],
              "extra": ' a:OriginalIssuer="urn:example:origin" xmlns:a='
                       '"http://schemas.xmlsoap.org/ws/2009/09/identity/claims"'}
    return assertion(
        prefix="", id="_5d1b1c5e-9f0a-4a57-8a6a-0e2f5c1d7a10",
        issuer={"value": "http://adfs.example.com/adfs/services/trust"},
        subject={"value": "alice@example.com", "format": names.UPN},
        confirmations=[_web()],
        statements=[("attributes", _claims(("upn", ["alice@example.com"]), ("name", ["Alice"]),
                                           ("surname", ["Example"])) + [groups]),
                    ("authn", {"session": "_5d1b1c5e", "context": names.PASSWORD})])


def _azure():
    return assertion(
        prefix="", id="_a7c4e2b0-1d11-4d57-9f27-3b1b2f6c0c00",
        issuer={"value": "https://sts.example.net/0f3c5b7e-0000-4000-8000-1234567890ab/"},
        subject={"value": "uq2h7s_persistent", "format": names.PERSISTENT},
        confirmations=[{"method": names.BEARER, "data": False}],
        statements=[("attributes", _claims(("givenname", ["Alice"]), ("emailaddress",
                                           ["alice@example.net"]))),
                    ("authn", {"context": names.PASSWORD})])


def _shibboleth():
    targeted = (f'<saml2:NameID xmlns:saml2="{names.SAML}" Format="{names.PERSISTENT}" '
                'NameQualifier="https://idp.example.org" SPNameQualifier="https://app.example.com">'
                "c29tZSBvcGFxdWU=</saml2:NameID>")
    return assertion(
        prefix="saml2", id="_e4d909c290d0fb1ca068ffaddf22cbd0",
        issuer={"value": "https://idp.example.org/shibboleth", "format": names.ENTITY},
        subject={"value": "_7f2d", "format": names.TRANSIENT,
                 "qualifier": "https://idp.example.org", "sp_qualifier": "https://app.example.com",
                 "sp_id": "local-17"},
        confirmations=[_web(address="192.0.2.17", start=names.START)],
        sign={"prefix_list": "xsd", "c14n": names.EXC_C14N}, declare={"xsd": names.XS},
        statements=[
            ("authn", {"session": "_s1", "address": "192.0.2.17", "context": names.PASSWORD}),
            ("attributes", [
                {"name": "urn:oid:1.3.6.1.4.1.5923.1.1.1.10", "format": names.URI,
                 "friendly": "eduPersonTargetedID", "values": [{"raw": targeted}]},
                {"name": "urn:oid:0.9.2342.19200300.100.1.1", "format": names.URI,
                 "friendly": "uid", "values": [
                     {"text": "alice", "type": "{%s}string" % names.XS,
                      "attributes": f' xmlns:xsi="{names.XSI}" xsi:type="xsd:string"'}]}])])


def _okta():
    return assertion(
        prefix="saml2", id="id32514823041234567890",
        issuer={"value": "http://www.okta.example/exk1", "format": names.ENTITY},
        subject={"value": "alice@example.com", "format": names.EMAIL},
        confirmations=[{"method": names.BEARER, "end": names.SOON,
                        "recipient": names.RECIPIENT}],
        statements=[("authn", {"session": "id17", "context": names.PASSWORD}),
                    ("attributes", [{"name": "groups", "format": "urn:oasis:names:tc:SAML:2.0:"
                                     "attrname-format:unspecified",
                                     "values": [_typed("Everyone"), _typed("Admins")]}])])


def _onelogin():
    return assertion(
        id="pfx3a0f6e5d-1b0f-f9f2-7c2b-1a2b3c4d5e6f",
        issuer={"value": "https://app.onelogin.example/saml/metadata/17"},
        subject={"value": "alice@example.com", "format": names.EMAIL},
        confirmations=[_web()],
        statements=[("authn", {"session": "_11", "session_end": names.END,
                               "context": names.PASSWORD}),
                    ("attributes", [{"name": "memberOf", "format": names.BASIC,
                                     "values": [_typed("Staff;Admins")]},
                                    {"name": "User.email", "values": [_typed("")]}])])


def _google():
    return assertion(
        prefix="saml2", id="_1c9b2f3e4d5a6b7c8d9e0f",
        issuer={"value": "https://accounts.google.example/o/saml2?idpid=C01"},
        subject={"value": "alice@example.com", "format": names.EMAIL},
        confirmations=[_web()],
        statements=[("attributes", [{"name": "department", "values": ["R&D"]}]),
                    ("authn", {"session": "_1c9b", "context": "urn:oasis:names:tc:SAML:2.0:ac:"
                               "classes:unspecified"})])


def _auth0():
    return assertion(
        prefix="", id="_XQy6mFQzU1rBcFbbp3LaFxFDtGN0rdbf",
        issuer={"value": "urn:auth0.example"},
        subject={"value": "auth0|17", "format": names.UNSPECIFIED},
        confirmations=[{"method": names.BEARER, "end": names.END,
                        "recipient": names.RECIPIENT}],
        statements=[("attributes", _claims(("nameidentifier", [_typed("auth0|17")]))),
                    ("authn", {"context": "urn:oasis:names:tc:SAML:2.0:ac:classes:unspecified"})])


def _simplesamlphp():
    return assertion(
        id="pfx0b7c2d1e-4f5a", issuer={"value": "https://idp.example.edu/metadata.php"},
        subject={"value": "_7c3f", "format": names.TRANSIENT,
                 "sp_qualifier": "https://app.example.com"},
        confirmations=[_web()],
        statements=[("authn", {"session": "_s2", "session_end": names.SOON,
                               "context": names.PASSWORD}),
                    ("attributes", [{"name": "uid", "format": names.BASIC,
                                     "values": [_typed("alice")]}])])


def _pysaml2():
    return assertion(
        prefix="ns0", id="id-Qp3mZ1x2Yc", declare={"xsi": names.XSI, "xs": names.XS},
        issuer={"value": "https://idp.example.se/idp.xml", "format": names.ENTITY},
        subject={"value": "b2f8", "format": names.TRANSIENT,
                 "qualifier": "https://idp.example.se", "sp_qualifier": "https://app.example.com"},
        confirmations=[_web()], sign={"ds_prefix": "ns1"},
        statements=[("authn", {"session": "id-77", "context": names.PASSWORD,
                               "authorities": ["https://idp.example.se/idp.xml"]}),
                    ("attributes", [{"name": "urn:oid:2.5.4.42", "format": names.URI,
                                     "friendly": "givenName",
                                     "values": [{"text": "Alice",
                                                 "attributes": ' xsi:type="xs:string"'}]}])])


def _opensaml():
    return assertion(
        prefix="saml2", id="_opensaml-0", layout="\n   ",
        issuer={"value": "https://idp.example.com", "format": names.ENTITY},
        subject={"value": "EXAMPLE\\alice", "format": names.WINDOWS},
        confirmations=[_web(), {"method": names.SENDER_VOUCHES, "data": False}],
        conditions={"start": names.START, "end": names.END,
                    "audiences": [[names.AUDIENCE, "https://other.example.com"]],
                    "xml": "<@P@OneTimeUse/>", "one_time": True},
        statements=[("authn", {"session": "s", "context": names.PASSWORD}),
                    ("attributes", [{"name": "urn:oid:2.5.4.10", "format": names.URI,
                                     "values": ["Example", "Example & Sons"]}])])


_CXF = {"prefix": "saml2", "declare": {"xsi": names.XSI},
        "attributes_of_assertion": ' xsi:type="saml2:AssertionType"',
        "issuer": {"value": "DoubleItSTSIssuer"}, "sign": {"prefix_list": "xs"}}


def _cxf_bearer():
    return assertion(
        **_CXF, id="_6c1b7a10-9f0a",
        subject={"value": "alice", "format": names.PERSISTENT,
                 "qualifier": "http://cxf.apache.org/sts"},
        confirmations=[{"method": names.BEARER, "data": False}],
        statements=[("attributes", [{"name": "token-requestor", "format": names.BASIC,
                                     "values": ["authenticated"]}])])


def _cxf_holder():
    return assertion(
        **_CXF, id="_6c1b7a10-9f0b",
        subject={"value": "CN=service,O=Example", "format": names.X509_SUBJECT,
                 "qualifier": "http://cxf.apache.org/sts"},
        confirmations=[{"method": names.HOLDER_OF_KEY,
                        "data_attributes": ' xsi:type="saml2:KeyInfoConfirmationDataType"',
                        "keys": [{"certificates": ["client"], "holder": "client"}]}],
        statements=[("attributes", [{"name": "token-requestor", "format": names.BASIC,
                                     "values": ["authenticated"]}])])


_SHAPES = {
    "adfs": (_adfs, "default namespace, attributes before authentication, foreign attributes"),
    "azure": (_azure, "bearer without data, no attribute formats"),
    "shibboleth": (_shibboleth, "all qualifiers, address, a value that holds a NameID"),
    "okta": (_okta, "an ID that begins with a letter, types that nothing covers"),
    "onelogin": (_onelogin, "an end of the session, an empty value"),
    "google": (_google, "attributes before authentication, escaped characters"),
    "auth0": (_auth0, "unspecified format, no session"),
    "simplesamlphp": (_simplesamlphp, "the session ends before the conditions"),
    "pysaml2": (_pysaml2, "unusual prefixes, authorities, a hyphen in the ID"),
    "opensaml": (_opensaml, "line breaks, two confirmations, one-time use, two audiences"),
    "cxf-bearer": (_cxf_bearer, "a type on the assertion, no authentication statement"),
    "cxf-holder-of-key": (_cxf_holder, "the holder's certificate"),
}


def documents():
    """(name, about, section, spec) of each shape with each kind of key."""
    for shape, (make, about) in _SHAPES.items():
        for kind, key, algorithm in _KEYS:
            key, algorithm = _OTHER.get((shape, kind), (key, algorithm))
            spec = make()
            spec["sign"].update(key=key, algorithm=algorithm, key_info=[key])
            yield f"{shape}-{kind}", f"{shape}: {about}", "SAML-CORE 2.3.3", spec
