#!/usr/bin/python3
"""Makes the keys that are missing, all the test tokens, and the table of expected results."""

from pathlib import Path

from tokengen import accepted, keys, refused
from tokengen.catalogue import Catalogue


def main():
    keys.make_missing_keys()
    catalogue = Catalogue(Path(__file__).resolve().parent / "tokens")
    accepted.add_all(catalogue)
    refused.add_all(catalogue)
    print(f"{catalogue.save()} tokens")


if __name__ == "__main__":
    main()
