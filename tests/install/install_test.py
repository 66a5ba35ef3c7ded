"""Installs into a temporary prefix, moves it, and builds and runs other projects with it."""

import os
import pathlib
import re
import tempfile
import unittest

import consumers
from commands import run

FLAGS = [f"-fsanitize={os.environ['SANITIZE']}"] if os.environ["SANITIZE"] else []

class Install(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        folder = tempfile.TemporaryDirectory()
        cls.addClassCleanup(folder.cleanup)
        cls.folder = pathlib.Path(folder.name)
        run(os.environ["CMAKE"], "--install", os.environ["BUILD_DIR"], "--prefix",
            cls.folder / "first")
        cls.prefix = (cls.folder / "first").rename(cls.folder / "moved")
        cls.libraries = cls.prefix / os.environ["LIBDIR"]

    def test_cmake_package(self):
        build = self.folder / "build"
        consumers.build_with_cmake(build, f"-DCMAKE_PREFIX_PATH={self.prefix}",
                                   f"-DCMAKE_CXX_FLAGS={' '.join(FLAGS)}")
        self.assertEqual(consumers.SAYS, consumers.run_all(build))

    def test_pkg_config(self):
        for package, source in consumers.SOURCES.items():
            with self.subTest(package=package):
                program = consumers.build_with_pkg_config(
                    self.folder, package, self.libraries / "pkgconfig", *FLAGS)
                self.assertEqual(consumers.SAYS[source],
                                 run(program, LD_LIBRARY_PATH=str(self.libraries)))

    def read_dynamic_section(self, library):
        return run("readelf", "--dynamic", "--wide", self.libraries / library)

    def get_needed(self, library):
        """The shared libraries that this one names. What those need is their own affair."""
        return re.findall(r"\(NEEDED\).*\[(.+)\]", self.read_dynamic_section(library))

    def test_libraries_cannot_be_unloaded(self):
        for library in ("libquillon.so", "libssoclient.so", "libssoclient_gss.so",
                        "libssoclient_runtime.so"):
            with self.subTest(library=library):
                self.assertRegex(self.read_dynamic_section(library), r"\(FLAGS_1\).*\bNODELETE\b")

    def test_only_the_kerberos_handler_needs_kerberos(self):
        kerberos = re.compile(r"lib(gssapi|krb5|k5crypto|com_err)")
        for library, is_needed in (("libquillon.so", False), ("libssoclient.so", False),
                                   ("libssoclient_runtime.so", False),
                                   ("libssoclient_gss.so", True)):
            with self.subTest(library=library):
                needed = self.get_needed(library)
                self.assertTrue(any(name.startswith("libc.so") for name in needed), needed)
                self.assertEqual(is_needed, any(map(kerberos.match, needed)), needed)

    @unittest.skipUnless(os.environ["TOOLS"] == "1", "the tools are not built")
    def test_tools_find_their_libraries(self):
        self.assertRegex(run(self.prefix / "bin" / "ssoclient", "--version"), r"^ssoclient \d")
        self.assertEqual(["ssoclient"], [path.name for path in (self.prefix / "bin").iterdir()])

    @unittest.skipUnless(os.environ["TOOLS"] == "1", "the tools are not built")
    def test_development_sts_is_installed_when_it_is_asked_for(self):
        prefix = self.folder / "devsts"
        run(os.environ["CMAKE"], "--install", os.environ["BUILD_DIR"], "--prefix", prefix,
            "--component", "ssoclient-devsts")
        self.assertIn("--state", run(prefix / "bin" / "ssoclient-devsts", "--help"))

    def test_private_headers_stay_at_home(self):
        installed = {path.relative_to(self.prefix / "include").as_posix()
                     for path in (self.prefix / "include").rglob("*") if path.is_file()}
        public = pathlib.Path(__file__).resolve().parents[2] / "lib" / "public"
        self.assertEqual({path.relative_to(public).as_posix() for path in public.rglob("*.h")},
                         installed)


if __name__ == "__main__":
    unittest.main()
