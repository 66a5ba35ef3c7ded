"""The ciphers, all by OpenSSL through python3-cryptography."""

import os
from functools import lru_cache
from pathlib import Path

from cryptography import x509
from cryptography.hazmat.primitives import hashes, keywrap
from cryptography.hazmat.primitives import padding as blocks
from cryptography.hazmat.primitives.asymmetric import padding
from cryptography.hazmat.primitives.ciphers import Cipher, algorithms, modes
from cryptography.hazmat.primitives.ciphers.aead import AESGCM

from . import names

KEYS = Path(__file__).resolve().parents[2] / "keys"

_HASHES = {names.SHA1: hashes.SHA1, names.SHA256: hashes.SHA256, names.SHA384: hashes.SHA384,
           names.SHA384_OF_XENC: hashes.SHA384, names.SHA512: hashes.SHA512,
           names.MD5: hashes.SHA1,  # never looked at: the name is refused
           names.mgf("sha1"): hashes.SHA1, names.mgf("sha224"): hashes.SHA224,
           names.mgf("sha256"): hashes.SHA256, names.mgf("sha384"): hashes.SHA384,
           names.mgf("sha512"): hashes.SHA512}


@lru_cache
def certificate(name):
    return x509.load_pem_x509_certificate((KEYS / f"{name}-cert.pem").read_bytes())


def make_content_key(bits):
    return os.urandom(bits // 8)


def encrypt_content(algorithm, key, text):
    if algorithm.endswith("-gcm"):
        vector = os.urandom(12)
        return vector + AESGCM(key).encrypt(vector, text, None)
    padder = blocks.PKCS7(128).padder()
    vector = os.urandom(16)
    encryptor = Cipher(algorithms.AES(key), modes.CBC(vector)).encryptor()
    return vector + encryptor.update(padder.update(text) + padder.finalize()) + encryptor.finalize()


def encrypt_key(key, content_key):
    """`key` says for whom and how; `used_digest` and `used_mask` if that is not what it says."""
    method = key["method"]
    if method == names.AES_KW:
        return keywrap.aes_key_wrap(os.urandom(32), content_key)
    public = certificate(key["to"]).public_key()
    if method == names.RSA_1_5:
        return public.encrypt(content_key, padding.PKCS1v15())
    digest = _HASHES[key.get("used_digest") or key.get("digest") or names.SHA1]()
    mask = _HASHES[key.get("used_mask") or key.get("mask") or names.SHA1]()
    return public.encrypt(
        content_key, padding.OAEP(padding.MGF1(mask), digest, key.get("label")))
