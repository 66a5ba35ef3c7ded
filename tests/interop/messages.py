"""Requests of the library as files, and what an attacker might make of them."""

import datetime
import os
import pathlib
import re
import subprocess
import tempfile

DATA = pathlib.Path(os.environ["TEST_DATA_DIR"])
KEYS = DATA / "keys"

# By the certificate in the message, and by the SAML token in the message.
SIGNED_BY_CERTIFICATE = ["password-signed", "certificate", "certificate-full", "renew",
                         "negotiation-first-signed"]
SIGNED_BY_TOKEN = ["exchange", "exchange-full", "exchange-bearer"]
SIGNED = SIGNED_BY_CERTIFICATE + SIGNED_BY_TOKEN
UNSIGNED = ["password", "password-full", "password-delegating", "validate", "negotiation-first",
            "negotiation-next"]

SOME_TIME = "2026-06-15T12:00:00.000Z"


def minutes_from_now(minutes):
    time = datetime.datetime.now(datetime.timezone.utc) + datetime.timedelta(minutes=minutes)
    return time.strftime("%Y-%m-%dT%H:%M:%S.000Z")


def write(time=SOME_TIME, key="client", dialect=()):
    """The text of every request by its name, written at a time by the holder of a key."""
    with tempfile.TemporaryDirectory() as folder:
        subprocess.run([os.environ["INTEROP_REQUESTS"], folder, key, time, *dialect], check=True)
        texts = {path.stem: path.read_text("utf-8") for path in pathlib.Path(folder).iterdir()}
    assert sorted(texts) == sorted(SIGNED + UNSIGNED), sorted(texts)
    return texts


def substitute(pattern, replacement, text):
    """Replaces the only match of the pattern."""
    changed, count = re.subn(pattern, replacement, text, flags=re.DOTALL)
    assert count == 1 and changed != text, (count, pattern)
    return changed


def change_body(text):
    return substitute("</wst:RequestType>", "x</wst:RequestType>", text)


def change_timestamp(text):
    """A millisecond more, so that the time remains a plausible one."""
    return substitute(r"\.000Z(?=</wsu:Expires></wsu:Timestamp>)", ".001Z", text)


def move_body(text):
    """The signed body goes to where nobody acts on it, and another one takes its place."""
    body = re.search("<soapenv:Body .*</soapenv:Body>", text, re.DOTALL)[0]
    other = change_body(substitute(' wsu:Id="[^"]+"', ' wsu:Id="other"', body))
    hidden = f'<x:x xmlns:x="urn:x">{body}</x:x></soapenv:Header>'
    return text.replace(body, other).replace("</soapenv:Header>", hidden)
