"""Signed documents that are no tokens, for what the shape of a token would refuse on its own."""

from . import keys
from .accepted import LEAN, good_reference
from .catalogue import replaced
from .signing import sign

FORM = LEAN.signed_as(uri="@URI@")
REFERENCE = good_reference(FORM)


def _signature(uri, *edits):
    text = FORM.signature.text().replace("@URI@", uri)
    for edit in edits:
        text = replaced(text, *edit)
    return text


def write_all(directory):
    """Every one is signed by `sts`; the digest is that of the root where the URI names nothing."""
    directory.mkdir(exist_ok=True)
    texts = {
        "whole": f"<r>a{_signature('')}</r>",
        "part": f'<r><p ID="_p">a{_signature("#_p")}</p>b</r>',
        "no-reference": f'<r>a{_signature("", (REFERENCE.replace("@URI@", ""), ""))}</r>',
        "whole-signed-in-a-part": f"<r><p>a{_signature('')}</p>b</r>",
        "uri-without-hash": f'<r ID="_r">a{_signature("x_r")}</r>',
        "uri-of-hash-only": f'<r ID="">a{_signature("#")}</r>',
        "namespace-like-an-id": f'<r ID="urn:r"><p xmlns:id="urn:r"/>{_signature("#urn:r")}</r>',
        "id-twice": f'<r ID="urn:r"><p xmlns:x="urn:x" x:id="urn:r"/>{_signature("#urn:r")}</r>',
        "uri-of-another": f'<r xmlns:w="urn:w" ID="_r"><p w:Id="_p"/>{_signature("#_p")}</r>',
    }
    for stale in set(directory.glob("*.xml")) - {directory / f"{name}.xml" for name in texts}:
        stale.unlink()
    for name, text in texts.items():
        (directory / f"{name}.xml").write_text(sign(text, keys.private_key("sts")))
    return len(texts)
