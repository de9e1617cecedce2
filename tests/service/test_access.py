# SPDX-License-Identifier: MIT
"""Who is let in, and what becomes of the service when the access database is not as it should be."""
import os
import shutil
import sqlite3
import stat
import subprocess

from harness import PYTHON, ServiceTest, grants_in


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
        self.assertNotEqual(self.service.brivoctl("access", "grant", PYTHON).returncode, 0)
        self.assertEqual(len(self.manager().devices()), 1)

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
        self.assertTrue(self.refused())
        self.assertEqual(len(self.manager().devices()), 1, "others are served meanwhile")
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


