"""Documents that other programs encrypt by their own code: xmlsec1 from a template, and OpenSAML."""

import re
import subprocess
import tempfile
from pathlib import Path

from . import ciphers, names

_TEMPLATE = (
    f'<xenc:EncryptedData xmlns:xenc="{names.XENC}" xmlns:ds="{names.DS}" Type="{names.ELEMENT}">'
    '<xenc:EncryptionMethod Algorithm="{content}"/><ds:KeyInfo><xenc:EncryptedKey>'
    '<xenc:EncryptionMethod Algorithm="{method}"/><ds:KeyInfo><ds:KeyName/></ds:KeyInfo>'
    "<xenc:CipherData><xenc:CipherValue/></xenc:CipherData></xenc:EncryptedKey></ds:KeyInfo>"
    "<xenc:CipherData><xenc:CipherValue/></xenc:CipherData></xenc:EncryptedData>")


def encrypt(file, content, bits, method=names.OAEP_MGF1P, to="client"):
    with tempfile.NamedTemporaryFile("w", suffix=".xml") as template:
        template.write(_TEMPLATE.format(content=content, method=method))
        template.flush()
        text = subprocess.run(
            ["xmlsec1", "--encrypt", f"--pubkey-cert-pem:{to}",
             ciphers.KEYS / f"{to}-cert.pem", "--session-key", f"aes-{bits}", "--xml-data", file,
             "--node-xpath", "/*", template.name],
            check=True, capture_output=True, text=True).stdout
    data = re.sub(r"^<\?xml[^>]*\?>\s*", "", text)
    return f'<saml:EncryptedAssertion xmlns:saml="{names.SAML}">{data}</saml:EncryptedAssertion>\n'


def encrypt_with_opensaml(
        file, jars, content, method, place, digest="-", mask="-", to=("client",)):
    program = Path(__file__).resolve().parents[1] / "opensaml" / "EncryptAssertion.java"
    if jars is None:
        raise ValueError("OpenSAML's jars are needed to make a document again")
    certificates = [ciphers.KEYS / f"{name}-cert.pem" for name in to]
    return subprocess.run(
        ["java", "-cp", f"{jars}/*", program, file, content, method, digest, mask, place,
         *certificates], check=True, capture_output=True, text=True).stdout


def decrypt(file, name):
    """What xmlsec1 finds in a document; None if it does not open it."""
    with tempfile.NamedTemporaryFile("w", suffix=".xml") as data:
        text = Path(file).read_text("utf-8")
        data.write(re.search(r"<xenc:EncryptedData.*</xenc:EncryptedData>", text, re.DOTALL)[0])
        data.flush()
        result = subprocess.run(
            ["xmlsec1", "--decrypt", "--privkey-pem", ciphers.KEYS / f"{name}-key.pem", data.name],
            capture_output=True)
    return result.stdout if result.returncode == 0 else None
