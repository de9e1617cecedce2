#!/usr/bin/python3
# SPDX-License-Identifier: MIT
"""Lists the pictures on every camera card, and saves the first one. Needs python3-gi.

The program must have been let in: brivoctl access grant "$(realpath /usr/bin/python3)"
"""
import os
import struct
import sys

import gi

gi.require_version("Gio", "2.0")
from gi.repository import Gio, GLib  # noqa: E402

PATH = "/org/orvid/brivod"
MANAGER = "org.orvid.OVZEPHDeviceManagerProtocol"
DEVICE = "org.orvid.KorvelProtocol"
LONGEST_READ = 4 * 1024 * 1024
# handle, content length, format, protection, size, five numbers of the thumbnail, pixels, depth, parent, ...
DATASET = struct.Struct("<IIHHQHIIIIIIIIHHQQ")
SETTLED_SECONDS = 1


def connect(address):
    return Gio.DBusConnection.new_for_address_sync(
        address, Gio.DBusConnectionFlags.AUTHENTICATION_CLIENT, None, None)


def call(connection, interface, member, signature=None, *arguments):
    """One call; large data arrives as (descriptor, size), smaller data as bytes."""
    reply, descriptors = connection.call_with_unix_fd_list_sync(
        None, PATH, interface, member, GLib.Variant(signature, arguments) if signature else None,
        None, Gio.DBusCallFlags.NONE, 30_000, None, None)
    return (reply.unpack() or (None,))[0], descriptors


def service_address():
    folder = os.environ.get("BRIVOD_RUNTIME_DIR")
    if not folder:
        runtime = os.environ.get("XDG_RUNTIME_DIR", "/run")
        folder = f"{runtime}/brivod"
    return f"unix:path={folder}/manager"


def item(dataset):
    """Handle, parent, size and name of one object."""
    data = bytes(dataset)
    fields = DATASET.unpack_from(data)
    units = data[DATASET.size]  # of UTF-16, a terminator among them
    name = data[75:75 + 2 * max(units - 1, 0)].decode("utf-16-le", "replace")
    return {"handle": fields[0], "parent": fields[13], "size": fields[4], "name": name, "folder": fields[14] == 1}


def catalogue(device):
    """All objects: the ready note says how many there will be, and then they come in batches."""
    loop, objects, expected = GLib.MainLoop(), [], [None]

    def on_signal(_connection, _sender, _path, _interface, member, arguments):
        body = arguments.unpack()[0]
        if member == "postNotification" and body.get("type") == "OVDeviceIsReady":
            expected[0] = body["OVANumberOfPreflightObjectsKey"]
        elif member == "notifyAddedItems":
            objects.extend(item(dataset) for dataset in body["OVMSObjectInfoArray"])
            quiet[0] = 0
        if expected[0] is not None and len(objects) >= expected[0]:
            loop.quit()

    def tick():  # what was counted may have gone before it was sent
        quiet[0] += 1
        if quiet[0] > 10 * SETTLED_SECONDS and expected[0] is not None:
            loop.quit()
        return True

    quiet = [0]
    subscription = device.signal_subscribe(None, DEVICE, None, None, None, 0, on_signal)
    call(device, DEVICE, "enumerateContentWithOptions", "(a{sv})", {})
    timer = GLib.timeout_add(100, tick)
    loop.run()
    GLib.source_remove(timer)
    device.signal_unsubscribe(subscription)
    return objects


def read(device, handle, offset, length):
    options = {"OVReadOffset": GLib.Variant("t", offset), "OVReadLength": GLib.Variant("t", length)}
    reply, descriptors = call(device, DEVICE, "requestReadDataFromObjectHandle_options_withReply",
                              "(ta{sv})", handle, options)
    if reply["errCode"] != 0:
        raise OSError(f"error {reply['errCode']} for object {handle}")
    data = reply["OVReadData"]
    if isinstance(data, tuple):
        index, size = data
        descriptor = descriptors.get(index)
        try:
            return os.pread(descriptor, size, 0)
        finally:
            os.close(descriptor)
    return bytes(data)


def save(device, entry):
    with open(entry["name"], "xb") as file:
        done = 0
        while done < entry["size"]:
            piece = read(device, entry["handle"], done, min(LONGEST_READ, entry["size"] - done))
            if not piece:
                raise OSError("the card gave no more bytes")
            file.write(piece)
            done += len(piece)
    print("saved", entry["name"])


def main():
    manager = connect(sys.argv[1] if len(sys.argv) > 1 else service_address())
    devices, _ = call(manager, MANAGER, "requestDeviceListWithReply")
    for context in devices["OVDeviceContexts"]:
        opened, _ = call(manager, MANAGER, "openDevice_withReply", "(s)", context["OVDeviceHandle"])
        if not opened:
            continue  # it has just gone
        device = connect(opened["OVDeviceEndpoint"])
        properties, _ = call(device, DEVICE, "requestStartUsingDeviceWithReply")
        print(properties["OVDeviceName"])
        files = [entry for entry in catalogue(device) if not entry["folder"]]
        for entry in files:
            print(f"  {entry['handle']:6}  {entry['size']:12}  {entry['name']}")
        if files:
            save(device, files[0])


main()
