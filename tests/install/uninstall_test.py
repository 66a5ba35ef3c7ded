"""./run uninstall removes what the list in the prefix names, and nothing else."""

import pathlib
import subprocess
import tempfile
import unittest

RUN = pathlib.Path(__file__).resolve().parents[2] / "run"
MANIFEST = "share/ssoclient/installed-by-run"


class Uninstall(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.folder = pathlib.Path(folder.name)
        self.prefix = self.folder / "a prefix"

    def put(self, *names):
        for name in names:
            path = self.prefix / name
            path.parent.mkdir(parents=True, exist_ok=True)
            path.write_text("x", "utf-8")

    def put_manifest(self, *names):
        self.put(MANIFEST)
        (self.prefix / MANIFEST).write_text("".join(f"{name}\n" for name in (*names, MANIFEST)),
                                            "utf-8")

    def uninstall(self):
        return subprocess.run([RUN, "uninstall", self.prefix], text=True, capture_output=True)

    def left(self):
        return sorted(path.relative_to(self.folder).as_posix()
                      for path in self.folder.rglob("*"))

    def test_all_of_it_goes(self):
        self.put("bin/ssoclient", "lib/a b.so")
        self.put_manifest("bin/ssoclient", "bin/", "lib/a b.so", "lib/", "share/", "share/ssoclient/",
                          "gone/before", "gone/")
        result = self.uninstall()
        self.assertEqual((0, ""), (result.returncode, result.stderr))
        self.assertEqual([], self.left())

    def test_what_others_put_there_stays(self):
        self.put("bin/ssoclient", "bin/other", "lib/other.so")
        (self.prefix / "include").mkdir()
        self.put_manifest("bin/ssoclient", "bin/", "share/ssoclient/", "share/")
        self.assertEqual(0, self.uninstall().returncode)
        self.assertEqual(["a prefix", "a prefix/bin", "a prefix/bin/other", "a prefix/include",
                          "a prefix/lib", "a prefix/lib/other.so"], self.left())

    def test_without_a_list_nothing_goes(self):
        self.put("bin/ssoclient")
        result = self.uninstall()
        self.assertEqual(1, result.returncode)
        self.assertIn(f"{self.prefix}/{MANIFEST}", result.stderr)
        self.assertTrue((self.prefix / "bin" / "ssoclient").exists())

    def test_a_list_that_leads_elsewhere_is_refused_whole(self):
        victim = self.folder / "victim"
        victim.write_text("x", "utf-8")
        for name in ("../victim", str(victim), "bin/../../victim"):
            with self.subTest(name=name):
                self.put("bin/ssoclient", "zzz")
                self.put_manifest("bin/ssoclient", name, "zzz")
                result = self.uninstall()
                self.assertEqual(1, result.returncode)
                self.assertIn(f"the list has '{name}'", result.stderr)
                self.assertTrue(victim.exists())
                self.assertTrue((self.prefix / "zzz").exists())


if __name__ == "__main__":
    unittest.main()
