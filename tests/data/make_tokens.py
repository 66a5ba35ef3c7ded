#!/usr/bin/python3
"""Makes the keys that are missing, all the test tokens, the table of expected results, and the
signed documents that are no tokens."""

from pathlib import Path

from tokengen import accepted, documents, keys, refused
from tokengen.catalogue import Catalogue


def main():
    keys.make_missing_keys()
    data = Path(__file__).resolve().parent
    catalogue = Catalogue(data / "tokens")
    accepted.add_all(catalogue)
    refused.add_all(catalogue)
    print(f"{catalogue.save()} tokens")
    print(f"{documents.write_all(data / 'documents')} documents")


if __name__ == "__main__":
    main()
