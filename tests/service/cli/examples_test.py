"""The example programs do what the documents say of them."""

import os
import unittest

from programs import DESCRIPTION, DONE, DevelopmentSts, ServiceTest, run


class Examples(ServiceTest):
    def test_acquire_with_password(self):
        result = run(os.environ["ACQUIRE_EXAMPLE"], self.sts.url, self.sts.ca, self.sts.trust,
                     DevelopmentSts.USER, stdin=DevelopmentSts.PASSWORD + "\n")
        self.assertEqual((DONE, ""), (result.code, result.err))
        self.assertRegex(result.out, DESCRIPTION)

    def test_acquire_with_wrong_password(self):
        result = run(os.environ["ACQUIRE_EXAMPLE"], self.sts.url, self.sts.ca, self.sts.trust,
                     DevelopmentSts.USER, stdin="wrong\n")
        self.assertEqual((1, ""), (result.code, result.out))
        self.assertRegex(result.err, r"\AInvalidCredentialsException: .+\n\Z")

    def test_inspect_file(self):
        out = self.folder / "token.xml"
        self.assert_done(self.acquire("--out", out))
        result = run(os.environ["INSPECT_EXAMPLE"], out, self.sts.trust)
        self.assertEqual((DONE, ""), (result.code, result.err))
        self.assertRegex(result.out, DESCRIPTION)


if __name__ == "__main__":
    unittest.main()
