"""The replies that lies.py is made of: answers byte for byte, and what serves an exchange in its own way."""

import time
import zlib
from typing import Callable, NamedTuple

from support import rss

BODY = rss("<title>Night Walks</title>")
SIZE = len(BODY)


class At(NamedTuple):
    """Not an answer, but a place that gives none or gives it oddly: a function from the catalogue's servers and
    a path to the URL."""
    url: Callable


def answer(*fields, status="200 OK", body=BODY, version="HTTP/1.1"):
    """An answer of the header fields as they are; the body ends with the connection unless a field tells."""
    return "\r\n".join([f"{version} {status}", *fields, "", ""]).encode() + body


def length(number):
    return f"Content-Length: {number}"


def chunked(body, *fields):
    """An answer whose body is written in chunks already, rightly or not."""
    return answer("Transfer-Encoding: chunked", *fields, body=body)


def chunk(content):
    return b"%x\r\n%s\r\n" % (len(content), content)


def coded(coding, body, *fields):
    return answer(f"Content-Encoding: {coding}", length(len(body)), *fields, body=body)


def redirect(*locations, status="302 Found", fields=(length(5),), body=b"moved"):
    return answer(*(f"Location: {location}" for location in locations), *fields, status=status, body=body)


def reset(before):
    def serve(exchange):
        exchange.send(before)
        exchange.reset()
    return serve


def endless(before, piece):
    """Sends the piece again and again until the tool hangs up."""
    def serve(exchange):
        exchange.send(before)
        while True:
            exchange.send(piece)
    return serve


def slow(before, after, pause, parts=10):
    """Sends `before` at once, and the bytes of `after` in parts with a pause (seconds) before each."""
    def serve(exchange):
        exchange.send(before)
        part = len(after) // parts + 1
        for start in range(0, len(after), part):
            time.sleep(pause)
            exchange.send(after[start:start + part])
        exchange.close()
    return serve


def split(before, after):
    """Sends the bytes in two pieces, so that the library reads of the second one what it waits for and no more, and
    leaves the connection open."""
    def serve(exchange):
        exchange.send(before)
        time.sleep(0.02)
        exchange.send(after)
    return serve


def tls_split(before, after):
    """The same in two records of TLS."""
    def url(servers, path):
        return servers.tls("good").route(path, split(before, after)).replace("http", "https", 1)
    return At(url)


def cookie_gate(exchange):
    """Redirects back to itself whoever does not bring the cookie that it sets."""
    if exchange.request.headers.get("cookie") == "seen=yes":
        exchange.send(answer(length(SIZE)))
    else:
        exchange.send(redirect(exchange.request.path, fields=("Set-Cookie: seen=yes", length(5))))


def bomb(size):
    """A small gzip stream of that many bytes."""
    packer = zlib.compressobj(9, zlib.DEFLATED, zlib.MAX_WBITS + 16)
    zeros = bytes(1 << 20)
    return b"".join([*(packer.compress(zeros) for _ in range(size >> 20)), packer.flush()])


def tls(certificate):
    return At(lambda servers, path: servers.tls(certificate).url(path, scheme="https"))


def tls_cut(reply):
    """Sends the bytes and closes the connection without TLS's own goodbye, as one who cuts a line does."""
    def url(servers, path):
        server = servers.tls("good")
        server.raw(f"{path}?cut", reply)
        return server.url(f"{path}?cut", scheme="https")
    return At(url)
