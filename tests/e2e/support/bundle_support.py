"""What the tests of bundles share: making one, and looking at everything that is in a directory."""

import hashlib
import os
import plistlib
import re
import threading
import time

from support import LOADING, ToolTestCase

IN_PLACE = re.compile(rb"(?:\x08*  -- \d+ / \d+ \(\d+\.\d%\))+\n")


def contents(directory):
    """Everything below the directory: relative path to bytes, "-> target" for a link, None for a directory,
    "special" for what is no file at all."""
    found = {}
    for folder, folders, files in os.walk(directory):
        for name in folders + files:
            path = os.path.join(folder, name)
            if os.path.islink(path):
                value = f"-> {os.readlink(path)}"
            elif os.path.isdir(path):
                value = None
            elif not os.path.isfile(path):
                value = "special"
            else:
                with open(path, "rb") as file:
                    value = file.read()
            found[os.path.relpath(path, directory)] = value
    return found


def digests(found):
    """The same with short digests of files for their bytes, so that a failure can be read."""
    return {path: hashlib.sha256(content).hexdigest()[:16] if isinstance(content, bytes) else content
            for path, content in found.items()}


def hidden(directory):
    """The relative paths of all hidden files below the directory."""
    return sorted(os.path.relpath(os.path.join(folder, name), directory)
                  for folder, folders, files in os.walk(directory)
                  for name in folders + files if name.startswith("."))


def eventually(condition, seconds=30):
    """Waits until the condition holds; a failure when it does not within the seconds."""
    end = time.monotonic() + seconds
    while not condition():
        if time.monotonic() > end:
            raise AssertionError("what was waited for did not happen")
        time.sleep(0.002)


def notices(*messages):
    """The progress lines of the messages, after the one about the source; "W " begins a warning."""
    lines = [f"[W] {text[2:]}\n" if text.startswith("W ") else f"[N] {text}\n" for text in messages]
    return LOADING + "".join(lines).encode()


class Gate:
    """A place in a server's answer that is passed when the test says so."""

    def __init__(self):
        self._reached = threading.Event()
        self._opened = threading.Event()

    def wait(self):
        """For the server: tells that it is here, and waits."""
        self._reached.set()
        self._opened.wait(60)

    def reached(self):
        """For the test: waits until the server is here."""
        if not self._reached.wait(60):
            raise AssertionError("the server was never asked so far")

    def open(self):
        self._opened.set()


class BundleTestCase(ToolTestCase):
    """Runs createbundle in the test's directory; the bundle is show.podcast unless told otherwise."""

    def setUp(self):
        super().setUp()
        self.bundle = self.path("show.podcast")

    def gate(self):
        gate = Gate()
        self.addCleanup(gate.open)
        return gate

    def media(self, name, content=b"media"):
        """A local media file or poster, out of the bundle's way. The path as a text."""
        path = self.path("media") / name
        path.parent.mkdir(parents=True, exist_ok=True)
        path.write_bytes(content)
        return str(path)

    def create(self, podcast, *arguments, **options):
        """The result of createbundle for a source, or for a podcast dictionary."""
        source = self.reference(podcast) if isinstance(podcast, dict) else podcast
        return self.run_tool("createbundle", source, "-d", self.bundle, *arguments, **options)

    def create_episodes(self, *episodes, **options):
        """The result for a podcast of the episodes, each a dictionary or a location."""
        return self.create({"Episodes": [{"EpisodeReference": episode} if isinstance(episode, str) else episode
                                         for episode in episodes]}, **options)

    def info(self, bundle=None):
        """The dictionary in the bundle's Info.plist."""
        return plistlib.loads(((bundle or self.bundle) / "Info.plist").read_bytes())

    def references(self):
        """The media's names in the bundle's Info.plist, in order."""
        return [episode["EpisodeReference"] for episode in self.info().get("Episodes", [])]

    def files(self, bundle=None):
        """Relative path to bytes of all files in the bundle but Info.plist."""
        return {path: content for path, content in contents(bundle or self.bundle).items()
                if content is not None and path != "Info.plist"}

    def assertRuns(self, result, *messages):
        """Success with exactly these progress lines, in which byte counters do not count."""
        self.assertEqual((result.status, result.stderr), (0, b""))
        self.assertEqual(IN_PLACE.sub(b"", result.stdout).decode(), notices(*messages, "Done!").decode())

    def assertWarns(self, result, *warnings):
        """Success with exactly these warnings among the progress lines."""
        self.assertEqual((result.status, result.stderr), (0, b""))
        lines = IN_PLACE.sub(b"", result.stdout).decode().splitlines()
        self.assertEqual([line[4:] for line in lines if line.startswith("[W] ")], list(warnings))
        self.assertEqual(lines[-1], "[N] Done!")
