"""Certificates for servers of this machine: a good one and bad ones of one authority, made by openssl in a moment.

The tool trusts their authority where the environment names its file or directory.
"""

import shutil
import ssl
import subprocess

AUTHORITY = "authority.pem"
KEY = "server.key"

_CONFIGURATION = """
[ca]
default_ca = authority
[authority]
database = index.txt
new_certs_dir = .
rand_serial = yes
default_md = sha256
policy = any_name
unique_subject = no
[any_name]
commonName = supplied
[this_host]
subjectAltName = IP:127.0.0.1, DNS:localhost
[other_host]
subjectAltName = DNS:other.example
"""

_NEW_KEY = ("-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:prime256v1", "-nodes")

# Certificate: section of its names, first and last moment.
_SIGNED = {
    "good": ("this_host", "20200101000000Z", "20991231235959Z"),
    "of another host": ("other_host", "20200101000000Z", "20991231235959Z"),
    "expired": ("this_host", "20200101000000Z", "20210101000000Z"),
    "not yet valid": ("this_host", "20980101000000Z", "20991231235959Z"),
}


def available():
    return shutil.which("openssl") is not None


def make(directory):
    """Makes the certificates in the directory; name to server context of the ssl module."""
    def openssl(*arguments):
        subprocess.run(["openssl", *arguments], cwd=directory, check=True, capture_output=True)

    (directory / "ca.cnf").write_text(_CONFIGURATION)
    (directory / "index.txt").touch()
    openssl("req", "-x509", *_NEW_KEY, "-keyout", "authority.key", "-out", AUTHORITY, "-days", "2", "-subj",
            "/CN=Authority of the tests")
    openssl("req", "-new", *_NEW_KEY, "-keyout", KEY, "-out", "server.csr", "-subj", "/CN=127.0.0.1")
    files = {"self-signed": "self-signed.pem"}
    openssl("req", "-x509", "-key", KEY, "-out", files["self-signed"], "-days", "2", "-subj", "/CN=127.0.0.1",
            "-addext", "subjectAltName=IP:127.0.0.1")
    for number, (name, (section, first, last)) in enumerate(_SIGNED.items()):
        files[name] = f"{number}.pem"
        openssl("ca", "-batch", "-notext", "-config", "ca.cnf", "-cert", AUTHORITY, "-keyfile", "authority.key", "-in",
                "server.csr", "-out", files[name], "-extensions", section, "-startdate", first, "-enddate", last)
    contexts = {}
    for name, file in files.items():
        contexts[name] = ssl.SSLContext(ssl.PROTOCOL_TLS_SERVER)
        contexts[name].load_cert_chain(directory / file, directory / KEY)
    return contexts
