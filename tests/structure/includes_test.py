"""Who may include what."""

import unittest

import sources

STANDARD_HEADERS = set("""
algorithm any array atomic bit bitset cassert cctype cerrno cfloat charconv chrono cinttypes climits
cmath compare complex concepts condition_variable csetjmp csignal cstdarg cstddef cstdint cstdio
cstdlib cstring ctime cwchar deque exception filesystem forward_list fstream functional future
initializer_list iomanip ios iosfwd iostream istream iterator limits list locale map memory
memory_resource mutex new numbers numeric optional ostream queue random ranges ratio regex set
shared_mutex source_location span sstream stack stdexcept stop_token streambuf string string_view
strstream system_error thread tuple type_traits typeindex typeinfo unordered_map unordered_set
utility valarray variant vector version
string.h""".split())  # <cstring> does not declare explicit_bzero

# Each third-party library of Quillon, and the one unit that may include it.
QUILLON_UNITS = {
    "openssl/": "lib/quillon/crypto/OpenSsl.h",
    "curl/": "lib/quillon/http/Curl.h",
    "libxml/": "lib/quillon/xml/",
}

# The same for the Kerberos handler. `krb5` begins the header's name and its folder's.
GSS_UNITS = {
    "gssapi": "lib/ssoClientGss/Gssapi.h",
    "krb5": "lib/ssoClientGss/Gssapi.h",
}

# What Quillon takes from the platform beside the standard library.
PLATFORM_HEADERS = {"arpa/inet.h", "cxxabi.h", "dlfcn.h", "execinfo.h", "netinet/in.h", "poll.h",
                    "sys/eventfd.h", "sys/inotify.h", "sys/random.h", "sys/socket.h", "unistd.h"}


def is_boost_or_standard(include):
    return include.target in STANDARD_HEADERS or include.target.startswith("boost/")


class Includes(unittest.TestCase):
    def assert_none(self, offenders):
        self.assertEqual([], [repr(offender) for offender in offenders])

    def test_ssoclient_sees_only_itself_quillons_interface_and_boost(self):
        paths = sources.files("lib/ssoClient", "lib/public/ssoClient")
        self.assert_none(
            include for include in sources.includes(paths)
            if not is_boost_or_standard(include)
            and not (include.is_quoted and include.resolves_under("lib/public"))
            and not (include.is_quoted and include.target.startswith("ssoClient/")
                     and include.resolves_under("lib")))

    def test_kerberos_handler_sees_only_itself_public_headers_boost_and_its_one_unit(self):
        paths = sources.files("lib/ssoClientGss", "lib/public/ssoClientGss")
        self.assert_none(
            include for include in sources.includes(paths)
            if not is_boost_or_standard(include)
            and not (include.is_quoted and include.resolves_under("lib/public"))
            and not (include.is_quoted and include.target.startswith("ssoClientGss/")
                     and include.resolves_under("lib"))
            and not include.target.startswith(tuple(GSS_UNITS)))

    def test_runtime_sees_only_itself_public_headers_and_boost(self):
        paths = sources.files("lib/ssoClientRuntime", "lib/public/ssoClientRuntime")
        self.assert_none(
            include for include in sources.includes(paths)
            if not is_boost_or_standard(include)
            and not (include.is_quoted and include.resolves_under("lib/public"))
            and not (include.is_quoted and include.target.startswith("ssoClientRuntime/")
                     and include.resolves_under("lib")))

    def test_runtime_and_kerberos_handler_do_not_know_each_other(self):
        for own, other in (("Runtime", "Gss"), ("Gss", "Runtime")):
            paths = sources.files(f"lib/ssoClient{own}", f"lib/public/ssoClient{own}")
            self.assert_none(include for include in sources.includes(paths)
                             if include.target.startswith(f"ssoClient{other}/"))

    def test_core_sees_nothing_of_what_stands_on_it(self):
        paths = sources.files("lib/ssoClient", "lib/public/ssoClient", "lib/quillon",
                              "lib/public/quillon")
        self.assert_none(
            include for include in sources.includes(paths)
            if include.target.startswith(("ssoClientGss/", "ssoClientRuntime/")))

    def test_quillon_sees_nothing_of_ssoclient(self):
        paths = sources.files("lib/quillon", "lib/public/quillon")
        self.assert_none(
            include for include in sources.includes(paths)
            if "ssoclient" in include.target.lower())

    def test_public_headers_see_only_public_headers_and_boost(self):
        paths = sources.files("lib/public")
        self.assert_none(
            include for include in sources.includes(paths)
            if not is_boost_or_standard(include)
            and not (include.is_quoted and include.resolves_under("lib/public")))

    def test_each_third_party_library_has_one_unit(self):
        units = {**QUILLON_UNITS, **GSS_UNITS}
        users = {prefix: set() for prefix in units}
        for include in sources.includes(sources.files("lib")):
            for prefix in units:
                if include.target.startswith(prefix):
                    users[prefix].add(sources.name(include.path))
        for prefix, unit in units.items():
            with self.subTest(library=prefix):
                self.assertEqual(1, len(users[prefix]), sorted(users[prefix]))
                self.assertTrue(next(iter(users[prefix])).startswith(unit), users[prefix])

    def test_quillon_takes_nothing_else_from_outside(self):
        paths = sources.files("lib/quillon")
        self.assert_none(
            include for include in sources.includes(paths)
            if not include.is_quoted
            and not is_boost_or_standard(include)
            and include.target not in PLATFORM_HEADERS
            and not include.target.startswith(tuple(QUILLON_UNITS)))

    def test_development_sts_sees_neither_library(self):
        paths = sources.files("tools/devsts")
        self.assert_none(
            include for include in sources.includes(paths)
            if include.target.startswith(("ssoClient/", "quillon/"))
            or (include.is_quoted and not include.resolves_under(
                "tools", include.path.parent.relative_to(sources.ROOT))))

    # Its headers are 9,000 lines, which no other source shall pay for.
    def test_parser_of_the_command_line_has_one_unit(self):
        users = {sources.name(include.path) for include in sources.includes(sources.files("tools"))
                 if include.target.startswith("CLI/")}
        self.assertEqual({"tools/ssoclient/CommandLine.cpp", "tools/devsts/main.cpp"}, users)

    def test_command_line_and_examples_see_only_public_headers(self):
        paths = sources.files("tools/ssoclient", "examples")
        self.assert_none(
            include for include in sources.includes(paths)
            if include.target.startswith(("ssoClient/", "quillon/"))
            and not include.resolves_under("lib/public"))


if __name__ == "__main__":
    unittest.main()
