"""Documents made to exhaust whoever reads them, of any size: what the tests of hostile documents share.

Documents are bytes, since much of what they hold is no text. A size is the number of bytes that the repeated
part of a document is to have, or just above.
"""

import ctypes
import os
import struct

from support import rss_text

# Feeds

_FEED_HEAD, _FEED_TAIL = rss_text("\0").encode().split(b"\0")


def feed(content, prolog=b""):
    """An RSS document whose channel holds the content, without a declaration."""
    return prolog + _FEED_HEAD + content + _FEED_TAIL


def doctype(declarations):
    return b"<!DOCTYPE rss [" + declarations + b"]>"


def declaration(encoding):
    return f"<?xml version='1.0' encoding='{encoding}'?>".encode()


# Property lists in XML

def podcast(content):
    """A property list of one dictionary, which holds the content."""
    return b"<plist><dict>" + content + b"</dict></plist>"


def episodes(content):
    return podcast(b"<key>Episodes</key><array>" + content + b"</array>")


# Property lists in the binary form

def binary_list(objects, top=0, offset_size=2, reference_size=1, count=None, table=None):
    """A binary property list of the raw objects, with a trailer that may say what it likes."""
    body = bytearray(b"bplist00")
    offsets = []
    for content in objects:
        offsets.append(len(body))
        body += content
    start = len(body) if table is None else table
    for offset in offsets:
        body += (offset % 256**offset_size).to_bytes(offset_size, "big")
    return bytes(body) + struct.pack(">5xBBBQQQ", 0, offset_size, reference_size,
                                     len(objects) if count is None else count, top, start)


def counted(kind, count):
    """The beginning of an object that has a count."""
    return bytes([kind << 4 | count]) if count < 15 else bytes([kind << 4 | 15, 0x13]) + count.to_bytes(8, "big")


def ascii_object(text):
    return counted(0x5, len(text)) + text


def array_object(elements, reference_size=1, kind=0xa):
    return counted(kind, len(elements)) + _references(elements, reference_size)


def dictionary_object(entries, reference_size=1):
    """Of the numbers of keys and of their values."""
    return (counted(0xd, len(entries)) + _references(entries.keys(), reference_size)
            + _references(entries.values(), reference_size))


def _references(numbers, size):
    return b"".join(number.to_bytes(size, "big") for number in numbers)


def binary_podcast(key, *objects, **options):
    """A binary list whose dictionary has under the key the first of the objects, which has the number 2."""
    return binary_list([dictionary_object({1: 2}, options.get("reference_size", 1)), ascii_object(key), *objects],
                       **options)


# Parts of a given size

def repeated(part, size):
    return part * -(-size // len(part))


def numbered(part, size):
    """The part again and again, each time with another number for its every "#"."""
    count = -(-size // (len(part) + 5 * part.count(b"#")))
    return b"".join(part.replace(b"#", b"%d" % number) for number in range(count))


def nested(opening, closing, size):
    count = -(-size // len(opening + closing))
    return opening * count + closing * count


def chain_of_entities(size):
    """Each is made of the one before."""
    return b"<!ENTITY e 'x'>" + b"".join(b"<!ENTITY e%d '&e%s;'>" % (number, b"%d" % (number - 1) if number else b"")
                                         for number in range(size // 25))


def laughs(levels, ways=10):
    """Entities of which each is ten times the one before."""
    return b"<!ENTITY e0 '0123456789'>" + b"".join(
        b"<!ENTITY e%d '%s'>" % (level, b"&e%d;" % (level - 1) * ways) for level in range(1, levels + 1))


def binary_laughs(levels, filling=b""):
    """Lists of which each holds the one before twice."""
    objects = [array_object([number + 1] * 2, 4) for number in range(3, 3 + levels)]
    return binary_podcast(b"Episodes", array_object([3], 4), *objects, b"\x09", counted(0x4, len(filling)) + filling,
                          offset_size=4, reference_size=4)


def overlapping_texts(size):
    """A list of texts, each of which runs over all that follow it."""
    width = 10
    count = -(-size // (width + 8))
    texts = [b"\x5f\x13" + ((count - 1 - number) * width).to_bytes(8, "big") for number in range(count)]
    return binary_podcast(b"Episodes", array_object(range(3, 3 + count), 4), *texts, offset_size=4, reference_size=4)


# Names that the hash of C++'s usual library, MurmurHash64A, makes equal: what it does to each eight bytes is
# undone, and a change of the highest bit in two successive eights cancels out.

def colliding_names(doublings):
    """2**doublings names; none has a byte that would be replaced in the name of a file."""
    factor, top = 0xc6a4a7935bd1e995, 1 << 63
    inverse = pow(factor, -1, 1 << 64)

    def hashed_as(mixed):
        block = mixed * inverse % (1 << 64)
        return ((block ^ block >> 47) * inverse % (1 << 64)).to_bytes(8, "little")

    names = [b""]
    mixed = 0
    while len(names) < 1 << doublings:
        mixed += 2
        pair = [hashed_as(mixed) + hashed_as(mixed + 1), hashed_as(mixed ^ top) + hashed_as((mixed + 1) ^ top)]
        if not set(b"".join(pair)) & set(b"\0/:."):
            names = [name + part for name in names for part in pair]
    return names


def percent_encoded(name):
    return b"".join(b"%%%02x" % byte for byte in name)


class FileWatch:
    """Tells which of some files have been opened, whoever did it and however quickly."""

    _IN_OPEN = 0x20
    _EVENT = struct.Struct("iIII")

    def __init__(self, *paths):
        library = ctypes.CDLL(None, use_errno=True)
        self._descriptor = library.inotify_init1(os.O_NONBLOCK | os.O_CLOEXEC)
        if self._descriptor < 0:
            raise OSError(ctypes.get_errno(), "inotify_init1")
        self._names = {library.inotify_add_watch(self._descriptor, os.fsencode(path), self._IN_OPEN):
                       os.path.basename(path) for path in paths}

    def openings(self):
        """The names of the files that were opened since the last call, in order."""
        names = []
        try:
            events = os.read(self._descriptor, 1 << 16)
        except BlockingIOError:
            return names
        while events:
            watch, _, _, length = self._EVENT.unpack_from(events)
            names.append(self._names[watch])
            events = events[self._EVENT.size + length:]
        return names

    def close(self):
        os.close(self._descriptor)
