"""What the command line makes of servers that do something wrong: a sample of the table of
ssoclient-devsts, every row of which the libraries are tried with elsewhere."""

import json
import pathlib
import re
import unittest

from programs import COMMUNICATION, DevelopmentSts, ServiceTest, ssoclient

TABLE = pathlib.Path(__file__).parents[3] / "tools/devsts/misbehaviour/misbehaviours.json"
SAMPLE = ("silent", "cut-in-its-body", "resets", "two-lengths", "gzip-bomb", "endless-fields",
          "version-0-9", "status-302", "html", "fault", "fault-of-bad-credentials",
          "certificate-expired", "certificate-sha1", "certificate-path-too-long", "tls-1-1",
          "tls-closes", "alert-80", "client-certificate-demanded")
# What is put in for the parts of a text that differ from run to run.
PARTS = {"{server}": r"127\.0\.0\.1 port \d+", "{number}": r"\d+", "{words}": r".+"}


def pattern(text):
    literal = re.split(r"(\{\w+\})", text)
    return "".join(PARTS.get(part, re.escape(part)) for part in literal)


class MisbehavingServer(ServiceTest):
    def acquire_from(self, *switches):
        with_fault = DevelopmentSts(*switches, like=self.sts)
        self.addCleanup(with_fault.stop)
        return ssoclient("acquire", "password", *with_fault.service_options, "--user",
                         DevelopmentSts.USER, "--password-file", self.password,
                         "--timeout", "1" if "silent" in switches else "20", "--json")

    def test_is_one_error_with_its_exit_code(self):
        rows = {row["name"]: row for row in json.loads(TABLE.read_text("utf-8"))}
        for name in SAMPLE:
            with self.subTest(name=name):
                end = rows[name].get("endOverTls", rows[name]["end"])
                result = self.acquire_from("--misbehave", name)
                self.assertEqual("", result.out)
                error = json.loads(result.err)["error"]
                self.assertEqual(end["class"], error["class"])
                text = end["text"].replace("0.3 seconds", "1 seconds")  # the shortest time-out
                self.assertRegex(error["message"], rf"\A{pattern(text)}\Z")
                self.assertEqual(end["exit"], error["exitCode"])
                self.assertEqual(end["exit"], result.code)

    def test_that_is_slow_but_in_time_is_none(self):
        self.assertEqual(0, self.acquire_from("--misbehave", "slow-but-in-time").code)

    def test_misbehaves_over_plain_http_too(self):
        result = self.acquire_from("--http", "--misbehave", "closes")
        self.assertEqual(COMMUNICATION, result.code)


if __name__ == "__main__":
    unittest.main()
