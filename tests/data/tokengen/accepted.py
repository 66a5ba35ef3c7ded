"""The tokens that must be accepted, and what must be read from them."""

from base64 import b64encode

from . import keys, names
from .assertion import ID, Token, key_info, wrap, x509_data
from .catalogue import signed

BASE = Token()
HOLDER = Token(holder="client")
# What the refused tokens are made of: there are many, so it is short.
LEAN = Token(surname=None)
LEAN_HOLDER = LEAN.but(holder="client")
DELEGATES = [
    ("first", "example.com", "2026-01-01T01:00:00Z"),
    ("second", "example.com", "2026-01-01T02:00:00Z"),
    ("third", "other.example", "2026-01-01T03:00:00Z"),
]
ADVICE = [
    ("http://source.example.com/one", [
        ("urn:example:colour", ["blue", "green"]), ("urn:example:empty", [])]),
    ("http://source.example.com/two", [("urn:example:size", ["  12 "])]),
]
EVERYTHING = Token(
    holder="client", delegates=DELEGATES, audience=["https://b.example.com", "https://a.example"],
    renew_count="5", proxy_count="10", advice=ADVICE, solution="true",
    groups=[("Users", "example.com"), ("Administrators", "example.local")])


def listed(prefixes):
    return (f'<ec:InclusiveNamespaces xmlns:ec="{names.EXC_C14N}" PrefixList="{prefixes}"/>')


def listed_prefixes(count):
    """Prefixes of which the last one counts: it makes another canonical form."""
    return [f"p{i}" for i in range(count - 1)] + ["xs"]


def good_reference(token):
    text = token.signature.text()
    return text[text.index("<ds:Reference "):text.index("</ds:SignedInfo>")]


def add_all(catalogue):
    _confirmations(catalogue)
    _references_and_transforms(catalogue)
    _algorithms(catalogue)
    _key_infos(catalogue)
    _lexical_forms(catalogue)
    _text_forms(catalogue)
    _conditions(catalogue)
    _attributes(catalogue)
    _dates(catalogue)
    _sizes(catalogue)


def _add(catalogue, name, about, token, *edits, key="sts", conditions=None, **forms):
    text = signed(token, *edits, key=key, **forms)
    catalogue.accept(name, about, text, token.facts(), **(conditions or {}))


def _confirmations(c):
    _add(c, "bearer", "a plain bearer token", BASE)
    _add(c, "holder-of-key", "a plain holder-of-key token", HOLDER)
    _add(c, "everything", "every optional part at once", EVERYTHING)
    _add(c, "holder-of-key-unprefixed-type",
         "the confirmation data's type lies in the default namespace", HOLDER.but(prefix=""))
    _add(c, "holder-of-key-other-type-prefix",
         "the confirmation data's type uses a second prefix of the assertion namespace", HOLDER,
         ('<saml:SubjectConfirmationData xsi:type="saml:',
          f'<saml:SubjectConfirmationData xmlns:s2="{names.SAML}" xsi:type="s2:'))
    wrapped = wrap(keys.certificate_base64("client"), 64)
    _add(c, "holder-of-key-wrapped-certificate", "the client's certificate in 64 columns", HOLDER,
         (keys.certificate_base64("client"), "\n" + wrapped + "\n"))


def _references_and_transforms(c):
    _add(c, "reference-id", "the reference names the assertion", BASE.signed_as(uri="#" + ID))
    _add(c, "reference-empty", "the reference is the whole document", BASE.signed_as(uri=""))
    pairs = {"exc": names.EXC_C14N, "inc": names.C14N}
    for info_name, info in pairs.items():
        for transform_name, transform in pairs.items():
            _add(c, f"c14n-{info_name}-{transform_name}",
                 "canonicalization of SignedInfo, then of the reference",
                 EVERYTHING.signed_as(c14n=info, transforms=(names.ENVELOPED, transform)))
    enveloped_only = BASE.signed_as(transforms=(names.ENVELOPED,))
    _add(c, "enveloped-only", "no canonicalization named: the inclusive one holds", enveloped_only)
    _add(c, "enveloped-only-empty-reference", "the same, by an empty reference",
         enveloped_only.signed_as(uri=""))
    for name, prefixes in (
            ("xs", "xs"), ("several", "xs xsi saml"), ("default", "#default"),
            ("default-and-xs", "#default xs"), ("unknown", "nowhere xs")):
        form = {"transform_prefixes": prefixes, "c14n_prefixes": prefixes}
        _add(c, f"prefix-list-{name}", "InclusiveNamespaces in both places",
             BASE.signed_as(**form))
        _add(c, f"prefix-list-{name}-default-namespace",
             "InclusiveNamespaces under a default namespace",
             EVERYTHING.but(prefix="").signed_as(**form))
    sixty_four = " ".join(listed_prefixes(64))
    for name, prefixes in (("64", sixty_four), ("64-twice", sixty_four + " " + sixty_four)):
        _add(c, f"prefix-list-{name}", "as many different prefixes as are looked up",
             BASE.signed_as(c14n_prefixes=prefixes, transform_prefixes=prefixes))
    one = good_reference(BASE)
    for name, count in (("two", 2), ("eight", 8)):
        _add(c, f"references-{name}", "references that name the assertion, each with its digest",
             BASE, (one, one * count))
    for name, second in (("inclusive", f'Algorithm="{names.C14N}"'),
                         ("sha512", f'Algorithm="{names.SHA512}"')):
        old = names.EXC_C14N if name == "inclusive" else names.SHA256
        _add(c, f"references-two-{name}", "two references that digest differently", BASE,
             (one, one + one.replace(f'Algorithm="{old}"', second)))
    _add(c, "prefix-list-transform-only", "InclusiveNamespaces in the transform alone",
         BASE.signed_as(transform_prefixes="xs xsi"))
    _add(c, "prefix-list-ds", "PrefixList names the signature's own prefix",
         BASE.signed_as(c14n_prefixes="ds saml", transform_prefixes="ds"))


def _algorithms(c):
    for name, method in (("256", names.RSA_SHA256), ("384", names.RSA_SHA384),
                         ("512", names.RSA_SHA512)):
        _add(c, f"rsa-sha{name}", "RSA PKCS #1 v1.5", BASE.signed_as(method=method))
    for name, digest in (("384", names.SHA384), ("512", names.SHA512)):
        _add(c, f"digest-sha{name}", "the reference's digest", BASE.signed_as(digest=digest))
    _add(c, "rsa-3072", "a longer RSA key", BASE, key="sts-second",
         conditions={"trust": ["sts-second"]})
    _add(c, "second-trusted", "the signer is the second of two trusted ones", BASE,
         key="sts-second", conditions={"trust": ["sts", "sts-second"]})
    curves = (("p256", names.ECDSA_SHA256), ("p384", names.ECDSA_SHA384),
              ("p521", names.ECDSA_SHA512))
    for curve, method in curves:
        _add(c, f"ecdsa-{curve}", "ECDSA, r and s side by side", BASE.signed_as(method=method),
             key=f"sts-{curve}", conditions={"trust": [f"sts-{curve}"]})
    mixed = ["sts", "sts-p256", "sts-p384", "sts-p521"]
    _add(c, "ecdsa-among-mixed", "the fitting key stands among others of every kind",
         BASE.signed_as(method=names.ECDSA_SHA384), key="sts-p384", conditions={"trust": mixed})
    _add(c, "rsa-among-mixed", "the fitting key stands last", BASE,
         conditions={"trust": list(reversed(mixed))})


def _key_infos(c):
    both = {"trust": ["sts-second", "sts"]}
    _add(c, "key-info-certificate", "KeyInfo holds the signer's certificate",
         BASE.signed_as(key_info=key_info("sts")), conditions=both)
    _add(c, "key-info-chain", "KeyInfo holds the signer's certificate and another",
         BASE.signed_as(key_info=key_info("sts", "client")), conditions=both)
    two_data = "<ds:KeyInfo>" + x509_data("sts") + x509_data("client") + "</ds:KeyInfo>"
    _add(c, "key-info-two-data", "KeyInfo holds two X509Data",
         BASE.signed_as(key_info=two_data), conditions=both)
    wrapped = x509_data("sts", form=lambda text: "\n" + wrap(text, 76) + "\n")
    _add(c, "key-info-wrapped", "the certificate in KeyInfo is wrapped at 76 columns",
         BASE.signed_as(key_info="<ds:KeyInfo>\n" + wrapped + "\n</ds:KeyInfo>"), conditions=both)
    _add(c, "key-info-key-name", "KeyInfo holds a name only",
         BASE.signed_as(key_info="<ds:KeyInfo><ds:KeyName>sts</ds:KeyName></ds:KeyInfo>"))
    _add(c, "key-info-key-value", "KeyInfo holds the signer's bare key",
         BASE.signed_as(key_info=rsa_key_value("sts")))
    _add(c, "key-info-id", "KeyInfo and SignatureValue carry Ids of their own",
         BASE.signed_as(key_info=key_info("sts").replace(
             "<ds:KeyInfo>", '<ds:KeyInfo Id="key-info">')),
         ("<ds:SignatureValue>", '<ds:SignatureValue Id="value">'))
    _add(c, "signature-ids", "Signature, SignedInfo and Reference carry Ids", BASE,
         ("<ds:Signature ", '<ds:Signature Id="s" '),
         ("<ds:SignedInfo>", '<ds:SignedInfo Id="i">'),
         ("<ds:Reference ", '<ds:Reference Id="r" '))


def rsa_key_value(name):
    modulus = b64encode(keys.modulus_bytes(name)).decode()
    return ("<ds:KeyInfo><ds:KeyValue><ds:RSAKeyValue>"
            f"<ds:Modulus>{modulus}</ds:Modulus><ds:Exponent>AQAB</ds:Exponent>"
            "</ds:RSAKeyValue></ds:KeyValue></ds:KeyInfo>")


def _lexical_forms(c):
    _add(c, "default-namespace", "the assertion namespace has no prefix", EVERYTHING.but(prefix=""))
    _add(c, "signature-default-namespace", "the signature has no prefix",
         BASE.signed_as(prefix=""))
    _add(c, "no-prefixes-at-all", "neither has a prefix", BASE.but(prefix="").signed_as(prefix=""))
    _add(c, "strange-prefixes", "prefixes that mean something else elsewhere",
         EVERYTHING.but(prefix="ds").signed_as(prefix="saml"),
         ("<ds:KeyInfo xmlns:ds=", "<x:KeyInfo xmlns:x="), ("</ds:KeyInfo>", "</x:KeyInfo>"),
         ("<ds:X509Data>", "<x:X509Data>"),
         ("</ds:X509Data>", "</x:X509Data>"),
         ("<ds:X509Certificate>", "<x:X509Certificate>"),
         ("</ds:X509Certificate>", "</x:X509Certificate>"))
    redeclared = BASE.but(audience=["urn:x"])
    edits = (
        ("<saml:Conditions ", f'<s:Conditions xmlns:s="{names.SAML}" xmlns:saml="urn:other" '),
        ("<saml:AudienceRestriction>", "<s:AudienceRestriction>"),
        ("<saml:Audience>", f'<saml:Audience xmlns:saml="{names.SAML}">'),
        ("</saml:AudienceRestriction>", "</s:AudienceRestriction>"),
        ("</saml:Conditions>", "</s:Conditions>"))
    _add(c, "prefix-redeclared", "a prefix is bound anew, to another namespace and back",
         redeclared, *edits)
    _add(c, "prefix-redeclared-inclusive", "the same under inclusive canonicalization",
         redeclared.signed_as(c14n=names.C14N, transforms=(names.ENVELOPED, names.C14N)), *edits)
    _add(c, "default-namespace-undeclared", "the default namespace is taken back below",
         BASE.but(prefix=""),
         ("<AuthnContextClassRef>", f'<a:AuthnContextClassRef xmlns:a="{names.SAML}" xmlns="">'),
         ("</AuthnContextClassRef>", "</a:AuthnContextClassRef>"))
    _add(c, "unused-namespaces", "declarations that nothing uses", BASE,
         ("<saml:Issuer ", '<saml:Issuer xmlns:a="urn:a" xmlns:b="urn:b" xmlns="urn:c" '))
    _add(c, "unused-namespaces-inclusive", "the same, which inclusive canonicalization keeps",
         BASE.signed_as(c14n=names.C14N, transforms=(names.ENVELOPED, names.C14N)),
         ("<saml:Issuer ", '<saml:Issuer xmlns:b="urn:b" xmlns:a="urn:a" xmlns="urn:c" '))
    _add(c, "attribute-order", "attributes of several namespaces, to be sorted by the signer", BASE,
         ("<saml:AuthnContextClassRef>",
          '<saml:AuthnContextClassRef z="1" b:y="2" xmlns:b="urn:a" a:z="3" xmlns:a="urn:b" A="4">'))
    _add(c, "comments-and-blanks", "comments and blanks between elements", EVERYTHING,
         ("<saml:Subject>", "<!-- one --><saml:Subject>\n\t<!-- two -->"),
         ("</saml:Subject>", "  <!----> </saml:Subject><!-- <saml:Issuer/> -->"),
         ("<saml:Advice>", "\r\n\r\n<saml:Advice><!-- & < > -->"),
         ("</saml:Assertion>", "<!-- last -->\n\n\n</saml:Assertion>"))
    _add(c, "comments-outside-root", "comments before and after the assertion", BASE,
         ("<saml:Assertion ", "<!-- before --> <saml:Assertion "),
         ("</saml:Assertion>", "</saml:Assertion>\n<!-- after -->\n"))
    _add(c, "comments-outside-root-empty-reference", "the same under an empty reference",
         BASE.signed_as(uri=""),
         ("<saml:Assertion ", "<!-- before --> <saml:Assertion "),
         ("</saml:Assertion>", "</saml:Assertion>\n<!-- after -->\n"))
    _add(c, "compact", "no blanks between elements", EVERYTHING.but(line_end=""))
    _add(c, "crlf-lines", "lines end in CR LF", EVERYTHING.but(line_end="\r\n"))
    _add(c, "signature-pretty", "the signature is indented", BASE,
         ("<ds:SignedInfo>", "\n  <ds:SignedInfo>\n    "),
         ("<ds:SignatureMethod ", "\n\n    <ds:SignatureMethod "),
         ("<ds:Reference ", "\t<ds:Reference "),
         ("</ds:Reference>", "\n    </ds:Reference>\n  "),
         ("<ds:SignatureValue>", "\n  <ds:SignatureValue>"))
    _add(c, "signature-comments", "comments between the signature's elements", BASE,
         ("<ds:SignedInfo>", "<!-- a --><ds:SignedInfo><!-- b -->"),
         ("<ds:Reference ", "<!-- c --><ds:Reference "),
         ("<ds:SignatureValue>", "<!-- d --><ds:SignatureValue>"))
    _add(c, "single-quotes", "attributes in single quotes, quotes within", BASE,
         (f'Format="{names.UPN}"', f"Format='{names.UPN}'"),
         ("<saml:AuthnContextClassRef>", "<saml:AuthnContextClassRef a='say \"x\"' b=\"it's\">"))
    _add(c, "attribute-normalization", "tabs and line ends inside attribute values", BASE,
         ("<saml:AuthnContextClassRef>",
          '<saml:AuthnContextClassRef a="x\ty\nz" b="&#9;&#10;&#13;&lt;&amp;&gt;&quot;">'))
    _add(c, "empty-element-tags", "empty elements in the other form", BASE,
         ("></saml:SubjectConfirmationData>", " />"),
         (f'"{names.RSA_SHA256}"/>', f'"{names.RSA_SHA256}"></ds:SignatureMethod>'),
         (f'"{names.SHA256}"/>', f'"{names.SHA256}"> </ds:DigestMethod>'))
    _add(c, "blanks-inside-tags", "blanks and line ends inside tags", BASE,
         ("<saml:Subject>", "<saml:Subject\n\t >"), ("</saml:Subject>", "</saml:Subject  \n>"),
         ('" NotOnOrAfter="2026-12-31T00:00:00Z">\n</saml:Conditions>',
          '"\r\n   NotOnOrAfter = "2026-12-31T00:00:00Z"  >\n</saml:Conditions>'))
    for name, head in (
            ("xml-declaration", '<?xml version="1.0" encoding="UTF-8"?>\n'),
            ("xml-declaration-lower-case", "<?xml version='1.0' encoding='utf-8'?>"),
            ("xml-declaration-standalone",
             '<?xml version="1.0" encoding="UTF-8" standalone="yes"?>\n'),
            ("xml-declaration-no-encoding", '<?xml version="1.0"?>'),
            ("byte-order-mark", "\ufeff"),
            ("byte-order-mark-and-declaration", '\ufeff<?xml version="1.0" encoding="UTF-8"?>')):
        text = head + signed(BASE)
        c.accept(name, "what stands before the root", text, BASE.facts())
    _add(c, "trailing-line-end", "blanks after the root", BASE,
         ("</saml:Assertion>", "</saml:Assertion>\n \t\r\n"))


def _text_forms(c):
    _base64_forms(c)
    admin = BASE.but(subject=("user", "example.com"), given_name="A & B <C> \"D\" 'E'")
    _add(c, "escaped-text", "characters that must be escaped", admin)
    escaped = [("http://source.example.com/?a=1&b=<2>", [("urn:\"name\"&amp;", ["&amp;"])])]
    _add(c, "escaped-attributes", "attribute values with characters that must be escaped",
         BASE.but(advice=escaped))
    _add(c, "escaped-attributes-by-reference", "the same by character references",
         BASE.but(advice=escaped), ("?a=1&amp;b=&lt;2&gt;", "&#63;a=1&#38;b=&#x3c;2&#x3E;"))
    _add(c, "cdata", "a value made of text and CDATA sections", admin,
         ("A &amp; B &lt;C&gt; \"D\" 'E'", "<![CDATA[A & B <C>]]> \"D<![CDATA[\" 'E]]>'"),
         (">user@example.com<", "><![CDATA[user@example.com]]><"))
    _add(c, "cdata-empty", "an empty CDATA section beside text", BASE,
         (">user@example.com<", ">user<![CDATA[]]>@example.com<"))
    _add(c, "character-references", "decimal and hexadecimal character references", admin,
         ("A &amp; B &lt;C&gt; \"D\" 'E'", "&#65; &#38; &#x42; &#x3c;C&#62; &quot;D&#34; &apos;E'"),
         ("user@example.com", "us&#101;r&#x40;example.com"))
    _add(c, "escaped-carriage-return", "a carriage return that survives line-end normalization",
         BASE.but(given_name="a\rb\nc\td"), ("a\rb\nc\td", "a&#13;b\nc\td"))
    _add(c, "line-ends-normalized", "CR and CR LF inside a value read as LF",
         BASE.but(given_name="a\nb\nc"), ("a\nb\nc", "a\rb\r\nc"))
    _add(c, "comment-after-text", "a comment after the whole of a value", BASE,
         ("user@example.com", "user@example.com<!-- nothing -->"))
    _add(c, "comment-before-text", "a comment before the whole of a value", BASE,
         ("user@example.com", "<!-- nothing -->user@example.com"))
    for name, given, surname in (
            ("utf8-two-bytes", "Zo\u00eb", "\u00d1and\u00fa"),
            ("utf8-three-bytes", "\u4e2d\u6587", "\u20acuro\ufffd"),
            ("utf8-four-bytes", "\U0001d11e", "\U0010fffd\U0001f600"),
            ("utf8-combining", "e\u0301", "\u202eabc\u200b")):
        _add(c, name, "names outside ASCII",
             BASE.but(given_name=given, surname=surname, subject=(given, surname)))
    _add(c, "utf8-as-references", "the same characters by reference",
         BASE.but(given_name="\u00e9\u4e2d\U0001d11e"),
         ("\u00e9\u4e2d\U0001d11e", "&#233;&#x4E2D;&#x1d11e;"))
    _add(c, "noncharacters", "delete and C1 controls, which XML 1.0 allows",
         BASE.but(given_name="\u007f\u0085\u009f\u2028"))


def _base64_forms(c):
    def lines(columns, end):
        return lambda text: end + wrap(text, columns, end) + end
    for columns in (64, 76):
        _add(c, f"base64-{columns}", "wrapped signature value", BASE,
             value_form=lines(columns, "\n"))
        _add(c, f"base64-{columns}-crlf", "wrapped by CR LF", BASE,
             value_form=lines(columns, "\r\n"))
        _add(c, f"base64-{columns}-escaped-cr", "wrapped by an escaped CR and LF", BASE,
             value_form=lines(columns, "&#13;\n"))
    _add(c, "base64-tabs", "tabs and blanks within", BASE,
         value_form=lambda text: "\t" + " ".join(text) + "\t")
    _add(c, "base64-digest-wrapped", "a wrapped digest, and blanks around it",
         BASE.signed_as(digest=names.SHA512), digest_form=lines(64, "\n   "))
    _add(c, "base64-cdata", "signature value and digest in CDATA sections", BASE,
         digest_form=lambda text: f"<![CDATA[{text}]]>",
         value_form=lambda text: f"{text[:100]}<![CDATA[{text[100:]}]]>")
    _add(c, "base64-character-references", "a digit of each written as a reference", BASE,
         digest_form=lambda text: f"&#{ord(text[0])};{text[1:]}",
         value_form=lambda text: f"&#x{ord(text[0]):x};{text[1:]}")


def _conditions(c):
    for count, name in ((None, "absent"), ("", "without-count"), ("0", "zero"), ("1", "one"),
                        ("9223372036854775807", "largest")):
        _add(c, f"renew-{name}", "the renew restriction", HOLDER.but(renew_count=count))
    for count, name in (("0", "zero"), ("1", "one"), ("9223372036854775807", "largest")):
        _add(c, f"proxy-{name}", "the proxy restriction", BASE.but(proxy_count=count))
    _add(c, "renew-optional-attributes", "Postdatable and RenewExpired are let pass",
         HOLDER.but(renew_count="2"),
         (' Count="2" ', ' Count="2" Postdatable="false" RenewExpired="true" '))
    _add(c, "renewable-delegable-solution", "all three flags",
         HOLDER.but(renew_count="3", proxy_count="3", solution="true"))
    _add(c, "delegated-one", "one delegate", HOLDER.but(delegates=DELEGATES[:1]))
    _add(c, "delegated-three", "three delegates", HOLDER.but(delegates=DELEGATES))
    _add(c, "delegated-bearer", "a bearer token with a delegate",
         BASE.but(delegates=DELEGATES[:2]))
    _add(c, "audience-one", "one audience", BASE.but(audience=["https://rp.example.com/"]))
    _add(c, "audience-sorted", "audiences come back sorted and without doubles",
         BASE.but(audience=["urn:b", "urn:a", "urn:b", "urn:C", "urn:a b&c"]))
    _add(c, "audience-none-listed", "a restriction that lists no audience",
         BASE.but(audience=[]))
    _add(c, "audience-with-attributes", "attributes of audiences are not looked at",
         BASE.but(audience=["urn:a"]),
         ("<saml:AudienceRestriction>", '<saml:AudienceRestriction a="1">'),
         ("<saml:Audience>", '<saml:Audience b="2">'))
    shuffled = EVERYTHING.text().split("\n")
    first = next(i for i, line in enumerate(shuffled) if line.startswith("<saml:Conditions"))
    last = shuffled.index("</saml:Conditions>")
    shuffled[first + 1:last] = reversed(shuffled[first + 1:last])
    c.accept("conditions-reversed", "restrictions may come in any order",
             signed("\n".join(shuffled)), EVERYTHING.facts())
    _add(c, "conditions-none", "no restriction at all, and no blank either", BASE,
         (">\n</saml:Conditions>", "></saml:Conditions>"))
    _add(c, "confirmation-outlives-conditions", "the confirmation may hold longer",
         BASE.but(confirmed_until="2027-01-01T00:00:00Z"))


def _attributes(c):
    _add(c, "no-attribute-statement", "there is no AttributeStatement",
         BASE.but(given_name=None, surname=None, groups=[]),
         ("<saml:AttributeStatement>\n", ""), ("</saml:AttributeStatement>\n", ""),
         (f'<saml:Attribute Name="{names.GROUPS}" NameFormat="{names.NAME_FORMAT}">'
          "</saml:Attribute>\n", ""))
    _add(c, "groups-none", "a group attribute without values", BASE.but(groups=[]))
    _add(c, "groups-two-attributes", "groups of several attributes accumulate",
         BASE.but(groups=[("Users", "example.com"), ("Ops", "other")]),
         ("</saml:AttributeValue><saml:AttributeValue xsi:type=\"xs:string\">other",
          f'</saml:AttributeValue></saml:Attribute><saml:Attribute Name="{names.GROUPS}" '
          f'NameFormat="{names.NAME_FORMAT}"><saml:AttributeValue>other'))
    _add(c, "groups-split-at-first-backslash", "a group's name may hold a backslash",
         BASE.but(groups=[("G\\H", "D"), ("\\x", "E"), ("a@b", "c@d")]))
    _add(c, "subject-split-at-last-at-sign", "a subject's name may hold an at sign",
         BASE.but(subject=("a@b", "c")))
    _add(c, "subject-blanks-kept", "blanks around the subject are part of it",
         BASE.but(subject=(" user", "example.com ")))
    for value, name in (("true", "true"), ("TRUE", "upper-case"), ("True", "mixed-case"),
                        ("false", "false"), ("1", "one"), ("yes", "yes"), ("", "empty"),
                        (" true", "leading-blank")):
        _add(c, f"solution-{name}", "the isSolution attribute", BASE.but(solution=value))
    _add(c, "solution-last-counts", "a later isSolution attribute overwrites",
         BASE.but(solution="true"),
         ("<saml:AttributeStatement>",
          "<saml:AttributeStatement>" + BASE.attribute(names.SOLUTION, ["false"])))
    _add(c, "names-absent", "no name attributes", BASE.but(given_name=None, surname=None))
    _add(c, "names-blank", "a value of blanks only reads as empty",
         BASE.but(given_name="", surname=""), ('xs:string"></saml:AttributeValue>',
                                               'xs:string"> \n</saml:AttributeValue>', 2))
    _add(c, "names-first-value-last-attribute", "the first value of the last attribute counts",
         BASE,
         ("<saml:AttributeStatement>", "<saml:AttributeStatement>"
          + BASE.attribute(names.GIVEN_NAME, ["Other"])),
         (">Ada</saml:AttributeValue>",
          ">Ada</saml:AttributeValue><saml:AttributeValue>Second</saml:AttributeValue>"))
    _add(c, "unknown-attribute", "an attribute of another name is passed over", BASE,
         ("<saml:AttributeStatement>", "<saml:AttributeStatement>"
          + BASE.attribute("urn:example:other", ["a\\b", "", "true"])))
    _add(c, "friendly-name", "FriendlyName is let pass", BASE,
         (f'Name="{names.GROUPS}"', f'FriendlyName="Groups" Name="{names.GROUPS}"'))
    _add(c, "value-attributes", "attributes of a value are not looked at", BASE,
         ('<saml:AttributeValue xsi:type="xs:string">Ada',
          '<saml:AttributeValue xsi:type="xs:anyURI" a="b">Ada'))
    # The attributes look like IDs and carry the assertion's, but nobody would look an ID up there.
    _add(c, "value-attributes-like-ids", "attributes whose names merely end in or begin with Id",
         BASE, ('<saml:AttributeValue xsi:type="xs:string">Ada',
                f'<saml:AttributeValue xmlns:x="urn:x" valid="{ID}" PAID="{ID}" x:valid="{ID}" '
                f'Ids="{ID}" I="{ID}" d="{ID}" x:d="{ID}" Identifier="{ID}" IDREF="{ID}" '
                f'ad="{ID}" x:bd="{ID}" ie="{ID}" _Id="{ID}" x:a-id="{ID}" href="#{ID}" '
                'xsi:type="xs:string">Ada'))
    _add(c, "blank-ends", "values with blanks at their ends, which belong to them",
         BASE.but(subject=(" user", "example.com "), groups=[("Users ", " example.com")],
                  advice=[("urn:source", [("urn:name", [" \tvalue "])])]))
    _add(c, "advice-two", "two advices, in document order", BASE.but(advice=ADVICE))
    blank = [("urn:source", [("urn:blank", [""]), ("urn:name", ["a", "", "b"])])]
    _add(c, "advice-empty-values", "empty values stay in their places", BASE.but(advice=blank))


def _dates(c):
    for name, start, end in (
            ("fractions", "2026-01-01T00:00:00.5Z", "2026-12-31T23:59:59.999Z"),
            ("microseconds", "2026-01-01T00:00:00.000001Z", "2026-12-31T23:59:59.999999Z"),
            ("offset-east", "2026-01-01T02:00:00+02:00", "2027-01-01T05:30:00+05:30"),
            ("offset-west", "2025-12-31T16:00:00-08:00", "2026-12-30T16:00:00-08:00"),
            ("offset-zero", "2026-01-01T00:00:00+00:00", "2026-12-31T00:00:00-00:00"),
            ("offset-and-fraction", "2026-01-01T01:00:00.250+01:00", "2026-12-31T00:00:00Z"),
            ("leap-day", "2024-02-29T12:00:00Z", "2028-02-29T12:00:00Z"),
            ("far-apart", "1970-01-01T00:00:00Z", "2999-12-31T23:59:59Z")):
        facts_start, facts_end = _six_digits(start), _six_digits(end)
        token = BASE.but(start=start, end=end)
        facts = BASE.but(start=facts_start, end=facts_end).facts()
        c.accept(f"date-{name}", f"valid from {start} to {end}", signed(token), facts)
    for name, written, meant in (
            ("no-offset", "2026-01-01T00:00:00", "2026-01-01T00:00:00Z"),
            ("end-of-day", "2026-01-01T24:00:00Z", "2026-01-02T00:00:00Z"),
            ("nine-digits", "2026-01-01T00:00:00.123456789Z", "2026-01-01T00:00:00.123456Z"),
            ("offset-14", "2026-01-01T14:00:00+14:00", "2026-01-01T00:00:00Z")):
        c.accept(f"date-{name}", f"valid from {written}", signed(BASE.but(start=written)),
                 BASE.but(start=meant).facts())
    start, end = "2026-06-15T12:00:00Z", "2026-06-15T13:00:00Z"
    token = BASE.but(start=start, end=end)
    for name, now, tolerance in (
            ("start-equals-now", "2026-06-15T12:00:00Z", 0),
            ("start-within-tolerance", "2026-06-15T11:51:00Z", 600),
            ("start-plus-tolerance-equals-now", "2026-06-15T11:50:00Z", 600),
            ("last-microsecond", "2026-06-15T12:59:59.999999Z", 0),
            ("end-within-tolerance", "2026-06-15T13:09:00Z", 600),
            ("last-microsecond-of-tolerance", "2026-06-15T13:09:59.999999Z", 600)):
        _add(c, f"clock-{name}", f"valid from {start} to {end}", token,
             conditions={"now": now, "tolerance": tolerance})


def _six_digits(text):
    """The moment in a form that datetime.fromisoformat of every Python version reads."""
    if "." not in text:
        return text
    head, tail = text.split(".")
    digits = tail.rstrip("Z").split("+")[0]
    return f"{head}.{digits.ljust(6, '0')}{tail[len(digits):]}"


def _sizes(c):
    _add(c, "bearer-4k", "a bearer token of about 4 KB, as the benchmark reads it",
         _of_size(4096, BASE.signed_as(key_info=key_info("sts"))))
    _add(c, "bearer-8k", "a bearer token of about 8 KB",
         _of_size(8192, BASE.signed_as(key_info=key_info("sts"))))
    _add(c, "bearer-100k", "a bearer token of a thousand groups, about 100 KB",
         BASE.but(groups=[(f"Department-{i:04}-Staff", "example.com") for i in range(1000)]))
    _add(c, "long-value", "one value of 16 KB", BASE.but(given_name="0123456789abcdef" * 1024))


def _of_size(size, token):
    signature_value = 342
    groups = []
    while len(token.text()) + signature_value < size:
        groups.append((f"Group-{len(groups):04}", "example.com"))
        token = token.but(groups=groups)
    return token
