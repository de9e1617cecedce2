# SPDX-License-Identifier: MIT
"""Whom the service takes a client for: programs with odd names, replaced ones, sandboxes and namespaces."""
import os
import shutil
import signal

from harness import BRIVOD, PYTHON, WAIT, ServiceTest, grants_in, needs_root


class IdentityTest(ServiceTest):
    grant = False

    def setUp(self):
        super().setUp()
        self.path = self.folder_card("CARD", {"100ABCDE/IMG_0001.JPG": b"x"})

    def program(self, name):
        """A program of its own that runs Python scripts."""
        return shutil.copy(PYTHON, f"{self.service.folder}/{name}")

    def install(self, folder, identifier, program):
        os.makedirs(f"{folder}/applications", exist_ok=True)
        with open(f"{folder}/applications/{identifier}.desktop", "w", encoding="utf-8") as file:
            file.write(f"[Desktop Entry]\nType=Application\nExec={program}\n")

    def is_let_in(self, *command):
        """Whether a fresh process is."""
        return self.other_client(*command).ask("is_let_in", self.path)


class ProgramTest(IdentityTest):
    def test_a_program_whose_path_is_a_statement_is_one_program_and_nothing_more(self):
        self.service.grant("/usr/bin/true")
        odd = self.program("x'; DROP TABLE orvid_apps; --\n<3>\"all's well\"")
        self.assertFalse(self.is_let_in(odd))
        self.assertEqual(grants_in(self.service.database), ["/usr/bin/true"])
        self.service.grant(odd)
        self.assertTrue(self.is_let_in(odd))
        self.assertEqual(self.service.brivoctl("access", "revoke", odd).returncode, 0)
        self.assertFalse(self.is_let_in(odd))
        self.assertEqual(grants_in(self.service.database), ["/usr/bin/true"])

    def test_a_program_that_was_replaced_is_let_in_again_when_it_is_started_anew(self):
        photos = self.program("photos")
        self.service.grant(photos)
        before = self.other_client(photos)
        before.ask("device_count")  # it runs by now
        os.rename(self.program("new"), photos)
        self.assertFalse(before.ask("is_let_in", self.path))
        self.assertTrue(self.is_let_in(photos))
        self.assertEqual(grants_in(self.service.database), [photos], "its grant is not lost")

    def test_a_program_that_was_deleted_is_not_let_in(self):
        photos = self.program("photos")
        self.service.grant(photos)
        client = self.other_client(photos)
        client.ask("device_count")  # it runs by now
        os.remove(photos)
        self.assertFalse(client.ask("is_let_in", self.path))

    def test_a_users_desktop_file_does_not_make_a_program_one_of_ours(self):
        photos = self.program("photos")
        self.install(self.service.data, "org.orvid.Photos", photos)
        self.install(self.service.data, "org.orvid.OrvidCoreTests", photos)
        self.assertFalse(self.is_let_in(photos))

    def test_a_desktop_file_names_its_program_and_no_other(self):
        photos, other = self.program("photos"), self.program("other")
        self.install(self.service.data, "org.example.Photos", photos)
        self.service.grant("org.example.Photos")
        self.assertTrue(self.is_let_in(photos))
        self.assertFalse(self.is_let_in(other))

    def test_a_desktop_file_that_is_a_fifo_holds_nobody_up(self):
        photos = self.program("photos")
        self.install(self.service.data, "org.example.Photos", photos)
        os.mkfifo(f"{self.service.data}/applications/org.example.Aaa.desktop")
        self.service.grant("org.example.Photos")
        self.assertTrue(self.is_let_in(photos))


# What a sandbox does: a root of its own, with the system's folders in it and its own description.
ROOT_SCRIPT = """
root=$1
mount -t tmpfs none "$root"
cp -P /bin /lib /lib64 "$root"
for folder in usr etc proc dev tmp "$2"; do
  mkdir -p "$root/$folder"
  mount --rbind "/$folder" "$root/$folder"
done
printf '[Application]\\nname=%s\\n' "$3" > "$root/.flatpak-info"
shift 3
exec chroot "$root" "$@"
"""


@needs_root
class SandboxTest(IdentityTest):
    def in_flatpak(self, identifier):
        """The command that runs Python as in a sandbox of that application."""
        root = f"{self.service.folder}/root"
        os.makedirs(root, exist_ok=True)
        checkout = os.path.realpath(__file__).split("/")[1]
        return ["unshare", "--mount", "sh", "-ec", ROOT_SCRIPT, "sh", root, checkout, identifier, PYTHON]

    def setUp(self):
        super().setUp()
        for identifier in ("org.example.Photos", "org.example.Other"):
            self.install(f"{self.service.data}/flatpak/exports/share", identifier, "/usr/bin/flatpak")

    def test_a_sandboxed_application_is_known_by_its_id_and_not_by_its_program(self):
        self.service.grant("org.example.Photos")
        self.assertTrue(self.is_let_in(*self.in_flatpak("org.example.Photos")))
        self.assertFalse(self.is_let_in(*self.in_flatpak("org.example.Other")))
        self.assertFalse(self.is_let_in(PYTHON))

    def test_a_grant_for_the_program_does_not_open_the_sandbox(self):
        self.service.grant(PYTHON)
        self.assertTrue(self.is_let_in(PYTHON))
        self.assertFalse(self.is_let_in(*self.in_flatpak("org.example.Photos")))

    def test_a_sandbox_that_does_not_say_who_it_holds_is_refused(self):
        self.service.grant(PYTHON)
        self.assertFalse(self.is_let_in(*self.in_flatpak("")))


@needs_root
class ProcessNamespaceTest(IdentityTest):
    """The service in a process namespace of its own: those outside have no number there."""

    def setUp(self):
        super().setUp()
        self.service.stop()
        self.service.command = ["unshare", "--pid", "--fork", "--mount-proc", "--kill-child", BRIVOD]
        self.service.start()
        launcher = self.service.process
        with open(f"/proc/{launcher.pid}/task/{launcher.pid}/children", encoding="ascii") as children:
            self.brivod = int(children.read())
        self.addCleanup(self.end)

    def end(self):
        os.kill(self.brivod, signal.SIGTERM)
        self.assertEqual(self.service.process.wait(WAIT), 0)
        self.service.process = None

    def inside(self):
        return self.other_client("nsenter", "--target", str(self.brivod), "--pid", "--mount", PYTHON)

    def test_who_has_no_number_there_is_refused_and_takes_nobody_along(self):
        self.service.grant(PYTHON)
        client = self.inside()
        client.ask("device_count")  # it is connected by now
        for _ in range(5):
            with self.assertRaisesRegex(AssertionError, "g-io-error-quark"):
                self.other_client().ask("device_count")
        self.assertEqual(client.ask("device_count"), 1)
        self.assertTrue(client.ask("is_let_in", self.path))
