"""What a project gets that takes this one in as a part of itself and sets no option."""

import json
import os
import pathlib
import re
import subprocess
import tempfile
import unittest

ROOT = pathlib.Path(__file__).resolve().parents[2]
SUBPROJECT = ROOT / "tests" / "install" / "subproject"


class Subproject(unittest.TestCase):
    def configure(self, *options):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.build = pathlib.Path(folder.name)
        return subprocess.run(
            [os.environ["CMAKE"], "-S", SUBPROJECT, "-B", self.build, "-DCMAKE_BUILD_TYPE=Debug",
             f"-DCMAKE_CXX_COMPILER={os.environ['CXX']}", "-DCMAKE_EXPORT_COMPILE_COMMANDS=ON",
             f"-DSSOCLIENT_SOURCE={ROOT}", *options],
            text=True, capture_output=True)

    def assert_configures(self, *options):
        result = self.configure(*options)
        self.assertEqual(0, result.returncode, result.stdout + result.stderr)
        return json.loads((self.build / "compile_commands.json").read_text("utf-8"))

    def check_that_it_is_the_libraries_alone(self, commands):
        folders = {pathlib.Path(command["file"]).relative_to(ROOT).parts[0] for command in commands}
        self.assertEqual({"lib", "tests"}, folders)
        self.assertEqual([], [command["file"] for command in commands
                              if "/tests/" in command["file"]
                              and "/tests/install/" not in command["file"]])
        self.assertEqual([], [command["file"] for command in commands
                              if re.search(r" -Werror\b", command["command"])])

    def check_that_nothing_is_installed(self):
        rules = [line for path in self.build.rglob("cmake_install.cmake")
                 for line in path.read_text("utf-8").splitlines() if "file(INSTALL" in line]
        self.assertEqual([], rules)

    def test_add_subdirectory_brings_the_libraries_alone(self):
        self.check_that_it_is_the_libraries_alone(self.assert_configures())
        self.check_that_nothing_is_installed()

    def test_fetch_content_brings_the_libraries_alone(self):
        self.check_that_it_is_the_libraries_alone(self.assert_configures("-DBY_FETCH_CONTENT=ON"))
        self.check_that_nothing_is_installed()

    def test_the_tests_need_the_handler_for_kerberos(self):
        result = self.configure("-DSSOCLIENT_BUILD_GSS=OFF", "-DSSOCLIENT_BUILD_TESTS=ON")
        self.assertNotEqual(0, result.returncode)
        self.assertIn("SSOCLIENT_BUILD_TESTS needs SSOCLIENT_BUILD_GSS", result.stderr)


class WithoutKerberos(unittest.TestCase):
    def test_nothing_looks_for_kerberos(self):
        with tempfile.TemporaryDirectory() as build:
            result = subprocess.run(
                [os.environ["CMAKE"], "-S", ROOT, "-B", build, "-DSSOCLIENT_BUILD_GSS=OFF",
                 "-DSSOCLIENT_BUILD_BENCHMARKS=OFF",
                 f"-DCMAKE_CXX_COMPILER={os.environ['CXX']}"], text=True, capture_output=True)
            cache = (pathlib.Path(build) / "CMakeCache.txt").read_text("utf-8")
        self.assertEqual(0, result.returncode, result.stderr)
        self.assertIn("SSOCLIENT_BUILD_TOOLS:BOOL=OFF", cache)
        self.assertFalse("SSOCLIENT_KRB5" in cache, "it was looked for")


if __name__ == "__main__":
    unittest.main()
