# SPDX-License-Identifier: MIT
"""A client in a process of its own: takes lines of JSON from its standard input, [method, argument...], and answers
each with {"result": ...} or {"error": text}."""
import json
import sys
import time

from harness import Device, Manager, wait_until


class Client:
    def __init__(self, address):
        self.address = address
        self.manager = Manager(self)
        self.device = None

    def open(self, path):
        self.device = Device(self.manager, path)
        return self.device.properties

    def enumerate(self):
        self.device.enumerate()

    def wait_for(self, *names):
        return {name: d.handle for name, d in self.device.wait_for(*names).items()}

    def batch_names(self):
        return [[dataset.filename for dataset in batch] for batch in self.device.batches()]

    def ready_counts(self):
        return self.device.ready_counts()

    def read(self, handle, offset, length):
        reply = self.device.read(handle, offset, length)
        return [reply["errCode"], reply["OVReadData"].decode("latin-1")]

    def open_stream(self, handle):
        return self.device.read(handle, OVReadBufferStreamOpen=True)["errCode"]

    def wait_until_closed(self):
        return wait_until(self.device.closed.is_set, "the end of the connection")

    def removed(self):
        return wait_until(lambda: self.manager.named("notifyRemovedDevice"), "a removal") and True

    def sleep(self, seconds):
        time.sleep(seconds)


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
