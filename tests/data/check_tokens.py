#!/usr/bin/python3
"""Asks the xmlsec1 program what it thinks of the signatures, without any code of this project.

Every token that the table calls "valid" must verify with the certificate of one of its trusted
signers, every "invalid" one with none. The rest are not asked.
"""

import json
import subprocess
import sys
from pathlib import Path

DATA = Path(__file__).resolve().parent
ASSERTION = "urn:oasis:names:tc:SAML:2.0:assertion:Assertion"


def table():
    """All tokens with what is expected of them, whose files are relative to DATA/tokens."""
    tokens = DATA / "tokens"
    defaults = json.loads((tokens / "defaults.json").read_text())
    for part in sorted(tokens.rglob("expected.json")):
        for entry in json.loads(part.read_text())["tokens"]:
            file = part.with_name(entry["file"]).relative_to(tokens)
            yield defaults | entry | {"file": str(file)}


def verifies(entry, signer):
    # Only key names are looked at in KeyInfo, so that the given certificate is the one used.
    result = subprocess.run(
        ["xmlsec1", "--verify", "--id-attr:ID", ASSERTION, "--enabled-key-data", "key-name"]
        + ["--pubkey-cert-pem", str(DATA / "keys" / f"{signer}-cert.pem")]
        + [str(DATA / "tokens" / entry["file"])], capture_output=True)
    return result.returncode == 0


def main():
    entries = list(table())
    asked = [e for e in entries if e["xmlsec1"] != "none"]
    wrong = []
    for entry in asked:
        valid = any(verifies(entry, signer) for signer in entry["trust"])
        if valid != (entry["xmlsec1"] == "valid"):
            wrong.append(entry)
    for entry in wrong:
        print(f"{entry['file']}: expected {entry['xmlsec1']}", file=sys.stderr)
    for opinion in ("valid", "invalid"):
        print(f"{opinion}: {sum(e['xmlsec1'] == opinion for e in asked)} asked")
    print(f"not asked: {len(entries) - len(asked)}, wrong: {len(wrong)}")
    return 1 if wrong or not asked else 0


if __name__ == "__main__":
    sys.exit(main())
