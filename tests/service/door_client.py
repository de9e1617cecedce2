# SPDX-License-Identifier: MIT
"""A client that has nothing but the bus: takes its address and what to do, and prints one JSON document."""
import json
import os
import sys
import time

from gi.repository import GLib
from front_door import device_list, error_name, knock, open_device, open_manager, read_all, wait_for_file
from harness import MANAGER, Connection, hung_up
from session_bus import SessionBus


class OtherBus(SessionBus):
    """One that somebody else has started."""

    def __init__(self, address):
        self.address = address


def read(bus, path):
    """Lists the devices through the bus, opens the first one and reads the first file."""
    bus = bus.connect()
    contexts = device_list(open_manager(bus))
    device = open_device(bus, contexts[0]["OVDeviceHandle"])
    device.call("requestStartUsingDeviceWithReply")
    first = wait_for_file(device)
    return {"sees_the_socket": os.path.exists(path), "devices": len(contexts), "name": first.filename,
            "bytes": read_all(device, first.handle).hex()}


def is_let_in(bus, handle):
    """Whether the first call is answered."""
    try:
        device = open_device(bus.connect(), handle)
        device.call("requestStartUsingDeviceWithReply")
        return True
    except GLib.Error as error:
        if not hung_up(error):
            raise
        return False


def refusal(bus):
    """The name of the error that there is instead of a manager."""
    try:
        knock(bus.connect(), "OpenManager")
        return None
    except GLib.Error as error:
        return error_name(error)


def come_and_go(bus, times):
    """As many processes one after the other, because the connections of one process end together: each opens a manager,
    asks it for the list and leaves. The answers."""
    return [in_another_process(lambda: device_list(open_manager(bus.connect()))) for _ in range(int(times))]


def come_around_the_end(bus, times):
    """The same, each a little later after the last one: a service that ends at once is met before its end, in it and
    after it."""
    return around_the_end(lambda: device_list(open_manager(bus.connect())), times)


def come_around_the_end_at(_bus, address, times):
    """The same at the manager's socket."""
    return around_the_end(lambda: device_list(Connection(address, MANAGER)), times)


def around_the_end(ask, times):
    answers = []
    for i in range(int(times)):
        answers.append(in_another_process(ask))
        due = time.monotonic() + i * 1e-5
        while time.monotonic() < due:
            pass
    return answers


def in_another_process(ask):
    """A fork is quick; it is safe as long as this process has connected to nothing."""
    reading, writing = os.pipe()
    child = os.fork()
    if child == 0:
        os.close(reading)
        try:
            os.write(writing, json.dumps(ask()).encode())
        except Exception as error:  # whatever it is, the test wants to hear it
            os.write(writing, json.dumps(str(error)).encode())
        os._exit(0)
    os.close(writing)
    with open(reading, encoding="utf-8") as answer:
        text = answer.read()
    os.waitpid(child, 0)
    return json.loads(text)


def main():
    address, method, *arguments = sys.argv[1:]
    print(json.dumps(globals()[method](OtherBus(address), *arguments)))


main()
