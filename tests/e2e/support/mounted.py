"""File systems of a test's own, in images that are mounted. That takes root and loop devices."""

import fcntl
import os
import shutil
import struct
import subprocess
import unittest

MEGABYTE = 1 << 20

# FS_IOC_SHUTDOWN of ext4 and others, and its argument for "write nothing any more, the journal included".
_SHUTDOWN = 0x8004587D
_WITHOUT_THE_LOG = 2


def _run(*command):
    return subprocess.run(command, stdin=subprocess.DEVNULL, stdout=subprocess.DEVNULL, stderr=subprocess.PIPE,
                          check=False)


class Image:
    """A file that holds an ext4 file system, and the directory where it is mounted."""

    def __init__(self, path, point, *options, megabytes=64):
        """Skips the test where no such file system can be made and mounted; options are those of mkfs.ext4."""
        self.path, self.point = path, point
        with open(path, "wb") as file:
            file.truncate(megabytes * MEGABYTE)
        point.mkdir(exist_ok=True)
        if os.geteuid() != 0 or not shutil.which("mkfs.ext4") or not os.path.exists("/dev/loop-control"):
            raise unittest.SkipTest("root, mkfs.ext4 and loop devices are needed")
        if _run("mkfs.ext4", "-q", "-F", *options, path).returncode != 0:
            raise unittest.SkipTest(f"mkfs.ext4 knows no {' '.join(options)}")
        made = _run("mount", "-o", "loop", path, point)
        if made.returncode != 0:
            raise unittest.SkipTest(f"nothing can be mounted here: {made.stderr.decode().strip()}")
        self._is_mounted = True

    def mount(self):
        result = _run("mount", "-o", "loop", self.path, self.point)
        if result.returncode != 0:
            raise AssertionError(result.stderr.decode())
        self._is_mounted = True

    def unmount(self):
        """Does nothing where it is not mounted."""
        if self._is_mounted:
            subprocess.run(["umount", self.point], check=True)
            self._is_mounted = False

    def cut(self):
        """From now on nothing gets to the image any more: what it holds is what a power cut leaves."""
        directory = os.open(self.point, os.O_RDONLY)
        try:
            fcntl.ioctl(directory, _SHUTDOWN, struct.pack("I", _WITHOUT_THE_LOG))
        finally:
            os.close(directory)
