"""Signed documents that are no tokens, for what the shape of a token would refuse on its own."""

import base64

from . import keys, names
from .accepted import LEAN, good_reference
from .catalogue import replaced
from .signing import sign, sign_by_xmlsec1

FORM = LEAN.signed_as(uri="@URI@")
REFERENCE = good_reference(FORM)


def _signature(uri, *edits):
    text = FORM.signature.text().replace("@URI@", uri)
    for edit in edits:
        text = replaced(text, *edit)
    return text


def _cut(digest):
    return base64.b64encode(base64.b64decode(digest)[:16]).decode()


def _with_another_end(digest):
    octets = base64.b64decode(digest)
    return base64.b64encode(octets[:-1] + bytes([octets[-1] ^ 1])).decode()


def _signed_texts():
    """Signed by `sts` but for the one of `weak`, which is named after it."""
    sts = keys.private_key("sts")
    texts = {name: sign(text, sts) for name, text in _texts().items()}
    whole = f"<r>a{_signature('')}</r>"
    texts["weak"] = sign(whole, keys.private_key("weak"))
    texts["digest-cut"] = sign(whole, sts, digest_form=_cut)
    texts["digest-with-another-end"] = sign(whole, sts, digest_form=_with_another_end)
    beside = sign_by_xmlsec1(f"<?before a?><!--not signed-->{whole}<?after b?>", sts)
    texts["beside-instructions"] = beside
    texts["beside-another-comment"] = replaced(beside, "not signed", "another")
    texts["beside-another-instruction"] = replaced(beside, "<?after b?>", "<?after c?>")
    texts["beside-one-instruction"] = replaced(beside, "<?before a?>", "")
    return texts


def _texts():
    """The digest is that of the root where the URI names nothing."""
    enveloped, exclusive = (
        f'<ds:Transform Algorithm="{name}"/>' for name in (names.ENVELOPED, names.EXC_C14N))
    digest_method = f'<ds:DigestMethod Algorithm="{names.SHA256}"/>'
    return {
        "whole": f"<r>a{_signature('')}</r>",
        "part": f'<r><p ID="_p">a{_signature("#_p")}</p>b</r>',
        "no-reference": f'<r>a{_signature("", (REFERENCE.replace("@URI@", ""), ""))}</r>',
        "whole-signed-in-a-part": f"<r><p>a{_signature('')}</p>b</r>",
        "uri-without-hash": f'<r ID="_r">a{_signature("x_r")}</r>',
        "uri-of-hash-only": f'<r ID="">a{_signature("#")}</r>',
        "namespace-like-an-id": f'<r ID="urn:r"><p xmlns:id="urn:r"/>{_signature("#urn:r")}</r>',
        "id-twice": f'<r ID="urn:r"><p xmlns:x="urn:x" x:id="urn:r"/>{_signature("#urn:r")}</r>',
        "digest-method-with-a-child": "<r>a%s</r>" % _signature("", (
            digest_method, digest_method[:-2] + "><k>1</k></ds:DigestMethod>")),
        "transforms-swapped": "<r>a%s</r>" % _signature("", (
            enveloped + exclusive, exclusive + enveloped)),
        "digest-before-a-comment": "<r>a%s</r>" % _signature("", (
            "@DIGEST@", "@DIGEST@<!--c-->")),
        "value-before-an-element": "<r>a%s</r>" % _signature("", ("@VALUE@", "@VALUE@<k/>")),
        "uri-of-another": f'<r xmlns:w="urn:w" ID="_r"><p w:Id="_p"/>{_signature("#_p")}</r>',
    }


def write_all(directory):
    directory.mkdir(exist_ok=True)
    texts = _signed_texts()
    for stale in set(directory.glob("*.xml")) - {directory / f"{name}.xml" for name in texts}:
        stale.unlink()
    for name, text in texts.items():
        (directory / f"{name}.xml").write_text(text)
    return len(texts)
