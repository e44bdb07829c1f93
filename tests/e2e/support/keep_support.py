"""What the tests of qel-keep share: a feed on a server, the bundle it is kept in, and runs of the program."""

import datetime
import plistlib
import subprocess
from email.utils import format_datetime
from pathlib import Path

from interruption import expect_signals
from support import Result, ToolTestCase, counting_from_start, element, environment, is_emulated, item, rss, run, tool

FIRST_DAY = datetime.datetime(2024, 1, 1, 12, tzinfo=datetime.timezone.utc)


def day(number):
    """The date of an episode, as feeds have it."""
    return format_datetime(FIRST_DAY + datetime.timedelta(days=number), usegmt=True)


def program():
    """The path of qel-keep, which is built beside the tool."""
    return str(Path(tool()).with_name("qel-keep"))


class KeepTestCase(ToolTestCase):
    def setUp(self):
        super().setUp()
        if is_emulated():
            self.skipTest("only the tool has an emulator's script")
        self.web = self.server()
        self.bundle = self.path("show.podcast")
        self.feed_url = self.web.url("/feed.xml")

    # The show

    def episode(self, number, *parts, title=None, url=None, body=None):
        """The item of an episode, whose media is served unless the URL of another is given."""
        if url is None:
            url = self.web.serve(f"/{number}.mp3", body if body is not None else f"media {number}".encode())
        return item(element("title", title or f"Episode {number}"), element("pubDate", day(number)),
                    element("enclosure", url=url, type="audio/mpeg"), *parts)

    def publish(self, *items, path="/feed.xml", channel=()):
        """Serves the feed with the items."""
        return self.web.serve(path, rss(element("title", "Show"), *channel, *items))

    # Running

    def command(self, *arguments):
        return [program(), *map(str, arguments)]

    def keep(self, *arguments, source=True, env=None, timeout=120):
        """Runs qel-keep on the bundle; `source` is the feed's URL, another source, or None for none."""
        named = [self.feed_url] if source is True else [source] if source else []
        return self.run_keep(*arguments, *named, self.bundle, env=env, timeout=timeout)

    def run_keep(self, *arguments, env=None, timeout=120, blocks=None):
        """Runs qel-keep to its end; no file that it writes may have more blocks, of 512 bytes, than told."""
        limit = () if blocks is None else ("/bin/sh", "-c", f'ulimit -f {blocks}; exec "$0" "$@"')
        counting = {} if blocks is None else counting_from_start("qel-keep")
        return run(*map(str, arguments), program="qel-keep", cwd=self.directory, prefix=limit,
                   env={**counting, **(env or {})}, timeout=timeout)

    def start_keep(self, *arguments, **options):
        options.setdefault("stdout", subprocess.PIPE)
        options.setdefault("stderr", subprocess.PIPE)
        options.setdefault("preexec_fn", expect_signals)
        return subprocess.Popen(self.command(*arguments, self.feed_url, self.bundle), stdin=subprocess.DEVNULL,
                                cwd=self.directory, env=environment(), **options)

    # Judging

    def info(self):
        return plistlib.loads((self.bundle / "Info.plist").read_bytes())

    def listed(self, key="EpisodeName"):
        """The values of a key of all listed episodes."""
        return [entry.get(key) for entry in self.info().get("Episodes", [])]

    def media(self, *numbers):
        """Checks that the episodes are listed in this order, and that each file is whole."""
        self.assertEqual(self.listed(), [f"Episode {number}" for number in numbers])
        for number, entry in zip(numbers, self.info().get("Episodes", [])):
            content = (self.bundle / entry["EpisodeReference"]).read_bytes()
            self.assertEqual(content, f"media {number}".encode())
            self.assertEqual(entry["EpisodeFileSize"], len(content))

    def assertKept(self, result, summary, status=0, errors=""):
        """The last line of standard output, the status, and all of standard error."""
        lines = result.stdout.decode().splitlines() or [""]
        self.assertEqual((lines[-1], result.stderr.decode(), result.status), (summary, errors, status))

    def assertRefused(self, result, message):
        """Nothing was done; the message is that on standard error."""
        self.assertEqual(result, Result(2, b"", f"qel-keep: {message}\n".encode()))

    def assertNothingHidden(self):
        self.assertEqual([path.name for path in self.bundle.rglob(".*")], [])
