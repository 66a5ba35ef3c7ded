"""An Apache CXF token service, which Maven gets, takes what the library sends in its dialect."""

import hashlib
import os
import pathlib
import shutil
import socket
import subprocess
import tempfile
import unittest

from messages import KEYS

HERE = pathlib.Path(__file__).with_name("cxf")
FOLDER = pathlib.Path(os.environ["CXF_DIR"])
COPY = "org.apache.maven.plugins:maven-dependency-plugin:2.8:copy-dependencies"
PASSWORD = "changeit"

OTHER_TOKEN = "SsoException: The service issued another token than was asked for: "
SECURITY_ERROR = r"SsoException: Unexpected SOAP fault: .*SecurityError; request failed\."
POLICY_ERROR = r"SsoException: Unexpected SOAP fault: soap:(Server|Receiver); request failed\."
REQUEST_FAILED = r"SsoException: Unexpected SOAP fault: .*RequestFailed; request failed\."
NOT_UNDERSTOOD = r"SsoException: Unexpected SOAP fault: .*BadRequest; request failed\."

# How each call ends, with both versions of SOAP.
ENDS = {
    "password": "ok alice",
    "password wrong": SECURITY_ERROR,
    "password bound to a key": "ok alice",
    "password for an audience": "ok alice",
    "password for two audiences":
        "SsoException: The audience restrictions have no audience in common",
    "password for less time": OTHER_TOKEN + r"it ends in 1[78]\d\d seconds, .* with 300",
    "password with claims": "ok alice",
    "claim": "claimed",
    "password without a dialect": NOT_UNDERSTOOD,
    "password where a certificate is wanted": SECURITY_ERROR,
    "password of long ago": SECURITY_ERROR,
    "certificate": "ok CN=solution-user,O=Example",
    "certificate by reference": "ok CN=solution-user,O=Example",
    "certificate not named": NOT_UNDERSTOOD,
    "certificate where a password is wanted": SECURITY_ERROR,
    "certificate where a token is wanted": SECURITY_ERROR,
    "certificate with a flag": NOT_UNDERSTOOD,
    "certificate of a stranger": SECURITY_ERROR,
    "token": "ok CN=solution-user,O=Example",
    "token without hyphen": SECURITY_ERROR,
    "token without a key": r"SsoException: Unexpected SOAP fault: .*InvalidRequest; .*",
    "token that was changed": SECURITY_ERROR,
    "certificate on behalf of": "ok alice",
    "on behalf of what was changed": REQUEST_FAILED,
    "password on behalf of": "ok alice",
    "certificate to act as": "ok CN=solution-user,O=Example",
    "password to act as": "ok alice",
    "validate with a key": "valid",
    "validate what was changed": "invalid",
    "validate without credentials": SECURITY_ERROR,
    "validate with a password": "valid",
    "certificate for a renewable token": "ok CN=solution-user,O=Example",
    "renew": "ok CN=solution-user,O=Example",
    "renew what is not renewable": REQUEST_FAILED,
}

# What a WS-SecurityPolicy says otherwise.
ENDS_WITH_POLICIES = {
    **ENDS,
    "password where a certificate is wanted": POLICY_ERROR,
    "certificate where a password is wanted": POLICY_ERROR,
    "certificate where a token is wanted": POLICY_ERROR,
    "validate without credentials": POLICY_ERROR,
    "token as a SAML token": "ok CN=solution-user,O=Example",
    "password without addressing":
        r"SsoException: Unexpected SOAP fault: .*MessageAddressingHeaderRequired; request failed\.",
    "password with addressing": "ok alice",
    "certificate in an asymmetric binding": "ok CN=solution-user,O=Example",
    "validate in an asymmetric binding": "valid",
    "on behalf of in an asymmetric binding": "ok alice",
}


def get_jars():
    """The jars of the service, which are kept in the folder of the build."""
    jars = FOLDER / "jars"
    expected = dict(reversed(line.split()) for line in
                    (HERE / "jars.sha256").read_text("ascii").splitlines())
    if not all((jars / name).exists() for name in expected):
        result = subprocess.run(
            ["mvn", "--batch-mode", "--quiet", "--file", HERE / "pom.xml", COPY,
             f"-DoutputDirectory={jars}"], cwd=FOLDER, capture_output=True, text=True)
        if result.returncode != 0:
            raise unittest.SkipTest(f"Maven does not get Apache CXF: {result.stdout[-500:]}")
    found = {path.name: hashlib.sha256(path.read_bytes()).hexdigest() for path in jars.iterdir()}
    if found != expected:
        raise AssertionError(f"{jars} has other files than it should have")
    return jars


def run(*command):
    subprocess.run([str(part) for part in command], check=True, capture_output=True)


def keep(folder, store, *trusted, key=None):
    """Writes a key store with trusted certificates, and with a key and its certificate."""
    store = folder / store
    if key is not None:
        run("openssl", "pkcs12", "-export", "-inkey", f"{key}-key.pem", "-in", f"{key}-cert.pem",
            "-name", pathlib.Path(key).name, "-out", store, "-passout", f"pass:{PASSWORD}")
    for name in trusted:
        run("keytool", "-importcert", "-noprompt", "-alias", name, "-file",
            KEYS / f"{name}-cert.pem", "-keystore", store, "-storetype", "PKCS12", "-storepass",
            PASSWORD)


class Cxf(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        missing = [name for name in ("mvn", "java", "javac", "keytool", "openssl")
                   if shutil.which(name) is None]
        if missing:
            raise unittest.SkipTest("not installed: " + ", ".join(missing))
        class_path = f"{get_jars()}/*"
        folder = pathlib.Path(cls.enterClassContext(tempfile.TemporaryDirectory()))
        cls.authority = folder / "tls-cert.pem"
        run("openssl", "req", "-x509", "-newkey", "rsa:2048", "-nodes", "-keyout",
            folder / "tls-key.pem", "-out", cls.authority, "-days", "2", "-subj", "/CN=localhost",
            "-addext", "subjectAltName=DNS:localhost")
        keep(folder, "tls.p12", key=folder / "tls")
        keep(folder, "sts.p12", "client", key=KEYS / "sts")
        keep(folder, "trust.p12", "client", "sts")
        run("javac", "-cp", class_path, "-d", folder, HERE / "StsServer.java")
        cls.start(class_path, folder)

    @classmethod
    def start(cls, class_path, folder):
        with socket.socket() as free:
            free.bind(("127.0.0.1", 0))
            port = free.getsockname()[1]
        cls.url = f"https://localhost:{port}"
        service = subprocess.Popen(
            ["java", "-cp", f"{folder}:{class_path}", "StsServer", str(folder), str(port),
             str(HERE / "policies")],
            stdin=subprocess.PIPE, stdout=subprocess.PIPE, stderr=subprocess.DEVNULL, text=True)

        def stop():
            service.stdin.close()
            service.wait(timeout=60)
            service.stdout.close()

        cls.addClassCleanup(stop)
        cls.assertEqual(cls(), "ready\n", service.stdout.readline())

    def talk(self, soap, path="", *more):
        said = subprocess.run(
            [os.environ["INTEROP_CXF"], f"{self.url}/{path}{soap}/", self.authority, soap, *more],
            capture_output=True, text=True, check=True, timeout=240).stdout
        return dict(line.split(": ", 1) for line in said.splitlines())

    def assert_ends(self, ends, expected):
        self.assertEqual(sorted(expected), sorted(ends))
        for name, pattern in expected.items():
            with self.subTest(call=name):
                self.assertRegex(ends[name], f"\\A{pattern}\\Z")

    def test_soap_11(self):
        self.assert_ends(self.talk("11"), ENDS)

    def test_soap_12(self):
        self.assert_ends(self.talk("12"), ENDS)

    def test_soap_11_with_policies(self):
        self.assert_ends(self.talk("11", "policy/", "policies"), ENDS_WITH_POLICIES)

    def test_soap_12_with_policies(self):
        self.assert_ends(self.talk("12", "policy/", "policies"), ENDS_WITH_POLICIES)


if __name__ == "__main__":
    unittest.main()
