"""What the end-to-end tests share: running the tool, building its input, judging its output.

The tool is the executable that the environment variable QEL names. It is judged from outside only: by
its exit status, its two output streams and the files that it writes, read back with Python's own
property-list and XML modules.
"""

import functools
import os
import plistlib
import re
import shutil
import subprocess
import tempfile
import unittest
import xml.etree.ElementTree as ElementTree
from pathlib import Path
from typing import NamedTuple
from xml.sax.saxutils import escape, quoteattr

from feed_server import FeedServer

DC = "{http://purl.org/dc/elements/1.1/}"
ORVANE = "{https://orvane.example/ns/podcast-1.0}"
QEL_NAMESPACE = "{https://qel.example/ns/1.0}"

LOADING = b"[N] Loading/interpreting source...\n"
NO_FEED = "Could not load source: The feed was neither RSS nor Atom"

# A sanitizer that finds a fault ends the tool with this status, which the tool itself never uses.
SANITIZER_STATUS = 99

# How a shell closes a descriptor.
_CLOSING = {0: "<&-", 1: ">&-", 2: "2>&-"}

# Nothing of the machine may decide a result, unless a test asks for it.
_HIDDEN_VARIABLES = {"http_proxy", "https_proxy", "all_proxy", "no_proxy", "lang", "language", "curl_ca_bundle",
                     "ssl_cert_file", "ssl_cert_dir", "sslkeylogfile", "source_date_epoch"}


class Result(NamedTuple):
    status: int
    stdout: bytes
    stderr: bytes


class Crash(AssertionError):
    """The tool was ended by a signal or by a sanitizer, which no input may bring about."""


def tool(program="qel"):
    """The path of the executable under test; a companion's stands beside it."""
    path = os.environ.get("QEL")
    if not path:
        raise RuntimeError("the environment variable QEL must name the executable to test")
    return path if program == "qel" else str(Path(path).with_name(Path(path).name.replace("qel", program)))


def environment(changes=None):
    """The environment of a run: this process's, without what could decide a result, and the changes."""
    values = {name: value for name, value in os.environ.items()
              if name.lower() not in _HIDDEN_VARIABLES and not name.startswith("LC_")}
    values.update(TZ="UTC", LC_ALL="C",
                  ASAN_OPTIONS=f"exitcode={SANITIZER_STATUS}",
                  UBSAN_OPTIONS=f"halt_on_error=1:print_stacktrace=1:exitcode={SANITIZER_STATUS}")
    values.update(changes or {})
    return values


@functools.cache
def counting_from_start(program="qel"):
    """Changes to the environment of a run that cannot write a file at its end: past a limit, as another user.

    Where coverage is measured, such a run counts into a file that is there from its start; nothing else changes.
    """
    name = os.environ.get("LLVM_PROFILE_FILE")
    if not name:
        return {}
    folder = Path(name).parent
    changes = {"LLVM_PROFILE_FILE": str(folder / f"{os.getpid()}-%c%m.profraw")}
    run(program=program, env=changes)  # makes the file, whole
    for file in folder.glob(f"{os.getpid()}-*"):
        file.chmod(0o666)
    return changes


def soaking():
    """Whether this is a long run (QEL_SOAK=1), in which a test tries all cases, not only a choice of them."""
    return os.environ.get("QEL_SOAK") == "1"


def start(*arguments, env=None, program="qel", **options):
    """Starts the tool with Popen's options and returns the process."""
    return subprocess.Popen([tool(program), *arguments], env=environment(env), **options)


def checked(arguments, status, stdout=b"", stderr=b""):
    """The result of a run that has ended, whatever it says, unless it crashed."""
    if status < 0 or status == SANITIZER_STATUS:
        raise Crash(f"{arguments!r} ended with {status}: {stderr[-4000:].decode(errors='replace')}")
    return Result(status, stdout, stderr)


def run(*arguments, stdin=b"", env=None, timeout=120, memory_limit=None, closed=(), prefix=(), program="qel",
        **options):
    """Runs the tool to its end. A crash and a run longer than the timeout (seconds) are failures.

    memory_limit is the number of bytes that the tool may take, for input made to exhaust memory; closed
    lists those of the descriptors 0 to 2 that the tool starts without; prefix is a command that runs it. Another
    program than the tool is a companion of it.
    """
    env = dict(env or {})
    shell = ['exec "$0" "$@"', *(_CLOSING[descriptor] for descriptor in closed)]
    if memory_limit is not None:
        if is_sanitized():
            env["ASAN_OPTIONS"] = f"exitcode={SANITIZER_STATUS}:hard_rss_limit_mb={memory_limit >> 20}"
        elif not is_emulated():  # most would be the emulator's own
            shell.insert(0, f"ulimit -v {memory_limit >> 10} &&")
    if len(shell) > 1:  # a shell prepares the process: Python's own way is unsafe beside a server's threads
        prefix = ("/bin/sh", "-c", " ".join(shell), *prefix)
    options = {"stdout": subprocess.PIPE, "stderr": subprocess.PIPE, **options}
    finished = subprocess.run([*prefix, tool(program), *arguments], input=stdin, env=environment(env), timeout=timeout,
                              check=False, **options)
    return checked(arguments, finished.returncode, finished.stdout, finished.stderr)


def is_sanitized():
    """Whether the executable has its own idea of the address space, which a limit would break."""
    return b"__asan_init" in Path(tool()).read_bytes()


def is_emulated():
    """Whether the tool is for another processor, so that a script starts it."""
    return Path(tool()).read_bytes().startswith(b"#!")


def unprivileged(directory):
    """The prefix that runs the tool as a user who may not do everything, with the directory, as it is now, handed
    over to that user. Empty where this is such a user already; where there is no other, the test is skipped."""
    if os.geteuid() != 0:
        return ()
    nobody = 65534
    counting = (f"{name}={value}" for name, value in counting_from_start().items())
    prefix = ("env", *counting, "setpriv", f"--reuid={nobody}", f"--regid={nobody}", "--clear-groups")
    tried = shutil.which("setpriv") and subprocess.run(
        [*prefix, tool(), "unknown"], stdin=subprocess.DEVNULL, capture_output=True, check=False).returncode == 1
    if not tried:
        raise unittest.SkipTest("nothing is forbidden to this user, and no other may run the tool")
    for folder, folders, files in os.walk(directory):
        for name in (".", *folders, *files):
            os.lchown(os.path.join(folder, name), nobody, nobody)
    return prefix


def has_gnu_parallel():
    """Whether GNU parallel is installed, and not another program of that name."""
    if not shutil.which("parallel"):
        return False
    finished = subprocess.run(["parallel", "--version"], stdin=subprocess.DEVNULL, stdout=subprocess.PIPE,
                              stderr=subprocess.DEVNULL, check=False)
    return finished.stdout.startswith(b"GNU parallel")


# Feeds. Nothing is inserted between the parts, so that every character of a feed is the test's own.

NAMESPACES = ('xmlns:dc="http://purl.org/dc/elements/1.1/" '
              'xmlns:orvane="https://orvane.example/ns/podcast-1.0" '
              'xmlns:qel="https://qel.example/ns/1.0"')


def rss_text(*parts):
    """The text of an RSS document whose channel holds the parts."""
    return f'<rss version="2.0" {NAMESPACES}><channel>{"".join(parts)}</channel></rss>'


def rss(*parts):
    """The bytes of an RSS document in UTF-8 whose channel holds the parts."""
    return f'<?xml version="1.0" encoding="UTF-8"?>\n{rss_text(*parts)}\n'.encode()


def item(*parts):
    return f'<item>{"".join(parts)}</item>'


def element(name, text="", **attributes):
    """One element with escaped text and attributes, for values that are not written out by hand."""
    written = "".join(f" {key}={quoteattr(value)}" for key, value in attributes.items())
    return f"<{name}{written}>{escape(text)}</{name}>"


def without_publication_date(feed):
    """A feed's bytes without the channel's moment of generation, which differs from run to run."""
    return re.sub(rb"<pubDate>[^<]*</pubDate>", b"", feed, count=1)


def tags(parent):
    """The names of an element's children, with the prefixes that the tool declares."""
    prefixes = {DC: "dc:", ORVANE: "orvane:", QEL_NAMESPACE: "qel:"}
    names = []
    for child in parent:
        namespace, brace, local = child.tag.rpartition("}")
        names.append(prefixes.get(namespace + brace, namespace + brace) + local)
    return names


class ToolTestCase(unittest.TestCase):
    """A test with a directory of its own, in which the tool runs and which is removed afterwards."""

    maxDiff = None

    def setUp(self):
        self.directory = Path(tempfile.mkdtemp(prefix="qel-e2e-")).resolve()
        self.addCleanup(shutil.rmtree, self.directory, ignore_errors=True)

    # Input

    def path(self, name):
        return self.directory / name

    def write(self, name, content):
        """Writes a file of the test's directory and returns its path."""
        path = self.path(name)
        path.write_bytes(content if isinstance(content, bytes) else content.encode())
        return path

    def reference(self, dictionary=None, name="reference.plist", fmt=plistlib.FMT_XML):
        """Writes a reference file and returns its path."""
        return self.write(name, plistlib.dumps(dictionary or {}, fmt=fmt))

    def feed(self, content, name="feed.xml"):
        """Writes a feed and returns its file: URL."""
        return self.write(name, content).as_uri()

    def server(self):
        """A feed server that runs until the test ends."""
        server = FeedServer()
        self.addCleanup(server.stop)
        return server

    # Running

    def run_tool(self, *arguments, **options):
        options.setdefault("cwd", self.directory)
        return run(*arguments, **options)

    def parsefeed(self, source, **options):
        """The reference dictionary that parsefeed writes on standard output for the source."""
        result = self.run_tool("parsefeed", source, **options)
        self.assertSucceeds(result)
        return plistlib.loads(result.stdout)

    def createfeed(self, source, **options):
        """The root element of the feed that createfeed writes on standard output for the source."""
        result = self.run_tool("createfeed", source, **options)
        self.assertSucceeds(result)
        return ElementTree.fromstring(result.stdout)

    def channel_of(self, dictionary, **options):
        """The channel element that createfeed makes of a reference dictionary."""
        source = self.reference(dictionary, fmt=plistlib.FMT_BINARY)
        channel = self.createfeed(source, **options).find("channel")
        self.assertIsNotNone(channel)
        return channel

    def item_of(self, episode, **options):
        """The item element that createfeed makes of an episode dictionary."""
        items = self.channel_of({"Episodes": [episode]}, **options).findall("item")
        self.assertEqual(len(items), 1)
        return items[0]

    def podcast_of(self, *parts, **options):
        """The reference dictionary that parsefeed makes of a feed whose channel holds the parts."""
        return self.parsefeed(self.feed(rss(*parts)), **options)

    def episode_of(self, *parts, **options):
        """The episode dictionary that parsefeed makes of a feed's item that holds the parts."""
        episodes = self.podcast_of(item(*parts), **options)["Episodes"]
        self.assertEqual(len(episodes), 1)
        return episodes[0]

    # Judging

    def assertSucceeds(self, result, stdout=None):
        self.assertEqual((result.status, result.stderr), (0, b""))
        if stdout is not None:
            self.assertEqual(result.stdout, stdout)

    def assertFails(self, result, message, stdout=b""):
        """Exit status 1, exactly the message on standard error and exactly stdout on standard output."""
        expected = message if isinstance(message, bytes) else message.encode()
        self.assertEqual(result, Result(1, stdout, expected))

    def assertInvalidSource(self, source, **options):
        """The source begins like a URL and is none."""
        self.assertFails(self.run_tool("parsefeed", source, **options), f'"{source}" is not a valid podcast source.\n')

    def assertNoSource(self, source, **options):
        """The source names neither a reference file nor a bundle."""
        self.assertFails(self.run_tool("parsefeed", source, **options),
                         f'Could not initialize podcast source with string "{source}".\n')

    def assertLoadFails(self, result, pattern=r".+", stdout=b""):
        """A failed load whose description, one that is not the tool's own, matches the whole pattern."""
        self.assertEqual((result.status, result.stdout), (1, stdout))
        message = result.stderr.decode()
        self.assertRegex(message, rf"\A(?s:Could not load source: {pattern})\Z")
        self.assertNotIn("\n", message)
