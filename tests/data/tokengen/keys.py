"""The keys and certificates that sign and appear in the tokens. A key that exists is kept."""

import base64
import subprocess
from functools import lru_cache
from pathlib import Path

from cryptography import x509
from cryptography.hazmat.primitives import serialization

DIRECTORY = Path(__file__).resolve().parent.parent / "keys"

# name: (openssl arguments that choose the key, subject)
_KEYS = {
    "sts": (["rsa:2048"], "/O=Example/CN=STS signing"),
    "sts-second": (["rsa:3072"], "/O=Example/CN=STS signing 2"),
    "sts-p256": (["ec", "-pkeyopt", "ec_paramgen_curve:P-256"], "/O=Example/CN=STS P-256"),
    "sts-p384": (["ec", "-pkeyopt", "ec_paramgen_curve:P-384"], "/O=Example/CN=STS P-384"),
    "sts-p521": (["ec", "-pkeyopt", "ec_paramgen_curve:P-521"], "/O=Example/CN=STS P-521"),
    "foreign": (["rsa:2048"], "/O=Example/CN=STS signing"),
    "weak": (["rsa:1024"], "/O=Example/CN=STS weak"),
    "client": (["rsa:2048"], "/O=Example/CN=solution-user"),
}


def make_missing_keys():
    DIRECTORY.mkdir(exist_ok=True)
    for name, (key_arguments, subject) in _KEYS.items():
        if certificate_path(name).exists():
            continue
        subprocess.run(
            ["openssl", "req", "-x509", "-nodes", "-sha256", "-days", "36500"]
            + ["-newkey", *key_arguments, "-subj", subject]
            + ["-keyout", str(DIRECTORY / f"{name}-key.pem"), "-out", str(certificate_path(name))],
            check=True, capture_output=True)


def certificate_path(name):
    return DIRECTORY / f"{name}-cert.pem"


@lru_cache
def private_key(name):
    pem = (DIRECTORY / f"{name}-key.pem").read_bytes()
    return serialization.load_pem_private_key(pem, None)


@lru_cache
def certificate(name):
    return x509.load_pem_x509_certificate(certificate_path(name).read_bytes())


def certificate_base64(name):
    der = certificate(name).public_bytes(serialization.Encoding.DER)
    return base64.b64encode(der).decode()


def public_key_bytes(name, encoding):
    form = serialization.PublicFormat.SubjectPublicKeyInfo
    return certificate(name).public_key().public_bytes(encoding, form)


def modulus_bytes(name):
    modulus = certificate(name).public_key().public_numbers().n
    return modulus.to_bytes((modulus.bit_length() + 7) // 8, "big")
