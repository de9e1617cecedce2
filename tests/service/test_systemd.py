# SPDX-License-Identifier: MIT
"""The units, under a real systemd of a user's: started over the socket and over the bus, confined, and met around its
end."""
import json
import os
import re
import subprocess
import tempfile
import unittest

from harness import BRIVOD, BRIVOCTL, BUILD, IS_ROOT, PYTHON, WAIT, make_card, needs, wait_until
from user_manager import UserManager

HERE = os.path.dirname(os.path.abspath(__file__))
UNIT = f"{BUILD}/share/systemd/user/brivod.service"
ACCOUNT = "daemon"
CAP_SYS_PTRACE = 1 << 19


class ExposureTest(unittest.TestCase):
    @needs("systemd-analyze")
    def test_the_exposure_of_the_unit_is_below_3(self):
        with tempfile.TemporaryDirectory() as folder:
            printed = subprocess.run(
                ["systemd-analyze", "security", "--user", "--offline=true", "--no-pager", UNIT], capture_output=True,
                text=True, timeout=WAIT, env={**os.environ, "XDG_RUNTIME_DIR": folder}, check=True).stdout
        print(printed.splitlines()[-1])
        self.assertLess(float(re.search(r"Overall exposure level for brivod.service: ([0-9.]+)", printed)[1]), 3.0)


@unittest.skipUnless(IS_ROOT, "a systemd of the test's own needs root")
@needs("/lib/systemd/systemd", "nsenter", "setpriv", "dbus-daemon")
class UnitTest(unittest.TestCase):
    def systemd(self, idle_seconds, account=ACCOUNT, installed=True):
        systemd = UserManager(account, idle_seconds, installed)
        self.addCleanup(systemd.close)
        if subprocess.run([*systemd.as_user, "test", "-x", BRIVOD], check=False).returncode != 0:
            self.skipTest("another user cannot run the program from here")
        if not os.path.exists("/usr/lib/systemd/user/dbus.socket"):
            self.skipTest("not installed: a bus that a user's systemd starts")
        make_card(f"{systemd.volumes}/CARD", {"100ABCDE/IMG_0001.JPG": b"what is on it"})
        if not systemd.start():
            with open(f"{systemd.folder}/systemd", encoding="utf-8", errors="replace") as log:
                self.skipTest(f"no user's systemd here: {log.read().strip()[-200:]}")
        if installed:
            self.systemctl(systemd, "start", "brivod.socket")
        return systemd

    def systemctl(self, systemd, *arguments):
        result = systemd.run("systemctl", "--user", *arguments)
        self.assertEqual(result.returncode, 0, result.stderr)

    def brivoctl(self, systemd, *arguments):
        result = systemd.run(BRIVOCTL, *arguments)
        self.assertEqual(result.returncode, 0, result.stderr)
        return result.stdout

    def ask(self, systemd, *arguments):
        result = systemd.run(PYTHON, f"{HERE}/door_client.py", systemd.bus_address, *arguments)
        self.assertEqual(result.returncode, 0, result.stderr)
        return json.loads(result.stdout)

    def wait_until_ended(self, systemd):
        wait_until(lambda: systemd.show("brivod.service", "ActiveState") == "inactive", "the service to end")
        self.assertEqual(systemd.show("brivod.service", "Result"), "success")

    def test_it_starts_over_the_socket_and_over_the_bus_and_ends_when_idle(self):
        systemd = self.systemd(1)
        self.assertEqual(systemd.show("brivod.service", "ActiveState"), "inactive")
        self.assertIn("CARD", self.brivoctl(systemd, "devices"))
        self.wait_until_ended(systemd)
        self.assertEqual([len(devices) for devices in self.ask(systemd, "come_and_go", "1")], [1])
        self.wait_until_ended(systemd)
        self.assertEqual(systemd.log().count("Launching"), 2)

    def test_a_running_session_into_which_it_is_installed_starts_it_after_a_reload(self):
        systemd = self.systemd(60, installed=False)
        self.assertNotEqual(systemd.run("systemctl", "--user", "start", "brivod.socket").returncode, 0)
        systemd.install()
        self.systemctl(systemd, "daemon-reload")
        self.systemctl(systemd, "start", "brivod.socket")
        self.assertIn("CARD", self.brivoctl(systemd, "devices"))

    def test_confined_it_reads_cards_and_knows_its_clients(self):
        for account, capabilities in ((ACCOUNT, 0), ("root", CAP_SYS_PTRACE)):
            with self.subTest(account=account):
                systemd = self.systemd(60, account)
                manager_socket = f"{systemd.runtime}/brivod/manager"
                self.brivoctl(systemd, "access", "grant", PYTHON)
                seen = self.ask(systemd, "read", manager_socket)
                self.assertEqual(seen["bytes"], b"what is on it".hex())
                self.assertEqual(systemd.show("brivod.service", "StatusText"), "Serving")
                wait_until(lambda s=systemd: "no new privileges, seccomp, Landlock" in s.log(), "the worker's confinement")
                self.assertEqual(self.capabilities(systemd), capabilities)
                self.mount_a_card(systemd)
                wait_until(lambda s=systemd: "MOUNTED" in self.brivoctl(s, "devices"), "the card that was mounted")
                self.assertEqual(systemd.log().count("Launching"), 1)

    def capabilities(self, systemd):
        status = systemd.run("cat", f"/proc/{systemd.show('brivod.service', 'MainPID')}/status").stdout
        self.assertIn("NoNewPrivs:\t1", status)
        self.assertIn("Seccomp:\t2", status)
        return int(re.search(r"CapEff:\t([0-9a-f]+)", status)[1], 16)

    def mount_a_card(self, systemd):
        """A FUSE file system or one on a block device: what counts as a volume."""
        image = f"{systemd.folder}/image"
        point = f"{systemd.mounts}/MOUNTED"
        for command in (["mkdir", point], ["truncate", "-s", "16M", image], ["mkfs.ext4", "-q", image],
                        ["mount", "-o", "loop", image, point], ["mkdir", f"{point}/DCIM"]):
            done = systemd.run(*command, as_root=True)
            self.assertEqual(done.returncode, 0, done.stderr)
        self.addCleanup(systemd.run, "umount", point, as_root=True)

    def test_no_request_is_lost_that_comes_around_its_end(self):
        systemd = self.systemd(0)
        for way in (["come_around_the_end"], ["come_around_the_end_at", systemd.manager_address]):
            wait_until(lambda w=way: self.ends_met(systemd, *w) > 25, "enough ends to be met")
        self.wait_until_ended(systemd)

    def ends_met(self, systemd, *way):
        """How often the service was started anew while 200 requests were answered."""
        before = systemd.log().count("Launching")
        answers = self.ask(systemd, *way, "200")
        self.assertEqual([len(devices) for devices in answers], [1] * 200, answers)
        return systemd.log().count("Launching") - before


if __name__ == "__main__":
    unittest.main()
