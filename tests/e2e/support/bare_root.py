"""A root directory that holds the tool and the shared libraries that it is linked with, and nothing else: no
settings, no time zones, no locales, no library that is only loaded when it is needed."""

import os
import re
import shutil
import subprocess

from support import ToolTestCase, checked, environment, is_sanitized, tool


def linked_files(executable):
    """The shared libraries that the loader takes for an executable, and the loader; None where that is not told."""
    try:
        finished = subprocess.run(["ldd", str(executable)], env=environment(), stdin=subprocess.DEVNULL,
                                  capture_output=True, check=False)
    except FileNotFoundError:
        return None
    files = re.findall(r"(/\S+) \(0x", finished.stdout.decode())
    return files if finished.returncode == 0 and files else None


class BareRootTestCase(ToolTestCase):
    """A test whose runs have the test's directory as their root directory, with the tool in it as /qel."""

    def setUp(self):
        super().setUp()
        if os.geteuid() != 0 or not shutil.which("chroot"):
            self.skipTest("only root may run the tool in another root directory")
        if is_sanitized():
            self.skipTest("a sanitizer needs /proc")
        files = linked_files(tool())
        if files is None:
            self.skipTest("nothing tells which libraries the tool is linked with")
        for file in files:
            copy = self.directory / file.lstrip("/")
            copy.parent.mkdir(parents=True, exist_ok=True)
            shutil.copy(file, copy)
        shutil.copy(tool(), self.directory / "qel")

    def in_root(self, *arguments, stdin=b"", env=None):
        """The status and the output of a run in the bare root, where the test's directory is called "/"."""
        finished = subprocess.run(["chroot", self.directory, "/qel", *arguments], input=stdin, env=environment(env),
                                  capture_output=True, timeout=120, check=False)
        return checked(arguments, finished.returncode, finished.stdout, finished.stderr)
