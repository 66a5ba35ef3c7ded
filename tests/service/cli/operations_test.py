"""The commands of docs/operations.md, run in their order."""

import os
import pathlib
import re
import shutil
import textwrap
import unittest
import urllib.parse

from programs import DATA, DONE, SSOCLIENT, ServiceTest, run

ROOT = pathlib.Path(__file__).parents[3]
VARIABLES = "url=https://sts.example.com/sts\nhost=sts.example.com:443\n"


def blocks():
    text = (ROOT / "docs" / "operations.md").read_text("utf-8")
    return [textwrap.dedent(block) for block in re.findall(
        r"^ *```sh\n(.*?)^ *```$", text, re.MULTILINE | re.DOTALL)]


class Operations(ServiceTest):
    def setUp(self):
        super().setUp()
        for name, file in (("ca.pem", self.sts.ca), ("sts.pem", self.sts.trust),
                           ("sts-next.pem", self.sts.certificate), ("service.key", self.sts.key),
                           ("service.pem", self.sts.certificate)):
            shutil.copy(file, self.folder / name)
        self.environment = {"PATH": f"{self.folder}:{os.environ['PATH']}",
                            "HOME": str(self.folder), "url": self.sts.url,
                            "host": urllib.parse.urlsplit(self.sts.url).netloc}
        (self.folder / "ssoclient").symlink_to(SSOCLIENT)

    def run_block(self, block):
        script = f"cd '{self.folder}'\n{block}"
        return run("bash", "-euo", "pipefail", "-c", script, environment=self.environment)

    def test_every_command_works(self):
        variables, *commands = blocks()
        self.assertEqual(VARIABLES, variables)
        self.assertGreater(len(commands), 6)
        outputs = []
        for block in commands:
            with self.subTest(block=block):
                result = self.run_block(block)
                self.assertEqual((DONE, ""), (result.code, result.err), block)
                outputs.append(result.out)
        tls, _, signer = outputs[:3]
        self.assertRegex(tls, r"(?i)subject=.*TLS\)\n.*\n.*\nsha256 Fingerprint=")
        expected = run("openssl", "x509", "-in", self.sts.trust, "-noout", "-subject",
                       "-fingerprint", "-sha256").out
        self.assertEqual(expected, signer)

    def test_a_token_that_has_ended_is_replaced(self):
        script = next(block for block in blocks() if "-eq 5" in block)
        token = self.folder / "token.xml"
        expired = DATA / "tokens" / "accepted" / "clock-start-equals-now.xml"
        token.write_bytes(expired.read_bytes())
        (self.folder / "sts.pem").write_text(
            self.sts.trust.read_text("ascii")
            + (DATA / "keys" / "sts-cert.pem").read_text("ascii"), "ascii")
        result = self.run_block(script)
        self.assertEqual(DONE, result.code, result.err)
        self.assertNotEqual(expired.read_bytes(), token.read_bytes())


if __name__ == "__main__":
    unittest.main()
