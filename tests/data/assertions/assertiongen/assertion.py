"""An assertion as a dictionary, written as XML and as the facts that must be read from it."""

import calendar
import copy
import time
from xml.sax.saxutils import escape, quoteattr

from lxml import etree

from . import keys, names, signing

BASE = {
    "prefix": "saml",  # of SAML's elements; empty for the default namespace
    "declare": {},  # further prefixes on the assertion
    "attributes_of_assertion": "",
    "version": "2.0",
    "id": "_0f3c5b7e",
    "instant": names.ISSUED,
    "issuer": {"value": "https://idp.example.com/entity"},
    "subject": {"value": "alice"},
    "confirmations": [{"method": names.BEARER, "end": names.END}],
    "conditions": {"start": names.START, "end": names.END, "audiences": [[names.AUDIENCE]]},
    "advice": None,  # content as XML
    "statements": [],  # ("authn", {...}), ("attributes", [...]) or ("xml", text), in order
    "sign": {"key": "sts", "algorithm": names.rsa(256), "digest": names.SHA256,
             "c14n": names.EXC_C14N, "prefix_list": "", "uri": "#@ID@", "ds_prefix": "ds",
             "key_info": ["sts"]},
    "edit": [],  # (from, to) after signing
    "layout": "",  # white space between elements
}


def assertion(**changes):
    """The base with changes; dictionaries are joined, everything else replaced."""
    return changed(BASE, **changes)


def changed(base, **changes):
    result = copy.deepcopy(base)
    for name, value in changes.items():
        if name in ("sign", "declare"):
            result[name].update(value)
        else:
            result[name] = copy.deepcopy(value)
    return result


# ---------------------------------------------------------------------------------------- as XML

def write(spec):
    """The signed document."""
    p = spec["prefix"] + ":" if spec["prefix"] else ""
    how = dict(spec["sign"])
    how["uri"] = how["uri"].replace("@ID@", spec["id"])
    declared = {spec["prefix"]: names.SAML, **spec["declare"]}
    declarations = "".join(
        f" xmlns{':' + prefix if prefix else ''}={quoteattr(uri)}"
        for prefix, uri in declared.items())
    gap = spec["layout"]
    parts = [
        f'<{p}Assertion{declarations} ID="{spec["id"]}" IssueInstant="{spec["instant"]}" '
        f'Version="{spec["version"]}"{spec["attributes_of_assertion"]}>',
        _name_id(p, "Issuer", spec["issuer"]),
        signing.signature_element(how),
        _subject(p, spec), _conditions(p, spec["conditions"]),
        "" if spec["advice"] is None else f"<{p}Advice>{spec['advice']}</{p}Advice>",
        *(_statement(p, kind, content) for kind, content in spec["statements"]),
        f"</{p}Assertion>"]
    text = signing.sign(gap.join(part for part in parts if part), how)
    for old, new in spec["edit"]:
        if text.count(old) != 1:
            raise ValueError(f"{old} stands {text.count(old)} times in the document")
        text = text.replace(old, new)
    return text


def _attributes(**values):
    return "".join(f" {name}={quoteattr(value)}" for name, value in values.items()
                   if value is not None)


def _name_id(p, element, name):
    if "xml" in name:
        return name["xml"]
    attributes = _attributes(
        Format=name.get("format"), NameQualifier=name.get("qualifier"),
        SPNameQualifier=name.get("sp_qualifier"), SPProvidedID=name.get("sp_id"))
    return (f"<{p}{element}{attributes}>{name.get('raw', escape(name['value']))}</{p}{element}>")


def _subject(p, spec):
    if spec["subject"] is None and not spec["confirmations"]:
        return ""
    name = "" if spec["subject"] is None else _name_id(p, "NameID", spec["subject"])
    confirmations = "".join(_confirmation(p, c) for c in spec["confirmations"])
    return f"<{p}Subject>{name}{confirmations}</{p}Subject>"


def _confirmation(p, c):
    name = _name_id(p, "NameID", c["name"]) if "name" in c else ""
    data = ""
    if c.get("data", True):
        attributes = c.get("data_attributes", "") + _attributes(
            Address=c.get("address"), InResponseTo=c.get("request"), NotBefore=c.get("start"),
            NotOnOrAfter=c.get("end"), Recipient=c.get("recipient"))
        content = "".join(_key_info(key) for key in c.get("keys", [])) + c.get("content", "")
        data = f"<{p}SubjectConfirmationData{attributes}>{content}</{p}SubjectConfirmationData>"
    return (f'<{p}SubjectConfirmation Method="{c["method"]}">{name}{data}'
            f"</{p}SubjectConfirmation>")


def _key_info(key):
    """`key` is {certificates, rsa, ec, serial_of, key_name}: names of keys."""
    parts = ""
    if "key_name" in key:
        parts += f"<d:KeyName>{key['key_name']}</d:KeyName>"
    if "rsa" in key:
        modulus, exponent = keys.rsa_numbers_base64(key["rsa"])
        parts += (f"<d:KeyValue><d:RSAKeyValue><d:Modulus>{modulus}</d:Modulus>"
                  f"<d:Exponent>{exponent}</d:Exponent></d:RSAKeyValue></d:KeyValue>")
    if "ec" in key:
        parts += (f'<d:KeyValue><k:ECKeyValue xmlns:k="{names.DS11}">'
                  f'<k:NamedCurve URI="urn:oid:1.2.840.10045.3.1.7"/>'
                  f"<k:PublicKey>{keys.point_base64(key['ec'])}</k:PublicKey></k:ECKeyValue>"
                  "</d:KeyValue>")
    x509 = ""
    if "serial_of" in key:
        x509 += (f"<d:X509IssuerSerial><d:X509IssuerName>{key['issuer_name']}</d:X509IssuerName>"
                 f"<d:X509SerialNumber>{keys.serial_number(key['serial_of'])}"
                 "</d:X509SerialNumber></d:X509IssuerSerial>")
    for name in key.get("certificates", []):
        x509 += f"<d:X509Certificate>{keys.certificate_base64(name)}</d:X509Certificate>"
    if x509:
        parts += f"<d:X509Data>{x509}</d:X509Data>"
    return f'<d:KeyInfo xmlns:d="{names.DS}">{parts}{key.get("xml", "")}</d:KeyInfo>'


def _conditions(p, c):
    if c is None:
        return ""
    content = "".join(
        f"<{p}AudienceRestriction>"
        + "".join(f"<{p}Audience>{c.get('blank', '')}{escape(a)}{c.get('blank', '')}</{p}Audience>"
                  for a in audience)
        + f"</{p}AudienceRestriction>" for audience in c.get("audiences", []))
    content += c.get("xml", "").replace("@P@", p)
    return (f"<{p}Conditions{_attributes(NotBefore=c.get('start'), NotOnOrAfter=c.get('end'))}>"
            f"{content}</{p}Conditions>")


def _statement(p, kind, content):
    if kind == "xml":
        return content.replace("@P@", p)
    if kind == "authn":
        return _authn(p, content)
    return (f"<{p}AttributeStatement>" + "".join(_attribute(p, a) for a in content)
            + f"</{p}AttributeStatement>")


def _authn(p, a):
    locality = ""
    if "address" in a or "dns" in a:
        locality = (f"<{p}SubjectLocality"
                    f"{_attributes(Address=a.get('address'), DNSName=a.get('dns'))}/>")
    context = ""
    if "context" in a:
        context += f"<{p}AuthnContextClassRef>{a['context']}</{p}AuthnContextClassRef>"
    if "declaration" in a:
        context += f"<{p}AuthnContextDecl>{a['declaration']}</{p}AuthnContextDecl>"
    if "declaration_ref" in a:
        context += f"<{p}AuthnContextDeclRef>{a['declaration_ref']}</{p}AuthnContextDeclRef>"
    context += "".join(f"<{p}AuthenticatingAuthority>{name}</{p}AuthenticatingAuthority>"
                       for name in a.get("authorities", []))
    attributes = _attributes(
        AuthnInstant=a.get("instant", names.ISSUED), SessionIndex=a.get("session"),
        SessionNotOnOrAfter=a.get("session_end"))
    return (f"<{p}AuthnStatement{attributes}>{locality}<{p}AuthnContext>{context}"
            f"{a.get('xml', '')}</{p}AuthnContext></{p}AuthnStatement>")


def _attribute(p, a):
    attributes = _attributes(
        FriendlyName=a.get("friendly"), Name=a["name"], NameFormat=a.get("format"))
    values = "".join(
        f"<{p}AttributeValue{v.get('attributes', '')}>{v.get('raw', escape(v.get('text', '')))}"
        f"</{p}AttributeValue>" for v in map(_value, a["values"]))
    return f"<{p}Attribute{attributes}{a.get('extra', '')}>{values}</{p}Attribute>"


def _value(value):
    return {"text": value} if isinstance(value, str) else value


# -------------------------------------------------------------------------------------- as facts

def micros(text):
    if text is None:
        return None
    return calendar.timegm(time.strptime(text, "%Y-%m-%dT%H:%M:%SZ")) * 1_000_000


def facts(spec, text, accepted=0):
    """`accepted` is the index of the confirmation that the rules leave."""
    conditions = spec["conditions"] or {}
    confirmation = spec["confirmations"][accepted]
    authns = [content for kind, content in spec["statements"] if kind == "authn"]
    ends = [conditions.get("end"), confirmation.get("end"),
            *(a.get("session_end") for a in authns)]
    starts = [conditions.get("start"), confirmation.get("start")]
    return {
        "id": spec["id"], "issueInstant": micros(spec["instant"]),
        "issuer": _name_facts(spec["issuer"]), "subject": _name_facts(spec["subject"]),
        "confirmations": [_confirmation_facts(c) for c in spec["confirmations"]],
        "conditions": _condition_facts(conditions),
        "advice": [] if spec["advice"] is None else _advice_facts(spec, text),
        "authentications": [_authn_facts(a) for a in authns],
        "attributes": _attribute_facts(spec, text),
        "confirmation": accepted,
        "start": max([micros(s) for s in starts if s] or [micros(spec["instant"])]),
        "end": min(micros(e) for e in ends if e),
    }


def _name_facts(name):
    if name is None:
        return None
    return {"value": name["value"], "format": name.get("format"),
            "nameQualifier": name.get("qualifier"), "spNameQualifier": name.get("sp_qualifier"),
            "spProvidedId": name.get("sp_id")}


def _confirmation_facts(c):
    has_data = c.get("data", True)
    get = c.get if has_data else (lambda name: None)
    return {"method": c["method"], "nameId": _name_facts(c.get("name")),
            "notBefore": micros(get("start")), "notOnOrAfter": micros(get("end")),
            "recipient": get("recipient"), "inResponseTo": get("request"),
            "address": get("address"),
            "keys": [_key_facts(k) for k in (c.get("keys", []) if has_data else [])]}


def _key_facts(key):
    serial = None
    if "serial_of" in key:
        serial = [key["issuer_name"], keys.serial_number(key["serial_of"])]
    return {"certificates": key.get("certificates", []), "certificate": key.get("holder"),
            "key": key.get("holder") or key.get("rsa") or key.get("ec"),
            "issuerSerial": serial, "subjectName": None, "keyName": key.get("key_name")}


def _condition_facts(c):
    return {"notBefore": micros(c.get("start")), "notOnOrAfter": micros(c.get("end")),
            "audiences": [sorted(a) for a in c.get("audiences", [])],
            "oneTimeUse": c.get("one_time", False), "proxy": c.get("proxy"),
            "delegates": [{"nameId": _name_facts(d["name"]), "instant": micros(d.get("instant")),
                           "method": d.get("method")} for d in c.get("delegates", [])],
            "renew": c.get("renew")}


def _authn_facts(a):
    return {"instant": micros(a.get("instant", names.ISSUED)), "session": a.get("session"),
            "sessionEnd": micros(a.get("session_end")), "address": a.get("address"),
            "dns": a.get("dns"), "context": a.get("context"),
            "declarationRef": a.get("declaration_ref"),
            "declaration": a.get("declaration_facts"), "authorities": a.get("authorities", [])}


def _tree(element):
    """Names as `{namespace}local`; texts on both sides of a comment are one text."""
    children, text = [], element.text or ""
    for child in element:
        if isinstance(child.tag, str):
            children += [{"text": text}] if text else []
            children.append(_tree(child))
            text = ""
        text += child.tail or ""
    children += [{"text": text}] if text else []
    return {"name": element.tag, "attributes": [[k, v] for k, v in element.attrib.items()],
            "children": children}


def _advice_facts(spec, text):
    advice = signing.parse(text).find("{%s}Advice" % names.SAML)
    return [_tree(child) for child in advice if isinstance(child.tag, str)]


def _attribute_facts(spec, text):
    written = signing.parse(text).iterfind(
        "{%s}AttributeStatement/{%s}Attribute" % (names.SAML, names.SAML))
    specs = [a for kind, content in spec["statements"] if kind == "attributes" for a in content]
    return [_one_attribute(a, element) for a, element in zip(specs, written, strict=True)]


def _one_attribute(a, element):
    values = [_value_facts(_value(v), e) for v, e in zip(a["values"], element, strict=True)]
    return {"name": a["name"], "nameFormat": a.get("format"), "friendlyName": a.get("friendly"),
            "other": [[k, v] for k, v in element.attrib.items() if k.startswith("{")],
            "values": values}


def _value_facts(v, element):
    xml = None
    if len(element) and any(isinstance(child.tag, str) for child in element):
        xml = etree.tostring(element, method="c14n", exclusive=True, with_comments=False,
                             with_tail=False).decode()
    return {"text": "" if xml else v.get("text", ""),
            "xml": xml, "nil": v.get("nil", False), "type": v.get("type"),
            "attributes": v.get("attribute_facts", [])}
