"""The rules that the refused tokens break: one folder each, with the rule in a sentence and the
section of the public standard that it comes from or narrows."""

RULES = {
    # The text
    "doctype": (
        "A token has no document type declaration, whatever stands in it.", "XML 2.8"),
    "encoding": (
        "A token is written in UTF-8, and only in characters that XML allows.", "XML 2.2, 4.3.3"),
    "well-formedness": (
        "A token is one whole, well-formed document of XML 1.0.", "XML 2.1"),
    "entity-references": (
        "A reference names one of the five predefined entities or a character that XML allows.",
        "XML 4.1, 4.6"),
    "namespaces": (
        "Every prefix is declared, no two attributes of an element have the same name, and "
        "namespaces are absolute.", "XML-NAMES 3 to 6; C14N 1.3"),
    # The signature
    "signature-place": (
        "The signature stands right after the issuer, once.", "SAML-CORE 2.3.3"),
    "signature-structure": (
        "A signature is SignedInfo, SignatureValue and at most one KeyInfo, each with exactly the "
        "children of the schema; Object is not accepted, and values are text alone.",
        "XMLDSIG 4.1 to 4.5"),
    "signature-coverage": (
        "Every reference, and there are 1 to 8, names the assertion that encloses the signature.",
        "SAML-CORE 5.4.2"),
    "duplicate-ids": (
        "The ID that is signed stands once in the document, under whatever attribute.",
        "SAML-CORE 1.3.4"),
    "wrapping": (
        "What was signed is what is read: a signed assertion that was moved aside does not vouch "
        "for the one in its place.", "SAML-CORE 5.4.2"),
    "transforms": (
        "A reference has the enveloped-signature transform and at most one canonicalization "
        "after it.", "SAML-CORE 5.4.4"),
    "algorithms": (
        "Signature, digest and canonicalization are of the few that are accepted: no HMAC, no "
        "MD5, no SHA-1, no comments.", "XMLDSIG 6.1"),
    "algorithm-parameters": (
        "No algorithm but exclusive canonicalization takes a parameter.", "XMLDSIG 6.1"),
    "prefix-lists": (
        "Exclusive canonicalization has at most one prefix list, which is an empty element with "
        "nothing but its PrefixList of at most 64 prefixes; other algorithms have none.",
        "EXC-C14N 4"),
    "signature-values": (
        "The digest and the signature value are Base64 of exactly the length and form that their "
        "algorithms give them.", "XMLDSIG 4.2, 4.3.3.6; RFC 4051 2.3.6"),
    "signing-key": (
        "Only a trusted key that is long enough and of the right kind signs; KeyInfo picks one "
        "of the trusted and adds none.", "XMLDSIG 4.4"),
    "tampering": (
        "Nothing changes after it was signed.", "XMLDSIG 3.2"),
    # The token
    "assertion": (
        "The root is a SAML 2.0 Assertion with three attributes and, in order, Issuer, Signature, "
        "Subject, Conditions, Advice if any, AuthnStatement and at most one AttributeStatement.",
        "SAML-CORE 2.3.3"),
    "version-and-id": (
        "The version is 2.0, and the ID begins with an underscore.", "SAML-CORE 1.3.4, 2.3.3"),
    "dates": (
        "A time is a complete xs:dateTime of a day that there is.", "SAML-CORE 1.3.3"),
    "issuer": (
        "The issuer is text with a format and no other attribute.", "SAML-CORE 2.2.5"),
    "subject": (
        "The subject is one NameID, text with a format and no other attribute, and one "
        "SubjectConfirmation.", "SAML-CORE 2.4.1"),
    "subject-confirmation": (
        "The confirmation is bearer or holder-of-key, with one SubjectConfirmationData; that of "
        "a bearer is empty but for its end, which is not before that of the token.",
        "SAML-CORE 2.4.1.1, 2.4.1.2"),
    "holder-of-key": (
        "The data of a holder-of-key confirmation has the type KeyInfoConfirmationDataType and "
        "holds one KeyInfo with one certificate.", "SAML-CORE 2.4.1.3"),
    "conditions": (
        "Conditions has a start and an end, and each of the four known restrictions at most once.",
        "SAML-CORE 2.5.1"),
    "audience": (
        "There is at most one AudienceRestriction, and it holds audiences only.",
        "SAML-CORE 2.5.1.4"),
    "counted-restrictions": (
        "Proxy and renew restrictions hold nothing but a count, a decimal number of 64 bits that "
        "is not negative.", "SAML-CORE 2.5.1.6"),
    "validity-period": (
        "A token starts before it ends, and is used between, give or take the clock tolerance.",
        "SAML-CORE 2.5.1.2"),
    "delegation": (
        "Delegates have a name and a time each, and the last of them is the one that the subject "
        "confirmation names.", "SAML-DELEGATION 2"),
    "advice": (
        "Advice holds RSAAdvice only, each with a source and at least one attribute.",
        "SAML-CORE 2.6.1"),
    "authn-statement": (
        "There is one AuthnStatement, with its time and one AuthnContextClassRef.",
        "SAML-CORE 2.7.2"),
    "attribute-statement": (
        "Attributes have a name, a format and text values; isSolution has one value.",
        "SAML-CORE 2.7.3"),
    "principal-names": (
        "The subject is a UPN, name@domain, and a group is domain\\name; no part is empty.",
        "SAML-CORE 2.2.2"),
    "order-of-checks": (
        "Of several rules broken at once the first one checked speaks: version, ID, times, "
        "subject, then the signature, then the names.", None),
}
