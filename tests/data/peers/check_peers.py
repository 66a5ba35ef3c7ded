#!/usr/bin/python3
"""Asks xmlsec1 what it thinks of the accepted signatures; it does not know PSS."""

import json
import subprocess
import sys

from peergen.shapes import DATA
from make_peers import HERE

ASSERTION = "urn:oasis:names:tc:SAML:2.0:assertion:Assertion"


def verifies(file, signer):
    result = subprocess.run(
        ["xmlsec1", "--verify", "--id-attr:ID", ASSERTION, "--enabled-key-data", "key-name",
         "--pubkey-cert-pem", DATA / "keys" / f"{signer}-cert.pem", HERE / file],
        capture_output=True)
    return result.returncode == 0


def main():
    table = json.loads((HERE / "expected.json").read_text("utf-8"))
    asked = [row["file"] for row in table["assertions"]
             if "facts" in row and "-pss" not in row["file"]]
    wrong = [file for file in asked
             if not any(verifies(file, name) for name in table["defaults"]["trust"])]
    print(f"{len(asked)} asked, {len(wrong)} wrong: {wrong}")
    return 1 if wrong or not asked else 0


if __name__ == "__main__":
    sys.exit(main())
