"""What the tool is measured against: which programs there are, in which versions, and the feed parsers of other
languages, each with a small program of bench/peers that parses a whole feed and writes how many items it has."""

import json
import os
import re
import shutil
import subprocess
import sys
from pathlib import Path

import media_server

PEERS = Path(__file__).resolve().parent / "peers"
FEEDSMITH = "feedsmith@3.0.1"
# Where distributions put the sources of Go's libraries.
GO_LIBRARIES = "/usr/share/gocode"


def said(*command, **variables):
    """What a command prints, standard error included; empty when it is missing or fails."""
    try:
        run = subprocess.run(command, env={**os.environ, **variables}, stdin=subprocess.DEVNULL, stdout=subprocess.PIPE,
                             stderr=subprocess.STDOUT, check=False)
    except OSError:
        return ""
    return run.stdout.decode(errors="replace").strip() if run.returncode == 0 else ""


def version_in(text):
    """The first version number in what a program says of itself; 20914 is how libxml writes 2.9.14."""
    found = re.search(r"\b(\d)(\d\d)(\d\d)\b|\d+(?:\.\d+)+", text)
    if not found:
        return "of an unknown version"
    return ".".join(str(int(part)) for part in found.groups()) if found[1] else found[0]


def program_versions():
    """The version of each program, None for a missing one."""
    versions = {}
    for name, argument in (("xmllint", "--version"), ("xsltproc", "--version"), ("plistutil", "--version"),
                           ("curl", "--version"), ("wget", "--version"), ("cp", "--version"), ("nginx", "-v")):
        path = media_server.program() if name == "nginx" else shutil.which(name)
        versions[name] = version_in(said(path, argument)) if path else None
    return versions


class Peers:
    """The feed parsers of other languages. What has to be built or installed for them goes into the directory."""

    NAMES = ("gofeed", "libmrss", "feedsmith", "feedparser")
    LANGUAGES = {"gofeed": "Go", "libmrss": "C", "feedsmith": "JavaScript", "feedparser": "Python"}
    # What to install where one is missing.
    PACKAGES = {"gofeed": "golang-github-mmcdole-gofeed-dev", "libmrss": "libmrss0-dev",
                "feedsmith": f"{FEEDSMITH} from npm", "feedparser": "python3-feedparser"}

    def __init__(self, directory, may_install):
        self.directory, self.may_install = directory, may_install

    def command(self, name):
        """The command that counts a feed's items, to be given the feed and an output; None for a missing parser."""
        self.directory.mkdir(parents=True, exist_ok=True)
        return getattr(self, f"_{name}")()

    def version(self, name):
        """None for a missing parser."""
        if not self.command(name):
            return None
        if name == "gofeed":
            return version_in(said("dpkg-query", "--show", "--showformat=${Version}", self.PACKAGES[name]))
        if name == "libmrss":
            return version_in(said("pkg-config", "--modversion", "mrss"))
        if name == "feedsmith":
            manifest = self.directory / "node_modules/feedsmith/package.json"
            return json.loads(manifest.read_text(encoding="utf-8"))["version"]
        return said(self._interpreter(), "-c", "import feedparser; print(feedparser.__version__)")

    def _gofeed(self):
        # The libraries come from the distribution, so nothing is fetched.
        variables = {"GO111MODULE": "off", "GOPATH": GO_LIBRARIES, "GOCACHE": str(self.directory / "go"), "GOFLAGS": ""}
        return self._built("with_gofeed.go", "go", "build", **variables)

    def _libmrss(self):
        flags = said("pkg-config", "--cflags", "--libs", "mrss").split()
        return self._built("with_libmrss.c", "cc", "-O2", flags=flags) if flags else None

    def _built(self, name, *compiler, flags=(), **variables):
        source = PEERS / name
        program = self.directory / source.stem
        if not program.exists() or program.stat().st_mtime < source.stat().st_mtime:
            said(*compiler, "-o", program, source, *flags, **variables)
        return [program] if program.exists() else None

    def _feedsmith(self):
        modules = self.directory / "node_modules"
        node, npm = shutil.which("node"), shutil.which("npm")
        if self.may_install and npm and not (modules / "feedsmith").exists():
            said(npm, "install", "--prefix", self.directory, "--no-save", "--no-audit", "--no-fund", FEEDSMITH)
        return [node, PEERS / "with_feedsmith.cjs", modules] if node and (modules / "feedsmith").exists() else None

    def _feedparser(self):
        interpreter = self._interpreter()
        return [interpreter, "-B", PEERS / "with_feedparser.py"] if interpreter else None

    @staticmethod
    def _interpreter():
        """A Python that has feedparser; distributions install it for their own one only."""
        for interpreter in (sys.executable, "/usr/bin/python3"):
            if said(interpreter, "-c", "import feedparser; print(1)"):
                return interpreter
        return None
