"""The schemas that the standards' own bodies publish, as packages bring them."""

import hashlib
import os
import pathlib
import shutil
import subprocess
import unittest
import zipfile

from lxml import etree

# The distribution packages xmltooling-schemas, shibboleth-sp-common and opensaml-schemas.
INSTALLED = pathlib.Path("/usr/share/xml")

# OASIS's licence of these is not free enough for the distribution, so Maven gets them.
ARTIFACT = "org.opensaml:opensaml-soap-api:4.0.1"
ARTIFACT_SHA256 = "e02843ec8e4790a0291c560361ad657e5069a3c1a7b9b187bd0febd565a6d13e"
COPY = "org.apache.maven.plugins:maven-dependency-plugin:2.8:copy"

WSS = "http://docs.oasis-open.org/wss/2004/01/"
WST = "http://docs.oasis-open.org/ws-sx/ws-trust/200512"

# By namespace; whatever a schema imports stands before it.
LOCATIONS = {
    "http://www.w3.org/XML/1998/namespace": INSTALLED / "xmltooling/xml.xsd",
    "http://www.w3.org/2000/09/xmldsig#": INSTALLED / "xmltooling/xmldsig-core-schema.xsd",
    "http://www.w3.org/2001/04/xmlenc#": INSTALLED / "xmltooling/xenc-schema.xsd",
    "http://schemas.xmlsoap.org/soap/envelope/": INSTALLED / "xmltooling/soap-envelope.xsd",
    "http://www.w3.org/2005/08/addressing": INSTALLED / "shibboleth/ws-addr.xsd",
    "urn:oasis:names:tc:SAML:2.0:assertion": INSTALLED / "opensaml/saml-schema-assertion-2.0.xsd",
    WSS + "oasis-200401-wss-wssecurity-utility-1.0.xsd":
        "oasis-200401-wss-wssecurity-utility-1.0.xsd",
    WSS + "oasis-200401-wss-wssecurity-secext-1.0.xsd":
        "oasis-200401-wss-wssecurity-secext-1.0.xsd",
    "http://schemas.xmlsoap.org/ws/2004/09/policy": "ws-policy.xsd",
    WST: "ws-trust-1.3.xsd",
}


def load(folder):
    """All schemas as one; those that Maven gets are kept in the folder."""
    unpack(get_artifact(folder), folder)
    lines = [f'<xs:import namespace="{namespace}" schemaLocation="{locate(name, folder)}"/>'
             for namespace, name in LOCATIONS.items()]
    return etree.XMLSchema(etree.fromstring(
        '<xs:schema xmlns:xs="http://www.w3.org/2001/XMLSchema">' + "".join(lines)
        + "</xs:schema>"))


def locate(name, folder):
    path = folder / name
    if not path.exists():
        raise unittest.SkipTest(f"not installed: {path}")
    return path


def get_artifact(folder):
    jar = folder / "{1}-{2}.jar".format(*ARTIFACT.split(":"))
    if not jar.exists():
        maven = shutil.which("mvn")
        if maven is None:
            raise unittest.SkipTest("not installed: mvn")
        result = subprocess.run(
            [maven, "--batch-mode", "--quiet", COPY, f"-Dartifact={ARTIFACT}",
             f"-DoutputDirectory={folder}"], cwd=folder, capture_output=True, text=True)
        if result.returncode != 0:
            raise unittest.SkipTest(f"Maven does not get {ARTIFACT}: {result.stdout[-500:]}")
    if hashlib.sha256(jar.read_bytes()).hexdigest() != ARTIFACT_SHA256:
        raise AssertionError(f"{jar} is not the file it should be")
    return jar


def unpack(jar, folder):
    with zipfile.ZipFile(jar) as archive:
        for name in LOCATIONS.values():
            if not os.path.isabs(name):
                text = archive.read(f"schema/{name}")
                # The schema of WS-Trust writes its namespace with a slash at the end. Its prose
                # and the identifiers made of the namespace have none.
                text = text.replace(f'"{WST}/"'.encode(), f'"{WST}"'.encode())
                (folder / name).write_bytes(text)
