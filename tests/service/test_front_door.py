# SPDX-License-Identifier: MIT
"""The service's name on the session bus: for clients that can reach the bus and not the sockets."""
import json
import os
import re
import shutil
import signal
import subprocess
import unittest

from gi.repository import Gio, GLib
from front_door import DOOR, LIMITS_EXCEEDED, UNKNOWN_DEVICE, WithoutDescriptors, device_list
from front_door import error_name, knock, open_device, open_manager, read_all, wait_for_file
from harness import BRIVOD, BUILD, IS_ROOT, PATH, PYTHON, WAIT, Service, ServiceTest, needs, needs_root
from harness import hung_up, wait_until
from session_bus import NAME, SessionBus

CLIENT = os.path.join(os.path.dirname(os.path.abspath(__file__)), "door_client.py")
NOBODY = 65534
SOMEBODY = 1
MOST_OF_ONE_PROCESS = 64


class FrontDoorTest(ServiceTest):
    def setUp(self):
        self.bus = SessionBus()
        self.addCleanup(self.bus.close)
        self.bus.start()
        self.environment = {"DBUS_SESSION_BUS_ADDRESS": self.bus.address}
        super().setUp()
        self.wait_for_the_door()

    def wait_for_the_door(self):
        wait_until(self.bus.has_owner, "the service's name on the bus")

    def connect(self):
        bus = self.bus.connect()
        self.addCleanup(lambda: bus.is_closed() or bus.close_sync(None))
        return bus

    def manager_at_the_door(self):
        manager = open_manager(self.connect())
        self.addCleanup(manager.close)
        return manager

    def handle_of(self, path):
        return self.manager().wait_for_device(path)["OVDeviceHandle"]

    def run_client(self, *arguments, program=PYTHON, prefix=()):
        """What a client in a process of its own says; see door_client.py."""
        result = subprocess.run(
            [*prefix, program, CLIENT, self.bus.address, *arguments], capture_output=True, text=True, timeout=WAIT * 2,
            env={**os.environ, "BRIVOD_BUILD": BUILD}, check=False)
        self.assertEqual(result.returncode, 0, result.stderr)
        return json.loads(result.stdout)

    def refusal(self, call):
        with self.assertRaises(GLib.Error) as raised:
            call()
        return error_name(raised.exception)


class MethodsTest(FrontDoorTest):
    @needs("gdbus")
    def test_gdbus_shows_the_interface(self):
        shown = subprocess.run(
            ["gdbus", "introspect", "--address", self.bus.address, "--dest", NAME, "--object-path", PATH],
            capture_output=True, text=True, timeout=WAIT, check=True).stdout
        self.assertIn("interface org.orvid.FrontDoor1 { methods: OpenManager(out h socket); OpenDevice(in s uuid, out h "
                      "socket, out a{sv} device);", " ".join(shown.split()))

    @needs("gdbus")
    def test_gdbus_gets_a_descriptor(self):
        got = subprocess.run(
            ["gdbus", "call", "--address", self.bus.address, "--dest", NAME, "--object-path", PATH, "--method",
             f"{DOOR}.OpenManager"], capture_output=True, text=True, timeout=WAIT, check=False)
        self.assertEqual(got.stdout, "(handle 0,)\n", got.stderr)

    def test_the_manager_behind_it_is_the_one_of_the_socket(self):
        at_the_door = self.manager_at_the_door()
        self.assertEqual(device_list(at_the_door), [])
        path = self.folder_card("CARD", {"100ABCDE/IMG_0001.JPG": b"x"})
        wait_until(lambda: at_the_door.named("notifyAddedDevice"), "the signal that the card was added")
        self.assertEqual(device_list(at_the_door), self.manager().devices())
        shutil.rmtree(path)
        wait_until(lambda: at_the_door.named("notifyRemovedDevice"), "the signal that it was removed")

    def test_a_device_is_opened_and_read_with_descriptors(self):
        content = os.urandom(300_000)
        handle = self.handle_of(self.folder_card("CARD", {"100ABCDE/IMG_0001.JPG": content}))
        device = open_device(self.connect(), handle)
        self.addCleanup(device.close)
        self.assertEqual(device.opened["OVInternalDeviceUUID"], handle)
        self.assertTrue(device.opened["OVDeviceEndpoint"].startswith(f"unix:path={self.service.runtime}/device-"))
        self.assertEqual(device.call("requestStartUsingDeviceWithReply")["OVDeviceName"], "CARD")
        self.assertEqual(read_all(device, wait_for_file(device).handle), content)

    def test_an_unknown_device_is_an_error_with_its_own_name(self):
        bus = self.connect()
        for handle in ("", "nothing", "3437B8BD-8089-49B9-A6BE-0F16E501ADA0", "x" * 100_000):
            self.assertEqual(self.refusal(lambda h=handle: open_device(bus, h)), UNKNOWN_DEVICE)

    def test_wrong_arguments_and_methods_are_errors_by_name(self):
        bus = self.connect()
        wrong = GLib.Variant("(i)", (1,))
        invalid = "org.freedesktop.DBus.Error.InvalidArgs"
        self.assertEqual(self.refusal(lambda: knock(bus, "OpenManager", wrong)), invalid)
        self.assertEqual(self.refusal(lambda: knock(bus, "OpenDevice", wrong)), invalid)
        self.assertEqual(self.refusal(lambda: knock(bus, "OpenAnything")), "org.freedesktop.DBus.Error.UnknownMethod")
        self.assertEqual(device_list(self.manager_at_the_door()), [])

    def test_a_caller_that_takes_no_descriptors_is_told_so(self):
        caller = WithoutDescriptors(self.bus)
        self.addCleanup(caller.close)
        caller.knock()
        caller.wait_for(b"org.freedesktop.DBus.Error.NotSupported")


class IdentityTest(FrontDoorTest):
    grant = False

    def setUp(self):
        super().setUp()
        self.handle = self.handle_of(self.folder_card("CARD", {"100ABCDE/IMG_0001.JPG": b"what is on it"}))

    def test_without_a_grant_the_connection_is_closed_before_its_first_call_is_answered(self):
        self.assertFalse(self.run_client("is_let_in", self.handle))

    def test_a_caller_with_a_grant_is_let_in_and_one_without_is_not(self):
        self.service.grant(PYTHON)
        stranger = shutil.copy(PYTHON, f"{self.service.folder}/stranger")
        self.assertFalse(self.run_client("is_let_in", self.handle, program=stranger))
        self.assertTrue(self.run_client("is_let_in", self.handle))

    def test_the_service_that_made_the_socket_lends_nobody_its_name(self):
        self.service.grant(os.path.realpath(BRIVOD))
        self.assertFalse(self.run_client("is_let_in", self.handle))

    def test_a_process_has_one_connection_to_a_device_whichever_way_it_comes(self):
        self.service.grant(PYTHON)
        device = self.device(self.manager(), f"{self.service.volumes}/CARD")
        bus = self.connect()
        with self.assertRaises(GLib.Error) as raised:
            open_device(bus, self.handle).call("requestStartUsingDeviceWithReply")
        self.assertTrue(hung_up(raised.exception), raised.exception)
        self.assertEqual(device.start_using()["OVDeviceName"], "CARD")

    def test_a_client_that_sees_nothing_but_the_bus_lists_the_devices_and_reads_a_file(self):
        self.service.grant(PYTHON)
        manager_socket = f"{self.service.runtime}/manager"
        seen = self.run_client("read", manager_socket, prefix=self.confinement())
        self.assertEqual(seen, {"sees_the_socket": False, "devices": 1, "name": "IMG_0001.JPG",
                                "bytes": b"what is on it".hex()})
        self.assertTrue(os.path.exists(manager_socket))

    def confinement(self):
        """A mount namespace in which the service's folder is empty."""
        namespace = ["unshare", "--mount", *([] if IS_ROOT else ["--user", "--map-current-user", "--keep-caps"])]
        if subprocess.run([*namespace, "true"], capture_output=True, check=False).returncode != 0:
            self.skipTest("no mount namespaces for this user")
        script = f'mount -t tmpfs none "{self.service.folder}" && exec "$@"'
        return [*namespace, "/bin/sh", "-c", script, "sh"]


class CrowdTest(FrontDoorTest):
    def test_a_process_has_a_limit_and_others_are_served_meanwhile(self):
        bus = self.connect()
        before = len(self.service.targets())
        sockets = []
        refusals = set()
        for _ in range(3000):
            try:
                sockets.append(knock(bus, "OpenManager")[0])
            except GLib.Error as error:
                refusals.add(error_name(error))
        self.assertEqual(len(sockets), MOST_OF_ONE_PROCESS)
        self.assertEqual(refusals, {LIMITS_EXCEEDED})
        self.assertIsNone(self.run_client("refusal"))
        for fd in sockets:
            os.close(fd)
        wait_until(lambda: len(self.service.targets()) <= before, "the service to let go of them")
        wait_until(lambda: not self.is_refused(bus), "the process to be let in again")

    def is_refused(self, bus):
        try:
            os.close(knock(bus, "OpenManager")[0])
            return False
        except GLib.Error as error:
            self.assertEqual(error_name(error), LIMITS_EXCEEDED)
            return True

    def test_thousands_of_calls_at_once_are_all_answered(self):
        bus = self.connect()
        answers = []

        def answered(source, result):
            try:
                _, descriptors = source.call_with_unix_fd_list_finish(result)
                answers.append(descriptors.get_length())
            except GLib.Error as error:
                answers.append(error_name(error))
        for _ in range(3000):
            bus.call_with_unix_fd_list(NAME, PATH, DOOR, "OpenManager", None, None, Gio.DBusCallFlags.NONE,
                                       WAIT * 1000, None, None, answered)
        context = GLib.MainContext.default()
        def have_come():
            while context.iteration(False):
                pass
            return len(answers) == 3000
        wait_until(have_come, "all answers")
        self.assertGreater(answers.count(1), 0)
        self.assertEqual(set(answers) - {1}, {LIMITS_EXCEEDED})
        self.assertIsNone(self.run_client("refusal"))

    def test_callers_that_leave_before_the_answer_leave_nothing_behind(self):
        before = len(self.service.targets())
        for _ in range(200):
            caller = WithoutDescriptors(self.bus)
            caller.knock()
            caller.close()
        self.assertIsNone(self.run_client("refusal"))
        wait_until(lambda: len(self.service.targets()) <= before, "the service to let go of them")

    def test_a_bus_that_answers_nothing_holds_up_nobody_at_the_socket(self):
        bus = self.connect()
        knock(bus, "OpenManager")
        self.bus.process.send_signal(signal.SIGSTOP)
        self.addCleanup(self.bus.process.send_signal, signal.SIGCONT)
        self.assertEqual(self.manager().devices(), [])
        self.assertEqual(self.service.stop(), 0)


class BusTest(FrontDoorTest):
    def test_the_door_opens_again_when_the_bus_has_been_away(self):
        manager = self.manager_at_the_door()
        for _ in range(2):
            before = len(self.service.log())
            self.bus.stop()
            wait_until(lambda b=before: re.search("the session bus has gone|no session bus", self.service.log()[b:]),
                       "the service to notice")
            self.assertEqual(self.manager().devices(), [])
            self.bus.start()
            self.wait_for_the_door()
        self.assertEqual(device_list(manager), [], "who had come in stays")

    def test_another_owner_of_the_name_is_waited_for(self):
        second = Service(DBUS_SESSION_BUS_ADDRESS=self.bus.address)
        self.addCleanup(second.close)
        wait_until(lambda: "another process has the name org.orvid.brivod" in second.log(), "the line that says so")
        bus = self.connect()
        owner = self.bus.ask(bus, "GetConnectionUnixProcessID", GLib.Variant("(s)", (NAME,)))
        self.assertEqual(owner, self.service.process.pid)
        self.assertEqual(second.brivoctl("devices").returncode, 0)
        self.assertEqual(self.service.stop(), 0)
        wait_until(lambda: "brivod on the session bus" in second.log(), "the second to have the name")
        self.assertIsNone(self.run_client("refusal"))

    def test_a_name_that_the_bus_does_not_give_is_logged(self):
        with open(f"{self.bus.folder}/configuration", encoding="utf-8") as file:
            configuration = file.read()
        with open(f"{self.bus.folder}/configuration", "w", encoding="utf-8") as file:
            file.write(configuration.replace('<allow own="*"/>', '<deny own="*"/>'))
        self.service.stop()
        self.bus.stop()
        self.bus.start()
        self.service.start()
        wait_until(lambda: "the session bus refuses the name org.orvid.brivod" in self.service.log(), "the line")
        self.assertEqual(self.manager().devices(), [])


class WithoutBusTest(unittest.TestCase):
    def lines_with(self, **environment):
        """All that a service says of the door until it ends."""
        service = Service(**environment)
        self.addCleanup(service.close)
        wait_until(lambda: "frontDoor" in service.log(), "the line")
        self.assertEqual(service.brivoctl("devices").returncode, 0)
        self.assertEqual(service.stop(), 0)
        return [line for line in service.log().splitlines() if "frontDoor" in line]

    def test_without_a_bus_it_says_so_once(self):
        self.assertEqual(self.lines_with(), ["<5>           frontDoor | there is no session bus"])

    def test_a_bus_that_is_not_there_is_looked_for_again_and_mentioned_once(self):
        bus = SessionBus()
        self.addCleanup(bus.close)
        service = Service(DBUS_SESSION_BUS_ADDRESS=bus.address)
        self.addCleanup(service.close)
        wait_until(lambda: "no session bus" in service.log(), "the line")
        bus.start()
        wait_until(bus.has_owner, "the name, when the bus has come")
        self.assertEqual(service.stop(), 0)
        self.assertEqual(service.log().count("no session bus"), 1)

    def test_an_address_that_is_none_does_no_harm(self):
        self.assertEqual(len(self.lines_with(DBUS_SESSION_BUS_ADDRESS="nonsense")), 1)


class OtherUsersTest(unittest.TestCase):
    @needs_root
    @needs("setpriv")
    def test_another_user_is_refused_by_name(self):
        if subprocess.run([*self.user(NOBODY), "test", "-x", BRIVOD], check=False).returncode != 0:
            self.skipTest("another user cannot run the program from here")
        bus = SessionBus()
        self.addCleanup(bus.close)
        bus.start()
        service = Service(start=False, grant=False, DBUS_SESSION_BUS_ADDRESS=bus.address)
        self.addCleanup(service.close)
        for folder, _, files in os.walk(service.folder):
            os.chown(folder, NOBODY, NOBODY)
            for name in files:
                os.chown(f"{folder}/{name}", NOBODY, NOBODY)
        service.start(prefix=self.user(NOBODY))
        wait_until(bus.has_owner, "the service's name")
        self.assertEqual(self.knock_as(NOBODY, bus).stdout, "(handle 0,)\n")
        self.assertIn("org.freedesktop.DBus.Error.AccessDenied", self.knock_as(SOMEBODY, bus).stderr)

    @staticmethod
    def user(number):
        return ["setpriv", f"--reuid={number}", "--clear-groups"]

    def knock_as(self, user, bus):
        return subprocess.run(
            [*self.user(user), "gdbus", "call", "--address", bus.address, "--dest", NAME, "--object-path", PATH, "--method",
             f"{DOOR}.OpenManager"], capture_output=True, text=True, timeout=WAIT, check=False)


if __name__ == "__main__":
    unittest.main()
