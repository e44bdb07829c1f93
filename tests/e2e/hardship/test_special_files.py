"""Whatever stands where a file or a directory is expected: read, written or refused at once, as these tables say.

Only regular files are ever read; nothing is waited for but the reader of a FIFO that is the output. The tool runs
as a user to whom something can be forbidden, with little memory, and has to come to its end.
"""

import os
import plistlib
import shutil
import signal
import socket
import subprocess
import tempfile
import time
import unittest

from bundle_support import BundleTestCase, contents, digests
from support import LOADING, checked, environment, is_sanitized, rss, soaking, start, tool, unprivileged, \
    without_publication_date

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


# What is read: the kind, and the cause for a feed (None: it is read). Where no cause is told, there is the message or
# the warning of its place.

NOT_REGULAR = "Not a regular file"
INPUTS = (
    ("a file", regular, None),
    ("a link to a file", link_to_file, None),
    ("a file that may only be read", read_only, None),
    ("a directory", directory, "Is a directory"),
    ("a FIFO without writer", fifo, NOT_REGULAR),
    ("a socket", unix_socket, NOT_REGULAR),
    ("/dev/zero", link("/dev/zero"), NOT_REGULAR),
    ("/dev/full", link("/dev/full"), NOT_REGULAR),
    ("/dev/null", link("/dev/null"), NOT_REGULAR),
    ("/dev/tty", link("/dev/tty"), NOT_REGULAR),
    ("/dev/stdin", link("/dev/stdin"), NOT_REGULAR),
    ("nothing", nothing, "No such file or directory"),
    ("a dangling link", link("nowhere"), "No such file or directory"),
    ("a loop of links", loop, "Too many levels of symbolic links"),
    ("a file that may not be read", unreadable, "Permission denied"),
    ("a file in a directory that may not be entered", unreachable, "Permission denied"),
    ("a path through a file", below_a_file, "Not a directory"),
)


class InputTest(SpecialFileTestCase):
    def assertRead(self, result):
        self.assertSucceeds(result)
        self.assertEqual(plistlib.loads(result.stdout)["PodcastName"], "Night Walks")

    def test_as_a_feed(self):
        for name, kind, cause in INPUTS:
            with self.subTest(name):
                path = self.make(kind, "feed.xml", rss("<title>Night Walks</title>"))
                result = self.run_tool("parsefeed", path.as_uri())
                if cause is None:
                    self.assertRead(result)
                else:
                    self.assertFails(result, f"Could not load source: {cause}")

    def assertSource(self, source, cause):
        result = self.run_tool("parsefeed", source)
        if cause is None:
            self.assertRead(result)
        else:
            self.assertFails(result, f'Could not initialize podcast source with string "{source}".\n')

    def test_as_a_reference_file(self):
        for name, kind, cause in INPUTS:
            with self.subTest(name):
                self.assertSource(self.make(kind, "show.plist", plistlib.dumps(PODCAST)), cause)

    def test_as_the_reference_file_of_a_bundle(self):
        for name, kind, cause in INPUTS:
            with self.subTest(name):
                path = self.make(kind, "Info.plist", plistlib.dumps(PODCAST))
                self.path("link.podcast").unlink(missing_ok=True)
                self.path("link.podcast").symlink_to(path.parent)
                self.assertSource("link.podcast", cause)

    def test_as_a_bundle(self):
        for name, kind, _ in INPUTS:
            with self.subTest(name):
                self.assertSource(self.make(kind, "show.podcast", b""), "no bundle")

    def test_as_media(self):
        for name, kind, cause in INPUTS:
            with self.subTest(name):
                path = self.make(kind, "a.mp3", MEDIA)
                for location in (str(path), path.as_uri()):
                    shutil.rmtree(self.bundle, ignore_errors=True)
                    result = self.create_episodes({"EpisodeName": "One", "EpisodeReference": location})
                    self.assertWarns(result, *(() if cause is None else ('Could not save or download episode "One"',)))
                    self.assertEqual(self.files(), {"a.mp3": MEDIA} if cause is None else {})

    def test_as_posters(self):
        media = self.media("one.mp3", MEDIA)
        for name, kind, cause in INPUTS:
            with self.subTest(name):
                path = self.make(kind, "a.jpg", MEDIA)
                for location, place in ((str(path), "local"), (path.as_uri(), "remote")):
                    shutil.rmtree(self.bundle, ignore_errors=True)
                    result = self.create({"PodcastName": "Show", "PodcastPosterReference": location,
                                          "PodcastPosterReferenceType": place, "Episodes": [
                        {"EpisodeName": "One", "EpisodeReference": media, "EpisodePosterReference": location}]})
                    self.assertWarns(result, *(() if cause is None else (
                        'Could not save or download poster image for podcast "Show"',
                        'Could not save or download poster image for episode "One"')))
                    posters = {"Posters/Podcast.jpg": MEDIA, "Posters/one.jpg": MEDIA} if cause is None else {}
                    self.assertEqual(self.files(), {"one.mp3": MEDIA, **posters})

    def test_as_standard_input(self):
        """Standard input is read whatever it is, to its end, to an error or until the memory runs out."""
        whole = plistlib.dumps(PODCAST)
        reader, writer = socket.socketpair()
        writer.sendall(whole)
        writer.close()
        file = tempfile.TemporaryFile()
        file.write(whole)
        file.seek(0)
        unusable, exhausting = '"(null)" is not a valid podcast source.\n', "Out of memory.\n"
        inputs = [("a file", file.fileno(), None),
                  ("a socket", reader.fileno(), None),
                  ("a directory", os.open(self.directory, os.O_RDONLY), unusable),
                  ("/dev/null", os.open("/dev/null", os.O_RDONLY), unusable),
                  ("a file that may only be written", os.open(self.path("out"), os.O_WRONLY | os.O_CREAT), unusable)]
        if is_sanitized():
            print("without /dev/zero and /dev/full: sanitizers end a process whose memory runs out")
        else:
            inputs += [("/dev/zero", os.open("/dev/zero", os.O_RDONLY), exhausting),
                       ("/dev/full", os.open("/dev/full", os.O_RDONLY), exhausting)]
        limit = "unlimited" if is_sanitized() else MEMORY >> 10
        prefix = unprivileged(self.directory)
        for name, descriptor, failure in inputs:
            with self.subTest(name):
                finished = subprocess.run(
                    ["/bin/sh", "-c", f'ulimit -v {limit} && exec "$0" "$@"', *prefix, tool(), "parsefeed", "-i"],
                    stdin=descriptor, env=environment(), capture_output=True, timeout=60, check=False)
                result = checked((name,), finished.returncode, finished.stdout, finished.stderr)
                if failure is None:
                    self.assertRead(result)
                else:
                    self.assertFails(result, failure)
            self.rows += 1
        for _, descriptor, _ in inputs[2:]:
            os.close(descriptor)
        file.close()
        reader.close()

    @unittest.skipUnless(soaking(), "reads 2 GiB; QEL_SOAK=1 has time for it")
    def test_an_endless_standard_input_ends_at_the_limit(self):
        with open("/dev/zero", "rb") as zeros:
            finished = subprocess.run([tool(), "parsefeed", "-i"], stdin=zeros, env=environment(), capture_output=True,
                                      timeout=300, check=False)
        self.assertFails(checked((), finished.returncode, finished.stdout, finished.stderr),
                         '"(null)" is not a valid podcast source.\n')


# What is written by parsefeed and createfeed: the kind, and whether the result is there afterwards (behind a link
# where it is one). The tool does not notice, by its rules, when it is not; but it never harms anything else.

OUTPUTS = (
    ("nothing", nothing, True),
    ("a file", regular, True),
    ("a link to a file", link_to_file, True),
    ("a dangling link", link("target"), True),
    ("a directory", directory, False),
    ("a socket", unix_socket, False),
    ("/dev/full", link("/dev/full"), False),
    ("/dev/null", link("/dev/null"), False),
    ("a loop of links", loop, False),
    ("a file that may only be read", read_only, False),
    ("a file in a directory that may not be entered", unreachable, False),
    ("a path through a file", below_a_file, False),
    ("a path through a directory that is not there", lambda path, content: path.parent.rmdir(), False),
)


class OutputTest(SpecialFileTestCase):
    def setUp(self):
        super().setUp()
        self.source = self.reference(PODCAST)

    def snapshot(self):
        """What is at the place, with the rights that it takes to look."""
        if not self.place.is_dir():
            return self.place.exists()
        mode = self.place.stat().st_mode
        self.place.chmod(0o755)
        found = contents(self.place)
        self.place.chmod(mode & 0o777)
        return found

    def assertOutputs(self, command, expected, comparable=lambda content: content):
        for name, kind, is_written in OUTPUTS:
            with self.subTest(name):
                path = self.make(kind, "out", b"x" * 100_000)
                before = self.snapshot()
                self.assertSucceeds(self.run_tool(command, self.source, "-d", path), LOADING)
                if is_written:
                    self.assertEqual(comparable(path.read_bytes()), comparable(expected))
                else:
                    self.assertEqual(self.snapshot(), before)

    def test_of_parsefeed(self):
        self.assertOutputs("parsefeed", self.run_tool("parsefeed", self.source).stdout)

    def test_of_createfeed(self):
        self.assertOutputs("createfeed", self.run_tool("createfeed", self.source).stdout, without_publication_date)

    def waiting(self):
        """A run whose output is a FIFO that nobody reads yet."""
        os.mkfifo(self.path("fifo"))
        process = start("parsefeed", self.source, "-d", self.path("fifo"), stdout=subprocess.DEVNULL,
                        preexec_fn=lambda: signal.signal(signal.SIGINT, signal.SIG_DFL))
        self.addCleanup(lambda: (process.kill(), process.wait()))
        time.sleep(0.3)
        self.assertIsNone(process.poll())
        return process

    def test_a_fifo_is_written_once_its_reader_comes(self):
        process = self.waiting()
        self.assertEqual(plistlib.loads(self.path("fifo").read_bytes()), PODCAST)
        self.assertEqual(process.wait(timeout=30), 0)

    def test_a_fifo_without_reader_is_waited_for_until_a_signal(self):
        process = self.waiting()
        process.send_signal(signal.SIGINT)
        self.assertEqual(process.wait(timeout=30), -signal.SIGINT)

    def test_the_source_itself(self):
        """Each source, and what a second run of the command reads there afterwards."""
        feed = rss("<title>Night Walks</title>")
        bundle = self.path("own.podcast")
        bundle.mkdir()
        for command, source, output, content in (
                ("parsefeed", "own.plist", "own.plist", plistlib.dumps(PODCAST)),
                ("parsefeed", self.path("feed.xml").as_uri(), "feed.xml", feed),
                ("parsefeed", "own.podcast", "own.podcast/Info.plist", plistlib.dumps(PODCAST)),
                ("createfeed", "own.plist", "own.plist", plistlib.dumps(PODCAST)),
                ("createfeed", self.path("feed.xml").as_uri(), "feed.xml", feed),
                ("createfeed", "own.podcast", "own.podcast/Info.plist", plistlib.dumps(PODCAST))):
            with self.subTest(command, source=source):
                self.write(output, content)
                expected = self.run_tool(command, source)
                self.assertSucceeds(expected)
                self.assertSucceeds(self.run_tool(command, source, "-d", output), LOADING)
                self.assertEqual(without_publication_date(self.path(output).read_bytes()),
                                 without_publication_date(expected.stdout))
                self.rows += 1


# The directory of a bundle: the kind, and the message (None: the bundle is there).

UNWRITTEN = "Could not generate bundle: Could not write Info.plist file\n"


def not_created(cause):
    return f"Could not generate bundle: Could not create bundle: {cause}\n"


def link_to_directory(path, content):
    path.with_name("target").mkdir()
    path.symlink_to("target")


def locked(path, content):
    path.mkdir()
    path.chmod(0o555)


def without_entry(path, content):
    path.parent.chmod(0)


def below_a_locked_directory(path, content):
    path.parent.chmod(0o555)


DIRECTORIES = (
    ("nothing", nothing, None),
    ("a directory", directory, None),
    ("a link to a directory", link_to_directory, None),
    ("a file", regular, not_created("File exists")),
    ("a FIFO", fifo, not_created("File exists")),
    ("a socket", unix_socket, not_created("File exists")),
    ("/dev/zero", link("/dev/zero"), not_created("File exists")),
    ("/dev/full", link("/dev/full"), not_created("File exists")),
    ("a dangling link", link("nowhere"), not_created("File exists")),
    ("a loop of links", loop, not_created("File exists")),
    ("a path through a file", below_a_file, not_created("Not a directory")),
    ("a directory that may not be written", locked, UNWRITTEN),
    ("a path through a directory that may not be written", below_a_locked_directory, not_created("Permission denied")),
    ("a path through a directory that may not be entered", without_entry, not_created("Permission denied")),
)

# What stands in a bundle under the name of a file to come: whether a download takes its place, or Info.plist. A copy
# never does.
TAKEN = (
    ("a file", regular, True),
    ("a file that may only be read", read_only, True),
    ("a link to a file", link_to_file, True),
    ("a dangling link", link("nowhere"), True),
    ("a loop of links", loop, True),
    ("/dev/full", link("/dev/full"), True),
    ("a FIFO", fifo, True),
    ("a socket", unix_socket, True),
    ("a link to a directory", link_to_directory, True),
    ("a directory", directory, False),
)


class BundleDirectoryTest(SpecialFileTestCase):
    def setUp(self):
        super().setUp()
        web = self.server()
        self.copied = {"PodcastName": "Show", "Episodes": [
            {"EpisodeName": "One", "EpisodeReference": self.media("a.mp3", MEDIA),
             "EpisodePosterReference": self.media("a.jpg", MEDIA)}]}
        self.downloaded = {"PodcastName": "Show", "Episodes": [
            {"EpisodeName": "One", "EpisodeReference": web.serve("/a.mp3", MEDIA),
             "EpisodePosterReference": web.serve("/a.jpg", MEDIA)}]}
        self.complete = {"a.mp3": MEDIA, "Posters/a.jpg": MEDIA}

    def test_the_directory(self):
        for name, kind, message in DIRECTORIES:
            with self.subTest(name):
                path = self.make(kind, "show.podcast", MINE)
                result = self.run_tool("createbundle", self.reference(self.downloaded), "-d", path)
                if message is None:
                    self.assertWarns(result)
                    self.assertEqual(self.files(path.resolve()), self.complete)
                else:
                    self.assertEqual((result.status, result.stderr.decode()), (1, message))
                    self.place.chmod(0o755)
                    if self.place.is_dir():
                        self.assertLessEqual(set(contents(self.place)), {"show.podcast", "loop"})

    def outside(self):
        """What is in the place beside the bundle's own files."""
        return {path: content for path, content in contents(self.place).items()
                if path in ("loop", "nowhere") or path.startswith("target")}

    def test_under_the_name_of_a_download(self):
        for name, kind, is_replaced in TAKEN:
            with self.subTest(name):
                path = self.make(kind, "a.mp3", MINE)
                before = self.outside()
                result = self.run_tool("createbundle", self.reference(self.downloaded), "-d", self.place)
                self.assertWarns(result, *(() if is_replaced else ('Could not save or download episode "One"',)))
                self.assertEqual(path.is_dir(), not is_replaced)
                if is_replaced:
                    self.assertFalse(path.is_symlink())
                    self.assertEqual(path.read_bytes(), MEDIA)
                self.assertEqual(self.outside(), before)

    def test_under_the_name_of_a_copy(self):
        for name, kind, _ in TAKEN:
            with self.subTest(name):
                path = self.make(kind, "a.mp3", MINE)
                before, status = self.outside(), path.lstat()
                result = self.run_tool("createbundle", self.reference(self.copied), "-d", self.place)
                self.assertWarns(result, 'Could not save or download episode "One"')
                self.assertEqual((path.lstat().st_ino, path.lstat().st_size), (status.st_ino, status.st_size))
                self.assertEqual(self.outside(), before)

    def test_under_the_name_of_the_reference_file(self):
        for name, kind, is_replaced in TAKEN:
            with self.subTest(name):
                path = self.make(kind, "Info.plist", MINE)
                before = self.outside()
                result = self.run_tool("createbundle", self.reference(self.downloaded), "-d", self.place)
                if is_replaced:
                    self.assertWarns(result)
                    self.assertFalse(path.is_symlink())
                    self.assertEqual(plistlib.loads(path.read_bytes())["PodcastName"], "Show")
                else:
                    self.assertEqual((result.status, result.stderr.decode()), (1, UNWRITTEN))
                self.assertEqual(self.outside(), before)

    def test_under_the_name_of_the_posters(self):
        for name, kind, warning in (
                ("a file", regular, "save or download"), ("a FIFO", fifo, "save or download"),
                ("a socket", unix_socket, "save or download"),
                ("a directory that may not be written", locked, "save or download"),
                ("a link to a directory", link_to_directory, "generate sane path for"),
                ("a dangling link", link("nowhere"), "generate sane path for"),
                ("a loop of links", loop, "generate sane path for"),
                ("/dev/zero", link("/dev/zero"), "generate sane path for")):
            for show in (self.copied, self.downloaded):
                with self.subTest(name, show=show):
                    self.make(kind, "Posters", MINE)
                    before = self.outside()
                    result = self.run_tool("createbundle", self.reference(show), "-d", self.place)
                    self.assertWarns(result, f'Could not {warning} poster image for episode "One"')
                    self.assertEqual((self.place / "a.mp3").read_bytes(), MEDIA)
                    self.assertEqual(self.outside(), before)

    def test_a_bundle_made_into_its_own_source(self):
        """No file in it is lost, by whatever name it is called; but its media cannot be copied onto themselves."""
        for source, output in (("show.podcast", "show.podcast"), ("show.podcast", "./x/../show.podcast/"),
                               ("show.podcast", "link"), ("link.podcast", "show.podcast"),
                               ("show.podcast/Info.plist", "show.podcast")):
            with self.subTest(source, output=output):
                for path in ("show.podcast", "x"):
                    shutil.rmtree(self.path(path), ignore_errors=True)
                for name in ("link", "link.podcast"):
                    self.path(name).unlink(missing_ok=True)
                    self.path(name).symlink_to("show.podcast")
                self.path("x").mkdir()
                self.assertWarns(self.create(self.copied))
                before = self.files()
                result = self.run_tool("createbundle", source, "-d", output)
                self.assertWarns(result, 'Could not save or download episode "One"')
                self.assertEqual(self.files(), before)
                self.assertEqual(self.info(), {"PodcastName": "Show"})
                self.rows += 1

    def test_a_bundle_made_inside_of_its_own_source(self):
        self.assertWarns(self.create(self.copied))
        inner = self.bundle / "inner.podcast"
        self.assertWarns(self.run_tool("createbundle", "show.podcast", "-d", inner),
                         'Could not save or download poster image for episode "One"')
        self.assertEqual(self.files(inner), {"a.mp3": MEDIA})
        self.assertEqual({path: content for path, content in self.files().items() if "inner" not in path},
                         self.complete)


class RunsAtOnceTest(BundleTestCase):
    """Runs into one directory at once: no file is a mixture, and what is left is complete."""

    ROUNDS = 40 if soaking() else 5
    RUNS = 3
    EPISODES = 12

    def show(self, name, serve):
        """A show whose files have the names of every other show's, and contents of their own."""
        files = {f"{number}.mp3": f"{name} {number} ".encode() * 5000 for number in range(self.EPISODES)}
        return files, {"PodcastName": name, "Episodes": [
            {"EpisodeName": str(number), "EpisodeReference": serve(f"{name}/{number}.mp3", content)}
            for number, content in enumerate(files.values())]}

    def run_at_once(self, shows):
        sources = [self.reference(show, name=f"{number}.plist") for number, show in enumerate(shows)]
        processes = [start("createbundle", source, "-d", self.bundle, stdout=subprocess.DEVNULL, stderr=subprocess.PIPE)
                     for source in sources]
        for process in processes:
            _, stderr = process.communicate(timeout=120)
            self.assertEqual((process.returncode, stderr), (0, b""))

    def assertOneOfEach(self, shows):
        """Each file is that of one of the shows."""
        found = self.files()
        self.assertEqual(found.keys(), shows[0][0].keys())
        for path, content in found.items():
            self.assertIn(content, [files[path] for files, _ in shows], path)
        self.assertIn(self.info()["PodcastName"], [show["PodcastName"] for _, show in shows])

    def test_downloads(self):
        web = self.server()
        shows = [self.show(f"show{number}", lambda path, content: web.serve(f"/{path}", content))
                 for number in range(self.RUNS)]
        for _ in range(self.ROUNDS):
            shutil.rmtree(self.bundle, ignore_errors=True)
            self.run_at_once([show for _, show in shows])
            self.assertOneOfEach(shows)
            self.assertEqual(len(self.references()), self.EPISODES)
        print(f"downloads: {self.ROUNDS} times {self.RUNS} runs into one directory", flush=True)

    def local(self, path, content):
        self.path("media").joinpath(path).parent.mkdir(parents=True, exist_ok=True)
        return self.media(path, content)

    def test_copies(self):
        shows = [self.show(f"show{number}", self.local) for number in range(self.RUNS)]
        for _ in range(self.ROUNDS):
            shutil.rmtree(self.bundle, ignore_errors=True)
            self.run_at_once([show for _, show in shows])
            self.assertOneOfEach(shows)
            self.assertLessEqual(set(self.references()), set(shows[0][0]))
        print(f"copies: {self.ROUNDS} times {self.RUNS} runs into one directory", flush=True)

    def test_one_show(self):
        web = self.server()
        files, show = self.show("show", lambda path, content: web.serve(f"/{path}", content))
        for _ in range(self.ROUNDS):
            self.run_at_once([show] * self.RUNS)
            self.assertEqual(digests(self.files()), digests(files))
            self.assertEqual(self.references(), list(files))


if __name__ == "__main__":
    unittest.main()
