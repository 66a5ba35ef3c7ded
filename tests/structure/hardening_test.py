"""What was built is hardened: seen in the files themselves, not in the flags."""

import os
import re
import subprocess
import unittest

LIBRARIES = os.environ["LIBRARIES"].split(":")
PROGRAMS = os.environ["PROGRAMS"].split(":")


def output(*command):
    return subprocess.run(command, check=True, capture_output=True, text=True).stdout


def imported(path):
    return output("nm", "--dynamic", "--undefined-only", path)


class Hardening(unittest.TestCase):
    def for_each(self, files, check):
        self.assertTrue(all(files), files)
        for path in files:
            with self.subTest(file=os.path.basename(path)):
                check(path)

    def test_programs_lie_anywhere(self):
        def check(path):
            self.assertRegex(output("readelf", "--dynamic", path), r"FLAGS_1.*\bPIE\b")
        self.for_each(PROGRAMS, check)

    def test_what_the_loader_fills_in_is_read_only_afterwards(self):
        def check(path):
            self.assertIn("GNU_RELRO", output("readelf", "--segments", path))
            self.assertRegex(output("readelf", "--dynamic", path), r"\bBIND_NOW\b|FLAGS_1.*\bNOW\b")
        self.for_each(LIBRARIES + PROGRAMS, check)

    def test_no_segment_can_be_written_and_run(self):
        def check(path):
            segments = output("readelf", "--segments", "--wide", path)
            self.assertRegex(segments, r"GNU_STACK .* RW  ")
            self.assertNotRegex(segments, r" (RWE|R?WE) ")
        self.for_each(LIBRARIES + PROGRAMS, check)

    def test_stacks_are_guarded(self):
        def check(path):
            self.assertIn("__stack_chk_fail", imported(path))
        self.for_each(LIBRARIES + PROGRAMS, check)

    def test_the_standard_library_asserts(self):
        def check(path):
            self.assertIn("__glibcxx_assert_fail", imported(path))
        self.for_each(LIBRARIES + PROGRAMS, check)

    def test_functions_of_c_know_the_size_of_what_they_write_to(self):
        """Wiping is the one such function that nearly all of them call."""
        def check(path):
            self.assertIn("__explicit_bzero_chk", imported(path))
            self.assertNotRegex(imported(path), r"\bexplicit_bzero@")
        callers = [path for path in LIBRARIES + PROGRAMS if "explicit_bzero" in imported(path)]
        self.assertGreater(len(callers), 2)
        self.for_each(callers, check)

    @unittest.skipUnless(os.uname().machine == "x86_64", "other processors have other marks")
    def test_jumps_land_on_marks(self):
        def check(path):
            code = output("objdump", "--disassemble", "--no-show-raw-insn", path)
            functions = len(re.findall(r"^[0-9a-f]+ <", code, re.MULTILINE))
            self.assertGreater(code.count("endbr64"), functions // 2)
        self.for_each(LIBRARIES + PROGRAMS, check)


if __name__ == "__main__":
    unittest.main()
