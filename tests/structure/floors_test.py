"""Includes go down: each folder of a library sees only the floors below it."""

import pathlib
import shutil
import tempfile
import unittest

import sources

FOLDERS = {"quillon": "lib/quillon", "ssoClient": "lib/ssoClient", "devsts": "tools/devsts"}

# Each folder with what it may include beside itself. Folders are floors, the lowest first.
FLOORS = {
    "quillon": {
        "core": set(),
        "system": {"core"},
        "crypto": {"core", "system"},
        "service": {"core", "system"},
        "threads": {"core", "system", "crypto", "service"},
        "ssl": {"core", "system", "crypto", "service", "threads"},
        "http": {"core", "system", "crypto", "service", "threads", "ssl"},
        "xml": {"core"},
        "xml/security": {"core", "crypto", "xml"},
        "versions": {"core", "crypto", "http", "xml"},
    },
    "ssoClient": {
        "wire": set(),
        "assertion": {"wire"},
        "token": {"wire"},
        "dialect": {"wire", "assertion"},
        "message": {"wire", "dialect"},
        "protocol": {"wire", "token", "dialect", "message"},
        "client": {"wire", "assertion", "token", "dialect", "message", "protocol"},
    },
    "devsts": {
        "wire": set(),
        "security": {"wire"},
        "state": {"wire", "security"},
        "token": {"wire", "security", "state"},
        "negotiation": {"wire", "security", "state", "token"},
        "service": {"wire", "security", "state", "token", "negotiation"},
        "http": {"wire", "security", "state", "service"},
        "misbehaviour": {"wire", "security", "state", "service", "http"},
        ".": {"state", "http", "misbehaviour"},
    },
}

# Public headers lie where users look for them, which is not always the floor that implements them.
PUBLIC_FLOORS = {
    "quillon": {
        "Exceptions.h": "core", "Export.h": "core", "Functor.h": "core", "MessageFormatter.h": "core",
        "PanicVerify.h": "core", "Reader.h": "core", "Ref.h": "core", "StringUtil.h": "core",
        "Wiped.h": "core",
        "LibraryVersions.h": "versions", "system/ThreadPool.h": "threads",
    },
    "ssoClient": {
        "Advice.h": "wire", "Delegate.h": "wire", "Exceptions.h": "wire", "Export.h": "wire",
        "HolderOfKeyConfig.h": "wire", "Leg.h": "wire", "PasswordCredentials.h": "wire",
        "PrincipalId.h": "wire", "SoapFault.h": "wire",
        "SamlToken.h": "wire", "TokenSpec.h": "wire",
        "Assertion.h": "assertion", "SubjectMapping.h": "assertion",
        "CreateSamlToken.h": "token", "ServiceDialect.h": "dialect",
        "ConnectionReuse.h": "protocol", "ExchangeOptions.h": "protocol",
        "CallOptions.h": "client", "Cancellation.h": "client", "OperationObserver.h": "client",
        "Descriptions.h": "client", "GssNegotiationContext.h": "client",
        "NegotiationHandler.h": "client", "SecurityTokenService.h": "client",
        "SecurityTokenServiceConfig.h": "client",
    },
}


def floor_of_public_header(library, path):
    return PUBLIC_FLOORS[library].get(path.as_posix(), path.parent.as_posix())


def floor_of_target(library, root, target):
    """The floor that an include leads to; None if it leads out of the library."""
    if target.startswith(library + "/"):
        path = pathlib.PurePath(target).relative_to(library)
        if (root / "lib" / "public" / target).is_file():
            return floor_of_public_header(library, path)
        return path.parent.as_posix()
    # Quillon's private headers are named from its own folder.
    if (root / FOLDERS[library] / target).is_file():
        return pathlib.PurePath(target).parent.as_posix()
    return None


def floor_of_file(library, root, path):
    public = root / "lib" / "public" / library
    if path.is_relative_to(public):
        return floor_of_public_header(library, path.relative_to(public))
    return path.relative_to(root / FOLDERS[library]).parent.as_posix()


def climbing_includes(library, root):
    """The includes that go up or sideways, as text."""
    sees = FLOORS[library]
    paths = [path for folder in (FOLDERS[library], f"lib/public/{library}")
             for path in sorted((root / folder).rglob("*")) if path.suffix in (".h", ".cpp")]
    assert paths
    found = []
    for include in sources.includes(paths):
        floor = floor_of_file(library, root, include.path)
        target = floor_of_target(library, root, include.target)
        if target is not None and target != floor and target not in sees[floor]:
            found.append(f"{include.path.relative_to(root).as_posix()} includes {include.target}")
    return found


class Floors(unittest.TestCase):
    def test_includes_go_down(self):
        for library in FLOORS:
            with self.subTest(library=library):
                self.assertEqual([], climbing_includes(library, sources.ROOT))

    def test_every_folder_is_a_floor(self):
        for library, sees in FLOORS.items():
            folders = {path.parent.relative_to(sources.ROOT / FOLDERS[library]).as_posix()
                       for path in sources.files(FOLDERS[library])}
            self.assertEqual(set(sees), folders)

    def test_floors_have_an_order(self):
        for sees in FLOORS.values():
            lower = set()
            for floor, below in sees.items():
                self.assertLessEqual(below, lower, floor)
                lower.add(floor)


class PlantedIncludes(unittest.TestCase):
    """The test above fails when it should."""

    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.root = pathlib.Path(folder.name)
        shutil.copytree(sources.ROOT / "lib", self.root / "lib")
        shutil.copytree(sources.ROOT / "tools", self.root / "tools")

    def assert_found(self, library, path, target):
        file = self.root / path
        file.write_text(f'#include "{target}"\n' + file.read_text("utf-8"), "utf-8")
        self.assertEqual([f"{path} includes {target}"], climbing_includes(library, self.root))

    def test_the_service_in_the_reader_of_xml(self):
        self.assert_found("ssoClient", "lib/ssoClient/wire/xmlReading.cpp",
                          "ssoClient/client/SecurityTokenServiceImpl.h")

    def test_the_transport_in_the_reader_of_statements(self):
        self.assert_found("ssoClient", "lib/ssoClient/token/samlStatements.cpp",
                          "ssoClient/protocol/HttpsClient.h")

    def test_the_narrow_reader_in_the_general_one(self):
        self.assert_found("ssoClient", "lib/ssoClient/assertion/subjectReading.cpp",
                          "ssoClient/token/samlAssertion.h")

    def test_http_in_the_core(self):
        self.assert_found("quillon", "lib/quillon/core/StringWriter.cpp", "http/HttpEngine.h")

    def test_a_sideways_step(self):
        self.assert_found("ssoClient", "lib/ssoClient/message/xmlCommonBuilders.cpp",
                          "ssoClient/token/samlAssertion.h")

    def test_the_server_in_the_reader_of_requests(self):
        self.assert_found("devsts", "tools/devsts/wire/RequestReader.cpp", "devsts/http/Server.h")

    def test_a_public_header_of_a_higher_floor(self):
        self.assert_found("ssoClient", "lib/ssoClient/wire/xmlReading.cpp",
                          "ssoClient/SecurityTokenService.h")


if __name__ == "__main__":
    unittest.main()
