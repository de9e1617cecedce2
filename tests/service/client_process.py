# SPDX-License-Identifier: MIT
"""A client in a process of its own: takes lines of JSON from its standard input, [method, argument...], and answers
each with {"result": ...} or {"error": text}."""
import concurrent.futures
import functools
import json
import socket
import sys

from gi.repository import GLib
import reading
from harness import Device, Manager, connect_raw, hung_up, wait_until


class Client:
    def __init__(self, address):
        self.address = address
        self.device = None

    @functools.cached_property
    def manager(self):
        return Manager(self)

    def wait_for_devices(self, count):
        wait_until(lambda: len(self.manager.devices()) == count, f"{count} devices")

    def open(self, path):
        self.device = Device(self.manager, path)
        return self.device.properties

    def is_let_in(self, path):
        self.manager.wait_for_device(path)
        try:
            self.open(path)
            return True
        except GLib.Error as error:
            if not hung_up(error):
                raise
            return False

    def device_count(self):
        return len(self.manager.devices())

    def enumerate(self):
        self.device.enumerate()

    def wait_for(self, *names):
        return {name: d.handle for name, d in self.device.wait_for(*names).items()}

    def handles(self, count):
        """The handles of that many objects, once they have arrived; each may come more than once."""
        def arrived():
            found = {dataset.handle for dataset in self.device.datasets()}
            return found if len(found) >= count else None
        return sorted(wait_until(arrived, f"{count} objects"))

    def batch_names(self):
        return [[dataset.filename for dataset in batch] for batch in self.device.batches()]

    def ready_counts(self):
        return self.device.ready_counts()

    def read(self, handle, offset, length):
        reply = self.device.read(handle, offset, length)
        return [reply["errCode"], reply["OVReadData"].decode("latin-1")]

    def open_stream(self, handle):
        return self.device.read(handle, OVReadBufferStreamOpen=True)["errCode"]

    def take_piece(self, handle, offset, length):
        """Reads and looks at nothing: the error code and how many bytes there are."""
        answer = reading.read(self.device, handle, offset, length)
        size = len(answer)
        answer.close()
        return [answer.code, size]

    def read_into_lent(self, handle, length, times):
        """Reads into a new buffer each time: the error codes and counts."""
        found = []
        for _ in range(times):
            buffer = reading.Lent(length)
            answer = reading.read_into(self.device, handle, 0, length, buffer.fd, length)
            found += [answer.code, answer.count]
        return found

    def connect_and_leave(self, times):
        """Connects to the manager's socket that often and hangs up without a word."""
        def connect(_):
            connect_raw(self.path).close()
        with concurrent.futures.ThreadPoolExecutor(16) as pool:
            list(pool.map(connect, range(times)))

    def say(self, hexadecimal, and_end=False):
        """Sends bytes to the manager's socket; true when the service hangs up."""
        raw = connect_raw(self.path)
        try:
            raw.sendall(bytes.fromhex(hexadecimal))
            if and_end:
                raw.shutdown(socket.SHUT_WR)
            while raw.recv(65536):
                pass
        except (BrokenPipeError, ConnectionResetError):
            pass
        except socket.timeout:
            return False
        finally:
            raw.close()
        return True

    @property
    def path(self):
        return self.address.removeprefix("unix:path=")

    def wait_until_closed(self):
        return wait_until(self.device.closed.is_set, "the end of the connection")

    def removed(self):
        return wait_until(lambda: self.manager.named("notifyRemovedDevice"), "a removal") and True


def main():
    client = Client(sys.argv[1])
    for line in sys.stdin:
        method, *arguments = json.loads(line)
        try:
            answer = {"result": getattr(client, method)(*arguments)}
        except Exception as error:  # whatever it is, the test wants to hear it
            answer = {"error": f"{type(error).__name__}: {error}"}
        print(json.dumps(answer), flush=True)


main()
