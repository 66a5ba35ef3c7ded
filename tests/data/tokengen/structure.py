"""Tokens that break one rule of shape or value each. All are signed as they stand, so that only
the named rule can refuse them."""

from . import keys, names
from .accepted import ADVICE, DELEGATES, LEAN, LEAN_HOLDER
from .assertion import ID
from .catalogue import RULE_SAYS_IT, TAMPERED, says, signed, syntax

EMPTY_REFERENCE = LEAN.signed_as(uri="")
ISSUER = f'<saml:Issuer Format="{names.ENTITY_FORMAT}">https://sts.example.com/STS</saml:Issuer>'
NAME_ID = f'<saml:NameID Format="{names.UPN}">user@example.com</saml:NameID>'
BEARER_DATA = ('<saml:SubjectConfirmationData NotOnOrAfter="2026-12-31T00:00:00Z">'
               "</saml:SubjectConfirmationData>")
CLASS_REF = (f"<saml:AuthnContextClassRef>{names.PASSWORD_CONTEXT}</saml:AuthnContextClassRef>")
HOLDER_DATA = '<saml:SubjectConfirmationData xsi:type="saml:KeyInfoConfirmationDataType">'
UNKNOWN = "Unknown or duplicate restriction node under Conditions"
BAD_DATES = {
    "empty": "", "word": "yesterday", "date-only": "2026-01-01", "month-13": "2026-13-01T00:00:00Z",
    "february-30": "2026-02-30T00:00:00Z", "february-29": "2026-02-29T00:00:00Z",
    "hour-25": "2026-01-01T25:00:00Z", "minute-60": "2026-01-01T00:60:00Z",
    "second-61": "2026-01-01T00:00:61Z", "trailing": "2026-01-01T00:00:00Zx",
    "two-digit-year": "26-01-01T00:00:00Z", "blank-not-t": "2026-01-01 00:00:00Z",
    "leading-blank": " 2026-01-01T00:00:00Z", "lower-case": "2026-01-01t00:00:00z",
    "empty-fraction": "2026-01-01T00:00:00.Z", "offset-15": "2026-01-01T00:00:00+15:00",
    "other-digits": "\u0662026-01-01T00:00:00Z", "sign": "+2026-01-01T00:00:00Z",
    "day-0": "2026-01-00T00:00:00Z", "one-digit": "2026-1-1T0:0:0Z",
}


def only_text(element):
    return says(f"Element '{element}' must only have textual content (but has extra children or "
                "is empty).")


def not_found(element):
    return says(f"Expected element '{element}' not found.")


def other_namespace(element):
    return says(f"Element '{element}' has unexpected namespace")


def missing(element, attribute):
    return says(f"Node '{element} is missing required attribute '{attribute}'")


def no_signature(found):
    return syntax(f"Expected element 'Signature', found '{found}'")


def undefined_prefix(element, line):
    """The column is left out: a parser may count to the start or to the end of the tag."""
    return [{"class": "SsoClient::ParseException", "prefix": f"Element {element}at {line},",
             "contains": " uses undefined prefix: `nowhere'"}]


def surplus(attribute, element):
    return says(f"Unexpected attribute '{attribute}' on element '{element}'")


def unexpected(element):
    return says(f"Unexpected attributes on element '{element}'")


def add_all(catalogue):
    _assertion(catalogue)
    _issuer(catalogue)
    _signature_place(catalogue)
    _subject(catalogue)
    _confirmation(catalogue)
    _holder_data(catalogue)
    _conditions(catalogue)
    _audience(catalogue)
    _counts(catalogue)
    _delegation(catalogue)
    _advice(catalogue)
    _authn_statement(catalogue)
    _attribute_statement(catalogue)
    _properties(catalogue)
    _clock(catalogue)
    _values(catalogue)


def _add(catalogue, name, token, refusals, *edits, **conditions):
    catalogue.refuse(name, RULE_SAYS_IT, signed(token, *edits), refusals, "valid", **conditions)


def _assertion(c):
    def add(name, refusals, *edits, rule="assertion"):
        _add(c, f"{rule}/assertion-{name}", EMPTY_REFERENCE, refusals, *edits)
    tag = "saml:Assertion"
    add("other-name", not_found("Assertion"),
        ("<saml:Assertion ", "<saml:EncryptedAssertion "),
        ("</saml:Assertion>", "</saml:EncryptedAssertion>"))
    add("lower-case-name", not_found("Assertion"),
        ("<saml:Assertion ", "<saml:assertion "), ("</saml:Assertion>", "</saml:assertion>"))
    add("other-namespace", other_namespace("Assertion"),
        (names.SAML, "urn:oasis:names:tc:SAML:1.0:assertion"))
    add("namespace-in-other-case", other_namespace("Assertion"),
        (names.SAML, names.SAML.replace("urn:oasis", "URN:OASIS")))
    add("no-namespace", other_namespace("Assertion"),
        (f"<{tag} ", "<Assertion "), (f"</{tag}>", "</Assertion>"))
    add("in-a-response", not_found("Assertion"),
        (f"<{tag} ", f'<samlp:Response xmlns:samlp="urn:oasis:names:tc:SAML:2.0:protocol"><{tag} '),
        (f"</{tag}>", f"</{tag}></samlp:Response>"))
    add("no-version", missing("Assertion", "Version"), (' Version="2.0"', ""))
    add("no-id", missing("Assertion", "ID"), (f' ID="{ID}"', ""))
    add("no-issue-instant", missing("Assertion", "IssueInstant"),
        (' IssueInstant="2026-01-01T00:00:00Z"', ""))
    add("no-version-nor-id", missing("Assertion", "Version"),
        (' Version="2.0"', ""), (f' ID="{ID}"', ""))
    add("prefixed-version", missing("Assertion", "Version"),
        (' Version="2.0"', ' saml:Version="2.0"'))
    add("extra-attribute", unexpected("Assertion"), (" Version=", ' Foo="" Version='))
    add("schema-location", unexpected("Assertion"),
        (" Version=", ' xsi:schemaLocation="urn:a b" Version='))
    add("xml-id", unexpected("Assertion"), (" Version=", f' xml:id="{ID}x" Version='))
    add("xml-lang", unexpected("Assertion"), (" Version=", ' xml:lang="en" Version='))
    add("issue-instant-bad", says("Assertion/@IssueInstant is not a date"),
        (' IssueInstant="2026-01-01T00:00:00Z"', ' IssueInstant="2026-01-01"'), rule="dates")
    add("text-first", not_found("Issuer"), (ISSUER, "text" + ISSUER))
    add("text-last", says("Unexpected elements under Assertion"),
        ("</saml:Assertion>", "text</saml:Assertion>"))
    add("no-break-space-last", says("Unexpected elements under Assertion"),
        ("</saml:Assertion>", "\u00a0</saml:Assertion>"))
    add("instruction-first", not_found("Issuer"), (ISSUER, "<?a b?>" + ISSUER))
    add("instruction-last", says("Unexpected elements under Assertion"),
        ("</saml:Assertion>", "<?a b?></saml:Assertion>"))
    add("two-attribute-statements", says("Unexpected elements under Assertion"),
        ("</saml:Assertion>", "<saml:AttributeStatement>" + LEAN.attribute(names.GROUPS, [])
         + "</saml:AttributeStatement></saml:Assertion>"))
    add("extra-element", says("Unexpected elements under Assertion"),
        ("</saml:Assertion>", "<saml:AuthzDecisionStatement/></saml:Assertion>"))
    add("empty", not_found("Issuer"), (ISSUER, ""))
    for name, version in (("1.1", "1.1"), ("2", "2"), ("2.00", "2.00"), ("empty", ""),
                          ("blank", " 2.0"), ("2.1", "2.1")):
        add(f"version-{name}", says("Invalid token version"),
            (' Version="2.0"', f' Version="{version}"'), rule="version-and-id")
    for name, value in (("letter", "abc"), ("empty", ""), ("digit", "1_a"), ("blank", " _a")):
        add(f"id-{name}", says("Invalid token ID"), (f' ID="{ID}"', f' ID="{value}"'),
            rule="version-and-id")


def _issuer(c):
    def add(name, refusals, *edits):
        _add(c, "issuer/issuer-" + name, LEAN, refusals, *edits)
    add("missing", not_found("Issuer"), (ISSUER, ""))
    add("no-format", missing("Issuer", "Format"), (f' Format="{names.ENTITY_FORMAT}"', ""))
    for attribute in ("NameQualifier", "SPNameQualifier", "SPProvidedID"):
        add(attribute.lower(), unexpected("Issuer"),
            ("<saml:Issuer ", f'<saml:Issuer {attribute}="x" '))
    add("empty", only_text("Issuer"), ("https://sts.example.com/STS", ""))
    add("blank", only_text("Issuer"), ("https://sts.example.com/STS", " \n\t"))
    add("element", only_text("Issuer"), ("https://sts.example.com/STS", "a<saml:b/>"))
    add("other-namespace", other_namespace("Issuer"),
        ("<saml:Issuer ", '<x:Issuer xmlns:x="urn:x" '), ("</saml:Issuer>", "</x:Issuer>"))
    add("twice", no_signature("saml:Issuer"), (ISSUER, ISSUER * 2))


def _signature_place(c):
    unsigned = LEAN.text().replace(LEAN.signature.text(), "")
    not_there = says("Expected element ds:Signature not found")

    def add(name, refusals, text):
        c.refuse("signature-place/signature-" + name, RULE_SAYS_IT, text, refusals)
    add("missing", no_signature("saml:Subject"), unsigned)
    head, _ = unsigned.split("<saml:Subject>", 1)
    add("missing-and-nothing-else", not_there, head + "</saml:Assertion>")
    add("text-instead", not_there, unsigned.replace("<saml:Subject>", "text<saml:Subject>"))
    add("instruction-instead", not_there, unsigned.replace("<saml:Subject>", "<?a?><saml:Subject>"))
    form = LEAN.signature.text()

    def moved(before, after):
        return signed(unsigned.replace(before, after.replace("@SIGNATURE@", form), 1))
    add("before-issuer", not_found("Issuer"), moved(ISSUER, "@SIGNATURE@" + ISSUER))
    add("inside-issuer", only_text("Issuer"), moved("</saml:Issuer>", "@SIGNATURE@</saml:Issuer>"))
    add("after-subject", no_signature("saml:Subject"),
        moved("</saml:Subject>", "</saml:Subject>@SIGNATURE@"))
    add("last", no_signature("saml:Subject"),
        moved("</saml:Assertion>", "@SIGNATURE@</saml:Assertion>"))
    add("twice", not_found("Subject"),
        signed(LEAN).replace("<saml:Subject>", "@S@<saml:Subject>", 1).replace(
            "@S@", signed(LEAN)[signed(LEAN).index("<ds:Signature"):].split("\n")[0]))
    add("other-namespace", no_signature("ds:Signature"),
        signed(LEAN).replace(names.DS + '"', 'urn:other"', 1))
    add("in-a-wrapper", no_signature("x:w"),
        signed(LEAN).replace("<ds:Signature ", '<x:w xmlns:x="urn:x"><ds:Signature ').replace(
            "</ds:Signature>", "</ds:Signature></x:w>"))


def _subject(c):
    def add(name, refusals, *edits):
        _add(c, "subject/subject-" + name, LEAN, refusals, *edits)
    confirmation = LEAN.text()[LEAN.text().index("<saml:SubjectConfirmation "):]
    confirmation = confirmation[:confirmation.index("</saml:Subject>")]
    add("attribute", unexpected("Subject"), ("<saml:Subject>", '<saml:Subject a="b">'))
    add("other-name", not_found("Subject"),
        ("<saml:Subject>", "<saml:Subjekt>"), ("</saml:Subject>", "</saml:Subjekt>"))
    add("empty", not_found("NameID"), (NAME_ID, ""), (confirmation, ""))
    add("no-name-id", not_found("NameID"), (NAME_ID, ""))
    add("base-id", not_found("NameID"), (NAME_ID, "<saml:BaseID/>"))
    add("encrypted-id", not_found("NameID"), (NAME_ID, "<saml:EncryptedID/>"))
    add("two-name-ids", not_found("SubjectConfirmation"), (NAME_ID, NAME_ID * 2))
    add("name-id-no-format", missing("NameID", "Format"), (f' Format="{names.UPN}"', ""))
    for attribute in ("NameQualifier", "SPNameQualifier", "SPProvidedID"):
        add(f"name-id-{attribute.lower()}", unexpected("NameID"),
            ("<saml:NameID ", f'<saml:NameID {attribute}="x" '))
    for name, value in (
            ("comment", "admin@example.com<!-- -->.evil.example"), ("empty", ""), ("blank", " "),
            ("element", "user@example.com<saml:a/>"), ("instruction", "user@example<?a?>.com"),
            ("empty-comment", "user@<!---->example.com"), ("comment-only", "<!-- a -->"),
            ("cdata-blank", "<![CDATA[ ]]>")):
        add(f"name-id-{name}", only_text("NameID"), ("user@example.com", value))
    add("no-confirmation", not_found("SubjectConfirmation"), (confirmation, ""))
    add("two-confirmations", says("Unexpected elements after SubjectConfirmation"),
        (confirmation, confirmation * 2))
    add("text-last", says("Unexpected elements after SubjectConfirmation"),
        ("</saml:Subject>", "x</saml:Subject>"))


def _confirmation(c):
    def add(name, refusals, *edits, rule="subject-confirmation"):
        _add(c, f"{rule}/subject-{name}", LEAN, refusals, *edits)
    data = "SubjectConfirmationData"
    for name, method in (
            ("sender-vouches", "urn:oasis:names:tc:SAML:2.0:cm:sender-vouches"),
            ("saml1-bearer", "urn:oasis:names:tc:SAML:1.0:cm:bearer"),
            ("upper-case", names.BEARER.upper()), ("trailing-blank", names.BEARER + " "),
            ("empty", ""), ("quote", "it's")):
        add(f"method-{name}", says(f"Unknown subject confirmation method: '{method}'"),
            (f'"{names.BEARER}"', f'"{method}"'))
    add("no-method", missing("SubjectConfirmation", "Method"), (f' Method="{names.BEARER}"', ""))
    add("confirmation-attribute", unexpected("SubjectConfirmation"),
        ("<saml:SubjectConfirmation ", '<saml:SubjectConfirmation a="b" '))
    add("no-data", not_found(data), (BEARER_DATA, ""))
    add("two-data", says("Unexpected elements after SubjectConfirmationData"),
        (BEARER_DATA, BEARER_DATA * 2))
    add("two-delegate-ids", not_found(data), (BEARER_DATA, NAME_ID * 2 + BEARER_DATA))
    for attribute in ("Recipient", "InResponseTo", "Address", "NotBefore"):
        add(f"data-{attribute.lower()}", unexpected(data),
            (f"<saml:{data} ", f'<saml:{data} {attribute}="2026-01-01T00:00:00Z" '))
    add("data-no-date", missing(data, "NotOnOrAfter"),
        (f'<saml:{data} NotOnOrAfter="2026-12-31T00:00:00Z">', f"<saml:{data}>"))
    add("data-bad-date", says(f"{data}/@NotOnOrAfter is not a date"),
        (f'<saml:{data} NotOnOrAfter="2026-12-31T00:00:00Z">',
         f'<saml:{data} NotOnOrAfter="2026-12-32T00:00:00Z">'), rule="dates")
    for name, content in (("element", "<saml:a/>"), ("text", "a"), ("instruction", "<?a?>")):
        add(f"data-{name}", says(f"Element '{data}' must be empty"),
            (f"></saml:{data}>", f">{content}</saml:{data}>"))


def _holder_data(c):
    data = "SubjectConfirmationData"
    xsi_type = f"{names.XSI}:type"

    def add(name, refusals, *edits):
        _add(c, "holder-of-key/holder-" + name, LEAN_HOLDER, refusals, *edits)
    text = LEAN_HOLDER.text()
    key_info = text[text.index("<ds:KeyInfo xmlns"):text.index(f"</saml:{data}>")]
    certificate = keys.certificate_base64("client")
    element = f"<ds:X509Certificate>{certificate}</ds:X509Certificate>"
    x509_data = f"<ds:X509Data>{element}</ds:X509Data>"

    def no_type(name):
        return says(f"Invalid {data} type: '{name}'")

    def typed(value):
        return HOLDER_DATA, f'<saml:{data} xsi:type="{value}">'
    add("no-type", missing(data, xsi_type), (HOLDER_DATA, f"<saml:{data}>"))
    add("date-only", surplus("NotOnOrAfter", data),
        (HOLDER_DATA, f'<saml:{data} NotOnOrAfter="2026-12-31T00:00:00Z">'))
    add("extra-date", surplus("NotOnOrAfter", data),
        (HOLDER_DATA, HOLDER_DATA[:-1] + ' NotOnOrAfter="2026-12-31T00:00:00Z">'))
    add("unprefixed-attribute", surplus("type", data),
        (HOLDER_DATA, HOLDER_DATA.replace("xsi:type", "type")))
    add("type-other-name", no_type(f"{{{names.SAML}}}KeyInfoType"), typed("saml:KeyInfoType"))
    add("type-other-namespace", no_type(f"{{{names.XS}}}KeyInfoConfirmationDataType"),
        typed("xs:KeyInfoConfirmationDataType"))
    add("type-unprefixed", no_type("KeyInfoConfirmationDataType"),
        typed("KeyInfoConfirmationDataType"))
    add("type-in-other-default-namespace", no_type("{urn:x}KeyInfoConfirmationDataType"),
        (HOLDER_DATA, f'<saml:{data} xmlns="urn:x" xsi:type="KeyInfoConfirmationDataType">'))
    add("type-empty", no_type(""), typed(""))
    add("type-blank", no_type(f"{{{names.SAML}}}KeyInfoConfirmationDataType "),
        typed("saml:KeyInfoConfirmationDataType "))
    add("type-undefined-prefix", undefined_prefix(data, 7),
        typed("nowhere:KeyInfoConfirmationDataType"))
    add("no-key-info", not_found("KeyInfo"), (key_info, ""))
    add("text", not_found("KeyInfo"), (key_info, "text"))
    add("certificate-directly", not_found("KeyInfo"),
        (key_info, x509_data.replace("<ds:X509Data>", f'<ds:X509Data xmlns:ds="{names.DS}">')))
    add("key-info-other-namespace", other_namespace("KeyInfo"),
        (f'<ds:KeyInfo xmlns:ds="{names.DS}">', '<ds:KeyInfo xmlns:ds="urn:x">'))
    add("key-info-id", unexpected("KeyInfo"), ("<ds:KeyInfo ", '<ds:KeyInfo Id="a" '))
    add("key-info-twice", says(f"Unexpected elements after {data}/KeyInfo"),
        (key_info, key_info * 2))
    add("key-value", not_found("X509Data"), (x509_data, "<ds:KeyValue></ds:KeyValue>"))
    add("data-attribute", unexpected("X509Data"), ("<ds:X509Data>", '<ds:X509Data a="b">'))
    add("data-twice", says("Unexpected elements after X509Data"), (x509_data, x509_data * 2))
    add("subject-name", not_found("X509Certificate"),
        (element, "<ds:X509SubjectName>CN=a</ds:X509SubjectName>"))
    add("certificate-attribute", unexpected("X509Certificate"),
        ("<ds:X509Certificate>", '<ds:X509Certificate a="b">'))
    add("certificate-twice", says("Unexpected elements after X509Certificate"),
        (element, element * 2))
    add("certificate-empty", only_text("X509Certificate"), (certificate, ""))
    add("certificate-comment", only_text("X509Certificate"),
        (certificate, certificate[:40] + "<!-- -->" + certificate[40:]))
    undecodable = [{"class": "Quillon::Crypto::CryptoException"}]
    add("certificate-not-base64", [{"class": "Quillon::Base64FormatException"}],
        (certificate, "*" + certificate[1:]))
    add("certificate-not-der", undecodable, (certificate, "AAAA"))
    add("certificate-cut", undecodable, (certificate, certificate[:-40]))
    add("certificate-trailing-bytes", undecodable,
        (certificate, certificate.rstrip("=") + "AAAA" if not certificate.endswith("=")
         else certificate[:-4] + _with_trailing_byte(certificate[-4:])))


def _with_trailing_byte(quantum):
    from base64 import b64decode, b64encode
    return b64encode(b64decode(quantum) + b"\0").decode()


def inside(content):
    return "</saml:Conditions>", content + "</saml:Conditions>"


def _conditions(c):
    def add(name, refusals, *edits, rule="conditions"):
        _add(c, f"{rule}/conditions-{name}", LEAN, refusals, *edits)
    start, end = ' NotBefore="2026-01-01T00:00:00Z"', ' NotOnOrAfter="2026-12-31T00:00:00Z"'
    both = f"<saml:Conditions{start}{end}>"
    add("missing", not_found("Conditions"),
        (both, "<saml:Advice>"), ("</saml:Conditions>", "</saml:Advice>"))
    add("no-start", missing("Conditions", "NotBefore"), (both, f"<saml:Conditions{end}>"))
    add("no-end", missing("Conditions", "NotOnOrAfter"), (both, f"<saml:Conditions{start}>"))
    add("no-start-bad-end", missing("Conditions", "NotBefore"),
        (both, '<saml:Conditions NotOnOrAfter="never">'))
    add("attribute", unexpected("Conditions"), (both, both[:-1] + ' a="b">'))
    for name, value in BAD_DATES.items():
        add(f"start-{name}", says("Conditions/@NotBefore is not a date"),
            (both, both.replace("2026-01-01T00:00:00Z", value)), rule="dates")
    add("end-bad", says("Conditions/@NotOnOrAfter is not a date"),
        (both, both.replace("2026-12-31T00:00:00Z", "2026-12-31T00:00:00ZZ")), rule="dates")
    add("one-time-use", says(UNKNOWN + ": OneTimeUse"), inside("<saml:OneTimeUse/>"))
    add("text", says(UNKNOWN), inside("text"))
    add("instruction", says(UNKNOWN), inside("<?a b?>"))
    add("condition-untyped", says(UNKNOWN + ": Condition"), inside("<saml:Condition/>"))
    add("condition-unknown", says(UNKNOWN + ": Condition"),
        inside('<saml:Condition xmlns:a="urn:a" xsi:type="a:RenewRestrictionType"/>'))
    add("condition-other-name", says(UNKNOWN + ": Condition"),
        inside(f'<saml:Condition xmlns:rsa="{names.RSA}" xsi:type="rsa:Other"/>'))
    add("condition-unprefixed", says(UNKNOWN + ": Condition"),
        inside('<saml:Condition xsi:type="RenewRestrictionType"/>'))
    add("condition-undefined-prefix",
        undefined_prefix("Condition", 11),
        inside('<saml:Condition xsi:type="nowhere:RenewRestrictionType"/>'))
    add("other-namespace", says(UNKNOWN + ": AudienceRestriction"),
        inside('<x:AudienceRestriction xmlns:x="urn:x"/>'))


def _audience(c):
    def add(name, refusals, *edits):
        _add(c, "audience/conditions-audience-" + name, LEAN, refusals, *edits)
    audience = "<saml:AudienceRestriction><saml:Audience>a</saml:Audience></saml:AudienceRestriction>"
    add("twice", says(UNKNOWN + ": AudienceRestriction"), inside(audience * 2))
    add("other-child", not_found("Audience"),
        inside("<saml:AudienceRestriction><saml:Foo/></saml:AudienceRestriction>"))
    add("text", not_found("Audience"),
        inside("<saml:AudienceRestriction>urn:a</saml:AudienceRestriction>"))
    add("empty", only_text("Audience"),
        inside("<saml:AudienceRestriction><saml:Audience/></saml:AudienceRestriction>"))
    add("comment", only_text("Audience"), inside(audience.replace(">a<", ">a<!-- -->b<")))


def _counts(c):
    """The two restrictions that count: how often a token may be passed on, and renewed."""
    def add(name, refusals, *edits):
        _add(c, "counted-restrictions/conditions-" + name, LEAN, refusals, *edits)
    add("proxy-twice", says(UNKNOWN + ": ProxyRestriction"),
        inside('<saml:ProxyRestriction Count="1"/>' * 2))
    add("proxy-no-count", missing("ProxyRestriction", "Count"), inside("<saml:ProxyRestriction/>"))
    add("proxy-attribute", unexpected("ProxyRestriction"),
        inside('<saml:ProxyRestriction Count="1" a="b"/>'))
    add("proxy-audience", says("Element 'ProxyRestriction' must be empty"),
        inside('<saml:ProxyRestriction Count="1"><saml:Audience>a</saml:Audience>'
               "</saml:ProxyRestriction>"))
    counts = (("negative", "-1"), ("fraction", "1.5"), ("beyond-64-bit", "18446744073709551615"),
              ("one-too-large", "9223372036854775808"), ("empty", ""), ("word", "many"),
              ("hexadecimal", "0x10"), ("trailing", "1x"), ("inner-blank", "1 0"),
              ("exponent", "1e3"), ("other-digits", "\u0661"))
    for name, count in counts:
        add(f"proxy-count-{name}", says("ProxyRestriction/@Count is not a non-negative integer."),
            inside(f'<saml:ProxyRestriction Count="{count}"/>'))

    def renew(attributes):
        return (f'<saml:Condition xmlns:rsa="{names.RSA}" xsi:type="rsa:RenewRestrictionType"'
                f"{attributes}/>")
    for name, count in counts[:3]:
        add(f"renew-count-{name}", says("Condition/@Count is not a non-negative integer."),
            inside(renew(f' Count="{count}"')))
    add("renew-twice", says(UNKNOWN + ": Condition"), inside(renew(' Count="1"') * 2))
    add("renew-attribute", surplus("Foo", "Condition"),
        inside(renew(' Foo="1"')))
    add("renew-element", says("Element 'Condition' must be empty"),
        inside(renew("").replace("/>", "><saml:a/></saml:Condition>")))
    add("renew-prefixed-count", surplus(f"{{{names.RSA}}}Count", "Condition"),
        inside(renew(' rsa:Count="1"')))
    # Only the exact namespace of the token service makes the restriction.
    add("renew-other-namespace", says(UNKNOWN + ": Condition"),
        inside(renew("").replace(names.RSA, names.RSA + "/")))


def _delegation(c):
    token = LEAN.but(delegates=DELEGATES[:2])
    first = f'<saml:NameID Format="{names.UPN}">first@example.com</saml:NameID>'
    second = first.replace("first@", "second@")
    condition = token.text()[token.text().index("<saml:Condition xmlns:del"):]
    condition = condition[:condition.index("\n")]
    confirmed = f'Method="{names.BEARER}">\n{second}'

    def add(name, refusals, *edits, rule="delegation"):
        _add(c, f"{rule}/delegation-{name}", token, refusals, *edits)
    mismatch = says("The SubjectConfirmation delegate id does not match the id of the last delegate")
    add("twice", says("Unknown or duplicate restriction node under Conditions: Condition"),
        (condition, condition * 2))
    inner = condition[condition.index("<del:"):-len("</saml:Condition>")]
    add("no-delegate", not_found("Delegate"), (inner, ""))
    add("other-child", not_found("Delegate"), (inner, inner + "<del:Other/>"))
    add("other-namespace", other_namespace("Delegate"),
        (inner, inner.replace("del:", "saml:")))
    add("attribute", surplus("Count", "Condition"),
        (condition, condition.replace(" xsi:type", ' Count="1" xsi:type')))
    instant = ' DelegationInstant="2026-01-01T01:00:00Z"'
    add("no-instant", missing("Delegate", "DelegationInstant"), (instant, ""))
    add("bad-instant", says("Delegate/@DelegationInstant is not a date"),
        (instant, ' DelegationInstant="now"'), rule="dates")
    add("confirmation-method", unexpected("Delegate"),
        (instant, instant + f' ConfirmationMethod="{names.BEARER}"'))
    add("no-name-id", not_found("NameID"), (first, ""))
    add("two-name-ids", says("Unexpected elements after NameID"), (first, first * 2))
    add("name-id-comment", only_text("NameID"),
        (first, first.replace("first@", "first@<!-- -->")))
    add("id-without-restriction",
        says("Token SubjectConfirmation contains delegate id, but no delegation restriction is "
             "present"), (condition, ""))
    add("restriction-without-id",
        says("Token has delegation restriction, but no delegate id is present in the "
             "SubjectConfirmation"), (confirmed, confirmed.replace(second, "")))
    add("id-of-first", mismatch, (confirmed, confirmed.replace(second, first)))
    add("id-in-other-case", mismatch,
        (confirmed, confirmed.replace("second@", "Second@")))
    add("id-with-other-format", mismatch,
        (confirmed, confirmed.replace(names.UPN, names.EMAIL_FORMAT)))
    format_error = says(f"Invalid or unsupported NameId format '{names.EMAIL_FORMAT}'")
    add("first-with-other-format", format_error,
        (first, first.replace(names.UPN, names.EMAIL_FORMAT)))
    add("first-without-domain",
        says("Failed to parse the UPN NameID: `first'; name or domain part is missing."),
        (first, first.replace("@example.com", "")))


def _advice(c):
    def add(name, refusals, *edits):
        _add(c, "advice/advice-" + name, LEAN.but(advice=ADVICE[:1]), refusals, *edits)
    text = LEAN.but(advice=ADVICE[:1]).text()
    advice = text[text.index("<rsa:RSAAdvice"):text.index("\n</saml:Advice>")]
    inner = advice[advice.index("<saml:Attribute"):-len("</rsa:RSAAdvice>")]
    add("attribute", unexpected("Advice"), ("<saml:Advice>", '<saml:Advice a="b">'))
    add("empty", not_found("RSAAdvice"), (advice, ""))
    add("assertion-id", not_found("RSAAdvice"),
        (advice, "<saml:AssertionIDRef>_a</saml:AssertionIDRef>"))
    add("text-last", not_found("RSAAdvice"), (advice, advice + "text"))
    add("other-namespace", other_namespace("RSAAdvice"),
        (names.RSA, names.RSA.replace("SAML2.0", "WS-Trust1.4/advice")))
    add("no-source", missing("RSAAdvice", "AdviceSource"),
        (' AdviceSource="http://source.example.com/one"', ""))
    add("extra-attribute", unexpected("RSAAdvice"), (" AdviceSource=", ' a="b" AdviceSource='))
    add("no-attributes", not_found("Attribute"), (inner, ""))
    add("other-child", not_found("Attribute"), (inner, inner + "<saml:Foo/>"))
    add("attribute-without-format", missing("Attribute", "NameFormat"),
        (inner, inner.replace(f' NameFormat="{names.NAME_FORMAT}"', "", 1)))
    add("after-statement", says("Unexpected elements under Assertion"),
        ("<saml:Advice>", "<saml:AuthnStatement AuthnInstant=\"2026-01-01T00:00:00Z\"><saml:"
         f"AuthnContext>{CLASS_REF}</saml:AuthnContext></saml:AuthnStatement><saml:Advice>"))


def _authn_statement(c):
    def add(name, refusals, *edits, rule="authn-statement"):
        _add(c, f"{rule}/authn-{name}", LEAN, refusals, *edits)
    text = LEAN.text()
    statement = text[text.index("<saml:AuthnStatement"):text.index("\n<saml:AttributeStatement")]
    context = f"<saml:AuthnContext>{CLASS_REF}</saml:AuthnContext>"
    add("missing", not_found("AuthnStatement"), (statement, ""))
    add("twice", says("Unexpected elements under Assertion"), (statement, statement * 2))
    for attribute in ("SessionIndex", "SessionNotOnOrAfter"):
        add(attribute.lower(), unexpected("AuthnStatement"),
            ("<saml:AuthnStatement ", f'<saml:AuthnStatement {attribute}="2026-12-31T00:00:00Z" '))
    instant = ' AuthnInstant="2026-01-01T00:00:00Z"'
    add("no-instant", missing("AuthnStatement", "AuthnInstant"), (instant, ""))
    add("bad-instant", says("AuthnStatement/@AuthnInstant is not a date"),
        (instant, ' AuthnInstant="2026-01-01T00:00Z"'), rule="dates")
    add("locality-first", not_found("AuthnContext"), (context, "<saml:SubjectLocality/>" + context))
    add("locality-last", says("Unexpected elements after AuthnContext"),
        (context, context + "<saml:SubjectLocality/>"))
    add("no-context", not_found("AuthnContext"), (context, ""))
    add("context-attribute", unexpected("AuthnContext"),
        ("<saml:AuthnContext>", '<saml:AuthnContext a="b">'))
    add("no-class", not_found("AuthnContextClassRef"), (CLASS_REF, ""))
    add("declaration", not_found("AuthnContextClassRef"),
        (CLASS_REF, "<saml:AuthnContextDeclRef>a</saml:AuthnContextDeclRef>"))
    add("authority", says("Unexpected elements after AuthnContextClassRef"),
        (CLASS_REF, CLASS_REF + "<saml:AuthenticatingAuthority>a</saml:AuthenticatingAuthority>"))
    add("class-empty", only_text("AuthnContextClassRef"), (names.PASSWORD_CONTEXT, ""))
    add("class-element", only_text("AuthnContextClassRef"), (names.PASSWORD_CONTEXT, "<saml:a/>"))


def _attribute_statement(c):
    def add(name, refusals, *edits):
        _add(c, "attribute-statement/attributes-" + name, LEAN, refusals, *edits)
    name_format = f' NameFormat="{names.NAME_FORMAT}"'
    given = LEAN.attribute(names.GIVEN_NAME, ["Ada"])
    all_of_them = "\n".join(LEAN.attribute(*a) for a in (
        (names.GIVEN_NAME, ["Ada"]),
        (names.GROUPS, ["example.com\\Users"])))
    add("attribute", unexpected("AttributeStatement"),
        ("<saml:AttributeStatement>", '<saml:AttributeStatement a="b">'))
    add("empty", not_found("Attribute"), (all_of_them, ""))
    add("encrypted", not_found("Attribute"), (given, given + "<saml:EncryptedAttribute/>"))
    add("text", not_found("Attribute"), (given, given + "text"))
    add("other-namespace", other_namespace("Attribute"),
        (given, given.replace("saml:Attribute ", 'x:Attribute xmlns:x="urn:x" ').replace(
            "</saml:Attribute>", "</x:Attribute>")))
    add("no-name", missing("Attribute", "Name"),
        (given, given.replace(f' Name="{names.GIVEN_NAME}"', "")))
    add("no-format", missing("Attribute", "NameFormat"), (given, given.replace(name_format, "")))
    add("extra-attribute", unexpected("Attribute"), (given, given.replace(" Name=", ' a="b" Name=')))
    add("other-child", not_found("AttributeValue"),
        (given, given.replace("</saml:Attribute>", "<saml:Foo/></saml:Attribute>")))
    add("bare-text", not_found("AttributeValue"),
        (given, given.replace("</saml:Attribute>", "Ada</saml:Attribute>")))
    for name, value in (("nested", "<saml:a>Ada</saml:a>"), ("mixed", "Ada<saml:a/>"),
                        ("comment", "Ada<!-- -->x"), ("instruction", "Ada<?a?>")):
        add(f"value-{name}", only_text("AttributeValue"), (given, given.replace("Ada", value)))
    solution = LEAN.attribute(names.SOLUTION, ["true"])
    add("solution-none", says("No value found for attribute isSolution."),
        (given, given + LEAN.attribute(names.SOLUTION, [])))
    add("solution-two", says("More than one value found for attribute isSolution."),
        (given, given + LEAN.attribute(names.SOLUTION, ["true", "true"])))
    add("solution-two-after-one", says("More than one value found for attribute isSolution."),
        (given, given + solution + LEAN.attribute(names.SOLUTION, ["true", "false"])))


def _properties(c):
    unsatisfiable = says("Unsatisfiable token validity conditions: NotBefore must be less than "
                         "NotOnOrAfter.")
    instant = "2026-06-15T12:00:00Z"
    _add(c, "validity-period/validity-empty", LEAN.but(start=instant, end=instant), unsatisfiable)
    _add(c, "validity-period/validity-empty-large-tolerance",
         LEAN.but(start=instant, end=instant), unsatisfiable, tolerance=1000000)
    _add(c, "validity-period/validity-empty-other-offset",
         LEAN.but(start=instant, end="2026-06-15T14:00:00+02:00"), unsatisfiable)
    _add(c, "validity-period/validity-reversed",
         LEAN.but(start="2026-12-31T00:00:00Z", end="2026-01-01T00:00:00Z"), unsatisfiable)
    shorter = says("Invalid token subject validity")
    _add(c, "subject-confirmation/confirmation-ends-earlier",
         LEAN.but(confirmed_until="2026-12-30T23:59:59Z"), shorter)
    _add(c, "subject-confirmation/confirmation-ends-a-microsecond-earlier",
         LEAN.but(confirmed_until="2026-12-30T23:59:59.999999Z"), shorter)
    # The checks have an order, and the first that fails speaks.
    _add(c, "order-of-checks/order-version-before-id", EMPTY_REFERENCE, says("Invalid token version"),
         (' Version="2.0"', ' Version="3.0"'), (f' ID="{ID}"', ' ID="a"'))
    _add(c, "order-of-checks/order-id-before-validity", EMPTY_REFERENCE.but(start=instant, end=instant),
         says("Invalid token ID"), (f' ID="{ID}"', ' ID="a"'))
    _add(c, "order-of-checks/order-expiry-before-confirmation",
         LEAN.but(end="2026-02-01T00:00:00Z", confirmed_until="2026-01-02T00:00:00Z"),
         says("The token has expired at: 2026-02-01T00:00:00.000Z"))
    forged = signed(LEAN.but(end="2026-02-01T00:00:00Z"), key="foreign")
    c.refuse("order-of-checks/order-expiry-before-signature",
             "an expired forged token reports expiry", forged,
             says("The token has expired at: 2026-02-01T00:00:00.000Z"), "invalid")
    c.refuse("order-of-checks/order-signature-before-subject",
             "a forged token with a bad subject reports forgery",
             signed(LEAN, ("user@example.com", "user"), key="foreign"),
             TAMPERED, "invalid")


def _clock(c):
    start, end = "2026-06-15T12:00:00Z", "2026-06-15T13:00:00Z"
    token = LEAN.but(start=start, end=end)
    future = says("Token start date is in the future: 2026-06-15T12:00:00.000Z")
    expired = says("The token has expired at: 2026-06-15T13:00:00.000Z")
    for name, refusals, now, tolerance in (
            ("future", future, "2026-06-15T11:49:00Z", 600),
            ("future-by-a-microsecond", future, "2026-06-15T11:49:59.999999Z", 600),
            ("future-without-tolerance", future, "2026-06-15T11:59:59.999999Z", 0),
            ("expired", expired, "2026-06-15T13:11:00Z", 600),
            ("expired-at-end-of-tolerance", expired, "2026-06-15T13:10:00Z", 600),
            ("expired-now-without-tolerance", expired, end, 0),
            ("expired-long-ago", expired, "2036-06-15T13:00:00Z", 600)):
        _add(c, "validity-period/clock-" + name, token, refusals, now=now, tolerance=tolerance)
    _add(c, "validity-period/clock-offset-read-right",
         LEAN.but(start="2026-06-15T12:00:00-01:00", end="2026-06-16T00:00:00Z"),
         says("Token start date is in the future: 2026-06-15T13:00:00.000Z"),
         now="2026-06-15T12:30:00Z", tolerance=0)


def _values(c):
    def format_error(value):
        return says(f"Invalid or unsupported NameId format '{value}'")
    for name, value in (
            ("email", names.EMAIL_FORMAT), ("empty", ""), ("upper-case", names.UPN.upper()),
            ("lower-case", names.UPN.lower()), ("other-host", "http://example.com/claims/UPN"),
            ("trailing-slash", names.UPN + "/")):
        _add(c, f"principal-names/format-{name}", LEAN, format_error(value), (names.UPN, value))
    for name, value in (("no-at", "user"), ("at-first", "@example.com"), ("at-last", "user@"),
                        ("at-only", "@"), ("two-at-last", "user@example.com@")):
        _add(c, f"principal-names/upn-{name}", LEAN,
             says(f"Failed to parse the UPN NameID: `{value}'; name or domain part is missing."),
             ("user@example.com", value))
    for name, value in (("no-backslash", "Admins"), ("first", "\\Admins"), ("last", "DOMAIN\\"),
                        ("only", "\\"), ("slash", "DOMAIN/Admins"), ("empty", ""), ("at", "a@b")):
        _add(c, f"principal-names/group-{name}", LEAN,
             says(f"Failed to parse Group Identity value: `{value}'; domain or group missing"),
             ("example.com\\Users", value))
    _add(c, "principal-names/group-second-bad",
         LEAN.but(groups=[("Users", "example.com"), ("Admins", "D")]),
         says("Failed to parse Group Identity value: `Admins'; domain or group missing"),
         ("D\\Admins", "Admins"))
