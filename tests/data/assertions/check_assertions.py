#!/usr/bin/python3
"""Asks xmlsec1 what it thinks of the signatures that it can judge."""

import json
import subprocess
import sys

from assertiongen import keys
from make_assertions import HERE

ASSERTION = "urn:oasis:names:tc:SAML:2.0:assertion:Assertion"


def verifies(file, signer):
    result = subprocess.run(
        ["xmlsec1", "--verify", "--id-attr:ID", ASSERTION, "--enabled-key-data", "key-name",
         "--pubkey-cert-pem", str(keys.certificate_path(signer)), str(HERE / file)],
        capture_output=True)
    return result.returncode == 0


def main():
    table = json.loads((HERE / "expected.json").read_text())
    asked = [entry for entry in table["assertions"] if entry["xmlsec1"] == "valid"]
    wrong = [entry["file"] for entry in asked
             if not any(verifies(entry["file"], name) for name in table["defaults"]["trust"])]
    print(f"{len(asked)} asked, {len(wrong)} wrong: {wrong}")
    return 1 if wrong or not asked else 0


if __name__ == "__main__":
    sys.exit(main())
