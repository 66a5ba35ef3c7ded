"""Writes the text of a token, unsigned, and tells the facts that a reader must find in it."""

from dataclasses import dataclass, field, replace
from datetime import datetime, timezone
from typing import List, Optional, Tuple
from xml.sax.saxutils import escape

from . import keys, names

ID = "_7d1f6a52-9c61"


def micros(text):
    moment = datetime.fromisoformat(text.replace("Z", "+00:00"))
    since = moment - datetime(1970, 1, 1, tzinfo=timezone.utc)
    return (since.days * 86400 + since.seconds) * 1000000 + since.microseconds


def _attribute_text(value):
    return escape(value, {'"': "&quot;"})


@dataclass
class SignatureForm:
    """What a ds:Signature says, before its values are known."""
    uri: str = "#" + ID
    c14n: str = names.EXC_C14N
    c14n_prefixes: Optional[str] = None
    transforms: Tuple[str, ...] = (names.ENVELOPED, names.EXC_C14N)
    transform_prefixes: Optional[str] = None
    method: str = names.RSA_SHA256
    digest: str = names.SHA256
    key_info: str = ""
    prefix: str = "ds"

    def text(self):
        p = self.prefix + ":" if self.prefix else ""
        declaration = "xmlns:" + self.prefix if self.prefix else "xmlns"
        transforms = "".join(
            self._method(p + "Transform", t, self.transform_prefixes) for t in self.transforms)
        return (
            f'<{p}Signature {declaration}="{names.DS}"><{p}SignedInfo>'
            + self._method(p + "CanonicalizationMethod", self.c14n, self.c14n_prefixes)
            + self._method(p + "SignatureMethod", self.method)
            + f'<{p}Reference URI="{self.uri}"><{p}Transforms>{transforms}</{p}Transforms>'
            + self._method(p + "DigestMethod", self.digest)
            + f"<{p}DigestValue>@DIGEST@</{p}DigestValue></{p}Reference></{p}SignedInfo>"
            f"<{p}SignatureValue>@VALUE@</{p}SignatureValue>{self.key_info}</{p}Signature>")

    @staticmethod
    def _method(name, algorithm, prefixes=None):
        if prefixes is None or algorithm != names.EXC_C14N:
            return f'<{name} Algorithm="{algorithm}"/>'
        return (f'<{name} Algorithm="{algorithm}"><ec:InclusiveNamespaces '
                f'xmlns:ec="{names.EXC_C14N}" PrefixList="{prefixes}"/></{name}>')


def x509_data(*certificates, prefix="ds:", form=str):
    inner = "".join(
        f"<{prefix}X509Certificate>{form(keys.certificate_base64(c))}</{prefix}X509Certificate>"
        for c in certificates)
    return f"<{prefix}X509Data>{inner}</{prefix}X509Data>"


def key_info(*certificates, prefix="ds:"):
    return f"<{prefix}KeyInfo>{x509_data(*certificates, prefix=prefix)}</{prefix}KeyInfo>"


def wrap(text, columns, end="\n"):
    return end.join(text[i:i + columns] for i in range(0, len(text), columns))


@dataclass
class Token:
    id: str = ID
    issue_instant: str = "2026-01-01T00:00:00Z"
    start: str = "2026-01-01T00:00:00Z"
    end: str = "2026-12-31T00:00:00Z"
    confirmed_until: Optional[str] = None
    subject: Tuple[str, str] = ("user", "example.com")
    holder: Optional[str] = None
    delegates: List[Tuple[str, str, str]] = field(default_factory=list)
    audience: Optional[List[str]] = None
    renew_count: Optional[str] = None
    proxy_count: Optional[str] = None
    advice: List[Tuple[str, List[Tuple[str, List[str]]]]] = field(default_factory=list)
    given_name: Optional[str] = "Ada"
    surname: Optional[str] = "Example"
    groups: List[Tuple[str, str]] = field(default_factory=lambda: [("Users", "example.com")])
    solution: Optional[str] = None
    prefix: str = "saml"
    line_end: str = "\n"
    signature: SignatureForm = field(default_factory=SignatureForm)

    def but(self, **changes):
        return replace(self, **changes)

    def signed_as(self, **changes):
        return replace(self, signature=replace(self.signature, **changes))

    def text(self):
        p = self._p
        declaration = "xmlns:" + self.prefix if self.prefix else "xmlns"
        lines = [
            f'<{p}Assertion {declaration}="{names.SAML}" xmlns:xs="{names.XS}" '
            f'xmlns:xsi="{names.XSI}" ID="{self.id}" IssueInstant="{self.issue_instant}" '
            f'Version="2.0">',
            f'<{p}Issuer Format="{names.ENTITY_FORMAT}">https://sts.example.com/STS</{p}Issuer>',
            self.signature.text(),
            *self._subject_lines(),
            *self._condition_lines(),
            *self._advice_lines(),
            f'<{p}AuthnStatement AuthnInstant="{self.issue_instant}"><{p}AuthnContext>'
            f"<{p}AuthnContextClassRef>{names.PASSWORD_CONTEXT}</{p}AuthnContextClassRef>"
            f"</{p}AuthnContext></{p}AuthnStatement>",
            *self._attribute_lines(),
            f"</{p}Assertion>",
        ]
        return self.line_end.join(lines)

    def facts(self):
        return {
            "id": self.id,
            "subject": list(self.subject),
            "fullName": [self.given_name or "", self.surname or ""],
            "groups": [list(g) for g in self.groups],
            "startMicros": micros(self.start),
            "endMicros": micros(self.end),
            "renewable": self.renew_count is not None and int(self.renew_count or 0) != 0,
            "delegable": self.proxy_count is not None and int(self.proxy_count) != 0,
            "solution": (self.solution or "").lower() == "true",
            "confirmation": "holder-of-key" if self.holder else "bearer",
            "certificate": self.holder,
            "delegationChain": [[n, d, micros(t)] for n, d, t in self.delegates],
            "audience": sorted(set(self.audience or []), key=str.encode),
            "advice": [
                {"source": source, "attributes": [list(a) for a in attributes]}
                for source, attributes in self.advice],
        }

    @property
    def _p(self):
        return self.prefix + ":" if self.prefix else ""

    def _name_id(self, name, domain):
        p = self._p
        return f'<{p}NameID Format="{names.UPN}">{escape(name + "@" + domain)}</{p}NameID>'

    def _subject_lines(self):
        p = self._p
        method = names.HOLDER_OF_KEY if self.holder else names.BEARER
        yield f"<{p}Subject>"
        yield self._name_id(*self.subject)
        yield f'<{p}SubjectConfirmation Method="{method}">'
        if self.delegates:
            yield self._name_id(*self.delegates[-1][:2])
        if self.holder:
            certificate = key_info(self.holder).replace(
                "<ds:KeyInfo>", f'<ds:KeyInfo xmlns:ds="{names.DS}">')
            yield (f'<{p}SubjectConfirmationData xsi:type="{p}KeyInfoConfirmationDataType">'
                   f"{certificate}</{p}SubjectConfirmationData>")
        else:
            until = self.confirmed_until or self.end
            yield (f'<{p}SubjectConfirmationData NotOnOrAfter="{until}">'
                   f"</{p}SubjectConfirmationData>")
        yield f"</{p}SubjectConfirmation>"
        yield f"</{p}Subject>"

    def _condition_lines(self):
        p = self._p
        yield f'<{p}Conditions NotBefore="{self.start}" NotOnOrAfter="{self.end}">'
        if self.proxy_count is not None:
            yield f'<{p}ProxyRestriction Count="{self.proxy_count}"></{p}ProxyRestriction>'
        if self.renew_count is not None:
            count = f' Count="{self.renew_count}"' if self.renew_count else ""
            yield (f'<{p}Condition xmlns:rsa="{names.RSA}"{count} '
                   f'xsi:type="rsa:RenewRestrictionType"></{p}Condition>')
        if self.delegates:
            inner = "".join(
                f'<del:Delegate DelegationInstant="{t}">{self._name_id(n, d)}</del:Delegate>'
                for n, d, t in self.delegates)
            yield (f'<{p}Condition xmlns:del="{names.DEL}" '
                   f'xsi:type="del:DelegationRestrictionType">{inner}</{p}Condition>')
        if self.audience is not None:
            inner = "".join(f"<{p}Audience>{escape(a)}</{p}Audience>" for a in self.audience)
            yield f"<{p}AudienceRestriction>{inner}</{p}AudienceRestriction>"
        yield f"</{p}Conditions>"

    def _advice_lines(self):
        if not self.advice:
            return
        p = self._p
        yield f"<{p}Advice>"
        for source, attributes in self.advice:
            inner = "".join(self.attribute(name, values) for name, values in attributes)
            yield (f'<rsa:RSAAdvice xmlns:rsa="{names.RSA}" AdviceSource="{_attribute_text(source)}">'
                   f"{inner}</rsa:RSAAdvice>")
        yield f"</{p}Advice>"

    def _attribute_lines(self):
        p = self._p
        yield f"<{p}AttributeStatement>"
        if self.given_name is not None:
            yield self.attribute(names.GIVEN_NAME, [self.given_name])
        if self.surname is not None:
            yield self.attribute(names.SURNAME, [self.surname])
        yield self.attribute(names.GROUPS, [d + "\\" + g for g, d in self.groups])
        if self.solution is not None:
            yield self.attribute(names.SOLUTION, [self.solution])
        yield f"</{p}AttributeStatement>"

    def attribute(self, name, values):
        p = self._p
        inner = "".join(
            f'<{p}AttributeValue xsi:type="xs:string">{escape(v)}</{p}AttributeValue>'
            for v in values)
        return (f'<{p}Attribute Name="{_attribute_text(name)}" NameFormat="{names.NAME_FORMAT}">'
                f"{inner}</{p}Attribute>")
