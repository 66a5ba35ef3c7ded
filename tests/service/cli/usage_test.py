"""What the command line says before anything is asked of a service."""

import ctypes
import os
import re
import unittest

from programs import DATA, REFUSED, USAGE, ProgramTest, run, ssoclient

STS_CERTIFICATE = DATA / "keys" / "sts-cert.pem"

KERBEROS = run("pkg-config", "--modversion", "mit-krb5").out.strip()


# What the libraries themselves say. Python may have an OpenSSL of its own, but not in this file.
def loaded_openssl():
    describe = ctypes.CDLL("libcrypto.so.3").OpenSSL_version
    describe.restype = ctypes.c_char_p
    return describe(6).decode()  # OPENSSL_VERSION_STRING


def loaded_libcurl():
    describe = ctypes.CDLL("libcurl.so.4").curl_version
    describe.restype = ctypes.c_char_p
    return re.match(r"libcurl/(\S+)", describe().decode())[1]


def loaded_libxml2():
    number = int(ctypes.c_char_p.in_dll(ctypes.CDLL("libxml2.so.2"), "xmlParserVersion").value)
    return f"{number // 10000}.{number // 100 % 100}.{number % 100}"


class Help(unittest.TestCase):
    SERVICE = ("--url", "--trust", "--ca", "--peer", "--insecure-http", "--timeout",
               "--verbose")
    IDENTITY = ("--key", "--cert", "--key-passphrase-file")
    SPEC = ("--lifetime", "--renewable", "--delegable", "--delegate-to", "--audience", "--advice")
    SPEECH = ("--json", "--quiet", "--explain")
    OUTPUT = ("--out", *SPEECH)

    def assert_prints(self, result, *texts):
        self.assertEqual((0, ""), (result.code, result.err))
        for text in texts:
            self.assertIn(text, result.out)

    def test_of_the_program_names_the_commands(self):
        self.assert_prints(ssoclient("--help"), "acquire", "renew", "validate", "inspect")
        self.assert_prints(ssoclient("acquire", "--help"), "password", "certificate", "token",
                           "gss")

    def test_of_a_command_names_its_options(self):
        for command, options in (
                ("acquire password", ("--user", "--password-file", "--bearer", *self.IDENTITY,
                                      *self.SERVICE, *self.SPEC, *self.OUTPUT)),
                ("acquire certificate", (*self.IDENTITY, *self.SERVICE, *self.SPEC, *self.OUTPUT)),
                ("acquire token", ("--token", "--bearer", *self.IDENTITY, *self.SERVICE,
                                   *self.SPEC, *self.OUTPUT)),
                ("acquire gss", ("--service", "--ccache", "--keytab", "--principal", "--bearer",
                                 *self.IDENTITY, *self.SERVICE, *self.SPEC, *self.OUTPUT)),
                ("renew", ("--token", "--lifetime", *self.IDENTITY, *self.SERVICE, *self.OUTPUT)),
                ("validate", ("--token", *self.SERVICE, *self.SPEECH)),
                ("inspect", ("FILE", "--trust", "--clock-tolerance", "--html", *self.SPEECH))):
            with self.subTest(command=command):
                self.assert_prints(ssoclient(*command.split(), "--help"), *options)

    COMMANDS = ("", "acquire", "acquire password", "acquire certificate", "acquire token",
                "acquire gss", "keep", "renew", "validate", "inspect", "doctor")

    def test_fits_into_80_columns(self):
        for command in self.COMMANDS:
            with self.subTest(command=command):
                lines = ssoclient(*command.split(), "--help").out.splitlines()
                self.assertEqual([], [line for line in lines if len(line) > 80])

    def test_ends_with_an_example_and_the_exit_codes(self):
        for command in self.COMMANDS[2:]:
            with self.subTest(command=command):
                text = ssoclient(*command.split(), "--help").out
                self.assertRegex(text, rf"\nExample:\n  ssoclient {command} --?[\s\S]+\n\n"
                                 r"Exit codes: 0 done; [\s\S]+ 5 [^;]+\.\n\Z"
                                 if command not in ("inspect", "keep")
                                 else rf"\nExample:\n  ssoclient {command} \w+\.xml ")

    def test_examples_name_options_that_there_are(self):
        for command in self.COMMANDS[2:]:
            with self.subTest(command=command):
                options, _, example = ssoclient(*command.split(), "--help").out.partition(
                    "\nExample:\n")
                named = set(re.findall(r"--[a-z-]+", example))
                self.assertIn("--trust", named)
                self.assertEqual(set(), named - set(re.findall(r"--[a-z-]+", options)))

    def test_has_headings(self):
        text = ssoclient("acquire", "password", "--help").out
        headings = ["The service:", "The caller's key:", "The token that is asked for:",
                    "What is printed:"]
        self.assertEqual(headings, [line for line in text.splitlines() if line in headings])

    def test_version_of_every_command(self):
        for command in self.COMMANDS:
            with self.subTest(command=command):
                self.assertEqual(ssoclient("--version"), ssoclient(*command.split(), "--version"))

    def test_version(self):
        result = ssoclient("--version")
        self.assertEqual((0, ""), (result.code, result.err))
        first, libraries = result.out.splitlines()
        self.assertRegex(first, r"\Assoclient \d+\.\d+\.\d+\Z")
        self.assertEqual(f"OpenSSL {loaded_openssl()}, libcurl {loaded_libcurl()}, libxml2 "
                         f"{loaded_libxml2()}; built with MIT Kerberos {KERBEROS}", libraries)
        self.assertEqual(result, ssoclient("version"))

    def test_version_of_the_development_sts(self):
        first, libraries = run(os.environ["DEVSTS"], "--version").out.splitlines()
        self.assertRegex(first, r"\Assoclient-devsts \d+\.\d+\.\d+\Z")
        xmlsec1 = run("xmlsec1", "--version").out.split()[1]
        self.assertEqual(f"OpenSSL {loaded_openssl()}, libxml2 {loaded_libxml2()}; built with "
                         f"xmlsec1 {xmlsec1}, MIT Kerberos {KERBEROS}", libraries)

    def test_by_word(self):
        for command in ("", "acquire", "acquire password", "inspect"):
            with self.subTest(command=command):
                words = command.split()
                self.assertEqual(ssoclient(*words, "--help"), ssoclient("help", *words))

    def test_of_an_unknown_command(self):
        result = ssoclient("help", "acquire", "pasword")
        self.assertEqual((USAGE, ""), (result.code, result.out))
        self.assertEqual("ssoclient: UsageError: ssoclient acquire has no command pasword; did you "
                         "mean password? (see: ssoclient acquire --help)\n", result.err)


class UsageErrors(ProgramTest):
    def assert_usage_error(self, pattern, *arguments):
        self.assert_fails_matching(ssoclient(*arguments), USAGE, "UsageError", pattern)

    def assert_misuse(self, command, message, *arguments):
        self.assert_misused(ssoclient(*command.split(), *arguments), command, message)

    def test_without_a_command(self):
        self.assert_misuse("", "ssoclient needs a command: acquire, keep, renew, validate, inspect, "
                           "doctor, profile")
        self.assert_misuse("acquire", "ssoclient acquire needs a command: password, certificate, "
                           "token, gss")

    def test_command_that_is_nearly_one(self):
        self.assert_misuse("", "ssoclient has no command aquire; did you mean acquire?", "aquire")
        self.assert_misuse("acquire", "ssoclient acquire has no command cert; did you mean "
                           "certificate?", "cert")

    def test_unknown_command_is_not_shown(self):
        self.assert_misuse("", "ssoclient has no such command, only acquire, keep, renew, validate, "
                           "inspect, doctor, profile", "SECRET")
        self.assert_misuse("acquire", "ssoclient acquire has no such command, only password, "
                           "certificate, token, gss", "SECRET", "SECRET")

    def test_unknown_option(self):
        for option, neighbour in (("--wish", ""), ("--trusts", "; did you mean --trust?"),
                                  ("--truts", "; did you mean --trust?"),
                                  ("--tolerance", "; did you mean --clock-tolerance?"),
                                  ("--jsn", "; did you mean --json?"), ("--js", ""), ("-j", "")):
            with self.subTest(option=option):
                self.assert_misuse("inspect", f"ssoclient inspect has no option {option}"
                                   f"{neighbour}", "x", "--trust", "y", option)

    def test_unknown_option_comes_before_what_is_missing_or_bad(self):
        for arguments in ((), ("--clock-tolerance", "x"), ("--trust",)):
            with self.subTest(arguments=arguments):
                self.assert_misuse("inspect", "ssoclient inspect has no option --wish",
                                   "--wish", *arguments)
        self.assert_misuse("", "ssoclient has no option --wish", "--wish", "acquire", "password")

    # Where a secret may have been typed by mistake, and what is said.
    SECRETS = (
        (("--password", "SECRET"),
         "ssoclient acquire password has no option --password; did you mean --password-file?"),
        (("--password=SECRET",),
         "ssoclient acquire password has no option --password; did you mean --password-file?"),
        (("--key-passphrase", "SECRET"), "ssoclient acquire password has no option "
         "--key-passphrase; did you mean --key-passphrase-file?"),
        (("-p", "SECRET"), "ssoclient acquire password has no option -p"),
        (("-pSECRET",), "ssoclient acquire password has no option -p"),
        (("--SECRET",), "ssoclient acquire password has no such option, which is not shown: "
         "it may be a secret"),
        (("--user", "u", "SECRET"), "there is an argument too many after --user, not shown "
         "because it may be a secret"),
        (("--bearer", "--", "SECRET"), "there is an argument too many after --bearer, not shown "
         "because it may be a secret"),
        (("SECRET",), "there is an argument too many, not shown because it may be a secret"),
        (("--bearer=SECRET",), "--bearer takes no value"))

    def test_secrets_are_not_shown(self):
        rest = ("--url", "https://127.0.0.1:1/sts", "--trust", "t", "--user", "u")
        for words, message in self.SECRETS:
            for arguments in (words, (*words, *rest)):
                with self.subTest(arguments=arguments):
                    result = ssoclient("acquire", "password", *arguments)
                    self.assertNotIn("SECRET", result.err)
                    self.assert_misused(result, "acquire password", message)

    def test_number_with_a_unit(self):
        for value, said in (("1h", ": write 3600"), ("90m", ": write 5400"), ("7d", ": write 604800"),
                            ("30s", ": write 30"), ("h", ""), ("1w", ""), ("1h30m", ""),
                            ("1.5h", ""), ("-1h", ""), ("99999999999999999999h", ""), ("", "")):
            with self.subTest(value=value):
                self.assert_misuse(
                    "inspect", f"--clock-tolerance: `{value}' is not a number of seconds{said}",
                    "x", "--trust", "y", "--clock-tolerance", value)

    def test_timeout_that_is_none(self):
        for value in ("0", "-1", "86401", "ten", ""):
            with self.subTest(value=value):
                self.assert_usage_error(".*--timeout.*", "validate", "--url", "https://h/",
                                        "--trust", "t", "--token", "t", "--timeout", value)

    def test_missing_options(self):
        service = {"--url": "https://127.0.0.1:1/sts", "--trust": STS_CERTIFICATE}
        identity = {"--key": "k", "--cert": "c"}
        for command, options in (
                ("acquire password", {**service, "--user": "u"}),
                ("acquire certificate", {**service, **identity}),
                ("acquire token", {**service, **identity, "--token": "t"}),
                ("acquire gss", service),
                ("renew", {**service, **identity, "--token": "t", "--lifetime": "1"}),
                ("validate", {**service, "--token": "t"})):
            for missing in options:
                with self.subTest(command=command, missing=missing):
                    rest = [part for name, value in options.items() if name != missing
                            for part in (name, value)]
                    self.assert_misuse(command, f"{missing} is required", *rest)
        self.assert_misuse("inspect", "--trust is required", "x")
        self.assert_misuse("inspect", "FILE is required", "--trust", STS_CERTIFICATE)

    def test_clock_tolerance_that_is_no_tolerance(self):
        for value in ("-1", "3153600001", "ten", "9223372036854775808", ""):
            with self.subTest(value=value):
                self.assert_usage_error(".*--clock-tolerance.*", "inspect", "x", "--trust",
                                        STS_CERTIFICATE, "--clock-tolerance", value)

    # Of the command and its required options; the files are not read.
    COMMANDS = {
        "acquire password": {"--url": "https://127.0.0.1:1/sts", "--trust": "t", "--user": "u"},
        "acquire certificate": {"--url": "https://127.0.0.1:1/sts", "--trust": "t", "--key": "k",
                                "--cert": "c"},
        "acquire token": {"--url": "https://127.0.0.1:1/sts", "--trust": "t", "--key": "k",
                          "--cert": "c", "--token": "x"},
        "acquire gss": {"--url": "https://127.0.0.1:1/sts", "--trust": "t"},
        "renew": {"--url": "https://127.0.0.1:1/sts", "--trust": "t", "--key": "k",
                  "--cert": "c", "--token": "x", "--lifetime": "1"}}

    def assert_value_is_refused(self, message, command, option, value):
        options = {**self.COMMANDS[command], option: value}
        words = [word for pair in options.items() for word in pair]
        self.assert_misuse(command, f"{option}: {message}", *words)

    def test_empty_value_is_not_the_same_as_no_option(self):
        common = ("--trust", "--ca", "--peer", "--key", "--cert", "--out")
        for command, options in (
                ("acquire password", (*common, "--user", "--password-file", "--delegate-to",
                                      "--audience")),
                ("acquire certificate", (*common, "--key-passphrase-file")),
                ("acquire token", (*common, "--token")),
                ("acquire gss", (*common, "--service", "--ccache", "--keytab", "--principal")),
                ("renew", (*common, "--token"))):
            for option in options:
                with self.subTest(command=command, option=option):
                    self.assert_value_is_refused("must not be empty", command, option, "")
        self.assert_misuse("inspect", "FILE: must not be empty", "", "--trust", "t")

    def test_name_with_control_characters(self):
        for command, option in (("acquire password", "--user"),
                                ("acquire password", "--delegate-to"),
                                ("acquire gss", "--service"), ("acquire gss", "--principal")):
            for value in ("a\nb", "a\tb", "\x1b[31m", "a\x7f", "a\u009bb", "a\u2028b"):
                with self.subTest(option=option, value=value):
                    self.assert_value_is_refused("must not hold control characters", command,
                                                 option, value)

    def test_name_that_is_not_utf8(self):
        for value in (b"\xff", b"a\xc3", b"\xc0\x80", b"\xed\xa0\x80"):
            with self.subTest(value=value):
                self.assert_value_is_refused("is not UTF-8", "acquire password", "--user",
                                             os.fsdecode(value))

    def test_text_that_xml_cannot_hold(self):
        for value, message in ((b"\xff", "is not UTF-8"), (b"a\xfc", "is not UTF-8"),
                               (b"\x01", "holds a character that XML does not allow"),
                               (b"a\x1b[31m", "holds a character that XML does not allow"),
                               (b"\xef\xbf\xbf", "holds a character that XML does not allow")):
            with self.subTest(value=value):
                text = os.fsdecode(value)
                self.assert_value_is_refused(message, "acquire password", "--audience", text)
                words = [word for pair in self.COMMANDS["acquire password"].items()
                         for word in pair]
                for advice in ((text, "n=v"), ("s", text + "=v"), ("s", "n=" + text)):
                    self.assert_fails_matching(
                        ssoclient("acquire", "password", *words, "--advice", *advice), USAGE,
                        "UsageError", f"--advice: {message} .+")

    def test_lifetime_that_is_too_long(self):
        for command in ("acquire password", "acquire certificate", "acquire token", "acquire gss",
                        "renew"):
            for value in ("3153600001", "9223372036854775807"):
                with self.subTest(command=command, value=value):
                    self.assert_value_is_refused("must be at most 3153600000 seconds", command,
                                                 "--lifetime", value)

    def test_lifetime_that_is_no_number(self):
        self.assert_usage_error(".*--lifetime.*", "acquire", "password", "--url", "x", "--user",
                                "x", "--trust", STS_CERTIFICATE, "--lifetime", "long")

    def test_missing_token_file(self):
        self.assert_usage_error("cannot open `/no/such/file': No such file or directory",
                                "inspect", "/no/such/file", "--trust", STS_CERTIFICATE)

    def test_token_file_that_is_a_folder(self):
        self.assert_usage_error(f"cannot read `{self.folder}': Is a directory",
                                "inspect", self.folder, "--trust", STS_CERTIFICATE)

    def test_missing_trust_file(self):
        self.assert_usage_error("cannot open `/no/such/file': No such file or directory",
                                "inspect", "x", "--trust", "/no/such/file")

    def test_trust_file_without_certificate(self):
        for text in ("", "no certificate\n", "-----BEGIN CERTIFICATE-----\nAAAA\n"
                     "-----END CERTIFICATE-----\n"):
            with self.subTest(text=text):
                path = self.write("trust.pem", text)
                self.assert_usage_error(f"cannot take certificates from `{path}': .+",
                                        "inspect", "x", "--trust", path)

    def test_private_key_in_place_of_a_certificate(self):
        path = DATA / "keys" / "sts-key.pem"
        self.assert_usage_error(f"cannot take certificates from `{path}': .+",
                                "inspect", "x", "--trust", path)

    def test_malformed_url(self):
        password = self.write("password", "x\n")
        for url in ("", "sts.example.com", "ftp://sts.example.com/", "https://", "https://h:0x/"):
            with self.subTest(url=url):
                result = ssoclient("acquire", "password", "--url", url, "--user", "u",
                                   "--trust", STS_CERTIFICATE, "--password-file", password)
                self.assert_fails_matching(result, USAGE, "InvalidArgumentException",
                                           "Invalid argument : .+")


class InputThatIsNoToken(ProgramTest):
    def test_is_refused_and_no_usage_error(self):
        for text in ("", "no xml", "<a/>"):
            with self.subTest(text=text):
                result = ssoclient("inspect", "-", "--trust", STS_CERTIFICATE, stdin=text)
                self.assertEqual(REFUSED, result.code)
                self.assertRegex(result.err,
                                 r"\Assoclient: (XMLParseException|ParseException): .+\n\Z")
                self.assertEqual("", result.out)


if __name__ == "__main__":
    unittest.main()
