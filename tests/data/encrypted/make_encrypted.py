#!/usr/bin/python3
"""Makes the encrypted assertions, each with hostile neighbours, and what must come of them.

    make_encrypted.py [JARS]

JARS is a folder with the jars that ../../interop/cxf lists; without it, what OpenSAML has encrypted
is kept.
"""

import inspect
import json
import sys
from pathlib import Path

from encryptedgen import commands, document, names, rows

HERE = Path(__file__).resolve().parent
ASSERTIONS = HERE.parent / "assertions"
PEERS = HERE.parent / "peers"
sys.path.append(str(HERE.parent))

from kept_documents import KeptDocuments  # noqa: E402


def plain_file(name):
    return name[1:] + ".xml" if name.startswith("/") else f"accepted/{name}.xml"


def describe(spec):
    """A text that changes whenever the document would."""
    parts = {name: (inspect.getsource(value), inspect.getclosurevars(value).nonlocals)
             if callable(value) else value for name, value in spec.items()}
    return repr(parts) + (HERE / "encryptedgen" / "document.py").read_text("utf-8")


class Maker:
    def __init__(self):
        self._documents = KeptDocuments(HERE, "encrypted")
        self._rules = {}
        for folder in (ASSERTIONS, PEERS):
            table = json.loads((folder / "expected.json").read_text("utf-8"))
            self._rules |= {row["file"]: row["rules"] for row in table["assertions"]}

    def add_row(self, row):
        self._add_written("accepted", row["name"], row["about"], row, row["spec"])
        for name, spec, text, *error in row["neighbours"]:
            self._add_written(
                "refused", name, f"neighbour of {row['name']}", row, spec,
                refusal={"class": error[0] if error else rows.PARSE, "contains": text})

    def _add_written(self, folder, name, about, row, spec, **outcome):
        plain = plain_file(spec["plain"])
        text = (ASSERTIONS / plain).read_bytes().decode()
        self._documents.add(
            f"{folder}/{name}.xml", describe(spec) + text, lambda: document.write(spec, text),
            about=about, maker="cryptography", section=row["section"], plain=plain,
            rules=self._rules[plain], keys=row["keys"], **outcome)

    def add_commanded(self, bits, plain, neighbour, text, **how):
        """By xmlsec1, and a neighbour by it that differs in `how`."""
        self._add_commanded(f"accepted/xmlsec1-aes{bits}.xml", bits, plain, {})
        self._add_commanded(f"refused/xmlsec1-{neighbour}.xml", bits, plain, how,
                            refusal={"class": rows.PARSE, "contains": text})

    def _add_commanded(self, file, bits, plain, how, **outcome):
        plain = plain_file(plain)
        arguments = {"content": names.gcm(bits), "bits": bits, **how}
        self._documents.add(
            file, repr(arguments) + (ASSERTIONS / plain).read_text("utf-8"),
            lambda: commands.encrypt(ASSERTIONS / plain, **arguments),
            about="what xmlsec1 writes", maker="xmlsec1", section="XMLENC11 4", plain=plain,
            rules=self._rules[plain], keys=["client"], **outcome)

    def add_opensaml(self, name, plain, neighbour, text, jars, how, **change):
        """By OpenSAML, and a neighbour by it that differs in `change`."""
        self._add_opensaml(f"accepted/opensaml-{name}.xml", plain, jars, how)
        self._add_opensaml(f"refused/opensaml-{neighbour}.xml", plain, jars, {**how, **change},
                           refusal={"class": rows.PARSE, "contains": text})

    def _add_opensaml(self, file, plain, jars, how, **outcome):
        plain = plain_file(plain)
        self._documents.add(
            file, repr(sorted(how.items())) + (PEERS / plain).read_text("utf-8"),
            lambda: commands.encrypt_with_opensaml(PEERS / plain, jars, **how),
            about="what OpenSAML writes", maker="opensaml", section="SAML-CORE 2.3.4", plain=plain,
            rules=self._rules[plain], keys=["client"], **outcome)

    def finish(self):
        self._documents.finish()


def main():
    jars = sys.argv[1] if len(sys.argv) > 1 else None
    maker = Maker()
    for row in rows.rows():
        maker.add_row(row)
    maker.add_commanded(128, "google-rsa", "cbc", "CBC lets others decrypt it",
                        content=names.cbc(128))
    maker.add_commanded(192, "simplesamlphp-pss", "for-somebody-else", rows.CLOSED, to="foreign")
    maker.add_commanded(256, "opensaml-ec", "rsa-1-5", "is not accepted, expected RSA-OAEP",
                        method=names.RSA_1_5)
    inside = {"content": names.gcm(256), "method": names.OAEP_MGF1P, "place": "INLINE"}
    maker.add_opensaml("inside", "opensaml-adfs-rsa", "cbc", "CBC lets others decrypt it", jars,
                       inside, content=names.cbc(256))
    maker.add_opensaml("beside", "opensaml-shibboleth-ec", "for-somebody-else", rows.CLOSED, jars,
                       {**inside, "content": names.gcm(128), "place": "PEER"}, to=("foreign",))
    maker.add_opensaml(
        "for-several", "opensaml-okta-pss", "for-several-others", rows.CLOSED, jars,
        {"content": names.gcm(256), "method": names.OAEP, "digest": names.SHA256,
         "mask": names.mgf("sha256"), "place": "PEER", "to": ("foreign", "client")},
        to=("foreign", "sts-second"))
    maker.add_opensaml("oaep-sha512", "opensaml-cxf-holder-of-key-rsa", "rsa-1-5",
                       "is not accepted, expected RSA-OAEP", jars,
                       {**inside, "method": names.OAEP, "digest": names.SHA512},
                       method=names.RSA_1_5, digest="-")
    maker.finish()


if __name__ == "__main__":
    main()
