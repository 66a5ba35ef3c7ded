"""Options that a file keeps under a name."""

import json
import os
import unittest

from programs import DONE, USAGE, DevelopmentSts, ServiceTest, ssoclient


class Profiles(ServiceTest):
    def setUp(self):
        super().setUp()
        (self.folder / "ssoclient").mkdir()
        self.write("ssoclient/config.toml", f'''[test]
url = "{self.sts.url}"
trust = ["{self.sts.trust}"]
ca = "ca.pem"
user = "{DevelopmentSts.USER}"
''')
        self.write("ssoclient/ca.pem", self.sts.ca.read_text("ascii"))

    def run_with_profiles(self, *arguments):
        environment = {**os.environ, "XDG_CONFIG_HOME": str(self.folder)}
        return ssoclient(*arguments, environment=environment)

    def test_stands_for_its_options(self):
        out = self.folder / "token.xml"
        self.assert_done(self.run_with_profiles("acquire", "password", "--profile", "test",
                                                "--password-file", self.password, "--out", out))
        result = self.run_with_profiles("validate", "--profile=test", "--token", out)
        self.assertEqual((DONE, "valid\n", ""), result)
        self.assertEqual(DONE, self.run_with_profiles("inspect", "--profile", "test", out).code)
        self.assertEqual(DONE, self.run_with_profiles("doctor", "--profile", "test").code)

    def test_options_win(self):
        result = self.run_with_profiles(
            "validate", "--profile", "test", "--token", "t", "--trust", "/no/such/file")
        self.assert_fails(result, USAGE, "UsageError",
                          "cannot open `/no/such/file': No such file or directory")

    def test_is_shown(self):
        result = self.run_with_profiles("profile", "show", "test")
        self.assertEqual((DONE, ""), (result.code, result.err))
        self.assertEqual(
            [f"--ca {self.folder}/ssoclient/ca.pem", f"--trust {self.sts.trust}",
             f"--url {self.sts.url}", f"--user {DevelopmentSts.USER}"], result.out.splitlines())
        shown = json.loads(self.run_with_profiles("profile", "show", "test", "--json").out)
        self.assertEqual({"ca": [f"{self.folder}/ssoclient/ca.pem"],
                          "trust": [str(self.sts.trust)], "url": [self.sts.url],
                          "user": [DevelopmentSts.USER]}, shown["profile"]["values"])

    def test_names_what_is_wrong(self):
        file = self.folder / "ssoclient" / "config.toml"
        self.assert_fails(self.run_with_profiles("validate", "--profile", "tset"), USAGE,
                          "UsageError", f"`{file}' has no profile `tset'; did you mean test?")
        file.unlink()
        self.assert_fails(self.run_with_profiles("profile", "show", "x"), USAGE, "UsageError",
                          f"cannot open `{file}': No such file or directory")


if __name__ == "__main__":
    unittest.main()
