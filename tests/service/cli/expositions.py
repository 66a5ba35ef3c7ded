"""Reads metrics in the text format of Prometheus."""

import re

# [Prometheus text format 0.0.4]
NAME = r"[a-zA-Z_:][a-zA-Z0-9_:]*"
LABEL = r'[a-zA-Z_][a-zA-Z0-9_]*="(?:[^"\\\n]|\\[\\"n])*"'
SAMPLE = re.compile(
    rf'({NAME})(\{{{LABEL}(?:,{LABEL})*\}})? (-?\d+(?:\.\d+)?(?:e[+-]?\d+)?)\Z')
PARTS = {"histogram": ("_bucket", "_sum", "_count")}  # of others the name is that of the family


def parse(text):
    """The values of an exposition by name and label, each after its own HELP and TYPE."""
    assert text.endswith("\n")
    samples, described, family, kind = {}, set(), None, None
    for line in text[:-1].split("\n"):
        if match := re.match(rf"# HELP ({NAME}) \S.*\Z", line):
            family = match[1]
            assert family not in described, line
        elif match := re.match(rf"# TYPE ({NAME}) (counter|gauge|histogram)\Z", line):
            assert match[1] == family, line
            described.add(family)
            kind = match[2]
            assert (kind == "counter") == family.endswith("_total"), line
        else:
            match = SAMPLE.match(line)
            assert match and family in described, line
            assert match[1] in [family + part for part in PARTS.get(kind, ("",))], line
            key = match[1] + (match[2] or "")
            assert key not in samples, line
            samples[key] = float(match[3])
    return samples
