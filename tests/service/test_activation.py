# SPDX-License-Identifier: MIT
"""The service is started by whoever wants it, over the bus or the socket, ends when nobody does, and loses no request
in between."""
import concurrent.futures
import json
import os
import shutil
import subprocess
import unittest

from gi.repository import GLib
from front_door import device_list, open_device, open_manager
from harness import BUILD, PYTHON, WAIT, ClientProcess, Service, make_card, needs, wait_until
from session_bus import NAME, SessionBus

CLIENT = os.path.join(os.path.dirname(os.path.abspath(__file__)), "door_client.py")


@needs("flock")
class BusActivationTest(unittest.TestCase):
    """A bus that starts the service itself, as buses without systemd do."""

    def setUp(self):
        self.service = Service(start=False)
        self.addCleanup(self.service.close)
        self.bus = SessionBus()
        self.addCleanup(self.wait_until_nobody_runs)
        self.addCleanup(self.bus.close)
        shutil.copy(f"{BUILD}/share/dbus-1/services/{NAME}.service", f"{self.bus.folder}/services")
        make_card(f"{self.service.volumes}/CARD", {"100ABCDE/IMG_0001.JPG": b"what is on it"})

    def start_bus(self, idle_seconds):
        self.bus.environment = {**self.service.environment, "BRIVOD_IDLE_SECONDS": str(idle_seconds)}
        self.bus.log_path = self.service.log_path
        self.bus.start()

    def starts(self):
        return self.service.log().count("Launching brivo")

    def is_running(self):
        """Whether somebody has the runtime folder."""
        if not os.path.exists(f"{self.service.runtime}/lock"):
            return False
        return subprocess.run(["flock", "--nonblock", f"{self.service.runtime}/lock", "true"], check=False).returncode != 0

    def wait_until_nobody_runs(self):
        wait_until(lambda: not self.is_running(), "the service to end")

    def run_client(self, *arguments):
        result = subprocess.run([PYTHON, CLIENT, self.bus.address, *arguments], capture_output=True, text=True,
                                timeout=WAIT * 4, env={**os.environ, "BRIVOD_BUILD": BUILD}, check=False)
        self.assertEqual(result.returncode, 0, result.stderr)
        return json.loads(result.stdout)

    def test_a_call_starts_it_and_when_idle_it_ends_and_is_started_again(self):
        self.start_bus(1)
        for generation in range(1, 3):
            self.assertEqual([len(devices) for devices in self.run_client("come_and_go", "1")], [1])
            self.assertEqual(self.starts(), generation)
            self.wait_until_nobody_runs()
            self.assertFalse(self.bus.has_owner())
            self.assertEqual(os.listdir(self.service.runtime), ["lock"])

    def test_a_client_that_came_over_the_bus_keeps_it(self):
        self.start_bus(0)
        self.service.grant(PYTHON)
        bus = self.bus.connect()
        manager = open_manager(bus)
        device = open_device(bus, device_list(manager)[0]["OVDeviceHandle"])
        device.call("requestStartUsingDeviceWithReply")
        manager.close()
        # Time enough for a service that would not be kept to end: another one has come and gone.
        self.assertEqual(len(self.run_client("come_and_go", "20")), 20)
        device.call("enumerateContentWithOptions", GLib.Variant("(a{sv})", ({},)))
        wait_until(lambda: device.named("notifyAddedItems"), "the catalogue")
        self.assertEqual(self.starts(), 1)
        self.assertTrue(self.is_running())
        device.close()
        bus.close_sync(None)
        self.wait_until_nobody_runs()

    def test_no_call_of_many_is_lost_while_it_comes_and_goes(self):
        self.start_bus(0)
        with concurrent.futures.ThreadPoolExecutor(4) as pool:
            answers = list(pool.map(self.run_client, ["come_and_go"] * 4, ["50"] * 4))
        self.assertEqual([[len(devices) for devices in one] for one in answers], [[1] * 50] * 4)
        self.assertGreater(self.starts(), 1)

    def test_no_call_is_lost_that_comes_around_its_end(self):
        self.start_bus(0)
        def ends_met():
            answers = self.run_client("come_around_the_end", "200")
            self.assertEqual([len(devices) for devices in answers], [1] * 200, answers)
            return self.starts() > 50
        wait_until(ends_met, "enough ends to be met")

    def test_a_client_at_the_socket_keeps_it_as_well(self):
        self.start_bus(0)
        manager = open_manager(self.bus.connect())
        device_list(manager)
        other = ClientProcess(self.service)
        self.addCleanup(other.close)
        other.ask("wait_for_devices", 1)
        manager.close()
        self.assertEqual(len(self.run_client("come_and_go", "20")), 20)
        self.assertEqual(self.starts(), 1)
        other.close()
        self.wait_until_nobody_runs()


if __name__ == "__main__":
    unittest.main()
