# SPDX-License-Identifier: MIT
"""A message bus of the test's own, and what clients do at the service's door on it."""
import contextlib
import os
import shutil
import signal
import socket
import struct
import subprocess
import tempfile

from gi.repository import Gio, GLib
from harness import KORVEL, MANAGER, PATH, WAIT, Connection, Dataset, unpacked, wait_until

NAME = "org.orvid.brivod"
DOOR = "org.orvid.FrontDoor1"
LIMITS_EXCEEDED = "org.freedesktop.DBus.Error.LimitsExceeded"
UNKNOWN_DEVICE = "org.orvid.FrontDoor1.Error.UnknownDevice"

CONFIGURATION = """<busconfig>
  <type>session</type>
  <listen>unix:path={folder}/bus</listen>
  <servicedir>{folder}/services</servicedir>
  <policy context="default">
    <allow user="*"/>
    <allow send_destination="*" eavesdrop="true"/>
    <allow eavesdrop="true"/>
    <allow own="*"/>
  </policy>
</busconfig>
"""


class SessionBus:
    """A dbus-daemon in a folder of its own, which only the bus is in."""

    def __init__(self, prefix=()):
        self.folder = os.path.realpath(tempfile.mkdtemp(prefix="brivod-bus-"))
        os.chmod(self.folder, 0o755)
        self.prefix = prefix
        self.path = f"{self.folder}/bus"
        self.address = f"unix:path={self.path}"
        self.environment = {"PATH": os.environ["PATH"], "HOME": self.folder}
        self.log_path = f"{self.folder}/log"
        self.process = None
        os.mkdir(f"{self.folder}/services")
        with open(f"{self.folder}/configuration", "w", encoding="utf-8") as file:
            file.write(CONFIGURATION.format(folder=self.folder))

    def start(self):
        with contextlib.suppress(FileNotFoundError):
            os.remove(self.path)
        with open(self.log_path, "ab") as log:
            self.process = subprocess.Popen(
                [*self.prefix, "dbus-daemon", "--nofork", f"--config-file={self.folder}/configuration"],
                env=self.environment, stdin=subprocess.DEVNULL, stdout=log, stderr=log)
        wait_until(lambda: self.listens() or self.process.poll() is not None, "the message bus")
        assert self.process.poll() is None, self.log()

    def listens(self):
        """Its socket has a name a moment before it can be connected to."""
        with socket.socket(socket.AF_UNIX) as probe:
            return probe.connect_ex(self.path) == 0

    def stop(self):
        if self.process is not None:
            self.process.send_signal(signal.SIGCONT)
            self.process.terminate()
            self.process.wait(WAIT)
            self.process = None

    def close(self):
        self.stop()
        shutil.rmtree(self.folder, ignore_errors=True)

    def log(self):
        with open(self.log_path, encoding="utf-8", errors="replace") as log:
            return log.read()

    def connect(self):
        flags = Gio.DBusConnectionFlags
        return Gio.DBusConnection.new_for_address_sync(
            self.address, flags.AUTHENTICATION_CLIENT | flags.MESSAGE_BUS_CONNECTION, None, None)

    def ask(self, bus, member, arguments=None):
        return bus.call_sync("org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus", member, arguments,
                             None, Gio.DBusCallFlags.NONE, WAIT * 1000, None).unpack()[0]

    def has_owner(self):
        bus = self.connect()
        try:
            return self.ask(bus, "NameHasOwner", GLib.Variant("(s)", (NAME,)))
        finally:
            bus.close_sync(None)


def knock(bus, member, arguments=None):
    """Calls a method of the door: the socket, and the device's properties if there are any."""
    reply, descriptors = bus.call_with_unix_fd_list_sync(
        NAME, PATH, DOOR, member, arguments, None, Gio.DBusCallFlags.NONE, WAIT * 1000, None, None)
    fd = descriptors.get(reply.get_child_value(0).get_handle())
    return fd, reply.unpack()[1] if reply.n_children() > 1 else None


def open_manager(bus):
    return Connection(knock(bus, "OpenManager")[0], MANAGER)


def open_device(bus, handle):
    """The connection to the device; `opened` has its properties."""
    fd, properties = knock(bus, "OpenDevice", GLib.Variant("(s)", (handle,)))
    device = Connection(fd, KORVEL)
    device.opened = properties
    return device


def device_list(manager):
    return manager.call("requestDeviceListWithReply")["OVDeviceContexts"]


def wait_for_file(device):
    """Has the catalogue sent: the first file in it."""
    device.call("enumerateContentWithOptions", GLib.Variant("(a{sv})", ({},)))

    def files():
        batches = [unpacked(arguments, None)["OVMSObjectInfoArray"] for arguments in device.named("notifyAddedItems")]
        return [d for d in (Dataset(data) for batch in batches for data in batch) if d.association == 0]
    return wait_until(files, "a file")[0]


def read_all(device, handle):
    return device.call("requestReadDataFromObjectHandle_options_withReply",
                       GLib.Variant("(ta{sv})", (handle, {})))["OVReadData"]


class WithoutDescriptors:
    """A connection to the bus that has not negotiated descriptors; it has no library's help."""

    def __init__(self, bus):
        self.socket = socket.socket(socket.AF_UNIX)
        self.socket.connect(bus.path)
        self.socket.settimeout(WAIT)
        self.serial = 0
        self.socket.sendall(b"\0AUTH EXTERNAL " + str(os.geteuid()).encode().hex().encode() + b"\r\n")
        assert self.socket.recv(1000).startswith(b"OK ")
        self.socket.sendall(b"BEGIN\r\n")
        self.send("org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus", "Hello")

    def send(self, destination, path, interface, member):
        self.serial += 1
        fields = b""
        for code, kind, text in ((1, b"o", path), (2, b"s", interface), (3, b"s", member), (6, b"s", destination)):
            fields += b"\0" * (-len(fields) % 8) + bytes([code, 1]) + kind + b"\0"
            fields += struct.pack("<I", len(text)) + text.encode() + b"\0"
        message = b"l\1\0\1" + struct.pack("<III", 0, self.serial, len(fields)) + fields
        self.socket.sendall(message + b"\0" * (-len(message) % 8))

    def knock(self):
        self.send(NAME, PATH, DOOR, "OpenManager")

    def wait_for(self, text):
        """Reads until that has come."""
        received = b""
        while text not in received:
            more = self.socket.recv(65536)
            assert more, received
            received += more
        return received

    def close(self):
        self.socket.close()


def error_name(error):
    return Gio.DBusError.get_remote_error(error)
