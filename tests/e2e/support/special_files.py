"""What may stand where a file or a directory is expected, and what its tests share.

The tool runs as a user to whom something can be forbidden, with little memory, and has to come to its end.
"""

import os
import shutil
import socket

from bundle_support import BundleTestCase
from support import unprivileged

MEMORY = 300 << 20
PODCAST = {"PodcastName": "Night Walks"}
MEDIA = b"media" * 1000
MINE = b"mine"


# Kinds: each makes something at a path. `content` is what a good file would hold there.

def regular(path, content):
    path.write_bytes(content)


def nothing(path, content):
    pass


def directory(path, content):
    path.mkdir()


def fifo(path, content):
    os.mkfifo(path)


def unix_socket(path, content):
    with socket.socket(socket.AF_UNIX) as listener:
        listener.bind(os.path.relpath(path))  # an absolute path may be too long for an address


def link(target):
    def make(path, content):
        path.symlink_to(target)
    return make


def link_to_file(path, content):
    target = path.with_name("target")
    target.write_bytes(content)
    path.symlink_to(target.name)


def loop(path, content):
    path.symlink_to("loop")
    path.with_name("loop").symlink_to(path.name)


def unreadable(path, content):
    path.write_bytes(content)
    path.chmod(0)


def read_only(path, content):
    path.write_bytes(content)
    path.chmod(0o444)


def unreachable(path, content):
    """The path leads through a directory that may not be entered."""
    path.write_bytes(content)
    path.parent.chmod(0)


def below_a_file(path, content):
    shutil.rmtree(path.parent)
    path.parent.write_bytes(MINE)


def link_to_directory(path, content):
    path.with_name("target").mkdir()
    path.symlink_to("target")


def locked(path, content):
    path.mkdir()
    path.chmod(0o555)


class SpecialFileTestCase(BundleTestCase):
    rows = 0

    def setUp(self):
        super().setUp()
        self.place = None

    def tearDown(self):
        if self.rows:
            print(f"{self.id().rpartition('.')[2]}: {self.rows} rows", flush=True)
        if self.place:
            self.clear()

    def clear(self):
        if self.place.is_dir():
            self.place.chmod(0o755)
            shutil.rmtree(self.place)
        else:
            self.place.unlink(missing_ok=True)

    def make(self, kind, name, content=b""):
        """Makes the kind at a place of its own. The path."""
        if self.place:
            self.clear()
        self.place = self.path("place")
        self.place.mkdir()
        path = self.place / name
        before = os.getcwd()
        os.chdir(self.directory)
        kind(path, content)
        os.chdir(before)
        self.rows += 1
        return path

    def run_tool(self, *arguments, **options):
        options = {"timeout": 30, "memory_limit": MEMORY, **options}
        return super().run_tool(*arguments, prefix=unprivileged(self.directory), **options)
