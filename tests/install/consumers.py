"""Other projects that use what is installed, and what they say when it works."""

import os
import pathlib

from commands import run

FOLDER = pathlib.Path(__file__).resolve().parent / "consumer"

# The program, and what it prints.
SAYS = {
    "consumer": "XMLParseException\n"
                "Invalid argument : HTTPS connection requested but no SSLContext provided.\n",
    "quillon_consumer": "aW5zdGFsbGVk\n",
    "gss_consumer":
        "Invalid argument : A keytab needs the principal whose key is in it\n"
        "Cannot log on as 'nobody@EXAMPLE.TEST' with the keytab '/no/keytab':"
        " Key table file '/no/keytab' not found\n",
    "runtime_consumer": "NoTokenException\nSsoException: nobody gives any\n",
}

# The pkg-config package, and the program that shows it.
SOURCES = {"ssoclient": "consumer", "quillon": "quillon_consumer", "ssoclient-gss": "gss_consumer",
           "ssoclient-runtime": "runtime_consumer"}


def build_with_cmake(build, *options):
    run(os.environ["CMAKE"], "-S", FOLDER, "-B", build,
        f"-DCMAKE_CXX_COMPILER={os.environ['CXX']}", *options)
    run(os.environ["CMAKE"], "--build", build)


def run_all(build):
    return {name: run(build / name) for name in SAYS}


def build_with_pkg_config(folder, package, pkg_config_path, *options):
    """The program for `package`, made in `folder`."""
    program = folder / package
    flags = run("pkg-config", "--cflags", "--libs", package, PKG_CONFIG_PATH=str(pkg_config_path))
    run(os.environ["CXX"], "-std=c++17", *options, FOLDER / f"{SOURCES[package]}.cpp", "-o", program,
        *flags.split())
    return program
