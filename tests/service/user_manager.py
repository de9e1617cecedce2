# SPDX-License-Identifier: MIT
"""A systemd of the test's own that manages a user's services, and the message bus that it starts: in namespaces, so
that nothing outside sees them and they end with the test."""
import contextlib
import os
import pwd
import shutil
import subprocess
import tempfile

from harness import BUILD, PYTHON, WAIT, wait_until

SETUP = """
set -e
mount --make-rshared /
mount -t tmpfs none /run
mkdir -p /run/systemd/system /run/systemd/inaccessible/dir
cd /run/systemd/inaccessible  # which the machine's systemd makes for the others
touch reg && mkfifo fifo && mknod chr c 0 0 && mknod blk b 0 0 && $PYTHON -c 'import os, stat; os.mknod("sock", stat.S_IFSOCK)'
mount -t tmpfs none /sys/fs/cgroup
mount -t cgroup2 none /sys/fs/cgroup
mkdir -p /sys/fs/cgroup/$GROUP/user
chown -R $ACCOUNT /sys/fs/cgroup/$GROUP
echo $$ >/sys/fs/cgroup/$GROUP/user/cgroup.procs
$AS_USER /lib/systemd/systemd --user &  # not as process 1, which would be another systemd
wait
"""

CLEAN_UP = """
mount -t cgroup2 none /sys/fs/cgroup
find /sys/fs/cgroup/$GROUP -depth -type d -exec rmdir {} +
"""


class UserManager:
    """systemd --user, with the units of the build tree from the beginning or as soon as they are installed."""

    def __init__(self, account, idle_seconds, installed=True):
        self.account = pwd.getpwnam(account)
        self.folder = os.path.realpath(tempfile.mkdtemp(prefix="brivod-user-"))
        self.volumes = f"{self.folder}/volumes"
        self.mounts = f"{self.folder}/mounts"
        self.runtime = f"{self.folder}/runtime"
        self.log_path = f"{self.folder}/log"
        self.manager_address = f"unix:path={self.runtime}/brivod/manager"
        self.bus_address = f"unix:path={self.runtime}/bus"
        self.environment = {
            "PATH": os.environ["PATH"],
            "HOME": self.folder,
            "XDG_RUNTIME_DIR": self.runtime,
            "XDG_DATA_DIRS": f"{self.folder}/installed/share",
            "SYSTEMD_GENERATOR_PATH": f"{self.folder}/installed/lib/systemd/user-generators",
            "DBUS_SESSION_BUS_ADDRESS": self.bus_address,
            "BRIVOD_VOLUME_FOLDERS": self.volumes,
            "BRIVOD_VOLUME_ROOTS": self.mounts,
            "BRIVOD_IDLE_SECONDS": str(idle_seconds),
            "BRIVOD_BUILD": BUILD,
            "PYTHONDONTWRITEBYTECODE": "1",
        }
        self.as_user = ["setpriv", f"--reuid={self.account.pw_uid}", f"--regid={self.account.pw_gid}", "--clear-groups"]
        self.group = os.path.basename(self.folder)
        for path in (self.volumes, self.mounts, self.runtime):
            os.mkdir(path)
        os.chmod(self.runtime, 0o700)
        self._write_settings()
        if installed:
            self.install()
        self.process = None

    def install(self):
        os.symlink(BUILD, f"{self.folder}/installed")

    def _write_settings(self):
        """The log goes to a file, and a service that comes and goes all the time is no failure."""
        folder = f"{self.folder}/.config/systemd/user"
        for unit in ("service", "socket"):
            os.makedirs(f"{folder}/brivod.{unit}.d")
        with open(f"{folder}/brivod.service.d/test.conf", "w", encoding="utf-8") as file:
            file.write(f"[Unit]\nStartLimitIntervalSec=0\n[Service]\nStandardError=append:{self.log_path}\n")
        with open(f"{folder}/brivod.socket.d/test.conf", "w", encoding="utf-8") as file:
            file.write("[Socket]\nTriggerLimitIntervalSec=0\n")

    def start(self):
        """False when this machine does not let one run."""
        for folder, _, files in os.walk(self.folder):
            os.chown(folder, self.account.pw_uid, self.account.pw_gid)
            for name in files:
                os.chown(f"{folder}/{name}", self.account.pw_uid, self.account.pw_gid)
        os.chmod(self.folder, 0o755)
        owner = f"{self.account.pw_uid}:{self.account.pw_gid}"
        with open(f"{self.folder}/systemd", "wb") as log:
            self.process = subprocess.Popen(
                ["unshare", "--mount", "--pid", "--fork", "--kill-child", "--mount-proc", "/bin/sh", "-c", SETUP],
                env={**self.environment, "GROUP": self.group, "ACCOUNT": owner, "AS_USER": " ".join(self.as_user), "PYTHON": PYTHON},
                stdin=subprocess.DEVNULL, stdout=log, stderr=log)
        wait_until(lambda: self.process.poll() is not None or self.is_up(), "the user's systemd")
        return self.process.poll() is None

    def is_up(self):
        return self.inside() is not None and self.run("systemctl", "--user", "is-system-running").stdout == "running\n"

    def inside(self):
        """The process in the namespaces."""
        children = f"/proc/{self.process.pid}/task/{self.process.pid}/children"
        with open(children, encoding="ascii") as file:
            found = file.read().split()
        return found[0] if found else None

    def run(self, *command, as_root=False):
        """Runs a command of the user, or of root, there."""
        return subprocess.run(
            ["nsenter", f"--target={self.inside()}", "--mount", "--pid", *([] if as_root else self.as_user), *command],
            env=self.environment, capture_output=True, text=True, timeout=WAIT * 4, check=False)

    def show(self, unit, what):
        return self.run("systemctl", "--user", "show", "--value", f"--property={what}", unit).stdout.strip()

    def log(self):
        """What the service has said; nothing before its first start."""
        with contextlib.suppress(FileNotFoundError), open(self.log_path, encoding="utf-8", errors="replace") as log:
            return log.read()
        return ""

    def close(self):
        if self.process is not None:
            ran = self.process.poll() is None
            self.process.kill()
            self.process.wait(WAIT)
            if ran:
                wait_until(self._has_left_nothing, "all of its processes to end")
        shutil.rmtree(self.folder, ignore_errors=True)

    def _has_left_nothing(self):
        return subprocess.run(
            ["unshare", "--mount", "/bin/sh", "-c", CLEAN_UP], env={"PATH": os.environ["PATH"], "GROUP": self.group},
            capture_output=True, check=False).returncode == 0
