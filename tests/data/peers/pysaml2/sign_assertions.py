"""Reads unsigned assertions as pysaml2's objects, and lets pysaml2 write and sign them.

pysaml2 signs with the `xmlsec1` program. The lines of the plan are those of `MakeAssertions.java`;
the canonical form is always pysaml2's own.
"""

import pathlib
import re
import shutil
import sys

from saml2 import saml, sigver


def sign(xml, key, algorithm, digest):
    assertion = saml.assertion_from_string(xml)
    certificate = pathlib.Path(f"{key}-cert.pem").read_text("ascii")
    certificate = re.sub(r"-----[A-Z ]+-----|\s", "", certificate)
    assertion.signature = sigver.pre_signature_part(
        assertion.id, certificate, digest_alg=digest, sign_alg=algorithm)
    backend = sigver.CryptoBackendXmlSec1(shutil.which("xmlsec1"))
    return backend.sign_statement(
        str(assertion), "urn:oasis:names:tc:SAML:2.0:assertion:Assertion", f"{key}-key.pem",
        assertion.id)


def main():
    for line in pathlib.Path(sys.argv[1]).read_text("utf-8").splitlines():
        unsigned, signed, key, algorithm, digest, _ = line.split("\t")
        text = pathlib.Path(unsigned).read_text("utf-8")
        pathlib.Path(signed).write_text(sign(text, key, algorithm, digest), "utf-8")


if __name__ == "__main__":
    main()
