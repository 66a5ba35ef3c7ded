#!/usr/bin/python3
"""Makes the assertions, each with its hostile neighbour, and the table of what must come of them."""

import json
import re
import sys
from pathlib import Path

from assertiongen import assertion, features, hostile, keys, names, producers

HERE = Path(__file__).resolve().parent
TRUSTED = ["sts", "sts-second", "sts-p256", "sts-p384", "sts-p521"]


def rows():
    """One dictionary for each accepted document."""
    for index, (name, about, section, spec) in enumerate(producers.documents()):
        change = hostile.rotation(index, spec)
        make, refusal, text = hostile.CHANGES[change]
        confirmation = spec["confirmations"][0]
        yield {"name": name, "about": about, "section": section, "spec": spec,
               "neighbour": make(spec), "neighbour_name": f"{name}-{change}", "class": refusal,
               "text": text, "accepted": 0,
               "rules": {"audience": names.AUDIENCE,
                         "recipient": confirmation.get("recipient"),
                         "inResponseTo": confirmation.get("request")}}
    for row in features.documents():
        yield {**row, "neighbour_name": "not-" + row["name"],
               "rules": {"audience": names.AUDIENCE, **row["rules"]}}


def main():
    keys.make_missing_keys()
    table, written = [], set()
    for row in rows():
        text = assertion.write(row["spec"])
        text = keep(HERE / "accepted" / f"{row['name']}.xml", text)
        neighbour = HERE / "refused" / f"{row['neighbour_name']}.xml"
        keep(neighbour, write_neighbour(row["neighbour"]))
        rules = {name: value for name, value in row["rules"].items() if value is not None}
        common = {"section": row["section"], "rules": rules}
        accepted = {"file": f"accepted/{row['name']}.xml", "about": row["about"], **common,
                    "xmlsec1": opinion(row["spec"]),
                    "facts": assertion.facts(row["spec"], text, row["accepted"])}
        refused = {"file": f"refused/{neighbour.name}", "about": f"neighbour of {row['name']}",
                   **common, "xmlsec1": refused_opinion(row),
                   "refusal": {"class": row["class"], "contains": row["text"]}}
        table += [accepted, refused]
        written |= {accepted["file"], refused["file"]}
    files = [entry["file"] for entry in table]
    if len(files) != len(written):
        sys.exit("two documents have the same name")
    for path in [*HERE.glob("accepted/*.xml"), *HERE.glob("refused/*.xml")]:
        if path.relative_to(HERE).as_posix() not in written:
            path.unlink()
    defaults = {"now": names.NOW, "trust": TRUSTED, "clockToleranceSec": 0}
    (HERE / "expected.json").write_text(
        json.dumps({"defaults": defaults, "assertions": table}, indent=1) + "\n")
    print(f"{len(table) // 2} accepted, each with a refused neighbour")


def write_neighbour(spec):
    text = assertion.write({name: value for name, value in spec.items() if name != "wrap"})
    return wrap(text, spec) if "wrap" in spec else text


def wrap(text, spec):
    """Another assertion that carries the genuine signature, and the genuine one as advice."""
    signature = re.search(r"<(\w+):Signature .*?</\1:Signature>", text, re.DOTALL).group()
    p = spec["prefix"] + ":" if spec["prefix"] else ""
    genuine = text.replace(signature, "")
    forged = text.replace(f'ID="{spec["id"]}"', 'ID="_forged"')
    end = forged.index(f"</{p}Conditions>") + len(f"</{p}Conditions>")
    return f"{forged[:end]}<{p}Advice>{genuine}</{p}Advice>{forged[end:]}"


def opinion(spec):
    """xmlsec1 does not know PSS."""
    return "none" if "MGF1" in spec["sign"]["algorithm"] else "valid"


def refused_opinion(row):
    """What breaks a rule of SAML alone is properly signed."""
    if row["class"] == hostile.SIGNATURE:
        return "none"
    return opinion(row["neighbour"])


def keep(path, text):
    """ECDSA and PSS signatures differ each time: a file that differs in nothing else is kept."""
    path.parent.mkdir(exist_ok=True)
    value = re.compile(r"(<(\w+):SignatureValue>).*?(</\2:SignatureValue>)", re.DOTALL)
    if path.exists():
        old = path.read_bytes().decode()
        if value.sub(r"\1\3", old) == value.sub(r"\1\3", text):
            return old
    path.write_bytes(text.encode())
    return text


if __name__ == "__main__":
    main()
