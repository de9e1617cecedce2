# SPDX-License-Identifier: MIT
"""What clients do at the service's door on a session bus."""
import os
import socket
import struct

from gi.repository import Gio, GLib
from harness import KORVEL, MANAGER, PATH, WAIT, Connection, Dataset, unpacked, wait_until
from session_bus import NAME

DOOR = "org.orvid.FrontDoor1"
LIMITS_EXCEEDED = "org.freedesktop.DBus.Error.LimitsExceeded"
UNKNOWN_DEVICE = "org.orvid.FrontDoor1.Error.UnknownDevice"


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
