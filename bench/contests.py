"""The contests: which programs do which work, and what each row of the table compares.

Both sides write what they make into new files on the same disk. A rival that only parses has nothing to write;
the tool then writes its result all the same, where the row does not say otherwise.
"""

import contextlib
import dataclasses
import plistlib
import shutil
from pathlib import Path
from typing import Optional

import inputs
import media_server
from measuring import Contestant, contest, run
from rivals import Peers

STYLESHEET = Path(__file__).parent / "to-reference.xsl"
MEGABYTE = 1_000_000


@dataclasses.dataclass(frozen=True)
class Sizes:
    items: int
    many_items: int
    episodes: int  # fetched over HTTP, and copied
    episode_bytes: int
    large_bytes: int  # the one large episode
    large_copies: int  # large local files
    large_copy_bytes: int


FULL = Sizes(20_000, 200_000, 1_000, 100_000, 1_000 * MEGABYTE, 20, 20 * MEGABYTE)
QUICK = Sizes(200, 2_000, 20, 50_000, 10 * MEGABYTE, 2, MEGABYTE)


@dataclasses.dataclass(frozen=True)
class Row:
    """One line of the table: a contestant's time or peak memory, over a rival's time or a number of bytes."""

    work: str
    against: str
    limit: Optional[float]  # None for a row that only shows a further rival
    ours: str
    theirs: object  # the name of a contestant, or bytes
    program: Optional[str] = None  # that the rival needs

    def figures(self, summaries):
        """The row with what was measured, as it is kept in the figures file."""
        kept = {"work": self.work, "against": self.against, "limit": self.limit}
        ours = summaries.get(self.ours)
        theirs = {"peak": self.theirs} if isinstance(self.theirs, int) else summaries.get(self.theirs)
        if ours is None or theirs is None:
            return {**kept, "missing": "nginx" if ours is None else self.program}
        if isinstance(self.theirs, int):
            return {**kept, "ours": ours, "theirs": theirs, "ratio": ours["peak"] / theirs["peak"]}
        return {**kept, "ours": ours, "theirs": theirs, "ratio": ours["median"] / theirs["median"]}


class Contests:
    """All contests, over inputs that are made when first needed and kept in `kept`; outputs go to `scratch`."""

    NAMES = ("feed", "peers", "reference", "growth", "names", "many", "large", "local", "start")

    def __init__(self, tool, peers, sizes, kept, scratch, rounds):
        self.tool, self.peer_parsers, self.sizes, self.rounds = tool, peers, sizes, rounds
        self.kept, self.scratch = kept, scratch

    def run(self, name):
        """The figures of the rows of one contest."""
        with contextlib.ExitStack() as self.until_end:
            contestants, rows, share = getattr(self, name)()
            summaries = contest(contestants, max(1, round(self.rounds * share)))
        return [{"contest": name, **row.figures(summaries)} for row in rows]

    # Inputs

    def made(self, name, make, *arguments):
        """The path of an input; a run that was cut off leaves none behind that is not whole."""
        path = self.kept / name
        if not path.exists():
            unfinished = path.with_name(f"{name}.unfinished")
            if unfinished.is_dir():
                shutil.rmtree(unfinished)
            make(unfinished, *arguments)
            unfinished.rename(path)
        return path

    def feed_of(self, items):
        return self.made(f"feed-{items}.xml", inputs.write_feed, items)

    def reference_of(self, items):
        """The reference file of a feed. The tool makes it, so it is made anew each time."""
        path = self.scratch / f"reference-{items}.plist"
        run(self.qel("parsefeed", "parsefeed", self.feed_of(items).as_uri(), path))
        return path

    def media_of(self, count, size):
        """A directory of media, and their names."""
        directory = self.made(f"media-{count}-{size}", inputs.write_media, count, size)
        return directory, [path.name for path in sorted(directory.iterdir())]

    # Programs

    def qel(self, name, command, source, output=None, **options):
        arguments = [self.tool, command, source] + (["-d", output] if output else [])
        return Contestant(name, arguments, output, **options)

    @staticmethod
    def rival(name, arguments, output=None, **options):
        """A contestant called after its program, and after what is said behind a comma."""
        path = shutil.which(name.partition(",")[0])
        return Contestant(name, [path, *arguments] if path else None, output, **options)

    def synced(self, contestant):
        """The same followed by `sync`, which has all that was written be on the disk, as a bundle is in the end."""
        command = contestant.command and ["/bin/sh", "-c", '"$@" && sync', "sh", *contestant.command]
        return dataclasses.replace(contestant, name=f"{contestant.name}, sync", command=command)

    # Contests: the programs, the rows, and how much of the rounds they get

    def feed(self):
        items = self.sizes.items
        feed = self.feed_of(items)
        size = feed.stat().st_size
        work = f"{items:,} items ({size / MEGABYTE:.0f} MB)"
        parser = "`xmllint --noout --sax`, which only parses"

        def holds_all(tag):
            return lambda output: output.read_bytes().count(tag) == items

        reference, document, other = (self.scratch / name for name in ("a.plist", "a.xml", "b.plist"))
        return (
            [
                self.qel("parsefeed", "parsefeed", feed.as_uri(), reference, check=holds_all(b"<key>EpisodeName<")),
                self.rival("xmllint", ["--noout", "--sax", feed]),
                self.qel("parsefeed, unwritten", "parsefeed", feed.as_uri()),
                self.qel("createfeed", "createfeed", feed.as_uri(), document, check=holds_all(b"<item>")),
                self.rival("xsltproc", ["--output", other, STYLESHEET, feed], other,
                             check=holds_all(b"<key>EpisodeName<")),
            ],
            [
                Row(f"parsefeed, {work}", parser, 1.4, "parsefeed", "xmllint", "xmllint"),
                Row(f"createfeed, {work}", parser, 2.0, "createfeed", "xmllint", "xmllint"),
                Row(f"parsefeed, {work}, to /dev/null", parser, None, "parsefeed, unwritten", "xmllint", "xmllint"),
                Row(f"parsefeed, {work}", "`xsltproc`, a stylesheet to the same file", None, "parsefeed", "xsltproc",
                    "xsltproc"),
                Row("peak memory, parsefeed", "the feed's size", 2.1, "parsefeed", size),
                Row("peak memory, createfeed", "the feed's size", 2.8, "createfeed", size),
            ],
            1.0,
        )

    def peers(self):
        items = self.sizes.items
        feed = self.feed_of(items)
        contestants, rows = [self.qel("parsefeed", "parsefeed", feed.as_uri(), self.scratch / "a.plist")], []
        for name in Peers.NAMES:
            output = self.scratch / f"{name}.count"
            command = self.peer_parsers.command(name)
            contestants.append(Contestant(name, [*command, feed, output] if command else None, output,
                                          check=lambda output: int(output.read_text()) == items))
            rows.append(Row(f"parsefeed, {items:,} items", f"{name}, a feed parser in {Peers.LANGUAGES[name]}",
                            0.02 if name == "feedparser" else None, "parsefeed", name, Peers.PACKAGES[name]))
        return contestants, rows, 0.3

    def reference(self):
        items = self.sizes.items
        reference = self.reference_of(items)
        binary = self.scratch / "binary.plist"
        binary.write_bytes(plistlib.dumps(plistlib.loads(reference.read_bytes()), fmt=plistlib.FMT_BINARY))
        outputs = [self.scratch / name for name in ("a.plist", "b.plist", "c.plist", "d.plist")]

        def same(output):
            return output.read_bytes() == reference.read_bytes()

        return (
            [
                self.qel("qel", "parsefeed", reference, outputs[0], check=same),
                self.rival("plistutil", ["-i", reference, "-o", outputs[1]], outputs[1]),
                self.qel("qel, binary", "parsefeed", binary, outputs[2], check=same),
                self.rival("plistutil, binary", ["-i", binary, "-o", outputs[3]], outputs[3]),
            ],
            [
                Row("parsefeed of its reference file (read and written)", "`plistutil`, from XML to binary", 0.8,
                    "qel", "plistutil", "plistutil"),
                Row("parsefeed of the same in binary form", "`plistutil`, from binary to XML", None, "qel, binary",
                    "plistutil, binary", "plistutil"),
            ],
            1.0,
        )

    def growth(self):
        few, many = self.sizes.items, self.sizes.many_items
        contestants = []
        for command in ("parsefeed", "createfeed"):
            for items in (few, many):
                contestants.append(self.qel(f"{command} {items}", command, self.feed_of(items).as_uri(),
                                            self.scratch / f"{command}-{items}"))
        rows = [Row(f"{command}, {many:,} items", f"{few:,} items", 11.0, f"{command} {many}", f"{command} {few}")
                for command in ("parsefeed", "createfeed")]
        return contestants, rows, 0.5

    def names(self):
        few, many = self.sizes.items, self.sizes.many_items
        contestants = [
            self.qel(str(count), "createbundle", self.made(f"one-name-{count}.plist", inputs.write_one_name, count),
                     self.scratch / f"names-{count}.podcast", check=lambda output: (output / "Info.plist").exists())
            for count in (few, many)
        ]
        return (contestants,
                [Row(f"{many:,} episodes of one name, createbundle, media missing", f"{few:,} of them", 12.0,
                     str(many), str(few))],
                0.5)

    def many(self):
        count, size = self.sizes.episodes, self.sizes.episode_bytes
        work = f"createbundle, {count:,} episodes of {size // 1000} KB over HTTP"
        return (
            self.fetching(count, size),
            [
                Row(work, "one `curl` process fetching the same list, then `sync`", 1.25, "createbundle", "curl, sync",
                    "curl"),
                Row(work, "the `curl` process alone", None, "createbundle", "curl", "curl"),
                Row(work, "one `wget` process fetching it", None, "createbundle", "wget", "wget"),
            ],
            1.0,
        )

    def large(self):
        size = self.sizes.large_bytes
        work = f"createbundle, one episode of {size // MEGABYTE:,} MB over HTTP"
        return (
            self.fetching(1, size),
            [
                Row(work, "`curl -o`, then `sync`", 1.25, "createbundle", "curl, sync", "curl"),
                Row(work, "`curl -o` alone", None, "createbundle", "curl", "curl"),
                Row(work, "`wget`", None, "createbundle", "wget", "wget"),
                Row("peak memory of that createbundle", "32 MB, whatever the size", 1.0, "createbundle", 32 << 20),
            ],
            0.5,
        )

    def fetching(self, count, size):
        """createbundle, curl and wget fetching the same media from nginx; none where that is missing."""
        if not media_server.program():
            return []
        media, names = self.media_of(count, size)
        url = self.until_end.enter_context(media_server.serving(media))
        reference, bundle = self.scratch / "remote.plist", self.scratch / "remote.podcast"
        inputs.write_reference(reference, [f"{url}/{name}" for name in names], "remote")
        by_curl, by_wget = self.scratch / "curl", self.scratch / "wget"
        curl_list, wget_list = self.scratch / "curl.list", self.scratch / "wget.list"
        curl_list.write_text("".join(f'url = "{url}/{name}"\noutput = "{by_curl / name}"\n' for name in names))
        wget_list.write_text("".join(f"{url}/{name}\n" for name in names))
        whole = self.holding(names, size)
        curl = self.rival("curl", ["--silent", "--show-error", "--fail", "--config", curl_list], by_curl,
                          needs_directory=True, check=whole)
        return [
            self.qel("createbundle", "createbundle", reference, bundle, check=whole),
            curl,
            self.synced(curl),
            self.rival("wget", ["--quiet", "--input-file", wget_list, "--directory-prefix", by_wget], by_wget,
                       needs_directory=True, check=whole),
        ]

    @staticmethod
    def holding(names, size):
        """A check for a directory that it has all of these files, whole."""
        return lambda output: all((output / name).stat().st_size == size for name in names)

    def local(self):
        sizes = self.sizes
        kinds = {"": (sizes.episodes, sizes.episode_bytes), ", large": (sizes.large_copies, sizes.large_copy_bytes)}
        contestants, rows = [], []
        for kind, (count, size) in kinds.items():
            media, names = self.media_of(count, size)
            reference, copies = self.scratch / f"local-{size}.plist", self.scratch / f"copies-{size}"
            inputs.write_reference(reference, [str(media / name) for name in names])
            whole = self.holding(names, size)
            copying = self.rival(f"cp{kind}", [*(media / name for name in names), copies], copies, needs_directory=True,
                                 check=whole)
            contestants += [
                self.qel(f"createbundle{kind}", "createbundle", reference, self.scratch / f"local-{size}.podcast",
                         check=whole),
                copying,
                self.synced(copying),
            ]
            shown = f"{size // MEGABYTE} MB" if size >= MEGABYTE else f"{size // 1000} KB"
            work = f"createbundle of local media, {count:,} of {shown}"
            rows += [Row(work, "`cp` of the same files, then `sync`", None, f"createbundle{kind}", f"cp{kind}, sync", "cp"),
                     Row(work, "`cp` alone", None, f"createbundle{kind}", f"cp{kind}", "cp")]
        return contestants, rows, 1.0

    def start(self):
        reference = self.made("one-episode.plist", inputs.write_episodes, 1)
        return (
            [
                self.qel("parsefeed", "parsefeed", reference),
                self.rival("xmllint", ["--noout", reference]),
                self.qel("createfeed", "createfeed", reference),
                self.rival("true", []),
            ],
            [
                Row("start: parsefeed of a one-episode reference file", "`xmllint --noout` on it", 2.0, "parsefeed",
                    "xmllint", "xmllint"),
                Row("start: createfeed of a one-episode reference file", "`xmllint --noout` on it", 3.0, "createfeed",
                    "xmllint", "xmllint"),
                Row("start: parsefeed of a one-episode reference file", "`true`, which does nothing", None,
                    "parsefeed", "true", "true"),
            ],
            20.0,
        )
