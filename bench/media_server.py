"""A web server on loopback that hands out the files of a directory, for as long as a "with" block lasts."""

import contextlib
import shutil
import socket
import subprocess
import tempfile
import time
from pathlib import Path

# One process and no log: the rivals, not the server, are what is measured.
CONFIGURATION = """
daemon off;
master_process off;
pid {home}/nginx.pid;
error_log {home}/error.log;
events {{ }}
http {{
  access_log off;
  sendfile on;
  keepalive_requests 1000000;
  client_body_temp_path {home}/body;
  proxy_temp_path {home}/proxy;
  fastcgi_temp_path {home}/fastcgi;
  uwsgi_temp_path {home}/uwsgi;
  scgi_temp_path {home}/scgi;
  default_type audio/mpeg;
  server {{
    listen 127.0.0.1:{port};
    root {root};
  }}
}}
"""
ATTEMPTS = 5  # another program may take the port between its choice and its use


def program():
    """The path of nginx, or None; Debian keeps it where only root looks."""
    return shutil.which("nginx") or shutil.which("nginx", path="/usr/sbin:/usr/local/sbin")


@contextlib.contextmanager
def serving(directory):
    """Yields the URL of the directory's files."""
    with tempfile.TemporaryDirectory(prefix="qel-bench-nginx-") as home:
        server, url = _start(Path(home), directory)
        try:
            yield url
        finally:
            server.terminate()
            server.wait(timeout=10)


def _start(home, directory):
    for _ in range(ATTEMPTS):
        port = _free_port()
        configuration = home / "nginx.conf"
        configuration.write_text(CONFIGURATION.format(home=home, port=port, root=directory), encoding="utf-8")
        server = subprocess.Popen([program(), "-p", home, "-c", configuration, "-e", home / "error.log"],
                                  stdin=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
        if _answers(server, port):
            return server, f"http://127.0.0.1:{port}"
    raise OSError(f"nginx does not start: {(home / 'error.log').read_text(encoding='utf-8')}")


def _free_port():
    with socket.socket() as chosen:
        chosen.bind(("127.0.0.1", 0))
        return chosen.getsockname()[1]


def _answers(server, port):
    """Whether the server takes connections, before it ends."""
    while server.poll() is None:
        with contextlib.suppress(OSError):
            socket.create_connection(("127.0.0.1", port), timeout=1).close()
            return server.poll() is None
        time.sleep(0.02)
    return False
