#!/usr/bin/python3
"""Lets OpenSAML and pysaml2 write and sign assertions, and makes the table of what must come of
them.

    make_peers.py JARS PYTHON

JARS is a folder with the jars that ../../interop/cxf lists, PYTHON an interpreter that has what
pysaml2/requirements.txt lists.
"""

import subprocess
import sys
import tempfile
from pathlib import Path

from peergen import shapes
from peergen.shapes import DATA, names

sys.path.append(str(DATA))

from kept_documents import KeptDocuments  # noqa: E402

HERE = Path(__file__).resolve().parent
TRUSTED = ["sts", "sts-second", "sts-p256", "sts-p384", "sts-p521"]
DIGESTS = {"256": names.SHA256, "384": "http://www.w3.org/2001/04/xmldsig-more#sha384",
           "512": "http://www.w3.org/2001/04/xmlenc#sha512"}


class Order:
    """One document that a peer is asked for."""

    def __init__(self, file, peer, spec, plan, change=None):
        self.file = file
        self.peer = peer
        self.plan = plan
        self.change = change
        self.template = shapes.template(spec, peer)

    def recipe(self):
        return repr((self.peer, sorted(self.plan.items()), self.template, bool(self.change)))

    def line(self, folder):
        """A line of the peer's plan; leaves the unsigned assertion in the folder."""
        unsigned = folder / f"{Path(self.file).stem}.unsigned"
        unsigned.write_text(self.template, "utf-8")
        plan = self.plan
        return "\t".join([str(unsigned), str(self.signed(folder)), str(DATA / "keys" / plan["key"]),
                          plan["algorithm"], plan["digest"], names.EXC_C14N])

    def signed(self, folder):
        return folder / f"{Path(self.file).stem}.signed"

    def read(self, folder):
        text = self.signed(folder).read_text("utf-8")
        return self.change(text) if self.change else text


def rules(spec):
    confirmation = spec["confirmations"][0]
    demanded = {"audience": names.AUDIENCE, "recipient": confirmation.get("recipient"),
                "inResponseTo": confirmation.get("request")}
    return {name: value for name, value in demanded.items() if value is not None}


def rows():
    """(order, order of the neighbour, its class and text, about, specification)"""
    index = 0
    for peer in shapes.SIGNATURES:
        for shape, about, spec in shapes.shapes():
            for signature, key, algorithm in shapes.signatures(peer, shape):
                bits = algorithm.split("sha")[1][:3]
                plan = {"key": key, "algorithm": algorithm, "digest": DIGESTS[bits]}
                name = f"{peer}-{shape}-{signature}"
                change, *changed, error, text = shapes.neighbour(index, spec, plan)
                yield (Order(f"accepted/{name}.xml", peer, spec, plan),
                       Order(f"refused/{name}-{change}.xml", peer, *changed),
                       error, text, f"{peer} in the shape of {about}", spec)
                index += 1


def run(peer, orders, folder, jars, python):
    plan = folder / f"{peer}.plan"
    plan.write_text("\n".join(order.line(folder) for order in orders) + "\n", "utf-8")
    program = {"opensaml": ["java", "-cp", f"{jars}/*", HERE / "opensaml/MakeAssertions.java"],
               "pysaml2": [python, HERE / "pysaml2/sign_assertions.py"]}[peer]
    subprocess.run([*program, plan], check=True)


def main():
    jars, python = sys.argv[1:]
    documents = KeptDocuments(HERE, "assertions")
    made = list(rows())
    with tempfile.TemporaryDirectory() as name:
        folder = Path(name)
        for peer in shapes.SIGNATURES:
            orders = [order for row in made for order in row[:2] if order.peer == peer]
            run(peer, orders, folder, jars, python)
        for accepted, refused, error, text, about, spec in made:
            common = {"maker": accepted.peer, "section": "SAML-CORE 2.3.3", "rules": rules(spec)}
            written = documents.add(
                accepted.file, accepted.recipe(), lambda: accepted.read(folder), about=about,
                **common)
            documents.set_last(facts=shapes.facts(spec, written))
            documents.add(
                refused.file, refused.recipe(), lambda: refused.read(folder),
                about=f"neighbour of {Path(accepted.file).stem}", **common,
                refusal={"class": error, "contains": text})
    documents.finish(defaults={"now": names.NOW, "trust": TRUSTED, "clockToleranceSec": 0})


if __name__ == "__main__":
    main()
