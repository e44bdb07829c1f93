"""A catalogue of what servers do that they should not, and of the one right outcome of each.

Each lie is told three times: of a feed, of an episode's media and of a poster. Media and posters are
downloads alike and have the same outcome. `python3 lies.py` prints the catalogue as a table.
"""

import gzip
import zlib
from typing import Callable, NamedTuple, Union

from replies import (At, BODY, SIZE, answer, bomb, chunk, chunked, coded, cookie_gate, endless, length, redirect,
                     reset, slow, split, tls, tls_cut, tls_split)

# Outcomes. A feed is read, or refused with a message; a file is stored, or left out with a warning.
READ = "read"
STORED = "stored"
LEFT_OUT = "left out"
NOT_ASKED = "not asked"

# Routes that tell the truth.
GOOD = "/good"  # the body
LOOP = "/loop"  # a redirect to itself
CHAIN = "/chain"  # /chain/N redirects N times and ends at the body


class Cause(str):
    """The message of a refusal, without its beginning "Could not load source: ". A star stands for a number."""


class LibraryCause(Cause):
    """A message that the transfer library words, in its version 7.88; other versions may use other words."""


class Lie(NamedTuple):
    name: str
    reply: Union[bytes, Callable, At]  # bytes, behind which the connection stays open; or what serves an Exchange
    feed: str = READ
    file: Union[str, bytes] = None  # the outcome of media and posters: stored if the feed is read, unless told
    closes: bool = False  # whether the connection is closed behind those bytes

    @property
    def outcome(self):
        """What becomes of media and posters: bytes that are stored, LEFT_OUT or NOT_ASKED."""
        if self.file is None:
            return BODY if self.feed is READ else LEFT_OUT
        return BODY if self.file is STORED else self.file


FOUND = b"HTTP/1.1 200 OK\r\n"
FIELD = b"X-Padding: " + b"x" * 100 + b"\r\n"
PACKED = gzip.compress(BODY)
BOMB = bomb(100 << 20)
OTHER = answer(length(5), body=b"other")
CONTINUE = b"HTTP/1.1 100 Continue\r\n\r\n"
ZERO_CHUNK = b"0\r\n\r\n"

# Causes that several lies share.
CONTRADICTORY = Cause("The announced lengths contradict each other")
NO_NUMBER = Cause("The announced length is no number")
UNTRUE = Cause("The announced length cannot be true")
UNFRAMED = Cause("The header does not tell where the body ends")
TRANSFER_CODING = Cause("The body comes in a transfer coding that was not asked for")
CONTENT_CODING = Cause("The body comes in a content coding that was not asked for")
CUT_HEADER = Cause("The header of the answer is cut short")
LONG_LINE = Cause("A line of the answer's header is too long")
BAD_LINE = LibraryCause("A line of the answer's header is malformed")
OUT_OF_MEMORY = Cause("Out of memory.")
CUT_STREAM = Cause("The compressed body is cut short")
BAD_STREAM = Cause("The compressed body is malformed")
EMPTY = Cause("Could not load or read the specified feed URL")
SHORT_CHUNKS = LibraryCause("transfer closed with outstanding read data remaining")
BAD_SIZE = LibraryCause("Illegal or missing hexadecimal sequence in chunked-encoding")
LONG_SIZE = LibraryCause("Too long hexadecimal number in chunked-encoding")
BAD_CHUNKS = LibraryCause("Failed reading the chunked-encoded stream")
NO_HTTP = LibraryCause("Received HTTP/0.9 when not allowed")
NO_REPLY = LibraryCause("Empty reply from server")
RESET = LibraryCause("Recv failure: Connection reset by peer")
LONG_HEADER = LibraryCause("Too large response headers: * > 307200")
NO_TARGET = Cause("The redirect leads to no valid URL")


def status(number):
    return Cause(f"HTTP status {number}")


def missing(number):
    return LibraryCause(f"transfer closed with {number} bytes remaining to read")


def unsupported(scheme):
    return Cause(f'URLs of the scheme "{scheme}" are not supported')


LIES = {
    "Lengths": (
        Lie("the true length", answer(length(SIZE))),
        Lie("no length; the end of the connection is the end", answer(), closes=True),
        Lie("the true length twice", answer(length(SIZE), length(SIZE))),
        Lie("the true length twice in one field", answer(length(f"{SIZE}, {SIZE}"))),
        Lie("the true length behind thirty zeros", answer(length("0" * 30 + str(SIZE)))),
        Lie("a length of 1 byte more than comes", answer(length(SIZE + 1)), missing(1), closes=True),
        Lie("a length of 2^63 - 1", answer(length(2**63 - 1)),
            Cause("The resource is larger than 2147483648 bytes"), LEFT_OUT, closes=True),
        Lie("a length of 1 byte less than comes; the rest is no part of it", answer(length(SIZE - 3)),
            Cause("unclosed token at line 2, column *"), BODY[:SIZE - 3]),
        Lie("a length of 0 before a body", answer(length(0)), EMPTY, b""),
        Lie("a whole second answer behind the first", answer(length(SIZE)) + OTHER),
        Lie("a whole second answer behind the first, in another piece",
            split(answer(length(SIZE), body=b""), BODY + OTHER)),
        Lie("an empty body", answer(length(0), body=b""), EMPTY, b""),
        Lie("two lengths, the first true", answer(length(SIZE), length(5)), CONTRADICTORY),
        Lie("two lengths, the last true", answer(length(5), length(SIZE)), CONTRADICTORY),
        Lie("two lengths in one field", answer(length(f"{SIZE}, 5")), CONTRADICTORY),
        Lie("a negative length", answer(length(-SIZE)), LibraryCause("Invalid Content-Length: value")),
        Lie("no number in the length", answer(length("")), LibraryCause("Invalid Content-Length: value")),
        Lie("a length with a plus sign", answer(length(f"+{SIZE}")), NO_NUMBER),
        Lie("a length with letters behind it", answer(length(f"{SIZE}abc")), NO_NUMBER),
        Lie("a hexadecimal length", answer(length(hex(SIZE))), NO_NUMBER),
        Lie("a length with a fraction", answer(length(f"{SIZE}.0")), NO_NUMBER),
        Lie("a length of 2^64 + the true one, which 64 bits cannot hold", answer(length(2**64 + SIZE)), UNTRUE),
        Lie("a space before the colon of the length", answer(f"Content-Length : {SIZE + 7}"), UNFRAMED),
        Lie("a length that goes on in a second line", answer(f"Content-Length: 5\r\n {SIZE}"), UNFRAMED),
    ),
    "Chunks": (
        Lie("chunks", chunked(chunk(BODY[:7]) + chunk(BODY[7:]) + ZERO_CHUNK)),
        Lie("chunks of one byte", chunked(b"".join(chunk(bytes([byte])) for byte in BODY) + ZERO_CHUNK)),
        Lie("chunks with extensions and a trailer",
            chunked(b'%x;a="b";c\r\n%s\r\n0;d\r\nX-Sum: 1\r\n\r\n' % (SIZE, BODY))),
        Lie("a trailer that tells another length and coding",
            chunked(chunk(BODY) + b"0\r\nContent-Length: 5\r\nContent-Encoding: gzip\r\n\r\n")),
        Lie("chunks with bare line feeds", chunked(b"%x\n%s\n0\n\n" % (SIZE, BODY))),
        Lie("chunks and a length, which does not count then", chunked(chunk(BODY) + ZERO_CHUNK, length(5))),
        Lie("a length and chunks",
            answer(length(5), "Transfer-Encoding: chunked", body=chunk(BODY) + ZERO_CHUNK)),
        Lie("chunks announced twice", chunked(chunk(BODY) + ZERO_CHUNK, "Transfer-Encoding: chunked")),
        Lie("bytes behind the last chunk", chunked(chunk(BODY) + ZERO_CHUNK + b"more")),
        Lie("a whole second answer behind the last chunk", chunked(chunk(BODY) + ZERO_CHUNK) + OTHER),
        Lie("no last chunk", chunked(chunk(BODY)), SHORT_CHUNKS, closes=True),
        Lie("half the last chunk", chunked(chunk(BODY) + b"0\r\n"), SHORT_CHUNKS, closes=True),
        Lie("a trailer that is cut", chunked(chunk(BODY) + b"0\r\nX-Sum: 1\r\n"), SHORT_CHUNKS, closes=True),
        Lie("a trailer that is no field", chunked(chunk(BODY) + b"0\r\nsum\r\n\r\n"), BAD_CHUNKS),
        Lie("a chunk cut short", chunked(chunk(BODY)[:-9]), SHORT_CHUNKS, closes=True),
        Lie("a chunk longer than its size", chunked(b"5\r\n" + BODY + b"\r\n" + ZERO_CHUNK),
            LibraryCause("Malformed encoding found in chunked-encoding")),
        Lie("a size that is no number", chunked(b"xyz\r\n" + BODY + b"\r\n" + ZERO_CHUNK), BAD_SIZE),
        Lie("a negative size", chunked(b"-5\r\n" + BODY + b"\r\n" + ZERO_CHUNK), BAD_SIZE),
        Lie("no size", chunked(b"\r\n" + BODY + b"\r\n" + ZERO_CHUNK), BAD_SIZE),
        Lie("a size that says it is hexadecimal", chunked(b"0x%x\r\n%s\r\n0\r\n\r\n" % (SIZE, BODY)), BAD_CHUNKS),
        Lie("a size of 2^64 - 1", chunked(b"f" * 16 + b"\r\n" + BODY), BAD_SIZE),
        Lie("a size of 2^64 + 5", chunked(b"10000000000000005\r\n" + BODY), LONG_SIZE),
        Lie("a size of endless zeros", endless(chunked(b""), b"0" * 8000), LONG_SIZE),
        Lie("endless fields in the trailer", endless(chunked(chunk(BODY) + b"0\r\n"), FIELD * 100),
            Cause("The header is longer than 1 MiB")),
        Lie("an endless field in the trailer", endless(chunked(chunk(BODY) + b"0\r\nX: "), b"x" * 8000),
            LibraryCause("Out of memory in chunked-encoding")),
    ),
    "Transfer codings": (
        Lie("gzip and chunks", answer("Transfer-Encoding: gzip, chunked", body=chunk(PACKED) + ZERO_CHUNK),
            TRANSFER_CODING),
        Lie("gzip to the end of the connection", answer("Transfer-Encoding: gzip", body=PACKED), TRANSFER_CODING),
        Lie("one that does not exist", answer("Transfer-Encoding: rot13", length(SIZE)), TRANSFER_CODING),
        Lie("chunks within another coding", answer("Transfer-Encoding: chunked, rot13", body=chunk(BODY)),
            TRANSFER_CODING),
        Lie("a space before the colon", answer("Transfer-Encoding : chunked", body=chunk(BODY) + ZERO_CHUNK), UNFRAMED),
        Lie("none, by name", answer("Transfer-Encoding: identity"), closes=True),
        Lie("none, by name, and a length", answer("Transfer-Encoding: identity", length(SIZE)), UNFRAMED),
        Lie("none, by name, and a longer body", answer("Transfer-Encoding: identity", length(SIZE - 7)), UNFRAMED),
        Lie("none, by no name, and a cut body", answer(length(SIZE + 7), "Transfer-Encoding:"), UNFRAMED, closes=True),
    ),
    "Content codings": (
        Lie("gzip, as feeds are asked for and media are not", coded("gzip", PACKED)),
        Lie("gzip by its old name", coded("X-GZip", PACKED)),
        Lie("gzip in two streams", coded("gzip", gzip.compress(BODY[:9]) + gzip.compress(BODY[9:]))),
        Lie("gzip beside the name of no coding", coded("identity, GZIP,", PACKED)),
        Lie("gzip in a second field", coded("identity", PACKED, "Content-Encoding: gzip")),
        Lie("gzip in a field's second line", coded("\r\n gzip", PACKED)),
        Lie("gzip cut in its checksum", coded("gzip", PACKED[:-1]), CUT_STREAM),
        Lie("gzip and a length of 1 byte more", answer("Content-Encoding: gzip", length(len(PACKED) + 1), body=PACKED),
            missing(1), closes=True),
        Lie("gzip cut in its data", coded("gzip", PACKED[:-20]), CUT_STREAM),
        Lie("gzip without a byte", coded("gzip", b""), CUT_STREAM),
        Lie("gzip with a wrong checksum", coded("gzip", PACKED[:-8] + bytes(8)), BAD_STREAM),
        Lie("gzip with garbage behind it", coded("gzip", PACKED + b"garbage"), BAD_STREAM),
        Lie("gzip with zeros behind it", coded("gzip", PACKED + bytes(512)), BAD_STREAM),
        Lie("gzip, and the body is plain", coded("gzip", BODY), BAD_STREAM),
        Lie("gzip twice", coded("gzip, gzip", gzip.compress(PACKED)), CONTENT_CODING),
        Lie("gzip twice, in two fields", coded("gzip", gzip.compress(PACKED), "Content-Encoding: gzip"),
            CONTENT_CODING),
        Lie("deflate", coded("deflate", zlib.compress(BODY)), CONTENT_CODING),
        Lie("br", coded("br", b"\x0b\x02\x80abc\x03"), CONTENT_CODING),
        Lie("br, told in the second field", coded("gzip", PACKED, "Content-Encoding: br"), CONTENT_CODING),
        Lie("a space before the colon", answer("Content-Encoding : gzip", length(len(PACKED)), body=PACKED), UNFRAMED),
        Lie("none told, and the body is gzip", answer(length(len(PACKED)), body=PACKED),
            Cause("not well-formed (invalid token) at line 1, column *"), PACKED),
        Lie("no coding, by name", coded("identity", BODY)),
        Lie("no coding, by no name", coded("", BODY)),
        Lie("a name that is no coding", coded("utf-8", BODY), READ, LEFT_OUT),
        Lie("100 MiB of zeros in 100 KiB", coded("gzip", BOMB),
            Cause("The body is more than 50 times as large as its compressed form"), bytes(100 << 20)),
    ),
    "Headers": (
        Lie("bare line feeds", answer(length(SIZE)).replace(b"\r\n", b"\n", 3)),
        Lie("a status without words", answer(length(SIZE), status="200")),
        Lie("an answer of HTTP/1.0", answer(length(SIZE), version="HTTP/1.0")),
        Lie("a location without a redirecting status", answer(length(SIZE), f"Location: {LOOP}")),
        Lie("250 KB of fields", answer(*["X: " + "x" * 95] * 2500, length(SIZE))),
        Lie("a content type of another kind", answer(length(SIZE), "Content-Type: image/png; charset=utf-16")),
        Lie("nothing", b"", NO_REPLY, closes=True),
        Lie("half a status line", b"HTTP/1.1 20", NO_REPLY, closes=True),
        Lie("only a status line", FOUND, CUT_HEADER, closes=True),
        Lie("no end of the header", FOUND + b"Content-Length: 3\r\n", missing(3), closes=True),
        Lie("the body without a header (HTTP/0.9)", BODY, NO_HTTP),
        Lie("another protocol", b"220 ready\r\n\r\n", NO_HTTP),
        Lie("zeros", bytes(1000), NO_HTTP),
        Lie("endless text", endless(b"hello\r\n", b"x" * 8000), NO_HTTP),
        Lie("a version that does not exist", answer(length(SIZE), version="HTTP/7.0"),
            LibraryCause("Unsupported HTTP version (7.0) in response")),
        Lie("a status of two digits", answer(length(SIZE), status="20 OK"),
            LibraryCause("Unsupported response code in HTTP response")),
        Lie("a status of letters", answer(length(SIZE), status="abc"),
            LibraryCause("Unsupported HTTP version in response")),
        Lie("a line without a colon", answer("garbage", length(SIZE)), LibraryCause("Header without colon")),
        Lie("a NUL in a field", answer("X: a\0b", length(SIZE)), LibraryCause("Nul byte in header")),
        Lie("a first field without a name", answer(f" {length(SIZE)}"), BAD_LINE),
        Lie("a carriage return in the name of a field", answer(f"Content-\rLength: {SIZE}"), BAD_LINE),
        Lie("an endless status line", endless(b"HTTP/1.1 200 ", b"x" * 8000), LONG_LINE),
        Lie("an endless field", endless(FOUND + b"X: ", b"x" * 8000), LONG_LINE),
        Lie("endless fields", endless(FOUND, FIELD * 100), LONG_HEADER),
    ),
    "Statuses": (
        Lie("100, 102 and 103 before the answer",
            CONTINUE * 3 + b"HTTP/1.1 102 Processing\r\nContent-Length: 5\r\n\r\n"
            b"HTTP/1.1 103 Early Hints\r\nLink: <x>\r\n\r\n" + answer(length(SIZE))),
        Lie("a thousand times 100 before the answer", CONTINUE * 1000 + answer(length(SIZE))),
        Lie("100 without end", endless(b"", CONTINUE * 300), LONG_HEADER),
        Lie("100 alone", CONTINUE, NO_REPLY, closes=True),
        Lie("101, to another protocol",
            answer("Upgrade: h2c", "Connection: Upgrade", status="101 Switching Protocols"), status(101)),
        *(Lie(f"{number} with the body", answer(length(SIZE), status=f"{number} x"), status(number))
          for number in (201, 202, 203, 205, 206, 226, 300, 305, 400, 401, 403, 404, 407, 410, 416, 429, 500, 502, 503,
                         600, 999)),
        *(Lie(f"{number}, which has no body", answer(status=f"{number} x", body=b""), status(number))
          for number in (204, 304)),
        Lie("206 with the whole range", answer(length(SIZE), f"Content-Range: bytes 0-{SIZE - 1}/{SIZE}",
                                               status="206 Partial Content"), status(206)),
        Lie("404 with a cut page", answer(length(SIZE + 9), status="404 Not Found"), status(404), closes=True),
        Lie("404 with two lengths", answer(length(SIZE), length(5), status="404 Not Found"), status(404)),
        Lie("404 with an endless page", endless(answer(status="404 Not Found"), b"x" * 8000), status(404)),
    ),
    "Redirects": (
        *(Lie(f"{number}", redirect(GOOD, status=f"{number} x")) for number in (301, 302, 303, 307, 308)),
        Lie("a cookie without which it leads nowhere", cookie_gate),
        Lie("a location with a fragment and dots", redirect(f"./x/..{GOOD}#part")),
        Lie("two locations: the first counts", redirect(GOOD, "/none")),
        Lie("a page that is cut", redirect(GOOD, fields=(length(9),)), closes=True),
        Lie("a page of 1 MB", redirect(GOOD, fields=(length(10**6),), body=bytes(10**6))),
        Lie("a page that never ends", endless(redirect(GOOD, fields=(length(10**15),)), b"x" * 8000)),
        Lie("a page that never ends, without a length", endless(redirect(GOOD, fields=()), b"x" * 8000)),
        Lie("a page with two lengths", redirect(GOOD, fields=(length(5), length(6))), CONTRADICTORY),
        Lie("20 in a row", redirect(f"{CHAIN}/19")),
        Lie("21 in a row", redirect(f"{CHAIN}/20"), Cause("Maximum (20) redirects followed")),
        Lie("a loop", redirect(LOOP), Cause("Maximum (20) redirects followed")),
        Lie("to a missing page", redirect("/none"), status(404)),
        *(Lie(f"{number} without location", redirect(status=f"{number} x"), status(number))
          for number in (301, 302, 303, 307, 308)),
        Lie("an empty location", redirect(""), status(302)),
        Lie("a location with a space, sent on as %20", redirect("/go od"), status(404)),
        Lie("a location with a control character", redirect("/go\x01od"),
            NO_TARGET),
        Lie("a location without host", redirect("http://"), NO_TARGET),
        Lie("a location with half an address", redirect("http://[::1/x"), NO_TARGET),
        Lie("a port beyond all ports", redirect("http://127.0.0.1:99999/"), NO_TARGET),
        Lie("a host that becomes the path", redirect("http://127.0.0.1\uff0f/x"), NO_TARGET),
        Lie("a host that becomes a user", redirect("http://127.0.0.1\uff20localhost/x"), NO_TARGET),
        Lie("to a file", redirect("file:///etc/passwd"), unsupported("file")),
        Lie("to ftp", redirect("ftp://127.0.0.1/x"), unsupported("ftp")),
        Lie("to gopher", redirect("gopher://127.0.0.1/x"), unsupported("gopher")),
        Lie("to data", redirect("data:text/xml,%3Crss/%3E"), unsupported("data")),
        Lie("to pcast", redirect("pcast://127.0.0.1/x"), unsupported("pcast")),
    ),
    "Connections": (
        Lie("a body that drips", slow(answer(length(SIZE), body=b""), BODY, 0.005)),
        Lie("a header that drips", slow(b"", answer(length(SIZE)), 0.005)),
        Lie("a stall in the body", slow(answer(length(SIZE), body=BODY[:9]), BODY[9:], 0.5, parts=1)),
        Lie("a stall in the header", slow(FOUND, answer(length(SIZE))[len(FOUND):], 0.5, parts=1)),
        Lie("reset before the answer", reset(b""), RESET),
        Lie("reset in the header", reset(FOUND + b"Content-"), RESET),
        Lie("reset in the body", reset(answer(length(SIZE + 1))), RESET),
        Lie("reset in a body without length", reset(answer()), RESET),
        Lie("reset in a chunk", reset(chunked(chunk(BODY))), RESET),
        Lie("closed behind the answer without having said so", answer(length(SIZE), "Connection: keep-alive"),
            closes=True),
        Lie("refused", At(lambda servers, path: f"http://127.0.0.1:{servers.unused_port}{path}"),
            LibraryCause("Failed to connect to 127.0.0.1 port * after * ms: Couldn't connect to server")),
        Lie("a host that does not exist", At(lambda servers, path: f"http://nowhere.invalid{path}"),
            LibraryCause("Could not resolve host: nowhere.invalid")),
        Lie("an endless body; media may be of any size", endless(answer(body=b""), b"x" * (1 << 20)),
            OUT_OF_MEMORY, NOT_ASKED),
    ),
    "TLS": (
        Lie("a good certificate", tls("good")),
        Lie("a certificate of another host", tls("of another host"),
            LibraryCause("SSL: no alternative certificate subject name matches target host name '127.0.0.1'")),
        Lie("an expired certificate", tls("expired"),
            LibraryCause("SSL certificate problem: certificate has expired")),
        Lie("a certificate that is not yet valid", tls("not yet valid"),
            LibraryCause("SSL certificate problem: certificate is not yet valid")),
        Lie("a self-signed certificate", tls("self-signed"),
            LibraryCause("SSL certificate problem: self-signed certificate")),
        Lie("no TLS", At(lambda servers, path: servers.web.url(path, scheme="https")),
            LibraryCause("OpenSSL/*.*.*: error:0A00010B:SSL routines::wrong version number")),
        Lie("a whole second answer behind the first", tls_split(answer(length(SIZE), body=b""), BODY + OTHER)),
        Lie("a connection cut before the end of a body of known length", tls_cut(answer(length(SIZE + 1))), missing(1)),
        Lie("a connection cut before the end of chunks", tls_cut(chunked(chunk(BODY))), SHORT_CHUNKS),
        Lie("a connection cut in a body without length, which nobody can tell from its end", tls_cut(answer())),
    ),
}


def table():
    """The catalogue in Markdown."""
    lines = ["| what the server does | a feed is | media and posters are |", "|---|---|---|"]
    for section, lies in LIES.items():
        lines.append(f"| **{section}** | | |")
        for lie in lies:
            feed = lie.feed if lie.feed is READ else f"refused: `{lie.feed}`"
            outcome = lie.outcome
            if isinstance(outcome, bytes):
                outcome = STORED if outcome == BODY else f"stored as sent, {len(outcome):,} bytes"
            lines.append(f"| {lie.name} | {feed} | {outcome} |")
    return "\n".join(lines)


if __name__ == "__main__":
    print(table())
