"""What tests of completions share: the real shells are asked what they offer and how they complete a line.

Bash and zsh complete only on a terminal; they get a pseudo-terminal, on which a key or a hook writes
down what came of each line. Fish tells it by a command.
"""

import os
import pty
import select
import shutil
import subprocess
import time
import tty
from pathlib import Path

from support import ToolTestCase, environment

COMPLETIONS = Path(__file__).resolve().parents[3] / "packaging" / "completions"
TIME_LIMIT = 60  # seconds, for all lines of a shell

SOURCES = ["UP.PLIST", "my show.plist", "my shows", "show.plist", "show.podcast", "sub"]
FILES = [*SOURCES, "notes.txt", "a:b.xml"]
DIRECTORIES = ["my shows", "show.podcast", "sub"]
SCHEMES = ["http:", "https:", "pcast:", "file:"]

BASH = r"""
source "$COMPLETIONS/$PROGRAM.bash"
record() {
  "_${PROGRAM//-/_}" "$@"
  printf '%s\n' "${COMPREPLY[@]}" >>"$RECORD"
}
complete -F record "$PROGRAM"
finish() {
  printf '\t%s\n' "$READLINE_LINE" >>"$RECORD"
  READLINE_LINE=''
}
bind -x '"\C-t": finish'
bind 'set enable-bracketed-paste off'
"""

# The hook runs for each line; the line after the last ends the shell.
ZSH = r"""
fpath=("$COMPLETIONS" $fpath)
autoload -Uz compinit
compinit -u -D
unsetopt auto_menu
compadd() {
  # Calls with these only compute, and add nothing.
  if [[ ${@[1,(i)(-|--)]} != *-(O|A|D)\ * ]]; then
    local -a offered
    builtin compadd -A offered "$@"
    (( $#offered )) && print -rl -- ${(Q)offered} >>$RECORD
  fi
  builtin compadd "$@"
}
lines=("${(@f)TYPED}")
finish() {
  (( $#lines )) || exit
  BUFFER=$lines[1]
  CURSOR=$#BUFFER
  shift lines
  zle complete-word
  print -r -- $'\t'$BUFFER >>$RECORD
  BUFFER=''
  zle accept-line
}
zle -N zle-line-init finish
"""

FISH = r"""
source $COMPLETIONS/$PROGRAM.fish
while read -l line
    complete -C $line | string replace -r '\t.*' ''
    printf '\t\n'
end
"""


class CompletionTestCase(ToolTestCase):
    """A test in a directory with the SOURCES and other FILES, all of which completions may offer."""

    PROGRAM = "qel"

    def setUp(self):
        super().setUp()
        self.record = self.path("record")
        self.shows = self.path("shows")
        self.shows.mkdir()
        for directory in DIRECTORIES:
            (self.shows / directory).mkdir()
        for file in set(FILES) - set(DIRECTORIES):
            (self.shows / file).touch()

    def require(self, shell):
        if not shutil.which(shell):
            self.skipTest(f"{shell} is not installed")

    def variables(self, **changes):
        # No settings of whoever runs the test.
        own = dict.fromkeys(["HOME", "ZDOTDIR", "XDG_CONFIG_HOME", "XDG_DATA_HOME"], str(self.directory))
        return environment({**own, "COMPLETIONS": str(COMPLETIONS), "PROGRAM": self.PROGRAM,
                            "RECORD": str(self.record), "TERM": "dumb", **changes})

    def on_terminal(self, command, typed, **changes):
        """Runs a shell on a terminal of its own, types into it and waits for its end."""
        terminal, end = pty.openpty()
        self.addCleanup(os.close, terminal)
        tty.setraw(end)
        process = subprocess.Popen(command, stdin=end, stdout=end, stderr=end, cwd=self.shows,
                                   env=self.variables(**changes), start_new_session=True)
        os.close(end)
        os.write(terminal, typed)
        shown = b""
        deadline = time.monotonic() + TIME_LIMIT
        while process.poll() is None:
            if time.monotonic() > deadline:
                process.kill()
                process.wait()
                self.fail(f"{command} did not end; it showed {shown!r}")
            if select.select([terminal], [], [], 0.1)[0]:
                try:
                    shown += os.read(terminal, 65536)
                except OSError:  # closed at the other end
                    time.sleep(0.01)

    def completed_by(self, shell, lines):
        """For each line, what the shell offers at its end and the line as completed (by fish: none)."""
        if shell == "bash":
            bashrc = self.write("bashrc", BASH)
            typed = "".join(f"{line}\t\x14" for line in lines) + "\x04"
            self.on_terminal(["bash", "--noprofile", "--rcfile", str(bashrc), "-i"], typed.encode())
            record = self.record.read_text(encoding="utf-8")
        elif shell == "zsh":
            self.write(".zshrc", ZSH)
            self.on_terminal(["zsh", "-d", "-i"], b"", TYPED="\n".join(lines))
            record = self.record.read_text(encoding="utf-8")
        else:
            script = self.write("script.fish", FISH)
            finished = subprocess.run(["fish", "--no-config", str(script)], input="\n".join([*lines, ""]), text=True,
                                      capture_output=True, cwd=self.shows, env=self.variables(),
                                      timeout=TIME_LIMIT, check=False)
            self.assertEqual((finished.returncode, finished.stderr), (0, ""))
            record = finished.stdout
        results = []
        offered = set()
        for entry in record.splitlines():
            if entry.startswith("\t"):
                results.append((offered, entry[1:]))
                offered = set()
            elif entry:
                offered.add(entry.rstrip("/"))
        self.assertEqual(len(results), len(lines), record)
        return results

    def check_offers(self, shell, rows):
        self.require(shell)
        results = self.completed_by(shell, [line for line, _ in rows])
        for (line, expected), (offered, _) in zip(rows, results):
            with self.subTest(line):
                self.assertEqual(sorted(offered), sorted(expected))

    def check_lines(self, shell, rows):
        self.require(shell)
        results = self.completed_by(shell, [line for line, _ in rows])
        for (line, expected), (_, completed) in zip(rows, results):
            with self.subTest(line):
                self.assertEqual(completed, expected)


class CompanionCompletions:
    """The tests of a program with long options; a test case is to be made of it, CompletionTestCase and its tables."""

    LONG = []  # its long options
    OFFERS = []  # a line up to the cursor, and what is offered there
    OFFERS_BUT_OF_ZSH = []  # which offers options where nothing else can stand
    LINES = []  # a line up to the cursor, and what becomes of it

    def offers(self):
        return [*self.OFFERS, *self.OFFERS_BUT_OF_ZSH, (f"{self.PROGRAM} --", self.LONG)]

    def test_bash(self):
        self.check_offers("bash", self.offers())
        self.record.unlink()
        self.check_lines("bash", self.LINES)

    def test_zsh(self):
        self.check_offers("zsh", self.OFFERS)
        self.record.unlink()
        self.check_lines("zsh", self.LINES)

    def test_fish(self):
        self.check_offers("fish", self.offers())
