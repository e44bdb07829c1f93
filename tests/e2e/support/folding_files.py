"""A file system in user space like those of memory cards: names that differ in the case of letters are one, and there are
no links, no renaming that refuses an existing name, and no permissions. It lives in memory. Mounting it takes root.

The protocol is the kernel's (linux/fuse.h), as far as the tool and its tests use it.

    python3 folding_files.py DIRECTORY    mounts it there, says so, and serves until it is unmounted
"""

import ctypes
import errno
import os
import stat
import struct
import sys

HEADER = struct.Struct("<IIQQIIII")  # of a request: length, kind, number, node, uid, gid, pid, padding
ATTRIBUTES = struct.Struct("<QQQQQQIIIIIIIIII")
BUFFER = 1 << 20
ROOT = 1


class Node:
    def __init__(self, number, mode):
        self.number, self.mode, self.content, self.names, self.modified = number, mode, bytearray(), {}, 0

    def attributes(self):
        return ATTRIBUTES.pack(self.number, len(self.content), 0, self.modified, self.modified, self.modified, 0, 0, 0,
                               self.mode, 1, 0, 0, 0, 4096, 0)


class Refusal(Exception):
    pass


def name_in(data):
    return data.split(b"\0", 1)[0]


class FileSystem:
    def __init__(self):
        self.nodes = {ROOT: Node(ROOT, stat.S_IFDIR | 0o777)}

    def new(self, parent, name, mode):
        if name.lower() in parent.names:
            raise Refusal(errno.EEXIST)
        node = Node(max(self.nodes) + 1, mode)
        self.nodes[node.number] = node
        parent.names[name.lower()] = (name, node)
        return node

    @staticmethod
    def child(parent, name):
        try:
            return parent.names[name.lower()][1]
        except KeyError:
            raise Refusal(errno.ENOENT) from None

    @staticmethod
    def entry(node):
        return struct.pack("<QQQQII", node.number, 0, 0, 0, 0, 0) + node.attributes()

    # One method for each kind of request: what is answered.

    def init(self, _node, _data):
        return struct.pack("<IIIIHHIIHHI7I", 7, 31, 0, 0, 0, 0, BUFFER - 4096, 1, 0, 0, 0, *[0] * 7)

    def lookup(self, node, data):
        return self.entry(self.child(node, name_in(data)))

    def getattr(self, node, _data):
        return struct.pack("<QII", 0, 0, 0) + node.attributes()

    def setattr(self, node, data):
        valid, _, _, size = struct.unpack_from("<IIQQ", data)
        if valid & 1:
            raise Refusal(errno.EPERM)  # permissions
        if valid & 8:
            del node.content[size:]
        return self.getattr(node, data)

    def mkdir(self, node, data):
        return self.entry(self.new(node, name_in(data[8:]), stat.S_IFDIR | 0o777))

    def create(self, node, data):
        return self.entry(self.new(node, name_in(data[16:]), stat.S_IFREG | 0o777)) + self.open(node, data)

    def open(self, _node, _data):
        return struct.pack("<QII", 0, 0, 0)

    def read(self, node, data):
        _, offset, size = struct.unpack_from("<QQI", data)
        return bytes(node.content[offset:offset + size])

    def write(self, node, data):
        _, offset, size = struct.unpack_from("<QQI", data)
        node.content[offset:offset + size] = data[40:40 + size]
        return struct.pack("<II", size, 0)

    def unlink(self, node, data):
        if stat.S_ISDIR(self.child(node, name_in(data)).mode):
            raise Refusal(errno.EISDIR)
        del node.names[name_in(data).lower()]
        return b""

    def rmdir(self, node, data):
        if self.child(node, name_in(data)).names:
            raise Refusal(errno.ENOTEMPTY)
        del node.names[name_in(data).lower()]
        return b""

    def rename(self, node, data):
        to = self.nodes[struct.unpack_from("<Q", data)[0]]
        old, new = data[8:].split(b"\0")[:2]
        moved = self.child(node, old)
        if stat.S_ISDIR(to.names.get(new.lower(), (new, moved))[1].mode) != stat.S_ISDIR(moved.mode):
            raise Refusal(errno.EISDIR)
        del node.names[old.lower()]
        to.names[new.lower()] = (new, moved)
        return b""

    def readdir(self, node, data):
        _, offset, size = struct.unpack_from("<QQI", data)
        listed = [(b".", node), (b"..", node), *node.names.values()]
        answer = b""
        for number, (name, entry) in enumerate(listed[offset:], offset + 1):
            line = struct.pack("<QQII", entry.number, number, len(name), entry.mode >> 12) + name
            line += bytes(-len(line) % 8)
            if len(answer) + len(line) > size:
                break
            answer += line
        return answer

    def statfs(self, _node, _data):
        return struct.pack("<QQQQQIIII24x", 1 << 20, 1 << 20, 1 << 20, 1 << 20, 1 << 20, 4096, 255, 4096, 0)

    def nothing(self, _node, _data):
        return b""

    def refused(self, _node, _data):
        raise Refusal(errno.EPERM)

    KINDS = {1: lookup, 3: getattr, 4: setattr, 6: refused, 9: mkdir, 10: unlink, 11: rmdir, 12: rename, 13: refused,
             14: open, 15: read, 16: write, 17: statfs, 18: nothing, 20: nothing, 25: nothing, 26: init, 27: open,
             28: readdir, 29: nothing, 30: nothing, 35: create}
    UNANSWERED = (2, 42)  # about what is forgotten

    def serve(self, device):
        while True:
            try:
                request = os.read(device, BUFFER)
            except OSError:
                return  # unmounted
            length, kind, number, node, *_ = HEADER.unpack_from(request)
            if kind in self.UNANSWERED:
                continue
            failure, answer = 0, b""
            try:
                if kind not in self.KINDS:
                    raise Refusal(errno.ENOSYS)
                answer = self.KINDS[kind](self, self.nodes.get(node), request[HEADER.size:length])
            except Refusal as refusal:
                failure = -refusal.args[0]
            os.write(device, struct.pack("<IiQ", 16 + len(answer), failure, number) + answer)


def main(directory):
    device = os.open("/dev/fuse", os.O_RDWR)
    options = f"fd={device},rootmode=40000,user_id=0,group_id=0,allow_other"
    library = ctypes.CDLL(None, use_errno=True)
    if library.mount(b"qel-test", os.fsencode(directory), b"fuse", 0, options.encode()) != 0:
        raise OSError(ctypes.get_errno(), os.strerror(ctypes.get_errno()))
    print("mounted", flush=True)
    FileSystem().serve(device)


if __name__ == "__main__":
    main(sys.argv[1])
