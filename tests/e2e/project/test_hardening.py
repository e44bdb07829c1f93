"""The release form is hardened as CMakeLists.txt promises: what the linker has done can be read off the executable."""

import re
import shutil
import subprocess
import unittest
from pathlib import Path

from support import tool


def is_hardened():
    """Whether the executable stands in a build directory whose form is hardened."""
    cache = Path(tool()).parent / "CMakeCache.txt"
    text = cache.read_text(encoding="utf-8") if cache.exists() else ""
    settings = dict(re.findall(r"^(\w+):\w+=(.*)$", text, re.MULTILINE))
    return (settings.get("CMAKE_BUILD_TYPE") == "Release" and settings.get("QEL_HARDENING") == "ON"
            and not settings.get("QEL_SANITIZE"))


@unittest.skipUnless(shutil.which("readelf"), "readelf is not installed; it comes with the compiler")
class HardeningTest(unittest.TestCase):
    def test_the_release_form_is_hardened(self):
        if not is_hardened():
            self.skipTest("this build is not the hardened one")
        told = subprocess.run(["readelf", "--wide", "--segments", "--dynamic", "--dyn-syms", tool()], timeout=60,
                              capture_output=True, text=True, check=True).stdout
        for what, pattern in (("loaded anywhere", r"\(FLAGS_1\).* PIE\b"),
                              ("bound before it runs", r"\(FLAGS_1\).* NOW\b"),
                              ("its tables read-only", r"^ +GNU_RELRO "),
                              ("its stack not executable", r"^ +GNU_STACK .* RW "),
                              ("its stack guarded", r"\b__stack_chk_fail@")):
            with self.subTest(what):
                self.assertTrue(re.search(pattern, told, re.MULTILINE))


if __name__ == "__main__":
    unittest.main()
