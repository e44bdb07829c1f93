"""An HTTP server that serves feeds and media well, or badly on purpose, and remembers who asked.

It listens on 127.0.0.1 at a port that the system picks, speaks HTTP/1.1 with connections kept open, and
runs in threads that end with the process. Routes that misbehave below HTTP write their own bytes.
"""

import gzip
import itertools
import socket
import struct
import threading
import time
from http.server import BaseHTTPRequestHandler, ThreadingHTTPServer
from typing import NamedTuple


class Request(NamedTuple):
    method: str
    path: str  # the request target as sent: path and query
    version: str
    headers: dict  # names in lower case
    connection: int  # the same number for requests on the same connection


class FeedServer:
    """Routes are added by the methods below, each of which returns the URL of its route."""

    def __init__(self):
        self.requests = []
        self.connections = 0
        self._routes = {}
        self._server = ThreadingHTTPServer(("127.0.0.1", 0), _Handler)
        self._server.daemon_threads = True
        self._server.block_on_close = False
        self._server.owner = self
        self._thread = threading.Thread(target=self._server.serve_forever, args=(0.01,), daemon=True)
        self._thread.start()

    def stop(self):
        self._server.shutdown()
        self._server.server_close()
        self._thread.join()

    def use_tls(self, context):
        """Speaks TLS from now on, by the ssl module's context."""
        self._server.socket = context.wrap_socket(self._server.socket, server_side=True, do_handshake_on_connect=False)

    @property
    def port(self):
        return self._server.server_address[1]

    def url(self, path, scheme="http"):
        return f"{scheme}://127.0.0.1:{self.port}{path}"

    def hits(self, path):
        """How many requests asked for the path, query included."""
        return sum(request.path == path for request in self.requests)

    # Routes

    def route(self, path, answer):
        """Has `answer`, called with an Exchange, serve the path."""
        self._routes[path] = answer
        return self.url(path)

    def serve(self, path, body, status=200, headers=()):
        """Serves the body with its true length."""
        return self.route(path, lambda exchange: exchange.reply(status, body, headers))

    def redirect(self, path, location, status=302, headers=()):
        """Redirects to the location as it is written."""
        return self.serve(path, b"moved", status, [*headers, ("Location", location)])

    def compressed(self, path, body):
        """Serves the body compressed by gzip."""
        return self.serve(path, gzip.compress(body), headers=[("Content-Encoding", "gzip")])

    def chunked(self, path, chunks, headers=()):
        """Serves the body in chunks."""
        def answer(exchange):
            exchange.head(200, [("Transfer-Encoding", "chunked"), *headers])
            for chunk in chunks:
                exchange.send(b"%x\r\n%s\r\n" % (len(chunk), chunk))
            exchange.send(b"0\r\n\r\n")
        return self.route(path, answer)

    def truncated(self, path, body, missing):
        """Announces `missing` bytes more than it sends."""
        def answer(exchange):
            exchange.head(200, [("Content-Length", str(len(body) + missing))])
            exchange.send(body)
            exchange.close()
        return self.route(path, answer)

    def until_closed(self, path, body):
        """Announces no length: the end of the connection is the end of the body."""
        def answer(exchange):
            exchange.head(200, [("Connection", "close")])
            exchange.send(body)
            exchange.close()
        return self.route(path, answer)

    def dripping(self, path, body, pause, piece=1):
        """Sends `piece` bytes at a time with a pause (seconds) before each."""
        def answer(exchange):
            exchange.head(200, [("Content-Length", str(len(body)))])
            for start in range(0, len(body), piece):
                time.sleep(pause)
                exchange.send(body[start:start + piece])
        return self.route(path, answer)

    def raw(self, path, answer_bytes, closes=True):
        """Sends the bytes, whatever they are, and closes the connection or not."""
        def answer(exchange):
            exchange.send(answer_bytes)
            if closes:
                exchange.close()
        return self.route(path, answer)


class Exchange:
    """One request being answered."""

    def __init__(self, handler, request):
        self._handler = handler
        self.request = request

    def head(self, status, headers=()):
        """Sends the status line and the header fields, and nothing that was not asked for."""
        self._handler.send_response_only(status)
        for name, value in headers:
            self._handler.send_header(name, value)
        self._handler.end_headers()

    def reply(self, status, body, headers=()):
        allows_body = status >= 200 and status not in (204, 304)
        length = [("Content-Length", str(len(body)))] if allows_body else []
        self.head(status, [*length, *headers])
        if allows_body:
            self.send(body)

    def send(self, content):
        self._handler.wfile.write(content)
        self._handler.wfile.flush()

    def close(self):
        self._handler.close_connection = True

    def reset(self):
        connection = self._handler.connection
        connection.setsockopt(socket.SOL_SOCKET, socket.SO_LINGER, struct.pack("ii", 1, 0))
        self._handler.rfile.close()  # the socket is closed with the last file made of it
        connection.close()
        self.close()


class _Handler(BaseHTTPRequestHandler):
    protocol_version = "HTTP/1.1"
    disable_nagle_algorithm = True
    _numbers = itertools.count()

    def setup(self):
        super().setup()
        self._number = next(self._numbers)
        self.server.owner.connections += 1

    def handle(self):
        try:
            super().handle()
        except OSError:
            pass  # the tool may hang up when it likes

    def do_GET(self):
        owner = self.server.owner
        headers = {name.lower(): value for name, value in self.headers.items()}
        request = Request(self.command, self.path, self.request_version, headers, self._number)
        owner.requests.append(request)
        exchange = Exchange(self, request)
        answer = owner._routes.get(self.path)
        if answer is None:
            exchange.reply(404, b"not found")
        else:
            answer(exchange)

    do_HEAD = do_POST = do_PUT = do_GET

    def log_message(self, *_):
        pass
