#!/usr/bin/python3
"""Asks xmlsec1 to decrypt what it can, and compares that with what was encrypted."""

import json
import sys
from io import BytesIO

from lxml import etree

from encryptedgen import commands
from make_encrypted import ASSERTIONS, HERE, PEERS


def canonical(octets):
    result = BytesIO()
    etree.fromstring(octets).getroottree().write_c14n(result, exclusive=True, with_comments=False)
    return result.getvalue()


def main():
    rows = [row for row in json.loads((HERE / "expected.json").read_text("utf-8"))["encrypted"]
            if "refusal" not in row]
    opened, wrong = 0, []
    for row in rows:
        text = commands.decrypt(HERE / row["file"], row["keys"][-1])
        opened += text is not None
        folder = PEERS if row["maker"] == "opensaml" else ASSERTIONS
        plain = (folder / row["plain"]).read_bytes()
        if text is not None and canonical(text) != canonical(plain):
            wrong.append(row["file"])
    print(f"{opened} of {len(rows)} opened, {len(wrong)} wrong: {wrong}")
    return 1 if wrong or opened < 10 else 0


if __name__ == "__main__":
    sys.exit(main())
