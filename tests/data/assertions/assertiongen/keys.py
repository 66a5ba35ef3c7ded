"""The keys of the other test data, and a certificate with a chain, which is made once and kept."""

import base64
import datetime
from functools import lru_cache
from pathlib import Path

from cryptography import x509
from cryptography.hazmat.primitives import hashes, serialization
from cryptography.hazmat.primitives.asymmetric import ec
from cryptography.x509.oid import NameOID

HERE = Path(__file__).resolve().parent.parent
SHARED = HERE.parent / "keys"
OWN = HERE / "keys"


def make_missing_keys():
    """`chain-ca` signs `chain-leaf`; their private keys are not needed afterwards."""
    OWN.mkdir(exist_ok=True)
    if (OWN / "chain-leaf-cert.pem").exists():
        return
    ca_key = ec.generate_private_key(ec.SECP256R1())
    ca_name = _name("Example CA")
    leaf_key = ec.generate_private_key(ec.SECP256R1())
    _write("chain-ca", _certificate(ca_name, ca_name, ca_key.public_key(), ca_key))
    _write("chain-leaf", _certificate(_name("holder"), ca_name, leaf_key.public_key(), ca_key))


def _name(common_name):
    return x509.Name([x509.NameAttribute(NameOID.ORGANIZATION_NAME, "Example"),
                      x509.NameAttribute(NameOID.COMMON_NAME, common_name)])


def _certificate(subject, issuer, public_key, signing_key):
    begin = datetime.datetime(2024, 1, 1)
    return (x509.CertificateBuilder().subject_name(subject).issuer_name(issuer)
            .public_key(public_key).serial_number(x509.random_serial_number())
            .not_valid_before(begin).not_valid_after(begin + datetime.timedelta(days=36500))
            .sign(signing_key, hashes.SHA256()))


def _write(name, certificate):
    (OWN / f"{name}-cert.pem").write_bytes(
        certificate.public_bytes(serialization.Encoding.PEM))


def certificate_path(name):
    own = OWN / f"{name}-cert.pem"
    return own if own.exists() else SHARED / f"{name}-cert.pem"


@lru_cache
def private_key(name):
    return serialization.load_pem_private_key((SHARED / f"{name}-key.pem").read_bytes(), None)


@lru_cache
def certificate(name):
    return x509.load_pem_x509_certificate(certificate_path(name).read_bytes())


def certificate_base64(name):
    return _base64(certificate(name).public_bytes(serialization.Encoding.DER))


def serial_number(name):
    return str(certificate(name).serial_number)


def rsa_numbers_base64(name):
    numbers = certificate(name).public_key().public_numbers()
    return tuple(_base64(n.to_bytes((n.bit_length() + 7) // 8, "big"))
                 for n in (numbers.n, numbers.e))


def point_base64(name):
    return _base64(certificate(name).public_key().public_bytes(
        serialization.Encoding.X962, serialization.PublicFormat.UncompressedPoint))


def _base64(data):
    return base64.b64encode(data).decode()
