# SPDX-License-Identifier: MIT
"""brivoctl import: what is copied, what is remembered, and what is left after an end that nobody planned."""
import fcntl
import hashlib
import json
import os
import pty
import signal
import subprocess
import threading
import unittest

from harness import BRIVOCTL, WAIT, needs_root, run, wait_until
from test_brivoctl import FAILURE, SUCCESS, USAGE, BrivoctlTest

RECEIPT = "import-receipt.jsonl"
CARD = {"100ABCDE/IMG_0001.JPG": b"first picture", "100ABCDE/IMG_0002.JPG": b"the second",
        "100ABCDE/IMG_0002.XMP": b"<sidecar/>", "101ABCDE/MVI_0003.QQQ": b"of a type that nobody knows",
        "101ABCDE/IMG_0004.JPG": b""}
MEGABYTE = 1_000_000


class ImportTest(BrivoctlTest):
    def import_card(self, *arguments, code=SUCCESS, target="in", **options):
        return self.brivoctl("import", "-d", self.out(target), *arguments, code=code, **options)

    def counts(self, *arguments, target="in", code=SUCCESS):
        """How many were imported now and before, and how many failed."""
        lines = self.import_card("--json", *arguments, target=target, code=code).stdout.splitlines()
        done = json.loads(lines[-1])
        return done["imported"], done["present"], done["failed"]

    def files(self, target="in"):
        """What was imported, by name."""
        found = {}
        for name in self.names(target):
            with open(self.out(f"{target}/{name}"), "rb") as file:
                found[name] = file.read()
        return found

    def names(self, target="in"):
        return [name for name in os.listdir(self.out(target)) if name != RECEIPT and not name.endswith(".part")]

    def receipt(self, target="in"):
        with open(self.out(f"{target}/{RECEIPT}"), encoding="utf-8") as file:
            return [json.loads(line) for line in file]

    def card_path(self, name):
        return f"{self.service.volumes}/CARD/DCIM/{name}"

    def put(self, name, content):
        """A file that comes to the card later; the next service lists it."""
        with open(self.card_path(name), "wb") as file:
            file.write(content)

    def reinsert(self):
        """Takes the card out and puts it in again, so that it is walked anew."""
        path = f"{self.service.volumes}/CARD"
        before = self.handle_of(path)
        os.rename(path, f"{self.service.folder}/outside")
        wait_until(lambda: self.json("devices") == [], "the card to go")
        os.rename(f"{self.service.folder}/outside", path)
        self.assertNotEqual(self.handle_of(path), before)

    def start(self, *arguments, **options):
        return subprocess.Popen([BRIVOCTL, "import", "-d", self.out("in"), *arguments], env=self.service.environment,
                                stdout=subprocess.PIPE, stderr=subprocess.PIPE, **options)

    def parts(self, target="in"):
        with_parts = os.listdir(self.out(target)) if os.path.isdir(self.out(target)) else []
        return [name for name in with_parts if name.endswith(".part")]


class WhatIsImportedTest(ImportTest):
    def test_everything_comes_with_sidecars_and_unknown_types(self):
        self.card(files=CARD)
        result = self.import_card()
        self.assertEqual(self.files(), {os.path.basename(name): content for name, content in CARD.items()})
        self.assertIn(b"5 imported", result.stdout)
        self.assertIn(b"0 failed", result.stdout)

    def test_times_are_kept(self):
        self.card(files=CARD)
        os.utime(self.card_path("100ABCDE/IMG_0001.JPG"), (1_000_000_000, 1_000_000_000))
        self.import_card()
        self.assertEqual(os.stat(self.out("in/IMG_0001.JPG")).st_mtime, 1_000_000_000)

    def test_the_receipt_has_a_line_for_each_file(self):
        self.card(files=CARD)
        self.import_card()
        lines = {line["path"]: line for line in self.receipt()}
        self.assertEqual(sorted(lines), sorted(f"DCIM/{name}" for name in CARD))
        line = lines["DCIM/100ABCDE/IMG_0001.JPG"]
        self.assertEqual((line["name"], line["size"], line["sha256"], line["card"]),
                         ("IMG_0001.JPG", 13, hashlib.sha256(b"first picture").hexdigest(), "CARD"))
        self.assertRegex(line["when"], r"^20\d\d-\d\d-\d\dT\d\d:\d\d:\d\dZ$")

    def test_large_files_come_whole(self):
        content = os.urandom(20 * MEGABYTE)
        self.card(files={"100ABCDE/MVI_0001.MOV": content})
        self.import_card()
        self.assertTrue(self.files()["MVI_0001.MOV"] == content)

    def test_the_same_name_in_two_folders_gets_a_number(self):
        self.card(files={"100ABCDE/IMG_0001.JPG": b"one", "101ABCDE/IMG_0001.JPG": b"two",
                         "102ABCDE/IMG_0001.JPG": b"two"})
        self.import_card()
        self.assertEqual(sorted(self.files()), ["IMG_0001-1.JPG", "IMG_0001-2.JPG", "IMG_0001.JPG"])
        self.assertEqual(sorted(self.files().values()), [b"one", b"two", b"two"])

    def test_two_files_of_one_content_are_both_imported(self):
        self.card(files={"100ABCDE/IMG_0001.JPG": b"alike", "100ABCDE/IMG_0002.JPG": b"alike"})
        for name in ("IMG_0001.JPG", "IMG_0002.JPG"):
            os.utime(self.card_path(f"100ABCDE/{name}"), (1_000_000_000, 1_000_000_000))
        self.assertEqual(self.counts(), (2, 0, 0))
        self.assertEqual(self.counts(), (0, 2, 0))

    def test_a_file_that_is_there_already_is_left_alone(self):
        self.card(files=CARD)
        os.makedirs(self.out("in"))
        with open(self.out("in/IMG_0001.JPG"), "wb") as file:
            file.write(b"mine")
        self.import_card()
        self.assertEqual(self.files()["IMG_0001.JPG"], b"mine")
        self.assertEqual(self.files()["IMG_0001-1.JPG"], b"first picture")

    def test_without_verification_the_files_are_the_same(self):
        self.card(files=CARD)
        self.import_card("--no-verify")
        self.assertEqual(len(self.files()), len(CARD))


class WhatIsRememberedTest(ImportTest):
    def test_a_second_import_copies_nothing(self):
        self.card(files=CARD)
        self.assertEqual(self.counts(), (5, 0, 0))
        self.assertEqual(self.counts(), (0, 5, 0))

    def test_what_is_new_on_the_card_is_imported(self):
        self.card(files=CARD)
        self.import_card()
        self.put("101ABCDE/IMG_0005.JPG", b"new")
        self.reinsert()
        self.assertEqual(self.counts(), (1, 5, 0))
        self.assertEqual(self.files()["IMG_0005.JPG"], b"new")

    def test_a_reused_name_is_not_skipped(self):
        self.card(files=CARD)
        self.import_card()
        path = self.card_path("100ABCDE/IMG_0001.JPG")
        times = os.stat(path)
        self.put("100ABCDE/IMG_0001.JPG", b"other picture")  # as long as the first
        os.utime(path, ns=(times.st_atime_ns, times.st_mtime_ns))
        self.reinsert()
        self.assertEqual(self.counts(), (1, 4, 0))
        self.assertEqual(self.files()["IMG_0001-1.JPG"], b"other picture")

    def test_a_renamed_file_is_not_copied_twice(self):
        self.card(files=CARD)
        self.import_card()
        os.rename(self.card_path("100ABCDE/IMG_0001.JPG"), self.card_path("100ABCDE/IMG_0777.JPG"))
        self.reinsert()
        self.assertEqual(self.counts(), (0, 5, 0))

    def test_a_file_that_was_moved_on_from_the_folder_does_not_come_again(self):
        self.card(files=CARD)
        self.import_card()
        os.remove(self.out("in/IMG_0001.JPG"))
        self.assertEqual(self.counts(), (0, 5, 0))

    def test_each_folder_remembers_for_itself_unless_they_share_a_receipt(self):
        self.card(files=CARD)
        self.assertEqual(self.counts(), (5, 0, 0))
        self.assertEqual(self.counts(target="other"), (5, 0, 0))
        shared = ("--receipt", self.out("in") + "/" + RECEIPT)
        self.assertEqual(self.counts(*shared, target="third"), (0, 5, 0))

    def test_torn_and_foreign_lines_of_the_receipt_are_passed_over(self):
        self.card(files=CARD)
        self.import_card()
        with open(self.out(f"in/{RECEIPT}"), encoding="utf-8") as file:
            lines = file.readlines()
        with open(self.out(f"in/{RECEIPT}"), "w", encoding="utf-8") as file:
            file.write("[]\n\n7\n{\"size\": \"text\"}\n" + "".join(lines[:-1]) + lines[-1][:40])
        self.assertEqual(self.counts(), (1, 4, 0))
        self.assertEqual(self.counts(), (0, 5, 0))
        self.assertEqual(len(self.files()), 5, "what was there is taken for what it is")


class UnplannedEndTest(ImportTest):
    FILES = {f"100ABCDE/IMG_{number:04}.JPG": bytes([number]) * (4 * MEGABYTE) for number in range(1, 21)}

    def assert_only_whole_files(self):
        for name, content in self.files().items():
            self.assertTrue(content == self.FILES[f"100ABCDE/{name}"], f"{name} is not whole")

    def test_killed_at_any_point_it_goes_on_where_it_stopped(self):
        self.card(files=self.FILES)
        for wanted in (0, 3, 9):
            process = self.start()
            wait_until(lambda: process.poll() is not None or self.parts() and len(self.names()) > wanted, "some files")
            process.kill()
            process.communicate()
            self.assert_only_whole_files()
        imported, present, failed = self.counts()
        self.assertEqual((imported + present, failed), (20, 0))
        self.assertEqual(sorted(self.files()), sorted(os.path.basename(name) for name in self.FILES))
        self.assertEqual(len({line["path"] for line in self.receipt()}), 20)

    def test_an_interrupt_ends_it_with_nothing_half_done(self):
        self.card(files=self.FILES)
        process = self.start()
        wait_until(lambda: self.parts(), "the first file")
        process.send_signal(signal.SIGINT)
        _, errors = process.communicate(timeout=WAIT)
        if process.returncode == SUCCESS:
            self.skipTest("it was done before the signal came")
        self.assertEqual(process.returncode, FAILURE)
        self.assertIn(b"interrupted", errors)
        self.assertEqual(self.parts(), [])
        self.assert_only_whole_files()
        self.assertEqual(self.counts()[2], 0)
        self.assertEqual(len(self.files()), 20)

    def test_the_card_pulled_in_the_middle_is_named_and_resumed(self):
        path = self.card(files=self.FILES)
        process = self.start()
        wait_until(lambda: self.parts(), "the first file")
        os.rename(path, f"{self.service.folder}/outside")
        _, errors = process.communicate(timeout=WAIT)
        self.assert_only_whole_files()
        self.assertEqual(self.parts(), [])
        missing = sorted(set(self.FILES) - {f"100ABCDE/{name}" for name in self.files()})
        if missing:
            self.assertEqual(process.returncode, FAILURE)
        for name in missing:
            self.assertIn(f"DCIM/{name}: ".encode(), errors)
        os.rename(f"{self.service.folder}/outside", path)
        self.handle_of(path)
        self.assertEqual(self.counts()[:2], (len(missing), 20 - len(missing)))
        self.assertEqual(len(self.files()), 20)

    def test_leftovers_go_but_not_those_of_an_import_that_is_running(self):
        self.card(files=CARD)
        os.makedirs(self.out("in"))
        for name in (".orvid-import-0123456789abcdef.part", ".orvid-import-locked.part", ".mine.part"):
            with open(self.out(f"in/{name}"), "w", encoding="utf-8"):
                pass
        with open(self.out("in/.orvid-import-locked.part"), "rb") as held:
            fcntl.flock(held, fcntl.LOCK_EX)
            self.import_card()
            self.assertEqual(sorted(self.parts()), [".mine.part", ".orvid-import-locked.part"])

    def test_two_imports_at_once_lose_nothing(self):
        self.card(files=self.FILES)
        processes = [self.start(), self.start()]
        for process in processes:
            process.communicate(timeout=WAIT * 2)
        self.assertEqual(self.counts()[2], 0)
        kept = set(self.files().values())
        self.assertEqual(kept, set(self.FILES.values()))
        self.assertEqual(self.parts(), [])


class BadTargetTest(ImportTest):
    @needs_root
    def test_a_full_disk_is_said_and_nothing_half_written_remains(self):
        self.card(files={"100ABCDE/IMG_0001.JPG": b"small", "100ABCDE/IMG_0002.MOV": os.urandom(12 * MEGABYTE),
                         "100ABCDE/IMG_0003.JPG": b"small too"})
        os.makedirs(self.out("in"))
        run("mount", "-t", "tmpfs", "-o", "size=8m", "tmpfs", self.out("in"))
        self.addCleanup(run, "umount", self.out("in"))
        result = self.import_card(code=FAILURE)
        self.assertIn(b"DCIM/100ABCDE/IMG_0002.MOV: ", result.stderr)
        self.assertIn(b"No space left on device", result.stderr)
        self.assertEqual(self.files(), {"IMG_0001.JPG": b"small", "IMG_0003.JPG": b"small too"})
        run("mount", "-o", "remount,size=20m", self.out("in"))
        self.assertEqual(self.counts(), (1, 2, 0))

    def test_a_folder_that_cannot_be_made_is_a_failure(self):
        path = self.card(files=CARD)
        self.import_card(target=f"../volumes/CARD/DCIM/100ABCDE/IMG_0001.JPG/in", code=FAILURE)
        self.assertTrue(os.path.isfile(f"{path}/DCIM/100ABCDE/IMG_0001.JPG"))

    def test_a_receipt_that_cannot_be_written_is_a_failure(self):
        self.card(files=CARD)
        os.makedirs(self.out(f"in/{RECEIPT}"))
        self.assertIn(RECEIPT.encode(), self.import_card(code=FAILURE).stderr)
        self.assertEqual(os.listdir(self.out("in")), [RECEIPT])

    def test_a_target_must_be_named(self):
        self.card(files=CARD)
        self.brivoctl("import", "CARD", code=USAGE)

    def test_a_file_that_vanished_from_the_card_is_counted_and_the_rest_is_imported(self):
        self.card(files=CARD)
        self.json("ls")
        os.remove(self.card_path("100ABCDE/IMG_0001.JPG"))
        result = self.import_card(code=FAILURE)
        self.assertIn(b"DCIM/100ABCDE/IMG_0001.JPG: ", result.stderr)
        self.assertIn(b"4 imported", result.stdout)
        self.assertIn(b"1 failed", result.stdout)
        self.assertEqual(self.parts(), [])


class ProgressTest(ImportTest):
    CONTENT = os.urandom(40 * MEGABYTE)

    def on_a_terminal(self, *arguments):
        """Everything that a run writes to its terminal."""
        terminal, end = pty.openpty()
        written = []

        def collect():
            while True:
                try:
                    chunk = os.read(terminal, 65536)
                except OSError:
                    return
                written.append(chunk)

        collector = threading.Thread(target=collect)
        collector.start()
        result = subprocess.run([BRIVOCTL, *arguments], env=self.service.environment, stdin=end, stdout=end, stderr=end,
                                timeout=WAIT * 2, check=False)
        os.close(end)
        collector.join()
        os.close(terminal)
        self.assertEqual(result.returncode, SUCCESS, written)
        return b"".join(written).decode()

    def test_a_terminal_shows_a_bar_with_rate_and_time_left(self):
        self.card(files={f"100ABCDE/MVI_{n:04}.MOV": self.CONTENT for n in range(1, 13)})
        shown = self.on_a_terminal("import", "-d", self.out("in"))
        self.assertRegex(shown, r"\r\x1b\[KMVI_00\d\d\.MOV \[#* *\] +\d+ %  [\d.]+ [kMG]?B/s  [\d:?]+ left")
        self.assertIn("12 imported", shown)

    def test_nothing_of_it_is_seen_when_piped(self):
        self.card(files={"100ABCDE/MVI_0001.MOV": self.CONTENT})
        for arguments in (("get", "DCIM/100ABCDE/MVI_0001.MOV", "-d", self.out("got")), ("import", "-d", self.out("in"))):
            result = self.brivoctl(*arguments)
            self.assertEqual(result.stderr, b"")
            self.assertNotIn(b"\r", result.stdout)
            self.assertEqual(len(result.stdout.splitlines()), 1)

    def test_as_json_each_event_is_a_line(self):
        self.card(files=CARD)
        lines = [json.loads(line) for line in self.import_card("--json").stdout.splitlines()]
        self.assertEqual({line["event"] for line in lines} - {"progress"}, {"imported", "done"})
        imported = next(line for line in lines if line.get("path") == "DCIM/100ABCDE/IMG_0001.JPG")
        self.assertEqual((imported["file"], imported["size"]), (self.out("in/IMG_0001.JPG"), 13))


if __name__ == "__main__":
    unittest.main()
