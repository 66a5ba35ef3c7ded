"""Static libraries: as a part of another project, unloaded while their threads run, and installed."""

import os
import pathlib
import tempfile
import unittest

import consumers
from commands import run

ROOT = pathlib.Path(__file__).resolve().parents[2]


class Static(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        folder = tempfile.TemporaryDirectory()
        cls.addClassCleanup(folder.cleanup)
        cls.folder = pathlib.Path(folder.name)
        cls.build = cls.folder / "build"
        cls.prefix = cls.folder / "prefix"
        run(os.environ["CMAKE"], "-S", ROOT / "tests" / "install" / "subproject", "-B", cls.build,
            f"-DSSOCLIENT_SOURCE={ROOT}", "-DBUILD_SHARED_LIBS=OFF", "-DSSOCLIENT_INSTALL=ON",
            f"-DCMAKE_INSTALL_PREFIX={cls.prefix}", "-DCMAKE_INSTALL_LIBDIR=lib",
            "-DCMAKE_CXX_COMPILER_LAUNCHER=ccache", f"-DCMAKE_CXX_COMPILER={os.environ['CXX']}")
        run(os.environ["CMAKE"], "--build", cls.build)
        run(os.environ["CMAKE"], "--install", cls.build)

    def test_programs_of_the_same_project(self):
        self.assertEqual(consumers.SAYS, consumers.run_all(self.build / "consumer"))

    def test_plug_in_stays_while_its_threads_run(self):
        self.assertEqual("HttpException\nstayed\n",
                         run(self.build / "host", self.build / "libplugin.so"))
        # Whether it would have left without being told to stay is up to the compiler.
        self.assertRegex(run("readelf", "--dynamic", self.build / "libplugin.so"),
                         r"\(FLAGS_1\).*\bNODELETE\b")

    def test_plug_in_hands_on_no_name_of_the_libraries(self):
        names = run("nm", "--dynamic", "--defined-only", "--demangle", self.build / "libplugin.so")
        self.assertIn("StartThreads", names)
        self.assertNotRegex(names, r"Quillon::Http::|SsoClient::CreateSecurityTokenService")

    def test_installed_libraries_are_static(self):
        self.assertEqual({"libquillon.a", "libssoclient.a", "libssoclient_gss.a", "libssoclient_runtime.a"},
                         {path.name for path in (self.prefix / "lib").glob("lib*")})

    def test_cmake_package(self):
        build = self.folder / "consumer"
        consumers.build_with_cmake(build, f"-DCMAKE_PREFIX_PATH={self.prefix}")
        self.assertEqual(consumers.SAYS, consumers.run_all(build))

    def test_pkg_config(self):
        for package, source in consumers.SOURCES.items():
            with self.subTest(package=package):
                program = consumers.build_with_pkg_config(
                    self.folder, package, self.prefix / "lib" / "pkgconfig")
                self.assertEqual(consumers.SAYS[source], run(program))


if __name__ == "__main__":
    unittest.main()
