# SPDX-License-Identifier: MIT
"""A client that has nothing but the bus: takes its address and what to do, and prints one JSON document."""
import json
import os
import sys
import time

from gi.repository import GLib
from front_door import SessionBus, device_list, error_name, knock, open_device, open_manager
from harness import Dataset, unpacked, variants, wait_until


class OtherBus(SessionBus):
    """One that somebody else has started."""

    def __init__(self, address):
        self.address = address


def read(bus, path):
    """Lists the devices through the bus, opens the first one and reads the first file."""
    contexts = device_list(open_manager(bus))
    device = open_device(bus, contexts[0]["OVDeviceHandle"])
    device.call("requestStartUsingDeviceWithReply")
    device.call("enumerateContentWithOptions", GLib.Variant("(a{sv})", ({},)))

    def files():
        batches = [unpacked(arguments, None)["OVMSObjectInfoArray"] for arguments in device.named("notifyAddedItems")]
        return [d for d in (Dataset(data) for batch in batches for data in batch) if d.association == 0]
    first = wait_until(files, "a file")[0]
    answer = device.call("requestReadDataFromObjectHandle_options_withReply",
                         GLib.Variant("(ta{sv})", (first.handle, variants({}))))
    return {"sees_the_socket": os.path.exists(path), "devices": len(contexts), "name": first.filename,
            "bytes": answer["OVReadData"].hex()}


def is_let_in(bus, handle):
    """Whether the first call is answered."""
    try:
        device = open_device(bus, handle)
        device.call("requestStartUsingDeviceWithReply")
        return True
    except GLib.Error:
        return False


def refusal(bus):
    """The name of the error that there is instead of a manager."""
    try:
        knock(bus, "OpenManager")
        return None
    except GLib.Error as error:
        return error_name(error)


def come_and_go(bus, times):
    """Opens a manager, asks it for the list and leaves, that often: the answers."""
    answers = []
    for _ in range(int(times)):
        manager = open_manager(bus)
        answers.append(device_list(manager))
        manager.close()
    return answers


def come_around_the_end(bus, times):
    """The same, each time a little later after the last one: a service that ends at once is met before its end, in it
    and after it."""
    answers = []
    for i in range(int(times)):
        answers += come_and_go(bus, 1)
        due = time.monotonic() + i * 1e-5
        while time.monotonic() < due:
            pass
    return answers


def main():
    address, method, *arguments = sys.argv[1:]
    print(json.dumps(globals()[method](OtherBus(address).connect(), *arguments)))


main()
