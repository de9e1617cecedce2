# SPDX-License-Identifier: MIT
"""brivoctl get and import from a card, or onto a disk, that fails: never a success, never a file that is not whole."""
import os
import subprocess

from faults import LAYER, FaultyService, sanitizer_runtimes
from harness import BRIVOCTL
from test_brivoctl import FAILURE, SUCCESS
from test_importing import ImportTest

MEBIBYTE = 1 << 20
BAD = "IMG_0002.MOV"
FILES = {"100ABCDE/IMG_0001.JPG": b"first picture", f"100ABCDE/{BAD}": bytes(range(256)) * (5 * MEBIBYTE // 256),
         "100ABCDE/IMG_0003.JPG": b"the third"}
# Reads that fail at once, in the middle of a piece, on the border of two, and of the last byte alone.
FAULTS = ("fail 0", f"short {MEBIBYTE}", f"fail {2 * MEBIBYTE}", f"end {3 * MEBIBYTE}", f"short {5 * MEBIBYTE - 1}")


class FaultTest(ImportTest):
    def setUp(self):
        self.service = FaultyService(grant=self.grant, **self.environment)
        self.addCleanup(self.service.close)
        self.card(files=FILES)

    def nothing_of(self, name, target):
        """There is no file of this name, whole or not, and no part of one."""
        self.assertEqual([found for found in os.listdir(self.out(target)) if found == name or found.startswith(".")],
                         [])


class FaultyCardTest(FaultTest):
    def test_an_import_names_what_failed_imports_the_rest_and_makes_up_for_it_later(self):
        for number, fault in enumerate(FAULTS):
            with self.subTest(fault):
                target = f"in{number}"
                self.service.order(f"{fault} {BAD}")
                result = self.import_card(target=target, code=FAILURE)
                self.assertIn(f"DCIM/100ABCDE/{BAD}: ".encode(), result.stderr)
                self.assertIn(b"2 imported", result.stdout)
                self.nothing_of(BAD, target)
                self.service.take_back()
                self.assertEqual(self.counts(target=target), (1, 2, 0))
                self.assertTrue(self.files(target)[BAD] == FILES[f"100ABCDE/{BAD}"])

    def test_a_file_is_saved_whole_or_not_at_all(self):
        os.makedirs(self.out("got"))
        for fault in FAULTS:
            with self.subTest(fault):
                self.service.order(f"{fault} {BAD}")
                self.brivoctl("get", f"DCIM/100ABCDE/{BAD}", "-d", self.out("got"), code=FAILURE)
                self.nothing_of(BAD, "got")
                self.service.take_back()
        self.brivoctl("get", f"DCIM/100ABCDE/{BAD}", "-d", self.out("got"))
        with open(self.out(f"got/{BAD}"), "rb") as file:
            self.assertTrue(file.read() == FILES[f"100ABCDE/{BAD}"])

    def test_reads_that_come_in_parts_lose_nothing(self):
        self.service.order(f"split 1000 {BAD}", f"split {MEBIBYTE + 7} {BAD}", f"split {2 * MEBIBYTE} {BAD}")
        self.assertEqual(self.counts(), (3, 0, 0))
        self.assertTrue(self.files()[BAD] == FILES[f"100ABCDE/{BAD}"])

    def test_a_card_that_does_not_answer_ends_in_a_failure_and_not_in_waiting(self):
        self.service.order(f"stall {2 * MEBIBYTE} {BAD}")
        result = self.brivoctl("get", f"DCIM/100ABCDE/{BAD}", "-d", self.out("got"), "--timeout", "1", code=FAILURE)
        self.assertIn(b"no answer in time", result.stderr)
        self.nothing_of(BAD, "got")
        self.service.take_back()
        self.assertEqual(self.counts(), (3, 0, 0))


class FaultyDiskTest(FaultTest):
    def import_to_faulty_disk(self, order):
        """Imports where the reads of what was written go as ordered."""
        self.service.order(order)
        preload = ":".join([*sanitizer_runtimes(), LAYER])
        return subprocess.run([BRIVOCTL, "import", "-d", self.out("in")], capture_output=True, check=False,
                              env={**self.service.environment, "LD_PRELOAD": preload})

    def test_what_the_disk_does_not_give_back_is_not_imported(self):
        for order, why in ((f"end {MEBIBYTE} .part", b"is not what was read"), ("fail 0 .part", b"Input/output error")):
            with self.subTest(order):
                result = self.import_to_faulty_disk(order)
                self.assertEqual(result.returncode, FAILURE)
                self.assertIn(f"DCIM/100ABCDE/{BAD}: ".encode(), result.stderr)
                self.assertIn(why, result.stderr)
                self.nothing_of(BAD, "in")
        self.service.take_back()
        self.assertEqual(self.import_card(code=SUCCESS).returncode, SUCCESS)
        self.assertEqual(sorted(self.files()), sorted(os.path.basename(name) for name in FILES))
