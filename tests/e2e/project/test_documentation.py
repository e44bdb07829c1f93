"""What the manual shows is true: commands work as typed, outputs, names and messages are the tool's.

A manual that is wrong is worse than none, and nobody notices when it becomes so. CONTRIBUTING.md says how
a document marks what is run.
"""

import os
import plistlib
import re
import shutil
import subprocess
import unittest
from pathlib import Path
from typing import NamedTuple
from urllib.parse import quote

from support import ToolTestCase, environment, has_gnu_parallel, tool

ROOT = Path(__file__).resolve().parents[3]
MANUAL_PAGE = ROOT / "docs" / "qel.1"
INSTALLED_README = ROOT / "packaging" / "installed-readme.md"
PAGES = [ROOT / "README.md", INSTALLED_README, *sorted((ROOT / "docs").glob("*.md"))]
MANUAL_PAGES = sorted((ROOT / "docs").glob("*.1"))
DOCUMENTS = [*PAGES, *MANUAL_PAGES]
PROGRAMS = ("qel", "qel-keep", "qel-check", "qel-publish")
FLEET = ROOT / "docs" / "fleet.md"

# The addresses that stand for a server of examples/: the manual's, and the one in the example feed.
SERVER = re.compile(r"https://example\.org|http://127\.0\.0\.1:8000")
FEED_SERVER = "http://127.0.0.1:8000"

ANY_LINES = "..."
PROMPT = "$ "


class Block(NamedTuple):
    line: int  # of the document, where the block begins
    comment: str  # the comment right before it, or ""
    language: str
    lines: list


def blocks(document):
    """The blocks of a document, in their order: fenced ones, or the literal displays of a manual page."""
    return displays(document) if document in MANUAL_PAGES else fenced_blocks(document)


def fenced_blocks(document):
    comment, block = "", None
    for number, line in enumerate(document.read_text(encoding="utf-8").splitlines(), 1):
        if block is not None:
            if line == "```":
                yield block
                block = None
            else:
                block.lines.append(line)
        elif line.startswith("```"):
            block = Block(number, comment, line[3:], [])
        found = re.fullmatch(r"<!-- (.*) -->", line)
        comment = found[1] if found else ""


# How a manual page writes the characters that a formatter would otherwise make prettier.
ROFF = {"\\-": "-", "\\(aq": "'", "\\(ga": "`", "\\(dq": '"', "\\e": "\\", "\\&": ""}


def as_shown(line):
    """What a formatter shows for a line of a manual page without macros."""
    unknown = re.sub("|".join(map(re.escape, ROFF)), "", line)
    if "\\" in unknown:
        raise ValueError(f"an escape that is not in the table: {line}")
    return re.sub("|".join(map(re.escape, ROFF)), lambda escape: ROFF[escape[0]], line)


def displays(manual_page):
    """The literal displays of a manual page. One that shows prompts is a console, any other one a file."""
    comment, block = "", None
    for number, line in enumerate(manual_page.read_text(encoding="utf-8").splitlines(), 1):
        if line.startswith(".Ed"):
            lines = [as_shown(shown) for shown in block.lines]
            yield block._replace(language="console" if lines[0].startswith(PROMPT) else "", lines=lines)
            block = None
        elif block is not None:
            block.lines.append(line)
        elif line.startswith(".Bd -literal"):
            block = Block(number, comment, "", [])
        comment = line.removeprefix('.\\" ') if line.startswith('.\\" ') else ""


def tables(document, *header):
    """The rows of the document's tables that have this header; each table is a list of lists of cells."""
    found, rows = [], None
    for line in document.read_text(encoding="utf-8").splitlines():
        cells = [cell.strip() for cell in line.strip("|").split("|")] if line.startswith("|") else None
        if cells == list(header):
            rows = []
            found.append(rows)
        elif cells is None:
            rows = None
        elif rows is not None and set(line) - set("|-"):
            rows.append(cells)
    return found


def as_on_a_terminal(output):
    """The text without the progress that later progress was drawn over."""
    return re.sub(r"[^\n]*\x08", "", output)


def expectation(lines):
    """The pattern of an output that is shown as these lines."""
    return "".join(r"(?:.*\n)*?" if line == ANY_LINES else re.escape(line) + r"\n" for line in lines)


class DocumentationTest(ToolTestCase):
    def setUp(self):
        super().setUp()
        (self.directory / "bin").mkdir()
        for program in PROGRAMS:
            (self.directory / "bin" / program).symlink_to(Path(tool(program)).resolve())
        self.site = self.server()

    def copy_of_examples(self, name):
        """A served copy of examples/ whose feed names that server; returns its folder of that name, else its show.

        The show also holds scripts/, as the directory of the project does.
        """
        copy = self.path(name)
        shutil.copytree(ROOT / "examples", copy)
        feed = copy / "show" / "feed.xml"
        feed.write_text(feed.read_text(encoding="utf-8").replace(FEED_SERVER, self.site.url("")), encoding="utf-8")
        for file in copy.rglob("*"):
            if file.is_file():
                self.site.serve("/" + quote(file.relative_to(copy).as_posix()), file.read_bytes())
        (copy / "show" / "scripts").symlink_to(ROOT / "scripts")
        return copy / name if (copy / name).exists() else copy / "show"

    def shell(self, script, directory):
        """What a script prints on both streams; it must succeed."""
        search_path = f"{self.directory / 'bin'}{os.pathsep}{os.environ.get('PATH', os.defpath)}"
        variables = environment({"PATH": search_path, "HOME": str(self.directory), "TMPDIR": str(self.directory)})
        script = SERVER.sub(self.site.url(""), script)
        finished = subprocess.run(["bash", "-euo", "pipefail", "-c", script], cwd=directory, env=variables,
                                  stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.STDOUT,
                                  timeout=120, check=False)
        output = finished.stdout.decode().replace(self.site.url(""), FEED_SERVER)
        self.assertEqual(finished.returncode, 0, f"{script}\n{output}")
        return output

    def check_console(self, lines, directory):
        """Runs the commands of a console block in one shell and compares what each prints."""
        commands = [line[len(PROMPT):] for line in lines if line.startswith(PROMPT)]
        self.assertTrue(lines[0].startswith(PROMPT), lines[0])
        outputs = self.shell("\n".join(f"{command}\nprintf '\\0'" for command in commands), directory).split("\0")
        shown = []
        for line in lines:
            if line.startswith(PROMPT):
                shown.append([])
            else:
                shown[-1].append(line)
        self.assertEqual(len(outputs), len(commands) + 1)
        for command, expected, output in zip(commands, shown, outputs):
            self.assertRegex(as_on_a_terminal(output), rf"\A{expectation(expected)}\Z", f"printed by: {command}")

    def check_commands(self, document):
        directory = self.copy_of_examples(document.stem)
        count = 0
        for block in blocks(document):
            with self.subTest(document=document.name, line=block.line):
                if block.comment.startswith("file: "):
                    content = SERVER.sub(self.site.url(""), "".join(line + "\n" for line in block.lines))
                    (directory / block.comment.removeprefix("file: ")).write_text(content, encoding="utf-8")
                elif block.language == "console":
                    self.check_console(block.lines, directory)
                    count += 1
                elif block.language == "sh" and not block.comment.startswith("not run: "):
                    self.shell("\n".join(block.lines), directory)
                    count += 1
        return count

    def test_commands_work_as_typed(self):
        counts = {document.name: self.check_commands(document) for document in DOCUMENTS if document != FLEET}
        # A document without such a block would pass unread.
        for name in ("README.md", INSTALLED_README.name, "bundle.md", "feeds.md", "reference-file.md",
                     *(page.name for page in MANUAL_PAGES)):
            self.assertGreater(counts[name], 0, name)

    @unittest.skipUnless(has_gnu_parallel(), "GNU parallel is not installed")
    def test_commands_for_fleets_work_as_typed(self):
        self.assertGreater(self.check_commands(FLEET), 0)

    def test_links_lead_somewhere(self):
        link = re.compile(r"\]\((?!https?:)([^)#]*)#?([^)]*)\)")
        for document in [*PAGES, ROOT / "CONTRIBUTING.md"]:
            for path, heading in link.findall(document.read_text(encoding="utf-8")):
                with self.subTest(document=document.name, link=f"{path}#{heading}"):
                    folder = ROOT if document == INSTALLED_README else document.parent
                    target = (folder / path).resolve() if path else document
                    self.assertTrue(target.exists())
                    if heading:
                        self.assertIn(heading, headings(target))

    def test_sources_that_are_named_exist(self):
        for document in (ROOT / "CONTRIBUTING.md", *PAGES):
            for name in re.findall(r"`([a-z]+/[\w/-]+\.(?:h|cpp|cmake|py))`", document.read_text(encoding="utf-8")):
                if "NAME" not in name:
                    with self.subTest(f"{document.name}: {name}"):
                        self.assertTrue((ROOT / name).exists())

    def test_the_tests_that_hold_the_promises_exist(self):
        text = (ROOT / "docs" / "reliability.md").read_text(encoding="utf-8")
        tests = set(re.findall(r"`(test_\w+)(?:\.(\w+))?(?:\.(\w+))?`", text))
        suites = set(re.findall(r"`(?:fuzz\.(\w+)|(\w+)Test)`", text))
        self.assertTrue(tests and suites)
        for module, case, method in tests:
            with self.subTest(module=module, case=case, method=method):
                (file,) = (ROOT / "tests" / "e2e").glob(f"*/{module}.py")
                self.assertRegex(file.read_text(encoding="utf-8"), rf"(?s)class {case}\b.*def {method}\b")
        for target, unit in suites:
            with self.subTest(fuzz=target, unit=unit):
                pattern = f"fuzz/{target}Fuzz.cpp" if target else f"tests/**/{unit}Test.cpp"
                self.assertEqual(len(list(ROOT.glob(pattern))), 1)


def headings(document):
    """The anchors of a document's headings."""
    for line in document.read_text(encoding="utf-8").splitlines():
        if line.startswith("#"):
            yield re.sub(r"[^\w -]", "", line.lstrip("# ").lower()).replace(" ", "-")


class ManualPageTest(unittest.TestCase):
    # Where a message is made: the driver's failures, errors and progress, and the end of a process without memory.
    MAKER = re.compile(r"\b(?:fail|fillSlot|leftOut|QELError|QELProgress|writeToStandardError)\([^;]*;")
    # The texts in there that are more than a mark, such as "W", or a part of another, such as "podcast".
    MESSAGE = re.compile(r'"((?:[A-Z-]|\\")(?:[^"\\]|\\.)+)"')
    PLACE = re.compile(r"%(?:@|s|lu|0\.1f)")

    def messages(self):
        """The messages of the sources, as patterns; what others say may stand before one."""
        found = set()
        for folder in ("cli", "model", "sources", "generators", "platform/files", "platform/process"):
            for source in (ROOT / folder).glob("*.[ch]*"):
                for maker in self.MAKER.findall(source.read_text(encoding="utf-8")):
                    found |= set(self.MESSAGE.findall(maker))
        self.assertGreater(len(found), 30)
        texts = (message.removesuffix("\\n").replace('\\"', '"').replace("%%", "%") for message in found)
        return ["(?:.+: )?" + ".+".join(map(re.escape, self.PLACE.split(text))) for text in texts]

    def entries(self):
        """The entries of the lists of messages."""
        entries, depth = [], 0
        for line in MANUAL_PAGE.read_text(encoding="utf-8").splitlines():
            if line.startswith(".Bl -diag"):
                depth += 1
            elif line.startswith(".El") and depth:
                depth -= 1
            elif line.startswith(".It ") and depth:
                entries.append(as_shown(line.removeprefix(".It ")))
        return entries

    def test_every_message_of_the_sources_has_its_entry(self):
        entries = self.entries()
        for message in self.messages():
            with self.subTest(message):
                self.assertTrue(any(re.fullmatch(message, entry) for entry in entries))

    def test_every_entry_is_a_message_of_the_sources(self):
        messages = self.messages()
        for entry in self.entries():
            with self.subTest(entry):
                self.assertTrue(any(re.fullmatch(message, entry) for message in messages))

    def test_every_key_of_a_reference_file_is_named(self):
        text = MANUAL_PAGE.read_text(encoding="utf-8")
        rows = [row for *header, in (("key", "type", "meaning"), ("key", "type", "meaning", "when it is missing"))
                for table in tables(ROOT / "docs" / "reference-file.md", *header) for row in table]
        self.assertEqual(len(rows), 30)
        for key in (row[0].strip("`") for row in rows):
            self.assertRegex(text, rf"\b{key}\b")

    @unittest.skipUnless(shutil.which("mandoc"), "mandoc is not installed; scripts/setup --checks installs it")
    def test_the_pages_are_sound_mdoc(self):
        # The pages name each other, and are not installed here.
        others = re.compile(rf"(?m)^mandoc: .* referenced manual not found: Xr (?:{'|'.join(PROGRAMS)}) 1.*\n")
        for page in MANUAL_PAGES:
            with self.subTest(page.name):
                text = page.read_text(encoding="utf-8").replace("@PROJECT_VERSION@", "1.2.3")
                self.assertNotIn("@", text)
                lint = subprocess.run(["mandoc", "-T", "lint"], input=text, capture_output=True, text=True,
                                      timeout=60, check=False)
                self.assertEqual(others.sub("", (lint.stdout + lint.stderr).replace("\\-", "-")), "")


class OptionsTest(ToolTestCase):
    def test_the_manuals_name_the_options_that_help_prints(self):
        for program in PROGRAMS[1:]:
            with self.subTest(program):
                manual = (ROOT / "docs" / f"{program}.1").read_text(encoding="utf-8")
                rows = re.findall(r"^\.It (Fl .*)$", manual.replace("\\-", "-").replace("Fl Fl ", "Fl -"), re.MULTILINE)
                named = [(re.findall(r"^Fl (\w)\b", row), re.search(r"Fl -([a-z-]+)", row)[1]) for row in rows]
                printed = self.run_tool("--help", program=program).stdout.decode()
                self.assertEqual(sorted(named), sorted(
                    ([letter] if letter else [], name)
                    for letter, name in re.findall(r"^  (?:-(\w), |    )--([a-z-]+)", printed, re.MULTILINE)))


class BundleTablesTest(ToolTestCase):
    DOCUMENT = ROOT / "docs" / "bundle.md"

    def setUp(self):
        super().setUp()
        self.site = self.server()

    def bundle(self, dictionary):
        """The output of createbundle for a reference dictionary, and the bundle, which is new."""
        bundle = self.path("show.podcast")
        shutil.rmtree(bundle, ignore_errors=True)
        result = self.run_tool("createbundle", self.reference(dictionary), "-d", bundle)
        self.assertSucceeds(result)
        return result.stdout.decode(), bundle

    def provide(self, location):
        """Puts a file at a location of the manual. Returns the location at which the tool finds it."""
        if not SERVER.match(location):
            path = self.path(location)
            path.parent.mkdir(exist_ok=True)
            if path.name != "..":
                path.write_bytes(b"sound")
            return location
        path = SERVER.sub("", location)
        # As it is sent: non-ASCII characters percent-encoded, without the fragment.
        self.site.serve(quote(path.partition("#")[0], safe="/:?=%"), b"sound")
        return self.site.url(path)

    def media(self, bundle):
        return sorted(path.name for path in bundle.iterdir() if path.name not in ("Info.plist", "Posters"))

    def rows(self):
        """Each table of names as pairs of location and file name, None for a skipped episode."""
        return [[(location.split("`")[1], None if file == "none, skipped" else file.strip("`"))
                 for location, file in table] for table in tables(self.DOCUMENT, "location", "file")]

    def test_a_location_gives_the_file_name_of_the_table(self):
        single, _ = self.rows()
        for location, file in single:
            with self.subTest(location):
                output, bundle = self.bundle({"Episodes": [{"EpisodeReference": self.provide(location)}]})
                self.assertEqual(self.media(bundle), [] if file is None else [file])
                if file is None:
                    self.assertIn('[W] Could not generate sane path for episode "(null)"\n', output)

    def test_episodes_of_one_source_are_numbered_as_in_the_table(self):
        _, several = self.rows()
        _, bundle = self.bundle({"Episodes": [{"EpisodeReference": self.provide(location)}
                                              for location, _ in several]})
        self.assertEqual(self.media(bundle), sorted(file for _, file in several))
        entries = plistlib.loads((bundle / "Info.plist").read_bytes())["Episodes"]
        self.assertEqual([entry["EpisodeReference"] for entry in entries], [file for _, file in several])

    def test_every_warning_is_a_row_of_the_table(self):
        (table,) = tables(self.DOCUMENT, "warning", "what it means", "what is left out")
        loses_episode = {warning.strip("`").replace("EXTENSION", "ogg"): lost == "the episode"
                         for warning, _, lost in table}
        seen = set()
        for dictionary in self.sources_of_warnings():
            output, _ = self.bundle(dictionary)
            lines = output.splitlines()
            for line, following in zip(lines, lines[1:]):
                if line.startswith("[W] "):
                    warning = line.removeprefix("[W] ")
                    self.assertIn(warning, loses_episode)
                    self.assertEqual(following.startswith("[N] Skipping episode "), loses_episode[warning], warning)
                    seen.add(warning)
        self.assertEqual(seen, set(loses_episode))

    def sources_of_warnings(self):
        """Reference dictionaries, everything in which is called TITLE, that give every warning there is."""
        self.write("a.mp3", b"sound")
        for poster, kind in (("http://", "remote"), ("missing.png", "local"), ("refused.ogg", "local")):
            episodes = [
                {},
                {"EpisodeReference": "http://"},
                {"EpisodeReference": "a.ogg"},
                {"EpisodeReference": "missing.mp3"},
                {"EpisodeReference": "a.mp3", "EpisodePosterReference": poster},
            ]
            yield {
                "PodcastName": "TITLE",
                "PodcastPosterReference": poster,
                "PodcastPosterReferenceType": kind,
                "AllowedPosterTypes": ["png"],
                "AllowedEpisodeTypes": ["mp3"],
                "Episodes": [{"EpisodeName": "TITLE", **episode} for episode in episodes],
            }


if __name__ == "__main__":
    unittest.main()
