"""Scripts call the tool with every order and spelling of arguments that once worked; here is which do.

An option is known by its second character alone, unknown options are passed over, and the order in
which faults are looked for decides which message people see.
"""

import plistlib
import subprocess
import unittest

from support import LOADING, ToolTestCase, checked, rss, start

PODCAST = {"PodcastName": "Night Walks"}


class ArgumentTest(ToolTestCase):
    def setUp(self):
        super().setUp()
        self.reference(PODCAST, name="podcast.plist")

    def assertWritesReference(self, *arguments, **options):
        """The arguments make the tool write the podcast's reference file on standard output."""
        result = self.run_tool(*arguments, **options)
        self.assertSucceeds(result)
        self.assertEqual(plistlib.loads(result.stdout), PODCAST)

    def assertWritesReferenceTo(self, name, *arguments):
        """The arguments make the tool write the podcast's reference file to the named file."""
        self.assertSucceeds(self.run_tool(*arguments), LOADING)
        self.assertEqual(plistlib.loads(self.path(name).read_bytes()), PODCAST)


class OrderTest(ArgumentTest):
    def test_command_then_source(self):
        self.assertWritesReference("parsefeed", "podcast.plist")

    def test_options_may_stand_before_the_command(self):
        self.assertWritesReferenceTo("out", "-d", "out", "parsefeed", "podcast.plist")

    def test_options_may_stand_between_command_and_source(self):
        self.assertWritesReferenceTo("out", "parsefeed", "-d", "out", "podcast.plist")

    def test_options_may_stand_after_the_source(self):
        self.assertWritesReferenceTo("out", "parsefeed", "podcast.plist", "-d", "out")

    def test_source_before_command_is_an_unknown_command(self):
        self.assertFails(self.run_tool("podcast.plist", "parsefeed"),
                         "Command `podcast.plist' not recognized.\n")

    def test_a_third_positional_argument_is_ignored(self):
        self.assertWritesReference("parsefeed", "podcast.plist", "missing.plist", "createfeed")


class OptionTest(ArgumentTest):
    def test_only_the_second_character_of_an_option_counts(self):
        for spelling in ("-d", "-dir", "-destination", "-d=x", "-dfi"):
            with self.subTest(spelling):
                self.path("out").unlink(missing_ok=True)
                self.assertWritesReferenceTo("out", "parsefeed", "podcast.plist", spelling, "out")

    def test_the_format_option_may_be_longer(self):
        result = self.run_tool("createfeed", "podcast.plist", "-format", "xml")
        self.assertFails(result, '"xml" is not a recognized feed format.\n')

    def test_the_input_option_may_be_longer(self):
        for spelling in ("-i", "-ixyz", "-input"):
            with self.subTest(spelling):
                self.assertWritesReference("parsefeed", spelling, stdin=plistlib.dumps(PODCAST))

    def test_option_letters_are_case_sensitive(self):
        self.assertWritesReference("parsefeed", "-D", "podcast.plist", "out")
        self.assertFalse(self.path("out").exists())

    def test_unknown_options_are_ignored(self):
        for option in ("-x", "-h", "-v", "-1", "-\u00e9", "- d"):
            with self.subTest(option):
                self.assertWritesReference(option, "parsefeed", option, "podcast.plist", option)

    def test_a_dash_alone_is_ignored(self):
        self.assertWritesReference("-", "parsefeed", "-", "podcast.plist")

    def test_long_options_and_two_dashes_are_ignored(self):
        for option in ("--", "--help", "--d", "--directory", "--i"):
            with self.subTest(option):
                self.assertWritesReference("parsefeed", option, "podcast.plist", option)

    def test_a_dash_cannot_name_the_source(self):
        self.reference(PODCAST, name="-podcast.plist")
        self.assertFails(self.run_tool("parsefeed", "-podcast.plist"), '"(null)" is not a valid podcast source.\n')

    def test_the_last_output_path_wins(self):
        self.assertWritesReferenceTo("second", "-d", "first", "parsefeed", "podcast.plist", "-d", "second")
        self.assertFalse(self.path("first").exists())

    def test_the_last_format_wins(self):
        result = self.run_tool("createfeed", "podcast.plist", "-f", "rss", "-f", "opml")
        self.assertFails(result, '"opml" is not a recognized feed format.\n')
        self.assertSucceeds(self.run_tool("createfeed", "podcast.plist", "-f", "opml", "-f", "rss"))

    def test_the_value_of_an_option_is_never_a_command_or_a_source(self):
        self.assertWritesReferenceTo("createfeed", "-d", "createfeed", "parsefeed", "podcast.plist")
        self.assertWritesReference("-f", "createfeed", "parsefeed", "podcast.plist")

    def test_the_value_of_an_option_may_begin_with_a_dash(self):
        self.assertWritesReferenceTo("-i", "parsefeed", "podcast.plist", "-d", "-i")

    def test_an_output_option_without_value_counts_as_not_given(self):
        self.assertWritesReference("parsefeed", "podcast.plist", "-d")

    def test_a_last_output_option_without_value_takes_back_the_earlier_one(self):
        self.assertWritesReference("parsefeed", "podcast.plist", "-d", "out", "-d")
        self.assertFalse(self.path("out").exists())

    def test_a_format_option_without_value_counts_as_not_given(self):
        result = self.run_tool("createfeed", "podcast.plist", "-f")
        self.assertSucceeds(result)
        self.assertIn(b"<rss ", result.stdout)

    def test_an_empty_output_path_is_given_but_cannot_be_written(self):
        self.assertSucceeds(self.run_tool("parsefeed", "podcast.plist", "-d", ""), LOADING)

    def test_parsefeed_does_not_look_at_the_format(self):
        self.assertWritesReference("parsefeed", "podcast.plist", "-f", "xml")

    def test_formats_are_accepted_in_any_case(self):
        for name in ("rss", "RSS", "Rss"):
            with self.subTest(name):
                result = self.run_tool("createfeed", "podcast.plist", "-f", name)
                self.assertSucceeds(result)
                self.assertIn(b"<rss ", result.stdout)
        for name in ("atom", "ATOM", "Atom"):
            with self.subTest(name):
                result = self.run_tool("createfeed", "podcast.plist", "-f", name)
                self.assertSucceeds(result)
                self.assertNotIn(b"<rss", result.stdout)


class OrderOfChecksTest(ArgumentTest):
    def test_commands_are_case_sensitive_and_whole(self):
        for word in ("ParseFeed", "PARSEFEED", "parsefee", "parsefeeds", "parsefeed ", "parse", "help", ""):
            with self.subTest(word):
                self.assertFails(self.run_tool(word, "podcast.plist"), f"Command `{word}' not recognized.\n")

    def test_an_unknown_command_comes_before_everything_else(self):
        self.assertFails(self.run_tool("-i", "-f", "xml", "-d", "out", "publish", "http://", stdin=b"garbage"),
                         "Command `publish' not recognized.\n")

    def test_an_unknown_command_ends_the_run_without_reading_standard_input(self):
        self.assertEqual(self.status_with_open_input("-i", "publish"), 1)

    def test_standard_input_is_left_alone_without_its_option(self):
        self.assertEqual(self.status_with_open_input("parsefeed", "podcast.plist"), 0)
        self.assertEqual(self.status_with_open_input(), 1)

    def status_with_open_input(self, *arguments):
        """The exit status of a run whose standard input never ends."""
        with start(*arguments, cwd=self.directory, stdin=subprocess.PIPE, stdout=subprocess.DEVNULL,
                   stderr=subprocess.DEVNULL) as process:
            try:
                return checked(arguments, process.wait(timeout=30)).status
            finally:
                process.kill()

    def test_no_arguments_at_all_is_a_missing_source(self):
        self.assertFails(self.run_tool(), '"(null)" is not a valid podcast source.\n')

    def test_a_command_alone_is_a_missing_source(self):
        for command in ("parsefeed", "createfeed", "createbundle"):
            with self.subTest(command):
                self.assertFails(self.run_tool(command), '"(null)" is not a valid podcast source.\n')

    def test_the_format_is_looked_at_after_the_source(self):
        self.assertFails(self.run_tool("createfeed", "http://", "-f", "xml"),
                         '"http://" is not a valid podcast source.\n')
        self.assertFails(self.run_tool("createfeed", "missing.plist", "-f", "xml"),
                         'Could not initialize podcast source with string "missing.plist".\n')

    def test_the_format_is_looked_at_after_loading(self):
        server = self.server()
        url = server.serve("/feed.xml", rss("<title>Night Walks</title>"))
        self.assertFails(self.run_tool("createfeed", url, "-f", "xml"), '"xml" is not a recognized feed format.\n')
        self.assertEqual(server.hits("/feed.xml"), 1)

    def test_a_failed_load_hides_an_unknown_format(self):
        url = self.feed(b"<feed/>")
        self.assertFails(self.run_tool("createfeed", url, "-f", "xml"),
                         "Could not load source: The feed was neither RSS nor Atom")

    def test_a_missing_command_is_noticed_after_loading(self):
        result = self.run_tool("-i", "-d", "out", stdin=plistlib.dumps(PODCAST))
        self.assertFails(result, "No recognizable command was provided.\n", stdout=LOADING)
        self.assertFalse(self.path("out").exists())

    def test_a_missing_command_does_not_hide_a_bad_input(self):
        self.assertFails(self.run_tool("-i", stdin=b"garbage"), '"(null)" is not a valid podcast source.\n')


class HostileArgumentTest(ArgumentTest):
    """No argument vector ends the tool otherwise than with status 0 or 1."""

    def test_arguments_that_are_no_text(self):
        for argument in (b"\xff\xfe", b"http://\xff/", b"file:///\xc3", b"-\xff", b"\xed\xa0\x80"):
            with self.subTest(argument):
                self.assertEqual(self.run_tool(argument).status, 1)
                self.assertEqual(self.run_tool(b"parsefeed", argument).status, 1)
                self.assertEqual(self.run_tool(b"createfeed", b"podcast.plist", b"-f", argument).status, 1)

    def test_an_argument_with_format_characters_is_shown_as_it_is(self):
        for argument in ("%s%s%n", "%@%@", "100%", "%", "\\n", "a\tb"):
            with self.subTest(argument):
                self.assertFails(self.run_tool(argument), f"Command `{argument}' not recognized.\n")
                self.assertFails(self.run_tool("parsefeed", argument),
                                 f'Could not initialize podcast source with string "{argument}".\n')

    def test_a_very_long_argument(self):
        argument = "a" * 100_000
        self.assertFails(self.run_tool(argument), f"Command `{argument}' not recognized.\n")
        self.assertFails(self.run_tool("parsefeed", argument),
                         f'Could not initialize podcast source with string "{argument}".\n')

    def test_very_many_arguments(self):
        self.assertWritesReference("parsefeed", "podcast.plist", *["-x", "more"] * 10_000)


if __name__ == "__main__":
    unittest.main()
