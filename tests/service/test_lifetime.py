# SPDX-License-Identifier: MIT
"""How the service starts and ends: sockets, a second instance, activation on demand, other users."""
import concurrent.futures
import os
import select
import signal
import socket
import stat
import subprocess
import threading
import unittest

from harness import BRIVOD, WAIT, Device, Manager, Service, ServiceTest, connect_raw, make_card
from harness import needs, needs_root, wait_until

NOBODY = 65534
SOMEBODY = 1


def as_user(user):
    return [] if user == os.geteuid() else ["setpriv", f"--reuid={user}", "--clear-groups"]


def need_program_for(user, test):
    """Root's own checkout may lie where others cannot go."""
    if subprocess.run([*as_user(user), "test", "-x", BRIVOD], check=False).returncode != 0:
        test.skipTest("another user cannot run the program from here")


class StartTest(ServiceTest):
    def run_brivod(self, as_nobody=False, **changes):
        if as_nobody:
            need_program_for(NOBODY, self)
        environment = {**self.service.environment, **changes}
        environment = {name: value for name, value in environment.items() if value is not None}
        return subprocess.run([*(as_user(NOBODY) if as_nobody else []), BRIVOD], env=environment,
                              capture_output=True, text=True, timeout=WAIT, check=False)

    def test_sigterm_ends_it_with_success_and_without_sockets(self):
        device = self.device(self.manager(), self.folder_card("CARD", {"100ABCDE/IMG_0001.JPG": b"x"}))
        self.assertEqual(len(os.listdir(self.service.runtime)), 3)
        self.assertEqual(self.service.stop(), 0)
        self.assertEqual(os.listdir(self.service.runtime), ["lock"])
        wait_until(device.closed.is_set, "the end of the device's connection")

    def test_sigint_ends_it_as_well(self):
        self.service.process.send_signal(signal.SIGINT)
        self.assertEqual(self.service.process.wait(WAIT), 0)
        self.service.process = None

    def test_its_folder_is_for_its_user_alone(self):
        self.assertEqual(stat.S_IMODE(os.stat(self.service.runtime).st_mode), 0o700)

    def test_a_second_service_is_refused_and_does_not_disturb_the_first(self):
        second = self.run_brivod()
        self.assertEqual(second.returncode, 1)
        self.assertIn("another service is running", second.stderr)
        self.assertEqual(self.manager().devices(), [])

    def test_sockets_that_a_killed_service_left_are_replaced(self):
        self.device(self.manager(), self.folder_card("CARD", {"100ABCDE/IMG_0001.JPG": b"x"}))
        self.service.process.kill()
        self.service.process.wait()
        stale = os.listdir(self.service.runtime)
        self.assertEqual(len(stale), 3)
        os.remove(f"{self.service.runtime}/manager")  # so that start() waits for the new one
        self.service.start()
        self.assertEqual(len(self.manager().devices()), 1)
        self.assertEqual(sorted(os.listdir(self.service.runtime)), ["lock", "manager"])

    def test_a_stale_manager_socket_does_not_keep_it_from_starting(self):
        self.service.process.kill()
        self.service.process.wait()
        self.assertIn("manager", os.listdir(self.service.runtime))
        before = os.stat(f"{self.service.runtime}/manager").st_mtime_ns
        self.service.start()
        wait_until(lambda: os.stat(f"{self.service.runtime}/manager").st_mtime_ns != before, "the new socket")
        self.assertEqual(self.manager().devices(), [])

    def test_without_a_runtime_folder_it_cannot_start(self):
        ended = self.run_brivod(as_nobody=os.geteuid() == 0, BRIVOD_RUNTIME_DIR=None, XDG_RUNTIME_DIR=None)
        self.assertEqual(ended.returncode, 1)
        self.assertIn("no runtime folder", ended.stderr)

    def test_a_runtime_folder_that_cannot_be_made_is_an_error(self):
        ended = self.run_brivod(BRIVOD_RUNTIME_DIR=f"{self.service.folder}/no/such/folder")
        self.assertEqual(ended.returncode, 1)
        self.assertIn("cannot start", ended.stderr)

    def test_a_runtime_folder_whose_path_is_too_long_for_a_socket_is_an_error(self):
        path = f"{self.service.folder}/{'x' * 100}"
        ended = self.run_brivod(BRIVOD_RUNTIME_DIR=path)
        self.assertEqual(ended.returncode, 1)
        self.assertIn("cannot start", ended.stderr)

    @needs_root
    def test_a_runtime_folder_of_another_user_is_refused(self):
        path = f"{self.service.folder}/foreign"
        os.mkdir(path)
        os.chown(path, NOBODY, NOBODY)
        ended = self.run_brivod(BRIVOD_RUNTIME_DIR=path)
        self.assertEqual(ended.returncode, 1)
        self.assertIn("belongs to another user", ended.stderr)

    def test_its_log_is_one_line_per_event_with_a_priority(self):
        self.manager()
        self.assertEqual(self.service.log().splitlines()[0], "<5>         brivo[zeph] | Launching brivo [zeph]")
        for line in self.service.log().splitlines():
            self.assertRegex(line, r"^<[357]> *.{0,20} [|!] |^<[357]>")


class PreferencesTest(ServiceTest):
    def test_corrupt_preferences_are_as_good_as_none(self):
        self.service.stop()
        os.makedirs(f"{self.service.folder}/config", exist_ok=True)
        with open(f"{self.service.folder}/config/org.orvid.OrvidCore.plist", "wb") as file:
            file.write(b"\xff\xfe not a property list")
        self.service.start()
        self.assertEqual(self.manager().devices(), [])

    def test_a_configuration_folder_that_cannot_be_made_does_not_keep_it_from_starting(self):
        self.service.stop()
        with open(f"{self.service.folder}/file", "wb"):
            pass
        self.service.environment["XDG_CONFIG_HOME"] = f"{self.service.folder}/file/config"
        self.service.start()
        self.assertEqual(self.manager().devices(), [])


class Launcher:
    """Holds the manager's socket and starts a brivod whenever somebody connects and none runs."""

    def __init__(self, service, idle_seconds, prefix=()):
        self.prefix = prefix
        os.makedirs(service.runtime, mode=0o700, exist_ok=True)
        self.socket = socket.socket(socket.AF_UNIX)
        self.socket.bind(f"{service.runtime}/manager")
        self.socket.listen(4096)
        self.environment = {**service.environment, "BRIVOD_IDLE_SECONDS": str(idle_seconds), "LISTEN_FDS": "1",
                            "LISTEN_FDNAMES": "manager"}
        self.log = open(service.log_path, "ab")
        self.codes = []
        self.process = None
        self.ended = threading.Event()
        self.thread = threading.Thread(target=self.run)
        self.thread.start()

    def run(self):
        while not self.ended.is_set():
            if not select.select([self.socket], [], [], 0.02)[0]:
                continue
            # The shell sets LISTEN_PID to what exec leaves in place: itself.
            with subprocess.Popen([*self.prefix, "/bin/sh", "-c", f'exec 3<&{self.socket.fileno()}; LISTEN_PID=$$ exec "{BRIVOD}"'],
                                  env=self.environment, pass_fds=[self.socket.fileno()], stderr=self.log) as process:
                self.process = process
                self.codes.append(process.wait())

    def close(self):
        self.ended.set()
        if self.process and self.process.poll() is None:
            self.process.terminate()
        self.thread.join()
        self.socket.close()
        self.log.close()


class ActivationTest(unittest.TestCase):
    def setUp(self):
        self.service = Service(start=False)
        self.addCleanup(self.service.close)

    def launcher(self, idle_seconds, **options):
        launcher = Launcher(self.service, idle_seconds, **options)
        self.addCleanup(launcher.close)
        return launcher

    def test_a_call_starts_it_and_when_idle_it_ends_and_is_started_again(self):
        launcher = self.launcher(1)
        for generation in range(1, 3):
            manager = Manager(self.service)
            self.assertEqual(manager.devices(), [])
            manager.close()
            wait_until(lambda g=generation: len(launcher.codes) == g, "the idle service to end")
        self.assertEqual(launcher.codes, [0, 0])
        self.assertTrue(os.path.exists(f"{self.service.runtime}/manager"), "the socket is the launcher's")

    def test_a_client_keeps_it(self):
        launcher = self.launcher(1)
        make_card(f"{self.service.volumes}/CARD", {"100ABCDE/IMG_0001.JPG": b"x"})
        manager = Manager(self.service)
        device = Device(manager, f"{self.service.volumes}/CARD")
        waited = threading.Event()
        waited.wait(2.5)  # more than the idle time: that nothing happens can only be waited for
        self.assertEqual(launcher.codes, [])
        device.enumerate()
        device.wait_for("IMG_0001.JPG")
        device.close()
        manager.close()
        wait_until(lambda: launcher.codes == [0], "the idle service to end")

    @needs("gdbus")
    def test_no_call_is_lost_while_it_comes_and_goes(self):
        launcher = self.launcher(0)
        # Each from a process of its own: a process's manager connections end together.
        with concurrent.futures.ThreadPoolExecutor(4) as pool:
            answers = list(pool.map(self.answer_for, [os.geteuid()] * 60))
        self.assertEqual(answers, ["({'OVDeviceContexts': <@av []>},)\n"] * 60)
        wait_until(lambda: launcher.codes, "the first of them to have ended")
        self.assertEqual(set(launcher.codes), {0})

    @needs_root
    @needs("setpriv")
    def test_another_user_is_refused_on_a_socket_that_everybody_can_reach(self):
        need_program_for(NOBODY, self)
        self.launcher(60, prefix=as_user(NOBODY))
        for folder, _, files in os.walk(self.service.folder):
            os.chown(folder, NOBODY, NOBODY)
            for name in files:
                os.chown(f"{folder}/{name}", NOBODY, NOBODY)
        os.chmod(self.service.folder, 0o755)
        os.chmod(f"{self.service.runtime}/manager", 0o777)
        self.assertEqual(self.answer_for(NOBODY), "({'OVDeviceContexts': <@av []>},)\n")
        self.assertEqual(self.answer_for(0), "({'OVDeviceContexts': <@av []>},)\n", "root may")
        os.chmod(self.service.runtime, 0o755)  # which it has made its own again
        self.assertEqual(self.answer_for(SOMEBODY), "")

    def answer_for(self, user):
        """What that user gets of the device list; nothing when refused."""
        asked = subprocess.run(
            [*as_user(user), "gdbus", "call", "--address", self.service.address, "--dest", ":1.0", "--object-path",
             "/org/orvid/brivod", "--method", "org.orvid.OVZEPHDeviceManagerProtocol.requestDeviceListWithReply"],
            capture_output=True, text=True, timeout=WAIT, check=False)
        self.assertNotIn("Permission denied", asked.stderr, "it is the service that refuses")
        return asked.stdout


class IdleClientsTest(ServiceTest):
    def test_two_hundred_idle_clients_cost_no_threads(self):
        before = len(self.service.threads())
        idle = [connect_raw(f"{self.service.runtime}/manager") for _ in range(200)]
        for raw in idle:
            self.addCleanup(raw.close)
        authentication = b"\0AUTH EXTERNAL " + str(os.geteuid()).encode().hex().encode() + b"\r\nBEGIN\r\n"
        for raw in idle:
            raw.sendall(authentication)
            self.assertTrue(raw.recv(100).startswith(b"OK "))
        client = self.other_client()
        path = self.folder_card("CARD", {"100ABCDE/IMG_0001.JPG": b"x"})
        self.assertEqual(client.ask("open", path)["OVDeviceName"], "CARD")
        self.assertEqual(self.service.threads().count("io"), 1)
        self.assertLess(len(self.service.threads()), before + 10)



if __name__ == "__main__":
    unittest.main()
