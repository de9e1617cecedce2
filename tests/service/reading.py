# SPDX-License-Identifier: MIT
"""Reading as clients do that look at the data where it lies: in memory of the service, or in memory of their own."""
import concurrent.futures
import ctypes
import fcntl
import mmap
import os

from gi.repository import Gio, GLib
from harness import KORVEL, PATH, WAIT, make_card

BAD_RANGE = -21449
TOO_LONG = -21446

LARGE = 65_536  # from here on data travels as memory
SLOT = 2_097_152
LONGEST = 4_194_304
READ = "requestReadDataFromObjectHandle_options_withReply"

F_SEAL_FUTURE_WRITE = 0x0010  # of Linux 5.1


class Answer:
    """What a read gave. Data that came as memory stays there until close(); slices of it are bytes."""

    def __init__(self, reply, descriptors):
        entries = reply.get_child_value(0)
        pairs = [entries.get_child_value(i) for i in range(entries.n_children())]
        self.values = {pair.get_child_value(0).get_string(): pair.get_child_value(1).get_variant() for pair in pairs}
        self.code = self.values["errCode"].unpack()
        self.fd = None
        self.data = b""
        data = self.values["OVReadData"]
        if data.get_type_string() == "ay":
            self.data = bytes(data.get_data_as_bytes().get_data() or b"")
        else:
            self.fd = descriptors.get(data.get_child_value(0).get_handle())
            self.data = mmap.mmap(self.fd, data.get_child_value(1).get_uint64(), prot=mmap.PROT_READ)

    def __len__(self):
        return len(self.data)

    def __getitem__(self, place):
        return self.data[place]

    @property
    def count(self):
        """How many bytes came into lent memory."""
        return self.values["OVReadBufferCount"].unpack()

    def take(self):
        """All of the data, for the last time."""
        taken = self.data[:]
        self.close()
        return taken

    def close(self):
        if self.fd is not None:
            self.data.close()
            os.close(self.fd)
            self.fd = None


def call(device, member, handle, options, descriptors=None):
    """The plain reply, and the descriptors that came with it."""
    return device.bus.call_with_unix_fd_list_sync(
        None, PATH, KORVEL, member, GLib.Variant("(ta{sv})", (handle, options)), None, Gio.DBusCallFlags.NONE,
        WAIT * 1000, descriptors, None)


def range_options(offset, length):
    """Numbers travel as such; what is a variant already stays what it is."""
    options = {"OVReadOffset": offset, "OVReadLength": length}
    return {name: value if isinstance(value, GLib.Variant) else GLib.Variant("t", value)
            for name, value in options.items() if value is not None}


def read(device, handle, offset=None, length=None):
    return Answer(*call(device, READ, handle, range_options(offset, length)))


def read_into(device, handle, offset, length, fd, size, also=None):
    """Reads into lent memory of which `size` bytes are said to be usable."""
    descriptors = Gio.UnixFDList.new()
    options = {**range_options(offset, length), **(also or {}),
               "OVReadBuffer": GLib.Variant("(ht)", (descriptors.append(fd), size))}
    return Answer(*call(device, READ, handle, options, descriptors))


def open_stream(device, handle):
    answer = Answer(*call(device, READ, handle, {"OVReadBufferStreamOpen": GLib.Variant("b", True)}))
    return answer.code, len(answer)


def close_stream(device, handle):
    answer = Answer(*call(device, READ, handle, {"OVReadBufferStreamClose": GLib.Variant("b", True)}))
    return answer.code, len(answer)


def pieces(device, handle, size, start=0):
    """The pieces of an open stream from `start` on, with their offsets, until the end or an empty one. Each is closed
    when the next is asked for."""
    offset = start
    while offset < size:
        answer = read(device, handle, offset, min(SLOT, size - offset))
        if answer.code != 0:
            raise AssertionError(f"error {answer.code} at {offset}")
        if len(answer) == 0:
            return
        yield offset, answer
        offset += len(answer)
        answer.close()


def streamed(device, handle, size):
    """All that a stream gives from its opening to its close."""
    assert open_stream(device, handle) == (0, 0)
    data = b"".join(piece[:] for _, piece in pieces(device, handle, size))
    assert close_stream(device, handle) == (0, 0)
    return data


class Lent:
    """A memfd to lend, filled with one byte."""

    def __init__(self, size, seals=fcntl.F_SEAL_SHRINK, filling=b"\xa5"):
        self.fd = os.memfd_create("lent", os.MFD_CLOEXEC | os.MFD_ALLOW_SEALING)
        self.size = size
        os.pwrite(self.fd, filling * size, 0)
        if seals:
            fcntl.fcntl(self.fd, fcntl.F_ADD_SEALS, seals)

    def bytes(self):
        return os.pread(self.fd, self.size, 0)

    def close(self):
        os.close(self.fd)


class BareMapping:
    """Memory that came with an answer, mapped without any descriptor of it."""

    LIBC = ctypes.CDLL(None, use_errno=True)
    LIBC.mmap.restype = ctypes.c_void_p
    LIBC.mmap.argtypes = [ctypes.c_void_p, ctypes.c_size_t, *[ctypes.c_int] * 3, ctypes.c_long]
    LIBC.munmap.argtypes = [ctypes.c_void_p, ctypes.c_size_t]

    def __init__(self, answer):
        self.size = len(answer)
        self.address = self.LIBC.mmap(None, self.size, mmap.PROT_READ, mmap.MAP_SHARED, answer.fd, 0)
        assert self.address != ctypes.c_void_p(-1).value
        answer.close()

    def take(self):
        """All of it, for the last time."""
        taken = ctypes.string_at(self.address, self.size)
        self.LIBC.munmap(self.address, self.size)
        return taken


def sparse(path, size, marks=()):
    """A file that takes no room, with some bytes in it: (offset, bytes)."""
    with open(path, "wb") as file:
        file.truncate(size)
        for offset, mark in marks:
            file.seek(offset)
            file.write(mark)


class Reads:
    """What a test of reading needs besides its service."""

    def the_manager(self):
        """A process has one connection to the manager."""
        if not hasattr(self, "_manager"):
            self._manager = self.manager()
        return self._manager

    def card(self, files, name="CARD"):
        """Serves a card with these files: contents, or functions that make the file at a path. Gives the device, where
        the card is, and the handles by name."""
        made, served = f"{self.service.folder}/{name}", f"{self.service.volumes}/{name}"
        make_card(made, {f"100ABCDE/{file}": content for file, content in files.items() if not callable(content)})
        os.makedirs(f"{made}/DCIM/100ABCDE", exist_ok=True)
        for file, make in files.items():
            if callable(make):
                make(f"{made}/DCIM/100ABCDE/{file}")
        os.rename(made, served)
        device = self.device(self.the_manager(), served)
        return device, served, self.handles_on(device, *files)

    def handles_on(self, device, *names):
        device.enumerate()
        return {name: dataset.handle for name, dataset in device.wait_for("DCIM", *names).items()}

    def closing(self, closable):
        self.addCleanup(closable.close)
        return closable

    def memory_named(self, name):
        """The service's mappings of memfds with this name."""
        with open(f"/proc/{self.service.process.pid}/maps", encoding="utf-8") as maps:
            return [line for line in maps if f"/memfd:{name} " in line]

    def forget_peak(self):
        """From here on the peak counts anew; gives what is resident now, in KiB."""
        with open(f"/proc/{self.service.process.pid}/clear_refs", "w", encoding="ascii") as refs:
            refs.write("5")
        return self.service.resident_kilobytes()

    def peak(self):
        """The most that was resident, in KiB."""
        with open(f"/proc/{self.service.process.pid}/status", encoding="ascii") as status:
            return next(int(line.split()[1]) for line in status if line.startswith("VmHWM"))


def at_once(*calls):
    """Runs them in threads of their own: futures of what they give."""
    pool = concurrent.futures.ThreadPoolExecutor(len(calls))
    futures = [pool.submit(function) for function in calls]
    pool.shutdown(wait=False)
    return futures
