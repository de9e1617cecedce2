# SPDX-License-Identifier: MIT
"""Who is let in, and what becomes of the service when the access database is not as it should be."""
import concurrent.futures
import contextlib
import os
import select
import shutil
import sqlite3
import stat
import subprocess
import time

from harness import KORVEL, PATH, PYTHON, Gio, ServiceTest, connect_raw, grants_in


class AccessTest(ServiceTest):
    grant = False

    def setUp(self):
        super().setUp()
        self.path = self.folder_card("CARD", {"100ABCDE/IMG_0001.JPG": b"x"})

    def refused(self):
        """Whether a new process of this program is turned away. It is asked about once, so each is a fresh one."""
        return not self.other_client().ask("is_let_in", self.path)


class RefusalTest(AccessTest):
    def test_without_a_grant_the_device_list_is_open_but_no_device(self):
        self.assertTrue(self.refused())
        self.assertEqual(len(self.manager().devices()), 1)

    def test_a_grant_counts_from_the_next_process_on(self):
        self.assertTrue(self.refused())
        self.service.grant(PYTHON)
        self.assertFalse(self.refused())
        revoked = self.service.brivoctl("access", "revoke", PYTHON)
        self.assertEqual(revoked.returncode, 0, revoked.stderr)
        self.assertTrue(self.refused())

    def test_a_refused_connection_is_closed_before_its_first_message_is_served(self):
        manager = self.manager()
        handle = manager.wait_for_device(self.path)["OVDeviceHandle"]
        path = manager.open(handle)["OVDeviceEndpoint"].removeprefix("unix:path=")
        call = Gio.DBusMessage.new_method_call(None, PATH, KORVEL, "requestStartUsingDeviceWithReply")
        call.set_serial(1)
        user = str(os.geteuid()).encode().hex().encode()
        received = b""
        with connect_raw(path) as raw, contextlib.suppress(BrokenPipeError, ConnectionResetError):
            raw.sendall(b"\0AUTH EXTERNAL " + user + b"\r\nBEGIN\r\n"
                        + call.to_blob(Gio.DBusCapabilityFlags.NONE))
            while part := raw.recv(4096):
                received += part
        self.assertNotIn(b"OVDevice", received)
        self.assertLess(len(received), 64, "no more than a greeting")
        self.assertNotIn("BrivoDevice Properties", self.service.log(), "nothing was begun for it")

    def test_two_programs_that_grant_at_once_both_do(self):
        names = [f"org.example.App{i}" for i in range(12)]
        with concurrent.futures.ThreadPoolExecutor(4) as threads:
            results = list(threads.map(lambda name: self.service.brivoctl("access", "grant", name), names))
        self.assertEqual([result.returncode for result in results], [0] * len(names), results)
        self.assertEqual(sorted(grants_in(self.service.database)), sorted(names))

    def test_a_process_is_asked_about_once(self):
        client = self.other_client()
        self.assertFalse(client.ask("is_let_in", self.path))
        self.service.grant(PYTHON)
        self.assertFalse(client.ask("is_let_in", self.path))
        self.assertFalse(self.refused())

    def test_a_process_has_one_connection_to_a_device(self):
        self.service.grant(PYTHON)
        client = self.other_client()
        self.assertTrue(client.ask("is_let_in", self.path))
        self.assertFalse(client.ask("is_let_in", self.path))

    def test_a_refused_client_disturbs_nobody(self):
        self.service.grant(PYTHON)
        device = self.device(self.manager(), self.path)
        stranger = shutil.copy("/usr/bin/gdbus", f"{self.service.folder}/stranger")
        endpoint = device.opened["OVDeviceEndpoint"]
        for _ in range(20):
            result = subprocess.run(
                [stranger, "call", "--address", endpoint, "--dest", ":1.0", "--object-path", "/org/orvid/brivod",
                 "--method", "org.orvid.KorvelProtocol.requestStartUsingDeviceWithReply"],
                capture_output=True, text=True, check=False)
            self.assertNotEqual(result.returncode, 0)
        device.enumerate()
        device.wait_for("IMG_0001.JPG")


class DatabaseTest(AccessTest):
    """The service starts with a database that something is wrong with."""

    def damage(self, change):
        self.service.stop()
        change()
        self.service.start()

    def put(self, content):
        folder = os.path.dirname(self.service.database)
        os.makedirs(folder, exist_ok=True)
        with open(self.service.database, "wb") as file:
            file.write(content)

    def test_a_missing_database_is_made(self):
        self.damage(lambda: shutil.rmtree(os.path.dirname(self.service.database)))
        self.assertTrue(self.refused())
        self.assertEqual(grants_in(self.service.database), [])
        self.assertEqual(stat.S_IMODE(os.stat(os.path.dirname(self.service.database)).st_mode), 0o700)
        self.service.grant(PYTHON)
        self.assertFalse(self.refused())

    def test_an_empty_database_file_gets_its_tables(self):
        self.damage(lambda: self.put(b""))
        self.assertTrue(self.refused())
        self.service.grant(PYTHON)
        self.assertFalse(self.refused())

    def test_a_corrupt_database_grants_nothing_and_the_service_stays(self):
        self.service.grant(PYTHON)
        self.damage(lambda: self.put(b"SQLite format 3\x00" + b"\xff" * 8192))
        self.assertTrue(self.refused())
        self.assertIn("ovaccess", self.service.log())
        for command in (["list"], ["list", "--control"], ["revoke", PYTHON], ["revoke", "--control", PYTHON]):
            result = self.service.brivoctl("access", *command)
            self.assertEqual((result.returncode, result.stdout), (1, b""), command)
            self.assertIn(b"cannot be read: file is not a database", result.stderr)
        self.assertEqual(self.service.brivoctl("access", "grant", PYTHON).returncode, 1)
        self.assertEqual(len(self.manager().devices()), 1)

    def test_a_corrupt_database_refuses_everybody_but_the_built_in_and_stays_as_it_is(self):
        self.service.grant(PYTHON)
        corrupt = b"SQLite format 3\x00" + b"\xff" * 8192
        self.damage(lambda: self.put(corrupt))
        self.assertTrue(self.refused())
        listed = self.service.brivoctl("ls")
        self.assertEqual((listed.returncode, b"IMG_0001.JPG" in listed.stdout), (0, True), listed.stderr)
        self.assertIn("Failed to create table: orvid_apps - ", self.service.log())
        with open(self.service.database, "rb") as file:
            self.assertEqual(file.read(), corrupt)

    def test_a_database_that_is_damaged_while_the_service_runs_refuses_and_stays_as_it_is(self):
        self.service.grant(PYTHON)
        self.assertFalse(self.refused())
        damaged = os.path.getsize(self.service.database) * b"\xaa"
        with open(self.service.database, "r+b") as file:
            file.write(damaged)
        self.assertTrue(self.refused())
        self.assertIn("ovaccess ! file is not a database", self.service.log())
        with open(self.service.database, "rb") as file:
            self.assertEqual(file.read(), damaged)

    def test_a_database_that_is_deleted_takes_its_grants_along_at_once(self):
        self.service.grant(PYTHON)
        self.assertFalse(self.refused())
        shutil.rmtree(os.path.dirname(self.service.database))
        self.assertTrue(self.refused())
        self.service.grant(PYTHON)
        self.assertFalse(self.refused())

    def test_a_database_that_is_another_file_grants_nothing(self):
        self.damage(lambda: self.put(b"this was no database " * 500))
        self.assertTrue(self.refused())
        self.assertEqual(len(self.manager().devices()), 1)

    def test_a_locked_database_grants_nothing_until_it_is_free(self):
        self.service.grant(PYTHON)
        self.assertFalse(self.refused())
        with_lock = sqlite3.connect(self.service.database, isolation_level=None)
        self.addCleanup(with_lock.close)
        with_lock.execute("BEGIN EXCLUSIVE")
        client, manager = self.other_client(), self.manager()
        client.tell("is_let_in", self.path)
        longest = 0
        while not select.select([client.process.stdout], [], [], 0.05)[0]:
            began = time.monotonic()
            self.assertEqual(len(manager.devices()), 1)
            longest = max(longest, time.monotonic() - began)
        self.assertFalse(client.answer())
        self.assertLess(longest, 4, "others are served meanwhile; each statement waits 5 seconds for the file")
        with_lock.execute("ROLLBACK")
        self.assertFalse(self.refused())

    def test_a_read_only_database_still_grants(self):
        self.service.grant(PYTHON)
        self.damage(lambda: os.chmod(self.service.database, 0o400))
        self.assertFalse(self.refused())

    def test_a_data_folder_that_cannot_be_made_is_logged_and_grants_nothing(self):
        self.service.stop()
        with open(f"{self.service.folder}/file", "wb"):
            pass
        self.service.environment["XDG_DATA_HOME"] = f"{self.service.folder}/file/data"
        self.service.start()
        self.assertTrue(self.refused())
        self.assertIn("ovaccess !", self.service.log())
        self.assertEqual(len(self.manager().devices()), 1)

    def test_a_data_folder_that_is_a_file_is_logged_and_grants_nothing(self):
        self.service.stop()
        folder = os.path.dirname(self.service.database)
        shutil.rmtree(folder, ignore_errors=True)
        with open(folder, "wb"):
            pass
        self.service.start()
        self.assertTrue(self.refused())
        self.assertIn("ovaccess !", self.service.log())


