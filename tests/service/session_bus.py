# SPDX-License-Identifier: MIT
"""A session bus of the test's own, which starts no program of this machine."""
import contextlib
import os
import shutil
import signal
import socket
import subprocess
import tempfile

from gi.repository import Gio, GLib
from harness import WAIT, wait_until

NAME = "org.orvid.brivod"  # the service's

CONFIGURATION = """<busconfig>
  <type>session</type>
  <listen>unix:path={folder}/bus</listen>
  <servicedir>{folder}/services</servicedir>
  <policy context="default">
    <allow user="*"/>
    <allow send_destination="*" eavesdrop="true"/>
    <allow eavesdrop="true"/>
    <allow own="*"/>
  </policy>
</busconfig>
"""


class SessionBus:
    """A dbus-daemon in a folder of its own, which only the bus is in."""

    def __init__(self, prefix=()):
        self.folder = os.path.realpath(tempfile.mkdtemp(prefix="brivod-bus-"))
        os.chmod(self.folder, 0o755)
        self.prefix = prefix
        self.path = f"{self.folder}/bus"
        self.address = f"unix:path={self.path}"
        self.environment = {"PATH": os.environ["PATH"], "HOME": self.folder}
        self.log_path = f"{self.folder}/log"
        self.process = None
        os.mkdir(f"{self.folder}/services")
        with open(f"{self.folder}/configuration", "w", encoding="utf-8") as file:
            file.write(CONFIGURATION.format(folder=self.folder))

    def start(self):
        with contextlib.suppress(FileNotFoundError):
            os.remove(self.path)
        with open(self.log_path, "ab") as log:
            self.process = subprocess.Popen(
                [*self.prefix, "dbus-daemon", "--nofork", f"--config-file={self.folder}/configuration"],
                env=self.environment, stdin=subprocess.DEVNULL, stdout=log, stderr=log)
        wait_until(lambda: self.listens() or self.process.poll() is not None, "the message bus")
        assert self.process.poll() is None, self.log()

    def listens(self):
        """Its socket has a name a moment before it can be connected to."""
        with socket.socket(socket.AF_UNIX) as probe:
            return probe.connect_ex(self.path) == 0

    def stop(self):
        if self.process is not None:
            self.process.send_signal(signal.SIGCONT)
            self.process.terminate()
            self.process.wait(WAIT)
            self.process = None

    def close(self):
        self.stop()
        shutil.rmtree(self.folder, ignore_errors=True)

    def log(self):
        with open(self.log_path, encoding="utf-8", errors="replace") as log:
            return log.read()

    def connect(self):
        flags = Gio.DBusConnectionFlags
        return Gio.DBusConnection.new_for_address_sync(
            self.address, flags.AUTHENTICATION_CLIENT | flags.MESSAGE_BUS_CONNECTION, None, None)

    def ask(self, bus, member, arguments=None):
        return bus.call_sync("org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus", member, arguments,
                             None, Gio.DBusCallFlags.NONE, WAIT * 1000, None).unpack()[0]

    def has_owner(self):
        bus = self.connect()
        try:
            return self.ask(bus, "NameHasOwner", GLib.Variant("(s)", (NAME,)))
        finally:
            bus.close_sync(None)
