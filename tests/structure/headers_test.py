"""Every public header compiles alone, as C++17, with only lib/public and Boost to be found."""

import concurrent.futures
import os
import subprocess
import unittest

import sources

PUBLIC = sources.ROOT / "lib" / "public"


def compile_alone(compiler, header):
    """The compiler's complaints; empty if it has none."""
    result = subprocess.run(
        [compiler, "-std=c++17", "-pedantic-errors", "-Wall", "-Wextra", "-Werror",
         "-Wnon-virtual-dtor", "-fsyntax-only", f"-I{PUBLIC}", "-x", "c++", "-"],
        input=f'#include "{header}"\n', text=True, capture_output=True)
    return "" if result.returncode == 0 else f"{compiler}: {header}:\n{result.stderr}"


class PublicHeaders(unittest.TestCase):
    def assert_all_compile(self, compiler):
        headers = [path.relative_to(PUBLIC).as_posix() for path in sources.files("lib/public")]
        with concurrent.futures.ThreadPoolExecutor(os.cpu_count()) as pool:
            complaints = list(pool.map(lambda header: compile_alone(compiler, header), headers))
        self.assertEqual("", "\n".join(filter(None, complaints)))

    def test_compile_alone_with_either_compiler(self):
        compilers = os.environ["COMPILERS"].split(":")
        self.assertEqual(2, len(compilers))
        for compiler in compilers:
            self.assert_all_compile(compiler)


if __name__ == "__main__":
    unittest.main()
