"""How qel-keep gets its files from servers that are busy, break off, stall, change their minds or lie."""

import threading
import time
import unittest

from keep_support import KeepTestCase
from support import element, rss

BODY = bytes(range(256)) * 4096  # a MiB
STRONG = [("ETag", '"one"')]
VERSIONS = {"A": BODY, "B": BODY[::-1]}


class TransfersTest(KeepTestCase):
    def one(self, answer):
        """Publishes one episode that `answer` serves."""
        self.publish(self.episode(1, url=self.web.route("/1.mp3", answer)))

    def requests(self):
        return [request for request in self.web.requests if request.path == "/1.mp3"]

    def assertWhole(self, body=BODY):
        self.assertEqual((self.bundle / "1.mp3").read_bytes(), body)
        self.assertEqual(self.listed("EpisodeFileSize"), [len(body)])
        self.assertNothingHidden()

    def breaking_off(self, body=BODY, headers=tuple(STRONG), sent=len(BODY) // 2, times=1):
        """Answers with all, but breaks off the first times behind some bytes; goes on by Range where it is asked."""
        counter = iter(range(times))

        def answer(exchange):
            asked = exchange.request.headers.get("range")
            condition = exchange.request.headers.get("if-range")
            start = int(asked.removeprefix("bytes=").removesuffix("-")) if asked else 0
            if asked and condition == dict(headers).get("ETag", dict(headers).get("Last-Modified")):
                exchange.head(206, [("Content-Length", str(len(body) - start)),
                                    ("Content-Range", f"bytes {start}-{len(body) - 1}/{len(body)}"), *headers])
            else:
                start = 0
                exchange.head(200, [("Content-Length", str(len(body))), *headers])
            if next(counter, None) is None:
                exchange.send(body[start:])
            else:
                exchange.send(body[start:start + sent])
                exchange.close()
        return answer

    def test_several_come_at_once_and_no_more(self):
        running, most, lock = [], [0], threading.Lock()

        def answer(exchange):
            with lock:
                running.append(1)
                most[0] = max(most[0], len(running))
            time.sleep(0.2)
            with lock:
                running.pop()
            exchange.reply(200, b"media")
        items = [self.episode(number, url=self.web.route(f"/{number}.mp3", answer)) for number in range(8)]
        self.publish(*items)
        self.assertKept(self.keep("--jobs", "3"), "8 new, 0 known, 0 failed")
        self.assertEqual(most[0], 3)

    def test_two_of_one_url_and_title_come_at_once(self):
        bodies = {number: bytes([number]) * (100_000 * number) for number in (1, 2)}
        numbers = iter(bodies)
        both = threading.Barrier(2)

        def answer(exchange):
            body = bodies[next(numbers)]
            exchange.head(200, [("Content-Length", str(len(body))), *STRONG])
            exchange.send(body[:50_000])
            both.wait(30)
            exchange.send(body[50_000:])
        url = self.web.route("/latest.mp3", answer)
        self.publish(*(self.episode(number, title="Latest", url=url) for number in (1, 2)))
        self.assertKept(self.keep(), "2 new, 0 known, 0 failed")
        self.assertEqual(sorted((self.bundle / name).read_bytes() for name in self.listed("EpisodeReference")),
                         list(bodies.values()))
        self.assertNothingHidden()

    def test_what_may_pass_is_tried_again(self):
        statuses = iter([503, 429])

        def answer(exchange):
            status = next(statuses, 200)
            exchange.reply(status, b"media 1", [("Retry-After", "0")] if status == 429 else [])
        self.one(answer)
        start = time.monotonic()
        self.assertKept(self.keep(), "1 new, 0 known, 0 failed")
        self.media(1)
        self.assertLess(0.9, time.monotonic() - start)
        self.assertEqual(len(self.requests()), 3)

    def test_a_storm_is_given_up(self):
        self.web.serve("/1.mp3", b"busy", 429, [("Retry-After", "0")])
        self.publish(self.episode(1, url=self.web.url("/1.mp3")), self.episode(2))
        self.assertKept(self.keep("--jobs", "1"), "1 new, 0 known, 1 failed", 1,
                        f'qel-keep: "Episode 1": {self.web.url("/1.mp3")}: HTTP status 429\n')
        self.assertEqual(len(self.requests()), 4)

    def test_one_that_waits_holds_nobody_up(self):
        moments = {}
        first = self.breaking_off(sent=0)

        def answer(exchange):
            moments["again"] = time.monotonic()
            first(exchange)
        self.web.route("/1.mp3", answer)
        self.web.route("/2.mp3", lambda exchange: (moments.update(other=time.monotonic()),
                                                   exchange.reply(200, b"media 2")))
        self.publish(self.episode(1, url=self.web.url("/1.mp3")), self.episode(2, url=self.web.url("/2.mp3")))
        self.assertKept(self.keep("--jobs", "1"), "2 new, 0 known, 0 failed")
        self.assertLess(moments["other"], moments["again"])

    def test_what_does_not_pass_is_not_tried_again(self):
        self.web.redirect("/1.mp3", "/1.mp3")
        self.publish(self.episode(1, url=self.web.url("/1.mp3")))
        self.assertKept(self.keep(), "0 new, 0 known, 1 failed", 1,
                        f'qel-keep: "Episode 1": {self.web.url("/1.mp3")}: Maximum (20) redirects followed\n')
        self.assertEqual(len(self.requests()), 21)

    def test_a_transfer_that_stalls_is_given_up_and_gone_on_with(self):
        calls = []

        def answer(exchange):
            calls.append(exchange.request.headers.get("range"))
            if len(calls) == 1:
                exchange.head(200, [("Content-Length", str(len(BODY))), *STRONG])
                exchange.send(BODY[:1000])
                time.sleep(5)
                exchange.close()
            else:
                self.breaking_off(times=0)(exchange)
        self.one(answer)
        self.assertKept(self.keep("--stall", "1"), "1 new, 0 known, 0 failed")
        self.assertWhole()
        self.assertEqual(calls, [None, "bytes=1000-"])

    def test_a_part_is_gone_on_with(self):
        for headers in [STRONG, [("Last-Modified", "Mon, 01 Jan 2024 00:00:00 GMT"),
                                 ("Date", "Tue, 02 Jan 2024 00:00:00 GMT")]]:
            with self.subTest(headers[0][0]):
                self.web.requests.clear()
                self.bundle = self.path(f"{headers[0][0]}.podcast")
                self.one(self.breaking_off(headers=headers))
                self.assertKept(self.keep(), "1 new, 0 known, 0 failed")
                self.assertWhole()
                asked = [(request.headers.get("range"), request.headers.get("if-range")) for request in self.requests()]
                self.assertEqual(asked, [(None, None), (f"bytes={len(BODY) // 2}-", headers[0][1])])

    def test_a_part_waits_for_the_next_run(self):
        self.one(self.breaking_off(times=4, sent=1000))
        cause = "transfer closed with 1044576 bytes remaining to read"
        self.assertKept(self.keep(), "0 new, 0 known, 1 failed", 1,
                        f'qel-keep: "Episode 1": {self.web.url("/1.mp3")}: {cause}\n')
        self.assertEqual([path.stat().st_size for path in self.bundle.glob(".qel-keep-*.part")], [4000])
        self.assertEqual(self.listed(), [])
        self.assertEqual(self.run_tool("createbundle", self.reference({}), "-d", self.path("show.podcast")).status, 0)
        self.assertKept(self.keep(), "1 new, 0 known, 0 failed")
        self.assertWhole()
        self.assertEqual(self.requests()[-1].headers.get("range"), "bytes=4000-")

    def test_a_part_of_what_is_not_wanted_any_more_goes(self):
        self.one(self.breaking_off(times=4, sent=1000))
        self.assertEqual(self.keep().status, 1)
        self.publish(self.episode(2, url=self.web.url("/none.mp3")))
        self.assertEqual(self.keep().status, 1)
        self.assertNothingHidden()

    def test_a_part_without_proof_is_not_gone_on_with(self):
        for headers in [[], [("ETag", 'W/"one"')], [("Last-Modified", "Mon, 01 Jan 2024 00:00:00 GMT"),
                                                    ("Date", "Mon, 01 Jan 2024 00:00:00 GMT")]]:
            with self.subTest(headers):
                self.web.requests.clear()
                self.bundle = self.path(f"{len(list(self.directory.iterdir()))}.podcast")
                self.one(self.breaking_off(headers=headers))
                self.assertKept(self.keep(), "1 new, 0 known, 0 failed")
                self.assertWhole()
                self.assertEqual([request.headers.get("range") for request in self.requests()], [None, None])

    def test_a_file_that_cannot_be_stored_leaves_no_part(self):
        self.publish(self.episode(1, url=self.web.route("/1.mp3", self.breaking_off(times=0))), self.episode(2))
        result = self.run_keep("--quiet", self.feed_url, self.bundle, blocks=200)
        self.assertEqual((result.status, result.stdout, result.stderr.decode()),
                         (1, b"", f'qel-keep: "Episode 1": {self.web.url("/1.mp3")}: File too large\n'))
        self.media(2)
        self.assertNothingHidden()

    def test_a_feed_that_stalls_or_is_busy_is_tried_again(self):
        feed = rss(element("title", "Show"), self.episode(1))
        answers = iter([lambda exchange: time.sleep(5), lambda exchange: exchange.reply(503, b"busy")])

        def answer(exchange):
            next(answers, lambda exchange: exchange.reply(200, feed))(exchange)
        self.web.route("/feed.xml", answer)
        self.assertKept(self.keep("--stall", "1"), "1 new, 0 known, 0 failed")
        self.media(1)
        self.assertEqual(self.web.hits("/feed.xml"), 3)

    def test_servers_that_lie_about_a_part_are_not_believed(self):
        half, size = len(BODY) // 2, len(BODY)
        other = VERSIONS["B"]
        lies = {
            "all the same": (206, [("Content-Range", f"bytes 0-{size - 1}/{size}")], BODY),
            "elsewhere": (206, [("Content-Range", f"bytes {half + 1}-{size - 1}/{size}")], BODY[half + 1:]),
            "no place": (206, [], BODY[half:]),
            "another tag": (206, [("Content-Range", f"bytes {half}-{size - 1}/{size}"), ("ETag", '"two"')],
                            other[half:]),
            "not to the end": (206, [("Content-Range", f"bytes {half}-{half + 9}/{size}")], BODY[half:half + 10]),
            "not satisfiable": (416, [("Content-Range", f"bytes */{half}")], b"")}
        for name, (status, headers, body) in lies.items():
            with self.subTest(name):
                self.web.requests.clear()
                self.bundle = self.path(f"{name}.podcast")
                calls = []

                def answer(exchange):
                    calls.append(exchange.request.headers.get("range"))
                    if calls[-1]:
                        exchange.reply(status, body, headers)
                    else:
                        self.breaking_off(times=1 if len(calls) == 1 else 0)(exchange)
                self.one(answer)
                self.assertKept(self.keep(), "1 new, 0 known, 0 failed")
                self.assertWhole()
                self.assertEqual(calls, [None, f"bytes={half}-", None])

    def test_a_file_that_changes_between_tries_is_of_one_piece(self):
        versions = iter("ABA")

        def answer(exchange):
            name = next(versions, "A")
            breaks = name == "B" or "if-range" not in exchange.request.headers
            self.breaking_off(VERSIONS[name], [("ETag", f'"{name}"')], sent=300_000, times=int(breaks))(exchange)
        self.one(answer)
        self.assertKept(self.keep(), "1 new, 0 known, 0 failed")
        self.assertIn((self.bundle / "1.mp3").read_bytes(), VERSIONS.values())
        self.assertNothingHidden()

    def test_two_episodes_of_one_url_do_not_share_a_part(self):
        url = self.web.dripping("/latest.mp3", BODY, 0.01, piece=len(BODY) // 8)
        self.publish(self.episode(1, url=url), self.episode(2, url=url))
        self.assertKept(self.keep(), "2 new, 0 known, 0 failed")
        self.assertEqual({(self.bundle / name).read_bytes() for name in self.listed("EpisodeReference")}, {BODY})


if __name__ == "__main__":
    unittest.main()
