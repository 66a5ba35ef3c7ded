"""The names that the built libraries export, and the lists in symbols/ that they shall be.

`python3 tests/structure/symbols.py build/release` writes the lists anew, from a Release build with
gcc. What changes in them is what changes for those who link the libraries.
"""

import pathlib
import re
import subprocess
import sys

LISTS = pathlib.Path(__file__).resolve().parent / "symbols"

LIBRARIES = {
    "quillon": "lib/quillon/libquillon.so",
    "ssoclient": "lib/ssoClient/libssoclient.so",
    "ssoclient_runtime": "lib/ssoClientRuntime/libssoclient_runtime.so",
    "ssoclient_gss": "lib/ssoClientGss/libssoclient_gss.so",
}

# The compiler also exports what it instantiates of Boost and the standard library, and the type
# descriptions of that: none of it is the libraries' own.
_OWN = re.compile(r"(typeinfo for |typeinfo name for |vtable for )?(Quillon|SsoClient)::")
_GLOBAL_DEFINITIONS = "TDRB"


def exported(library):
    """The names of a library's own that it exports, readable and sorted. A constructor or
    destructor of which there are two forms stands there twice."""
    lines = subprocess.run(["nm", "-D", "-C", "--defined-only", library], check=True, text=True,
                           capture_output=True).stdout.splitlines()
    symbols = (line.split(" ", 2)[1:] for line in lines)
    return sorted(name for kind, name in symbols
                  if kind in _GLOBAL_DEFINITIONS or _OWN.match(name))


def listed(name):
    return (LISTS / f"{name}.txt").read_text("utf-8").splitlines()


def write(build):
    for name, library in LIBRARIES.items():
        symbols = exported(pathlib.Path(build) / library)
        (LISTS / f"{name}.txt").write_text("".join(f"{symbol}\n" for symbol in symbols), "utf-8")


if __name__ == "__main__":
    if len(sys.argv) != 2:
        sys.exit(__doc__)
    write(sys.argv[1])
