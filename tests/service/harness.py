# SPDX-License-Identifier: MIT
"""Starts the real brivod and talks to it through GLib's D-Bus implementation, as clients in other languages do."""
import contextlib
import json
import os
import shutil
import signal
import socket
import sqlite3
import struct
import subprocess
import sys
import tempfile
import threading
import time
import unittest

import gi

gi.require_version("Gio", "2.0")
from gi.repository import Gio, GLib  # noqa: E402

BUILD = os.environ["BRIVOD_BUILD"]
BRIVOD = f"{BUILD}/bin/brivod"
BRIVOCTL = f"{BUILD}/bin/brivoctl"
SHARE = f"{BUILD}/share"
PYTHON = os.path.realpath(sys.executable)

PATH = "/org/orvid/brivod"
MANAGER = "org.orvid.OVZEPHDeviceManagerProtocol"
KORVEL = "org.orvid.KorvelProtocol"
WAIT = 30  # seconds, for what should take none

IS_ROOT = os.geteuid() == 0


def wait_until(condition, what, limit=WAIT):
    """Looks until the condition gives something true, and returns that."""
    deadline = time.monotonic() + limit
    while True:
        found = condition()
        if found:
            return found
        if time.monotonic() > deadline:
            raise AssertionError(f"did not happen in {limit} s: {what}")
        time.sleep(0.005)


class Service:
    """A brivod with folders of its own."""

    def __init__(self, grant=True, start=True, **environment):
        self.folder = os.path.realpath(tempfile.mkdtemp(prefix="brivod-service-"))
        self.volumes = f"{self.folder}/volumes"
        self.mounts = f"{self.folder}/mounts"
        self.runtime = f"{self.folder}/run"
        self.data = f"{self.folder}/data"
        self.database = f"{self.data}/org.orvid.imagecapture/externalMediaAccess.db"
        for path in (self.volumes, self.mounts, self.data):
            os.mkdir(path)
        self.environment = {
            "PATH": os.environ["PATH"],
            "HOME": self.folder,
            "BRIVOD_RUNTIME_DIR": self.runtime,
            "BRIVOD_VOLUME_ROOTS": self.mounts,
            "BRIVOD_VOLUME_FOLDERS": self.volumes,
            "XDG_DATA_HOME": self.data,
            "XDG_CONFIG_HOME": f"{self.folder}/config",
            "XDG_DATA_DIRS": SHARE,
        }
        for name in ("ASAN_OPTIONS", "TSAN_OPTIONS", "UBSAN_OPTIONS", "LSAN_OPTIONS"):
            if name in os.environ:
                self.environment[name] = os.environ[name]
        self.environment.update(environment)
        self.environment = {name: value for name, value in self.environment.items() if value is not None}
        self.log_path = f"{self.folder}/log"
        self.address = f"unix:path={self.runtime}/manager"
        self.command = [BRIVOD]
        self.process = None
        if grant:
            self.grant(PYTHON)
        if start:
            self.start()

    def start(self, prefix=()):
        with open(self.log_path, "ab") as log:
            self.process = subprocess.Popen([*prefix, *self.command], env=self.environment, stdin=subprocess.DEVNULL,
                                            stderr=log)
        wait_until(lambda: self.process.poll() is not None or os.path.exists(f"{self.runtime}/manager"), "the socket")
        if self.process.poll() is not None:
            raise AssertionError("brivod ended at once:\n" + self.log())

    def stop(self):
        """Asks it to end and gives its exit code."""
        if self.process is None:
            return 0
        self.process.send_signal(signal.SIGTERM)
        code = self.process.wait(WAIT)
        self.process = None
        return code

    def close(self):
        code = self.stop()
        log = self.log()
        shutil.rmtree(self.folder, ignore_errors=True)
        if code != 0 or "ERROR: " in log or "WARNING: ThreadSanitizer" in log or "runtime error:" in log:
            raise AssertionError(f"brivod ended with {code}:\n{log[-8000:]}")

    def log(self):
        with contextlib.suppress(FileNotFoundError), open(self.log_path, encoding="utf-8", errors="replace") as log:
            return log.read()
        return ""

    def brivoctl(self, *arguments, **options):
        return subprocess.run([BRIVOCTL, *arguments], env=self.environment, capture_output=True, timeout=WAIT * 2,
                              **options)

    def grant(self, identifier):
        result = self.brivoctl("access", "grant", identifier)
        assert result.returncode == 0, result.stderr

    # What the process holds.
    def descriptors(self):
        return os.listdir(f"/proc/{self.process.pid}/fd")

    def descriptors_below(self, path):
        return [target for target in self.targets() if target.startswith(path)]

    def targets(self):
        """What the open descriptors are once the first worker runs, without the timers that come with the first
        deadline and the processes that have been decided about: those that have ended go with the next decision."""
        wait_until(lambda: "imaging worker: " in self.log(), "the first worker")
        found = []
        for fd in self.descriptors():
            with contextlib.suppress(OSError):
                found.append(os.readlink(f"/proc/{self.process.pid}/fd/{fd}"))
        return [target for target in found if target not in ("anon_inode:[timerfd]", "anon_inode:[pidfd]")]

    def threads(self):
        """The names of its threads."""
        found = []
        for thread in os.listdir(f"/proc/{self.process.pid}/task"):
            with contextlib.suppress(FileNotFoundError), \
                    open(f"/proc/{self.process.pid}/task/{thread}/comm", encoding="utf-8") as name:
                found.append(name.read().strip())
        return found

    def is_instrumented(self):
        """Whether a sanitizer watches it, and takes memory of its own for that."""
        with open(f"/proc/{self.process.pid}/maps", encoding="utf-8") as maps:
            return any(name in line for line in maps for name in ("libtsan", "libasan"))

    def resident_kilobytes(self):
        with open(f"/proc/{self.process.pid}/status", encoding="ascii") as status:
            return next(int(line.split()[1]) for line in status if line.startswith("VmRSS"))


def make_card(folder, files, root="DCIM"):
    """Makes a card: {"100ABCDE/IMG_0001.JPG": b"..."} below the media folder."""
    os.makedirs(f"{folder}/{root}", exist_ok=True)
    for name, content in files.items():
        path = f"{folder}/{root}/{name}"
        os.makedirs(os.path.dirname(path), exist_ok=True)
        with open(path, "wb") as file:
            file.write(content)


class Connection:
    """One peer-to-peer connection, to an address or over a socket that is connected already. Signals are kept by a thread
    that runs a GLib loop."""

    def __init__(self, address, interface):
        self.interface = interface
        self.signals = []
        self.closed = threading.Event()
        self._context = GLib.MainContext()
        self._loop = GLib.MainLoop(self._context)
        ready = threading.Event()
        self._failure = None

        def run():
            self._context.push_thread_default()
            try:
                self._connect(address)
            except GLib.Error as error:
                self._failure = error
            ready.set()
            if self._failure is None:
                self._loop.run()
            self._context.pop_thread_default()

        self._thread = threading.Thread(target=run, daemon=True)
        self._thread.start()
        ready.wait(WAIT)
        if self._failure is not None:
            raise self._failure

    def _connect(self, address):
        flags = Gio.DBusConnectionFlags.AUTHENTICATION_CLIENT | Gio.DBusConnectionFlags.DELAY_MESSAGE_PROCESSING
        if isinstance(address, int):
            stream = Gio.Socket.new_from_fd(address).connection_factory_create_connection()
            self.bus = Gio.DBusConnection.new_sync(stream, None, flags, None, None)
        else:
            self.bus = Gio.DBusConnection.new_for_address_sync(address, flags, None, None)
        self.bus.connect("closed", lambda *_: self.closed.set())
        self.bus.signal_subscribe(None, self.interface, None, None, None, 0, self._on_signal)
        self.bus.start_message_processing()

    def _on_signal(self, _bus, _sender, _path, _interface, member, arguments):
        self.signals.append((member, arguments))

    def call(self, member, arguments=None, interface=None, timeout=WAIT):
        """The reply, unpacked; descriptors in it become the bytes that they hold."""
        reply, descriptors = self.bus.call_with_unix_fd_list_sync(
            None, PATH, interface or self.interface, member, arguments, None, Gio.DBusCallFlags.NONE,
            timeout * 1000, None, None)
        return unpacked(reply, descriptors)

    def named(self, member):
        return [arguments for name, arguments in list(self.signals) if name == member]

    def close(self):
        with contextlib.suppress(GLib.Error):
            self.bus.close_sync(None)
        # On the loop: it may not have begun to run yet.
        quit_loop = GLib.idle_source_new()
        quit_loop.set_callback(lambda *_: self._loop.quit())
        quit_loop.attach(self._context)
        self._thread.join(WAIT)


def unpacked(variant, descriptors):
    values = [_plain(variant.get_child_value(i), descriptors) for i in range(variant.n_children())]
    return values[0] if len(values) == 1 else values


def _plain(variant, descriptors):
    kind = variant.get_type_string()
    if kind == "v":
        return _plain(variant.get_variant(), descriptors)
    if kind == "ay":
        return bytes(variant.get_data_as_bytes().get_data() or b"")
    if kind == "(ht)":
        index, size = variant.get_child_value(0).get_handle(), variant.get_child_value(1).get_uint64()
        fd = descriptors.get(index)
        try:
            return os.pread(fd, size, 0)
        finally:
            os.close(fd)
    if kind == "a{sv}":
        entries = [variant.get_child_value(i) for i in range(variant.n_children())]
        return {e.get_child_value(0).get_string(): _plain(e.get_child_value(1), descriptors) for e in entries}
    if kind.startswith("a"):
        return [_plain(variant.get_child_value(i), descriptors) for i in range(variant.n_children())]
    return variant.unpack()


class Manager(Connection):
    def __init__(self, service):
        super().__init__(service.address, MANAGER)

    def devices(self):
        return self.call("requestDeviceListWithReply")["OVDeviceContexts"]

    def wait_for_device(self, path):
        return wait_until(lambda: next((d for d in self.devices() if d["OVDevicePrimaryIdentifier"] == path), None),
                          f"the device at {path}")

    def open(self, handle):
        return self.call("openDevice_withReply", GLib.Variant("(s)", (handle,)))


class Device(Connection):
    def __init__(self, manager, path):
        context = manager.wait_for_device(path)
        self.handle = context["OVDeviceHandle"]
        self.opened = manager.open(self.handle)
        self._batches = []
        super().__init__(self.opened["OVDeviceEndpoint"], KORVEL)
        self.properties = self.start_using()

    def start_using(self):
        return self.call("requestStartUsingDeviceWithReply")

    def register(self, *types):
        return self.call("registerInterestedEventNotifications", GLib.Variant("(as)", (types,)))

    def enumerate(self, **options):
        return self.call("enumerateContentWithOptions", GLib.Variant("(a{sv})", (variants(options),)))

    def request(self, member, handle, options=None):
        return self.call(f"{member}_options_withReply",
                         GLib.Variant("(ta{sv})", (handle, variants(options or {}))))

    def read(self, handle, offset=None, length=None, **options):
        if offset is not None:
            options["OVReadOffset"] = GLib.Variant("t", offset)
        if length is not None:
            options["OVReadLength"] = GLib.Variant("t", length)
        return self.request("requestReadDataFromObjectHandle", handle, options)

    def delete(self, handle):
        return self.request("requestDeleteObjectHandle", handle)

    # What arrived.
    def ready_counts(self):
        return [note["OVANumberOfPreflightObjectsKey"] for note in self.notes() if note["type"] == "OVDeviceIsReady"]

    def notes(self):
        return [unpacked(arguments, None) for arguments in self.named("postNotification")]

    def batches(self):
        """The datasets of each content batch."""
        for arguments in self.named("notifyAddedItems")[len(self._batches):]:
            self._batches.append([Dataset(data) for data in unpacked(arguments, None)["OVMSObjectInfoArray"]])
        return self._batches

    def datasets(self):
        return [dataset for batch in self.batches() for dataset in batch]

    def wait_for(self, *names):
        """The datasets by name, once those named have arrived."""
        def arrived():
            found = {dataset.filename: dataset for dataset in self.datasets()}
            return found if set(names) <= set(found) else None
        return wait_until(arrived, f"datasets {names}")


def hung_up(error):
    """Whether the peer ended the connection, which is how one is refused."""
    ends = (Gio.IOErrorEnum.CLOSED, Gio.IOErrorEnum.CONNECTION_CLOSED)
    return any(error.matches(Gio.io_error_quark(), end) for end in ends)


def variants(options):
    plain = {bool: "b", str: "s", float: "d"}
    return {name: value if isinstance(value, GLib.Variant)
            else GLib.Variant(plain.get(type(value), "x"), value) for name, value in options.items()}


class Dataset:
    """One serialised object info dataset, read field by field from its layout."""

    FIXED = struct.Struct("<IIHHQHIIIIIIIIHHQQ")

    def __init__(self, data):
        self.data = data
        (self.handle, self.content_length, self.format, self.protection, self.size, self.thumb_format,
         self.thumb_size, self.thumb_offset, self.thumb_width, self.thumb_height, self.width, self.height,
         self.bit_depth, self.parent, self.association, self.orientation, self.captured,
         self.modified) = self.FIXED.unpack_from(data)
        units = data[74]
        self.filename = data[75:75 + 2 * max(units - 1, 0)].decode("utf-16-le")
        self.padding = data[75 + 2 * units:]


class LoopCard:
    """A file system in an image file, mounted where the service looks for volumes. An ext4 can have files of a folder
    before it is mounted for the first time."""

    def __init__(self, service, name, kind="ext4", megabytes=32, content=None, options="rw"):
        self.point = f"{service.mounts}/{name}"
        self.image = f"{service.folder}/{name}.image"
        os.mkdir(self.point)
        run("truncate", "-s", f"{megabytes}M", self.image)
        run(f"mkfs.{kind}", *(["-q"] if kind == "ext4" else []), *(["-d", content] if content else []), self.image)
        self.loop = run("losetup", "-f", "--show", self.image).strip()
        self.kind = kind
        self.options = options
        self.mount()

    def mount(self):
        program = "mount.exfat-fuse" if self.kind == "exfat" else "mount"
        run(program, self.loop, self.point, "-o", self.options)

    def unmount(self):
        run("umount", self.point)

    def close(self):
        subprocess.run(["umount", "-l", self.point], capture_output=True, check=False)
        subprocess.run(["losetup", "-d", self.loop], capture_output=True, check=False)


def run(*command):
    result = subprocess.run(command, capture_output=True, text=True, check=False)
    if result.returncode != 0:
        raise AssertionError(f"{command}: {result.stderr}")
    return result.stdout


def needs_root(test):
    return unittest.skipUnless(IS_ROOT, "mounting needs root")(test)


def needs(*programs):
    missing = [program for program in programs if shutil.which(program) is None]
    return unittest.skipIf(missing, f"not installed: {missing}")


class ServiceTest(unittest.TestCase):
    """A test with a running service; subclasses say with what."""

    grant = True
    environment = {}

    def setUp(self):
        self.service = Service(grant=self.grant, **self.environment)
        self.addCleanup(self.service.close)

    def manager(self):
        manager = Manager(self.service)
        self.addCleanup(manager.close)
        return manager

    def device(self, manager, path):
        device = Device(manager, path)
        self.addCleanup(device.close)
        return device

    def folder_card(self, name, files, **options):
        make_card(f"{self.service.volumes}/{name}", files, **options)
        return f"{self.service.volumes}/{name}"

    def other_client(self, *command):
        """A client in a process of its own; see client_process.py."""
        client = ClientProcess(self.service, *command)
        self.addCleanup(client.close)
        return client


class ClientProcess:
    """A client that is another process, because a process may open a device once. It takes one line of JSON, a list
    of method name and arguments, and answers with one. The command is what runs the script."""

    def __init__(self, service, *command):
        script = os.path.join(os.path.dirname(__file__), "client_process.py")
        self.process = subprocess.Popen([*(command or [PYTHON]), script, service.address], stdin=subprocess.PIPE,
                                        stdout=subprocess.PIPE, text=True, env={**os.environ, "BRIVOD_BUILD": BUILD})

    def ask(self, method, *arguments):
        self.tell(method, *arguments)
        return self.answer()

    def tell(self, method, *arguments):
        """Asks and leaves the answer for later."""
        self.process.stdin.write(json.dumps([method, *arguments]) + "\n")
        self.process.stdin.flush()

    def answer(self):
        answer = json.loads(self.process.stdout.readline() or '{"error": "the client ended"}')
        if "error" in answer:
            raise AssertionError(answer["error"])
        return answer["result"]

    def kill(self):
        self.process.kill()
        self.process.wait()

    def close(self):
        with contextlib.suppress(BrokenPipeError):
            self.process.stdin.close()
        self.process.wait(WAIT)
        self.process.stdout.close()


def grants_in(database):
    with contextlib.closing(sqlite3.connect(database)) as connection:
        return [row[0] for row in connection.execute("SELECT bundle_id FROM orvid_apps")]


def connect_raw(path):
    raw = socket.socket(socket.AF_UNIX)
    raw.connect(path)  # waits while the backlog is full, as it would not with a time limit
    raw.settimeout(WAIT)
    return raw
