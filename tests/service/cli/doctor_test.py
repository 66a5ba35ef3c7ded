"""`ssoclient doctor`: each part of a service that is in order, and each that is not."""

import email.utils
import http.server
import json
import pathlib
import re
import socket
import threading
import time
import unittest

import jsonschema

from programs import DONE, REFUSED, USAGE, ServiceTest, ssoclient
from scripted import ScriptedTest, fault

SCHEMA = json.loads((pathlib.Path(__file__).parents[3] / "tools" / "ssoclient" / "schema"
                     / "output.schema.json").read_text("utf-8"))


def findings(*options):
    """What an examination finds, as its JSON tells."""
    result = ssoclient("doctor", *options, "--json")
    document = json.loads(result.out)
    jsonschema.Draft7Validator(SCHEMA).validate(document)
    found = document["findings"]
    is_bad = any(each["result"] == "bad" for each in found)
    assert (result.code, result.err) == (REFUSED if is_bad else DONE, ""), result
    assert all(each["remedy"] for each in found if each["result"] == "bad"), found
    return found


def texts(found, part, result):
    return "\n".join(each["text"] for each in found
                     if (each["part"], each["result"]) == (part, result))


def parts(found):
    return {each["part"] for each in found}


class Healthy(ServiceTest):
    def test_every_part_is_good_but_for_a_clock_that_is_not_told(self):
        found = findings(*self.sts.service_options)
        self.assertEqual(["clock"], [each["part"] for each in found if each["result"] != "good"])
        self.assertRegex(texts(found, "trust", "good"), "CN=.*expires at .*SHA-256 [0-9a-f]{64}")
        self.assertRegex(texts(found, "name", "good"), r"127\.0\.0\.1")
        self.assertRegex(texts(found, "tcp", "good"), r"127\.0\.0\.1 port \d+ takes connections")
        self.assertRegex(texts(found, "tls", "good"), "TLSv1.3 with ")
        self.assertRegex(texts(found, "clock", "note"), "does not tell")
        self.assertRegex(texts(found, "answer", "good"), "speaks WS-Trust .*Authentication failed")

    def test_pin_that_is_shown_is_one(self):
        found = findings(*self.sts.service_options)
        pin, = re.findall(r"pin \(--peer\) (sha256//\S+)$", texts(found, "tls", "good"))
        again = findings(*self.sts.service_options, "--peer", pin)
        self.assertRegex(texts(again, "answer", "good"), "speaks WS-Trust")

    def test_is_told_in_lines(self):
        result = ssoclient("doctor", *self.sts.service_options)
        self.assertEqual((DONE, ""), (result.code, result.err))
        for line in result.out.splitlines():
            self.assertRegex(line, r"\A(good|note)  (trust|name|tcp|tls|clock|answer) +\S.*\Z")

    def test_trust_may_be_missing(self):
        found = findings("--url", self.sts.url, "--ca", self.sts.ca)
        self.assertRegex(texts(found, "trust", "note"), "no certificate is trusted")
        self.assertRegex(texts(found, "answer", "good"), "speaks WS-Trust")

    def test_authority_that_did_not_issue_the_certificate(self):
        found = findings("--url", self.sts.url, "--ca", self.sts.trust)
        self.assertRegex(texts(found, "tls", "bad"), "is refused")
        self.assertRegex(texts(found, "tls", "good"), "shown: CN=.* issued by CN=.*pin .*sha256//")
        self.assertTrue(parts(found).isdisjoint(["clock", "answer"]))

    def test_another_pin(self):
        found = findings(*self.sts.service_options, "--peer", "sha256//" + "A" * 43 + "=")
        self.assertRegex(texts(found, "tls", "bad"), "is not the pinned one")
        self.assertTrue(parts(found).isdisjoint(["answer"]))

    def test_http_where_tls_is_spoken(self):
        found = findings("--url", self.sts.url.replace("https:", "http:"))
        self.assertRegex(texts(found, "tls", "note"), "in the clear")
        self.assertRegex(texts(found, "answer", "bad"), "without a reply")

    def test_takes_no_credentials(self):
        for option in ("--user", "--password-file", "--key"):
            with self.subTest(option=option):
                result = ssoclient("doctor", *self.sts.service_options, option, "x")
                self.assertEqual(USAGE, result.code)
                self.assertIn(f"ssoclient doctor has no option {option}", result.err)


class Ill(ScriptedTest):
    def examine(self, body="", status=500, **headers):
        self.service.say(body, status, **headers)
        return findings("--url", self.service.url)

    def test_asks_with_a_user_that_says_that_it_is_made_up(self):
        received = []

        class Handler(http.server.BaseHTTPRequestHandler):
            def do_POST(self):
                received.append(self.rfile.read(int(self.headers["Content-Length"])).decode())
                self.send_error(503)

            def log_message(self, *_):
                pass

        server = http.server.HTTPServer(("127.0.0.1", 0), Handler)
        self.addCleanup(server.server_close)
        thread = threading.Thread(target=server.handle_request)
        thread.start()
        # The first connection is that of the examination itself, which sends nothing.
        second = threading.Thread(target=server.handle_request)
        second.start()
        findings("--url", f"http://127.0.0.1:{server.server_port}/sts")
        thread.join()
        second.join()
        request, = received
        self.assertIn("ssoclient-doctor-made-this-up@example.invalid", request)
        self.assertIn("made up by ssoclient doctor", request)

    def test_nobody_listens(self):
        with socket.socket() as unused:
            unused.bind(("127.0.0.1", 0))
            port = unused.getsockname()[1]
            found = findings("--url", f"https://127.0.0.1:{port}/sts")
        self.assertRegex(texts(found, "tcp", "bad"), "Connection refused")
        self.assertTrue(parts(found).isdisjoint(["tls", "clock", "answer"]))

    def test_unknown_host(self):
        found = findings("--url", "https://no-such-host.invalid/sts")
        self.assertRegex(texts(found, "name", "bad"), r"no-such-host\.invalid: ")
        self.assertTrue(parts(found).isdisjoint(["tcp", "tls", "clock", "answer"]))

    def test_no_tls(self):
        found = findings("--url", self.service.url.replace("http:", "https:"))
        self.assertRegex(texts(found, "tls", "bad"), "wrong version number")
        self.assertTrue(parts(found).isdisjoint(["clock", "answer"]))

    def test_clocks(self):
        for days, text in ((-2, "2 d 0 h ahead of"), (2, "1 d 23 h behind")):
            with self.subTest(days=days):
                date = email.utils.formatdate(time.time() + days * 86400, usegmt=True)
                found = self.examine(fault("wst:FailedAuthentication"), Date=date)
                self.assertRegex(texts(found, "clock", "bad"), text)
        found = self.examine(fault("wst:FailedAuthentication"), Date="noon")
        self.assertRegex(texts(found, "clock", "note"), "does not tell")
        found = self.examine(fault("wst:FailedAuthentication"))
        self.assertRegex(texts(found, "clock", "good"), "agree")

    def test_answers(self):
        for body, status, result, text in (
                (fault("wst:FailedAuthentication", "no"), 500, "good", "speaks WS-Trust"),
                (fault("wst:InvalidRequest"), 500, "note", "speaks SOAP .*wst:InvalidRequest"),
                ("<html><p></html>", 200, "bad", "not well-formed"),
                ("", 404, "bad", "404"),
                ("", 302, "bad", "302")):
            with self.subTest(status=status, text=text):
                self.assertRegex(texts(self.examine(body, status), "answer", result), text)

    def test_steers_no_terminal(self):
        self.service.say(fault("wst:FailedAuthentication", "\x85red\u202e"))
        result = ssoclient("doctor", "--url", self.service.url)
        self.assertIn("\\u0085red\\u202e", result.out.replace("\\xc2\\x85", "\\u0085"))
        self.assertNotIn("\u202e", result.out)

    def test_another_machine_in_the_clear(self):
        result = ssoclient("doctor", "--url", "http://sts.example.com/")
        self.assertEqual(USAGE, result.code)
        self.assertIn("--insecure-http", result.err)


if __name__ == "__main__":
    unittest.main()
