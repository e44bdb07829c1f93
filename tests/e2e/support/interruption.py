"""What the tests of interruptions share: runs that are in the middle of something when a signal comes."""

import signal
import subprocess

from bundle_support import BundleTestCase, hidden
from support import start

ENDING_SIGNALS = (signal.SIGINT, signal.SIGTERM, signal.SIGHUP, signal.SIGQUIT, signal.SIGXCPU, signal.SIGALRM,
                  signal.SIGUSR1, signal.SIGUSR2, signal.SIGVTALRM, signal.SIGRTMIN)


def expect_signals():
    """For the tool, before it starts: no signal is ignored, even if these tests run under nohup."""
    for number in ENDING_SIGNALS:
        signal.signal(number, signal.SIG_DFL)


class InterruptionTestCase(BundleTestCase):
    def begin(self, podcast, **options):
        """A running createbundle for a podcast dictionary or a source."""
        source = self.reference(podcast) if isinstance(podcast, dict) else podcast
        options = {"stdout": subprocess.PIPE, "stderr": subprocess.PIPE, "preexec_fn": expect_signals, **options}
        process = start("createbundle", source, "-d", self.bundle, **options)
        self.addCleanup(process.communicate)
        self.addCleanup(process.kill)
        return process

    def held(self, web, path, first, rest=b"never sent"):
        """A route that sends the rest of its body once the gate is open. Its URL and the gate."""
        gate = self.gate()

        def answer(exchange):
            exchange.head(200, [("Content-Length", str(len(first + rest)))])
            exchange.send(first)
            gate.wait()
            exchange.send(rest)
        return web.route(path, answer), gate

    def assertEndsBy(self, process, number):
        process.send_signal(number)
        _, stderr = process.communicate(timeout=60)
        self.assertEqual((process.returncode, stderr), (-number, b""))
        self.assertEqual(hidden(self.bundle), [])
