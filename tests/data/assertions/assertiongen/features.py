"""One thing that SAML allows per row, with its reason, its section, and a hostile neighbour."""

from . import names
from .assertion import assertion, changed
from .hostile import CHANGES, PARSE, SIGNATURE

_ROWS = []


def _row(name, about, section, spec, neighbour, text, rules=None, refusal=PARSE, accepted=0):
    """`neighbour` is a document, or the name of a change. `rules` go for both."""
    if isinstance(neighbour, str):
        change, refusal, text = CHANGES[neighbour]
        neighbour = change(spec)
    _ROWS.append({"name": name, "about": about, "section": section, "spec": spec,
                  "neighbour": neighbour, "class": refusal, "text": text, "rules": rules or {},
                  "accepted": accepted})


def documents():
    return _ROWS


_XSI = {"xsi": names.XSI}
_VALUE = [("attributes", [{"name": "a", "values": ["v"]}])]


def _statement(values, **more):
    return [("attributes", [{"name": "a", "values": values, **more}])]


def _condition(xml, **facts):
    return {"start": names.START, "end": names.END, "audiences": [[names.AUDIENCE]], "xml": xml,
            **facts}


def _holder(**key):
    return [{"method": names.HOLDER_OF_KEY, "keys": [key]}]


def _types():
    typed = {"declare": _XSI, "attributes_of_assertion": ' xsi:type="saml:AssertionType"'}
    section = "SAML-CORE 1.2"
    _row("type-by-a-rendered-prefix", "the element's own prefix, which its name renders", section,
         assertion(**typed), changed(
             assertion(**typed), declare={"s2": names.SAML},
             attributes_of_assertion=' xsi:type="s2:AssertionType"'),
         "does not cover what the prefix of the xsi:type 's2:AssertionType'")
    _row("type-of-its-own", "the type that the element has anyway", section,
         assertion(**typed),
         assertion(declare=_XSI, attributes_of_assertion=' xsi:type="saml:AdviceType"'),
         "The xsi:type of 'saml:Assertion' at 1,1 is")
    _row("type-by-a-listed-prefix", "a prefix of the InclusiveNamespaces list", section,
         assertion(declare={**_XSI, "s2": names.SAML}, sign={"prefix_list": "s2"},
                   attributes_of_assertion=' xsi:type="s2:AssertionType"'),
         assertion(declare={**_XSI, "s2": names.SAML, "s3": names.SAML}, sign={"prefix_list": "s3"},
                   attributes_of_assertion=' xsi:type="s2:AssertionType"'),
         "does not cover what the prefix of the xsi:type 's2:AssertionType'")
    _row("type-in-the-inclusive-form", "the inclusive form carries all declarations", section,
         assertion(declare={**_XSI, "s2": names.SAML}, sign={"c14n": names.C14N},
                   attributes_of_assertion=' xsi:type="s2:AssertionType"'),
         assertion(declare={**_XSI, "s2": names.SAML}, sign={"c14n": names.EXC_C14N},
                   attributes_of_assertion=' xsi:type="s2:AssertionType"'), "does not cover")
    _row("type-in-the-default-namespace", "unprefixed names render the default namespace", section,
         assertion(prefix="", declare=_XSI, attributes_of_assertion=' xsi:type="AssertionType"'),
         assertion(declare={**_XSI, "": names.SAML},
                   attributes_of_assertion=' xsi:type="AssertionType"'), "does not cover")
    _row("type-of-a-condition", "a type that decides, by a listed prefix",
         "SAML-CORE 2.5.1",
         _delegated("del"),
         _delegated("un"), "does not cover what the prefix of the xsi:type 'un:Delegation")
    _row("delegate-without-instant", "when it was is not known", "SAML-DEL 2.2",
         _delegated("del", instant=None),
         changed(_delegated("un"), declare={"un": "urn:example:other"},
                 sign={"prefix_list": "del un"}),
         "of type '{urn:example:other}DelegationRestrictionType'")
    _row("type-of-confirmation-data", "the type that the data has anyway", "SAML-CORE 2.4.1.2",
         assertion(declare=_XSI, confirmations=[{
             "method": names.BEARER, "end": names.END,
             "data_attributes": ' xsi:type="saml:SubjectConfirmationDataType"'}]),
         assertion(declare=_XSI, confirmations=[{
             "method": names.BEARER, "end": names.END,
             "data_attributes": ' xsi:type="saml:SubjectLocalityType"'}]),
         "expected one of SAML's confirmation data")
    _row("schema-location", "a hint where a schema lies says nothing", "XML Schema Part 1, 2.6.3",
         assertion(declare=_XSI, attributes_of_assertion=f' xsi:schemaLocation="{names.SAML} x"'),
         assertion(declare=_XSI, attributes_of_assertion=' xsi:nil="false"'),
         "Unexpected attribute 'xsi:nil' of 'saml:Assertion' at 1,1")


def _delegated(prefix, instant=names.ISSUED):
    name = {"value": "service@example.com", "format": names.UPN}
    when = "" if instant is None else f' DelegationInstant="{instant}"'
    delegate = (f'<del:Delegate{when}><saml:NameID '
                f'Format="{names.UPN}">service@example.com</saml:NameID></del:Delegate>')
    return assertion(
        declare={**_XSI, "del": names.DEL, "un": names.DEL},
        # The delegate's own name renders its prefix below the condition, which is too late.
        sign={"prefix_list": "del"},
        conditions=_condition(
            f'<saml:Condition xsi:type="{prefix}:DelegationRestrictionType">{delegate}'
            "</saml:Condition>", delegates=[{"name": name, "instant": instant}]))


def _keys():
    section = "SAML-PROF 3.1"
    typed = ' xsi:type="saml:KeyInfoConfirmationDataType"'
    _row("holder-of-key-with-type", "the type of key information", section,
         assertion(declare=_XSI, confirmations=[{
             "method": names.HOLDER_OF_KEY, "data_attributes": typed,
             "keys": [{"certificates": ["client"], "holder": "client"}]}]),
         assertion(declare=_XSI, confirmations=[{
             "method": names.BEARER, "end": names.END, "data_attributes": typed}]),
         "has the type of key information and no key")
    _row("holder-of-key-without-type", "the type may be left out", section,
         assertion(confirmations=_holder(certificates=["client"], holder="client")),
         assertion(confirmations=[{"method": names.HOLDER_OF_KEY}]),
         "is holder-of-key and has no ds:KeyInfo")
    _row("rsa-key-value", "a key by its numbers", "XMLDSIG 4.4.2",
         assertion(confirmations=_holder(rsa="client")),
         assertion(confirmations=_holder(xml="<d:KeyValue><d:DSAKeyValue/></d:KeyValue>")),
         "Unexpected element 'd:DSAKeyValue' at 1,")
    _row("ec-key-value", "a key by its point", "XMLDSIG11 4.5.2.3",
         assertion(confirmations=_holder(ec="sts-p256")),
         assertion(confirmations=_holder(
             xml=f'<d:KeyValue><k:ECKeyValue xmlns:k="{names.DS11}"><k:NamedCurve '
             'URI="urn:oid:1.3.132.0.10"/><k:PublicKey>BA==</k:PublicKey></k:ECKeyValue>'
             "</d:KeyValue>")), "Curve 'urn:oid:1.3.132.0.10' of")
    _row("certificate-and-key-value", "two descriptions that agree", "XMLDSIG 4.4",
         assertion(confirmations=_holder(certificates=["client"], rsa="client", holder="client")),
         assertion(confirmations=_holder(certificates=["client"], rsa="foreign")),
         "0 of the 1 certificates in 'd:KeyInfo'")
    _row("chain-with-the-leaf-last", "the order of certificates means nothing", "XMLDSIG 4.4.4",
         assertion(confirmations=_holder(
             certificates=["chain-ca", "chain-leaf"], holder="chain-leaf")),
         assertion(confirmations=_holder(certificates=["client", "chain-leaf"])),
         "2 of the 2 certificates in 'd:KeyInfo'")
    _row("serial-number-picks", "issuer and serial number name the one of the key",
         "XMLDSIG 4.4.4",
         assertion(confirmations=_holder(
             certificates=["sts", "client"], serial_of="client", holder="client",
             issuer_name="CN=solution-user,O=Example")),
         assertion(confirmations=_holder(
             certificates=["sts", "client"], serial_of="foreign",
             issuer_name="CN=solution-user,O=Example")),
         "0 of the 2 certificates in 'd:KeyInfo'")
    _row("serial-number-alone", "the certificate is only named", "XMLDSIG 4.4.4",
         assertion(confirmations=_holder(serial_of="client", issuer_name="CN=solution-user")),
         assertion(confirmations=_holder(xml="<d:RetrievalMethod URI='#x'/>")),
         "Unexpected element 'd:RetrievalMethod'")
    _row("two-keys", "any of the keys confirms", section,
         assertion(confirmations=[{"method": names.HOLDER_OF_KEY, "keys": [
             {"certificates": ["client"], "holder": "client"}, {"key_name": "other"}]}]),
         assertion(confirmations=[{"method": names.HOLDER_OF_KEY, "keys": [
             {"certificates": ["client"], "holder": "client"}, {}]}]),
         "names no key")


def _subjects():
    _row("issuer-without-format", "a missing format says entity", "SAML-CORE 2.2.5",
         assertion(), assertion(issuer={"value": ""}), "'saml:Issuer' at 1,")
    _row("name-with-all-qualifiers", "shown, never mapped silently", "SAML-CORE 2.2.2",
         assertion(subject={"value": "x", "format": "urn:example:own", "qualifier": "q",
                            "sp_qualifier": "s", "sp_id": "i"}), "encrypted-id", "")
    _row("empty-qualifier", "empty is not absent", "SAML-CORE 2.2.2",
         assertion(subject={"value": "x", "qualifier": ""}),
         assertion(subject={"value": "", "qualifier": ""}), "'saml:NameID' at 1,")
    _row("subject-without-name", "the confirmation alone tells who it is", "SAML-CORE 2.4.1",
         assertion(subject=None, confirmations=_holder(certificates=["client"], holder="client")),
         assertion(subject={"value": "", "xml": "<saml:BaseID/>"}),
         "'saml:BaseID' at 1,")
    _row("bearer-without-data", "the conditions end", "SAML-CORE 2.4.1.1",
         assertion(confirmations=[{"method": names.BEARER, "data": False}]),
         assertion(confirmations=[{"method": names.BEARER, "data": False}],
                   conditions={"start": names.START, "audiences": [[names.AUDIENCE]]}),
         "neither its conditions nor its confirmation have NotOnOrAfter")
    _row("confirmation-ends-alone", "its end is the only one", "SAML-CORE 2.4.1.2",
         assertion(conditions={"start": names.START, "audiences": [[names.AUDIENCE]]}),
         "confirmation-ended", "")
    _row("confirmation-ends-before", "the earlier end counts", "SAML-CORE 2.4.1.2",
         assertion(confirmations=[{"method": names.BEARER, "end": names.SOON}]),
         "confirmation-ended", "")
    _row("confirmation-starts-later", "the later start counts", "SAML-CORE 2.4.1.2",
         assertion(confirmations=[{"method": names.BEARER, "start": names.ISSUED,
                                   "end": names.END}]),
         assertion(confirmations=[{"method": names.BEARER, "start": names.SOON,
                                   "end": names.END}]), "is not valid before 2024-05-06T12:04:00")
    two = [{"method": names.BEARER, "end": names.END, "recipient": "https://other.example.com"},
           {"method": names.BEARER, "end": names.SOON, "recipient": names.RECIPIENT}]
    _row("two-confirmations", "the recipient leaves one", "SAML-CORE 2.4.1.1",
         assertion(confirmations=two),
         assertion(confirmations=[two[1], two[1]]), "2 subject confirmations are acceptable",
         rules={"recipient": names.RECIPIENT}, accepted=1)
    _row("confirmation-names-somebody", "who is expected to present it", "SAML-CORE 2.4.1.1",
         assertion(confirmations=[{"method": names.BEARER, "end": names.END,
                                   "name": {"value": "service", "format": names.UPN}}]),
         "sender-vouches", "")
    _row("in-response-to", "demanded by the rules", "SAML-CORE 2.4.1.2",
         assertion(confirmations=[{"method": names.BEARER, "end": names.END,
                                   "request": names.REQUEST}]),
         assertion(), "its InResponseTo is none, expected '_request-4711'",
         rules={"inResponseTo": names.REQUEST})
    _row("one-method-only", "the rules take holder-of-key alone", "SAML-CORE 2.4.1.1",
         assertion(confirmations=_holder(certificates=["client"], holder="client")),
         assertion(), "its method 'urn:oasis:names:tc:SAML:2.0:cm:bearer' is not accepted",
         rules={"methods": [names.HOLDER_OF_KEY]})


def _all_conditions():
    _row("two-restrictions", "each names the audience", "SAML-CORE 2.5.1.4",
         assertion(conditions={"start": names.START, "end": names.END, "audiences": [
             [names.AUDIENCE, "https://a.example.com"], ["https://b.example.com",
                                                         names.AUDIENCE]]}),
         "second-audience", "")
    _row("blanks-around-an-audience", "blanks do not belong to a URI",
         "XML Schema Part 2, 3.2.17",
         assertion(conditions={"start": names.START, "end": names.END, "blank": "\n  ",
                               "audiences": [[names.AUDIENCE]]}),
         assertion(conditions={"start": names.START, "end": names.END,
                               "audiences": [["https://app.example.com/ service"]]}),
         "An audience restriction names 'https://app.example.com/ service', not")
    _row("audience-not-demanded", "told, for the caller to judge", "SAML-CORE 2.5.1.4",
         assertion(conditions={"start": names.START, "end": names.END,
                               "audiences": [["https://a.example.com"]]}),
         assertion(conditions=_condition("<saml:AudienceRestriction/>")), "names no audience",
         rules={"audience": None})
    _row("one-time-use", "told, for the caller to keep", "SAML-CORE 2.5.1.5",
         assertion(conditions=_condition("<saml:OneTimeUse/>", one_time=True)),
         assertion(conditions=_condition("<saml:OneTimeUse/><saml:OneTimeUse/>")),
         "Second condition of its kind: 'saml:OneTimeUse'")
    proxy = "<saml:ProxyRestriction%s><saml:Audience>urn:p</saml:Audience></saml:ProxyRestriction>"
    _row("proxy-restriction-with-audience", "no count, one audience", "SAML-CORE 2.5.1.6",
         assertion(conditions=_condition(
             proxy % "", proxy={"count": None, "audience": ["urn:p"]})),
         assertion(conditions=_condition(proxy % ' Count="-1"')),
         "is '-1', which is not a non-negative integer")
    _row("proxy-restriction-with-count", "a count alone", "SAML-CORE 2.5.1.6",
         assertion(conditions=_condition('<saml:ProxyRestriction Count="3"/>',
                                         proxy={"count": 3, "audience": []})),
         assertion(conditions=_condition('<saml:ProxyRestriction Count="3"/>' + proxy % "")),
         "Second condition of its kind: 'saml:ProxyRestriction'")
    renew = '<saml:Condition xmlns:r="%s" xsi:type="r:RenewRestrictionType"%s/>'
    _row("renew-restriction", "how often it may be renewed", "SAML-CORE 2.5.1.3",
         assertion(declare=_XSI, sign={"prefix_list": "r"}, conditions=_condition(
             renew % (names.RSA, ' Count="5" Postdatable="true"'),
             renew={"count": 5, "postdatable": True, "renewExpired": False})),
         assertion(declare=_XSI, sign={"prefix_list": "r"},
                   conditions=_condition(renew % ("urn:example:other", ""))),
         "of type '{urn:example:other}RenewRestrictionType'")
    _row("one-second", "the end comes after the start", "SAML-CORE 2.5.1.2",
         assertion(conditions={"start": names.NOW, "end": "2024-05-06T12:00:01Z",
                               "audiences": [[names.AUDIENCE]]}),
         assertion(conditions={"start": names.NOW, "end": names.NOW,
                               "audiences": [[names.AUDIENCE]]}),
         "is never valid: it starts at 2024-05-06T12:00:00")
    _row("no-start", "valid since it was issued", "SAML-CORE 2.5.1.2",
         assertion(conditions={"end": names.END, "audiences": [[names.AUDIENCE]]}),
         assertion(instant=names.SOON, conditions={"end": names.END,
                                                   "audiences": [[names.AUDIENCE]]}),
         "is issued in the future: 2024-05-06T12:04:00")
    _row("no-conditions", "the confirmation ends", "SAML-CORE 2.3.3",
         assertion(conditions=None), assertion(conditions=None, confirmations=[]),
         "No subject confirmation is acceptable: there is none", rules={"audience": None})
    _row("maximum-age", "young enough", "SAML-CORE 2.3.3", assertion(),
         assertion(instant=names.PAST), "more than 60 seconds ago",
         rules={"maximumAgeSec": 60})
    _row("start-within-the-tolerance", "clocks differ", "SAML-CORE 1.3.3",
         assertion(conditions={"start": names.SOON, "end": names.END,
                               "audiences": [[names.AUDIENCE]]}),
         assertion(conditions={"start": "2024-05-06T12:05:01Z", "end": names.END,
                               "audiences": [[names.AUDIENCE]]}),
         "is not valid before 2024-05-06T12:05:01", rules={"clockToleranceSec": 300})
    _row("end-within-the-tolerance", "clocks differ", "SAML-CORE 1.3.3",
         assertion(confirmations=[{"method": names.BEARER, "end": "2024-05-06T11:55:01Z"}],
                   conditions={"end": names.END, "start": names.LONG_PAST,
                               "audiences": [[names.AUDIENCE]]}),
         assertion(confirmations=[{"method": names.BEARER, "end": "2024-05-06T11:55:00Z"}],
                   conditions={"end": names.END, "start": names.LONG_PAST,
                               "audiences": [[names.AUDIENCE]]}),
         "has expired at 2024-05-06T11:55:00", rules={"clockToleranceSec": 300})


def _statements():
    _row("no-statement", "the subject is all it says", "SAML-CORE 2.3.3", assertion(),
         assertion(statements=[("xml", "<saml:AuthzDecisionStatement Resource='urn:r'/>")]),
         "Expected element 'AttributeStatement' in")
    _row("several-authentications", "with sessions and localities; the earliest end counts",
         "SAML-CORE 2.7.2", assertion(statements=[
             ("authn", {"session": "1", "session_end": names.END, "context": names.PASSWORD}),
             ("authn", {"session": "2", "session_end": names.SOON, "address": "192.0.2.1",
                        "dns": "host.example.com", "declaration_ref": "urn:decl"})]),
         "session-ended", "")
    _row("context-declaration", "kept as a tree", "SAML-CORE 2.7.2.2",
         assertion(statements=[("authn", {
             "context": names.PASSWORD, "declaration": '<c:x xmlns:c="urn:c" b="2">t</c:x>',
             "declaration_facts": {
                 "name": "{%s}AuthnContextDecl" % names.SAML, "attributes": [], "children": [
                     {"name": "{urn:c}x", "attributes": [["b", "2"]],
                      "children": [{"text": "t"}]}]}, "authorities": ["urn:a", "urn:b"]})]),
         assertion(statements=[("authn", {"context": names.PASSWORD, "xml": "<saml:Other/>"})]),
         "Unexpected element 'saml:Other' at 1,")
    _row("several-attribute-statements", "joined in their order", "SAML-CORE 2.7.3",
         assertion(statements=_VALUE + _statement(["w"])),
         assertion(statements=_VALUE + [("xml", "<saml:AttributeStatement>"
                                         "<saml:EncryptedAttribute/></saml:AttributeStatement>")]),
         "Unexpected element 'saml:EncryptedAttribute' at 1,")
    _row("foreign-attributes", "kept with their namespaces", "SAML-CORE 2.7.3.1",
         assertion(statements=_statement(["v"], extra=' f:x="1" xmlns:f="urn:f"')),
         assertion(statements=_statement(["v"], extra=' Secret="1"')),
         "Unexpected attribute 'Secret' of 'saml:Attribute' at 1,")
    _row("no-values", "an attribute without values", "SAML-CORE 2.7.3.1",
         assertion(statements=_statement([])),
         assertion(statements=[("attributes", [{"name": "", "values": []}])]),
         "has no attribute 'Name'")
    _row("element-values", "kept as XML, never flattened", "SAML-CORE 2.7.3.1.1",
         assertion(statements=_statement([{"raw": 'a<x xmlns="urn:x"><y/>b</x><!-- c -->'}, "v"])),
         assertion(statements=_statement([{"raw": "adm<!-- -->in"}])),
         "cuts the value of 'saml:AttributeValue'")
    _row("covered-type-of-a-value", "told", "SAML-CORE 2.7.3.1.1",
         assertion(declare={**_XSI, "xs": names.XS}, sign={"prefix_list": "xs"},
                   statements=_statement([{"text": "1", "attributes": ' xsi:type="xs:integer"',
                                           "type": "{%s}integer" % names.XS}])),
         assertion(declare={**_XSI, "xs": names.XS}, sign={"prefix_list": "xs"},
                   statements=_statement(["1"], extra=' xsi:type="xs:integer"')),
         "The xsi:type of 'saml:Attribute' at 1,")
    _row("uncovered-type-of-a-value", "not told, because anyone could have changed it",
         "SAML-CORE 2.7.3.1.1",
         assertion(declare={**_XSI, "xs": names.XS},
                   statements=_statement([{"text": "1", "attributes": ' xsi:type="xs:integer"'}])),
         assertion(declare={**_XSI, "xs": names.SAML},
                   statements=_statement(["1"], extra=' xsi:type="xs:AttributeType"')),
         "does not cover what the prefix of the xsi:type 'xs:AttributeType'")
    _row("nil-value", "nil is not empty", "SAML-CORE 2.7.3.1.1",
         assertion(declare=_XSI, statements=_statement(
             [{"attributes": ' xsi:nil="true"', "nil": True}, ""])),
         assertion(declare=_XSI, statements=_statement(
             [{"text": "x", "attributes": ' xsi:nil="true"'}])), "is nil and has content")
    _row("other-attributes-of-a-value", "a value may be anything", "SAML-CORE 2.7.3.1.1",
         assertion(statements=_statement([{"text": "x", "attributes": ' o="1"',
                                           "attribute_facts": [["o", "1"]]}])),
         "value-changed", "")
    _row("comments-at-the-ends", "the value is the same without them", "C14N 2.1",
         assertion(subject={"value": "alice", "raw": "<!-- a -->alice<!-- b -->"}),
         "comment-in-name", "")
    _row("cdata", "the signature covers the characters, not how they are written", "C14N 2.1",
         assertion(subject={"value": "alice&b", "raw": "al<![CDATA[ice&]]>b"}),
         assertion(subject={"value": "alice", "raw": "al<?cut here?>ice"}),
         "cuts the value of 'saml:NameID'")


def _for_mapping():
    """What the mapping of subjects and groups is tested with."""
    _row("group-values", "groups in three forms", "SAML-CORE 2.7.3",
         assertion(subject={"value": "alice@Example.COM", "format": names.UPN}, statements=[
             ("attributes", [
                 {"name": "qualified", "values": ["EXAMPLE\\Admins", "EXAMPLE\\A\\B"]},
                 {"name": "slashed", "values": ["EXAMPLE/Admins"]},
                 {"name": "plain", "values": ["Staff"]},
                 {"name": "distinguished", "values": [
                     "CN=Admins,OU=IT,DC=example,DC=com", "cn=A\\,B, DC=example"]},
                 {"name": "user", "values": ["alice"]},
                 {"name": "users", "values": ["alice", "bob"]},
                 {"name": "none", "values": []},
                 {"name": "given", "values": ["Alice", "second"]},
                 {"name": "family", "values": ["Example"]}])]), "sha1", "")
    for name, spelling in (("upn", "http://schemas.xmlsoap.org/claims/UPN"),
                           ("upn-lower-case", "http://schemas.xmlsoap.org/claims/upn")):
        _row(f"name-of-{name}", "a UPN in another spelling", "SAML-CORE 8.3",
             assertion(subject={"value": "alice@example.com", "format": spelling}), "sha1", "")
    _row("name-with-two-signs", "a UPN is split at the last sign", "SAML-CORE 8.3",
         assertion(subject={"value": "alice@home@example.com", "format": names.UPN}), "sha1", "")
    _row("disjoint-audiences", "nobody is named by both", "SAML-CORE 2.5.1.4",
         assertion(conditions={"start": names.START, "end": names.END,
                               "audiences": [["urn:a", "urn:b"], ["urn:c"]]}),
         "sha1", "", rules={"audience": None})
    _row("other-method", "a method that the rules take", "SAML-CORE 2.4.1.1",
         assertion(confirmations=[{"method": names.SENDER_VOUCHES, "data": False}]),
         assertion(confirmations=[{"method": names.BEARER, "data": False}]),
         "its method 'urn:oasis:names:tc:SAML:2.0:cm:bearer' is not accepted",
         rules={"methods": [names.SENDER_VOUCHES]})


def _whole():
    _row("id-without-underscore", "any NCName", "SAML-CORE 1.3.4", assertion(id="a-b.c_1"),
         assertion(id="1a"), "ID '1a' of 'saml:Assertion' at 1,1 is no NCName")
    _row("advice", "of any kind, as a tree", "SAML-CORE 2.6",
         assertion(advice='<saml:AssertionIDRef>_x</saml:AssertionIDRef><o:x xmlns:o="urn:o" '
                   'a="1">t<o:y/><!-- c -->u</o:x>'),
         assertion(advice="loose text"), "Unexpected text in 'saml:Advice' at 1,")
    _row("signed-as-the-whole-document", "an empty reference", "XMLDSIG 4.3.3.3",
         assertion(sign={"uri": ""}), changed(assertion(sign={"uri": ""}), sign={"uri": "#other"}),
         "Reference '#other' does not name the element", refusal=SIGNATURE)
    _row("no-key-information", "each trusted key is tried", "XMLDSIG 4.4",
         assertion(sign={"key_info": []}),
         assertion(sign={"key_info": [], "key": "foreign"}), "might have been tampered with",
         refusal=SIGNATURE)
    _row("chain-of-the-signer", "one of the certificates is trusted", "XMLDSIG 4.4.4",
         assertion(sign={"key_info": ["chain-ca", "sts"]}),
         assertion(sign={"key_info": ["chain-ca", "chain-leaf"]}), "is not one of the",
         refusal=SIGNATURE)
    _row("line-breaks", "blanks between elements", "SAML-CORE 1.3",
         assertion(layout="\n\t", statements=_VALUE),
         assertion(layout="\n.\t", statements=_VALUE), "Unexpected text in")


_types()
_keys()
_subjects()
_all_conditions()
_statements()
_for_mapping()
_whole()
