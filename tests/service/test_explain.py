# SPDX-License-Identifier: MIT
"""The two commands for people who debug clients: explain and dataset. Neither needs a service."""
import json
import os
import random
import struct
import subprocess
import tempfile
import unittest

BRIVOCTL = os.environ["BRIVOD_BUILD"] + "/bin/brivoctl"
SUCCESS, FAILURE, USAGE = range(3)
WAIT = 60  # seconds, for what should take none


def counted(text):
    """A PTP string."""
    return bytes([len(text) + 1]) + text.encode("utf-16-le") + bytes(2) if text else bytes(1)


def dataset(handle=7, name="IMG_0001.JPG"):
    """A serialised object-info dataset."""
    content = 2 * len(name) + 78 if name else 76
    fields = struct.pack("<IIHHQHIIIIIIIIHHQQ", handle, content, 0x3801, 1, 5_000_000_000, 0x3808, 8400, 0x2000,
                         160, 120, 6000, 4000, 24, 0xFFFFFFFE, 1, 6, 1_700_000_000, 1_700_000_001)
    return (fields + counted(name)).ljust(content + 8, b"\0")


def usb(kind, code, transaction, body=b""):
    return struct.pack("<IHHI", 12 + len(body), kind, code, transaction) + body


def packet(kind, body=b""):
    return struct.pack("<II", 8 + len(body), kind) + body


class BrivoctlTest(unittest.TestCase):
    def brivoctl(self, *arguments, code=SUCCESS, **options):
        result = subprocess.run([BRIVOCTL, *arguments], capture_output=True, timeout=WAIT, **options)
        self.assertEqual(result.returncode, code, result.stderr.decode())
        if code == FAILURE:
            self.assertTrue(result.stderr.startswith(b"brivoctl: "), result.stderr)
        return result


class ExplainTest(BrivoctlTest):
    def explain(self, code):
        return json.loads(self.brivoctl("explain", "--json", code).stdout)

    def lines(self, code):
        return self.brivoctl("explain", code).stdout.decode().splitlines()

    def test_an_error_has_its_name_and_its_text(self):
        self.assertEqual(self.explain("-9934"), [
            {"kind": "error", "code": -9934, "name": "OVReturnDownloadFailed", "text": "_device download failed."},
            {"kind": "request result", "code": -9934, "name": "", "text": "download not offered"}])
        self.assertEqual(self.lines("-9900"),
                         ["error                   OVLegacyReturnCodeCommunicationErr  _device communication error."])

    def test_an_error_with_two_names_has_both(self):
        self.assertEqual(self.explain("-9938"), [
            {"kind": "error", "code": -9938, "name": "OVReturnFailedToEnableTethering",
             "olderName": "OVReturnFailedToEnabeTethering", "text": "_camera enable tethering failed."}])

    def test_a_result_of_the_service_that_has_no_name_has_its_text(self):
        self.assertEqual(self.explain("-21449"),
                         [{"kind": "request result", "code": -21449, "name": "", "text": "bad range"}])
        self.assertEqual(self.explain("-21450")[0]["text"], "no such object")
        self.assertEqual(self.explain("-21446")[0]["text"], "read longer than 4 MiB")

    def test_success_is_explained_too(self):
        self.assertEqual(self.explain("0")[0],
                         {"kind": "error", "code": 0, "name": "success", "text": "_operation success."})

    def test_one_code_of_each_table(self):
        for code, kind, name in [
                ("0x1007", "operation", "PTPOperationCodeGetObjectHandles"),
                ("0x2001", "response", "PTPResponseCodeOK"),
                ("0x4002", "event", "PTPEventCodeObjectAdded"),
                ("0x5001", "device property", "PTPDevicePropCodeBatteryLevel"),
                ("0x3001", "object format", "PTPObjectFormatCodeAssociation"),
                ("0xD101", "vendor property", "CanonAperture"),
                ("0xD02C", "vendor property", "CanonImageQualityEnumeration")]:
            with self.subTest(code):
                self.assertEqual(self.explain(code), [{"kind": kind, "code": int(code, 16), "name": name}])

    def test_all_matches_are_listed_with_their_table(self):
        kinds = [match["kind"] for match in self.explain("1")]
        self.assertEqual(kinds, ["error", "functional mode", "storage type", "file-system type", "access capability",
                                 "protection status", "association type", "initialisation failure"])
        self.assertEqual(len(self.lines("1")), len(kinds))

    def test_trailing_blanks_of_names_stay(self):
        self.assertEqual(self.explain("0xD115")[0]["name"], "CanonOwner    ")

    def test_decimal_and_hexadecimal_are_the_same_number(self):
        self.assertEqual(self.explain("4103"), self.explain("0x1007"))
        self.assertEqual(self.explain("-0x26ac"), self.explain("-9900"))
        self.assertEqual(self.explain("+17"), self.explain("0X11"))

    def test_an_error_as_the_unsigned_number_in_memory(self):
        self.assertEqual(self.explain("0xFFFFD954"), self.explain("-9900"))

    def test_a_code_in_no_table_is_a_failure_that_says_so(self):
        for code in ("0x9FFF", "99999", "-1", "-21448", "0xFFFFFFFF"):
            with self.subTest(code):
                result = self.brivoctl("explain", code, code=FAILURE)
                self.assertEqual(result.stderr.decode(),
                                 f"brivoctl: {code} is in no table of errors or PTP codes\n")
                self.assertEqual(result.stdout, b"")

    def test_what_is_no_number_is_wrong_usage(self):
        for argument in ("", "abc", "12x", "0x", "0x100000000", "4294967296", "1.5", "--1", "+-1"):
            with self.subTest(argument):
                self.brivoctl("explain", argument, code=USAGE)
        self.brivoctl("explain", code=USAGE)


class DatasetTest(BrivoctlTest):
    def setUp(self):
        folder = tempfile.TemporaryDirectory(prefix="brivod-explain-")
        self.addCleanup(folder.cleanup)
        self.path = folder.name + "/bytes"

    def write(self, content):
        with open(self.path, "wb") as file:
            file.write(content)
        return self.path

    def records(self, content):
        lines = self.brivoctl("dataset", "--json", self.write(content)).stdout.splitlines()
        return [json.loads(line) for line in lines]

    def refused(self, content):
        """What is said when it cannot be decoded to its end, and what was printed before."""
        result = self.brivoctl("dataset", "--json", self.write(content), code=FAILURE)
        return result.stderr.decode(), result.stdout.splitlines()

    def test_every_field_of_a_dataset(self):
        self.assertEqual(self.records(dataset()), [{
            "record": "object info dataset", "objectHandle": 7,
            "objectFormat": 0x3801, "objectFormatName": "PTPObjectFormatCodeEXIF_JPEG",
            "protectionStatus": 1, "protectionStatusName": "PTPProtectionStatusReadOnly",
            "objectCompressedSize": 5_000_000_000, "thumbFormat": 0x3808, "thumbCompressedSize": 8400,
            "thumbOffset": 0x2000, "thumbPixWidth": 160, "thumbPixHeight": 120, "imagePixWidth": 6000,
            "imagePixHeight": 4000, "imageBitDepth": 24, "parentObject": 0xFFFFFFFE,
            "associationType": 1, "associationTypeName": "PTPAssociationTypeGenericFolder", "imageOrietation": 6,
            "captureDate_tvsec": 1_700_000_000, "modificationDate_tvsec": 1_700_000_001,
            "filename": "IMG_0001.JPG"}])

    def test_a_dataset_without_a_name(self):
        self.assertEqual(self.records(dataset(name=""))[0]["filename"], "")

    def test_records_come_one_after_the_other(self):
        records = self.records(dataset(1) + usb(1, 0x1002, 0) + packet(13) + dataset(2, "DCIM"))
        self.assertEqual([record["record"] for record in records],
                         ["object info dataset", "PTP USB container", "PTP/IP packet", "object info dataset"])
        self.assertEqual(records[3]["objectHandle"], 2)

    def test_a_usb_transaction(self):
        command, data, response, event = self.records(
            usb(1, 0x1009, 3, struct.pack("<I", 8)) + usb(2, 0x1009, 3, b"abc") + usb(3, 0x2001, 3) +
            usb(4, 0xC001, 4, struct.pack("<II", 1, 2)))
        self.assertEqual(command, {"record": "PTP USB container", "type": 1, "typeName": "command", "length": 16,
                                   "code": 0x1009, "codeName": "PTPOperationCodeGetObject", "transaction": 3,
                                   "parameters": [8]})
        self.assertEqual((data["payloadLength"], data["payload"]), (3, "616263"))
        self.assertEqual((response["typeName"], response["codeName"]), ("response", "PTPResponseCodeOK"))
        self.assertEqual((event["codeName"], event["parameters"]), ("PTPEventCodeNorelDeviceUnlocked", [1, 2]))

    def test_a_connection_over_ip(self):
        side = bytes(range(16)) + "K\u00e4mera\0".encode("utf-16-le") + struct.pack("<I", 0x10000)
        request, ack, refusal = self.records(
            packet(1, side) + packet(2, struct.pack("<I", 12) + side) + packet(5, struct.pack("<I", 2)))
        self.assertEqual(request, {"record": "PTP/IP packet", "type": 1, "typeName": "init command request",
                                   "length": 42, "guid": bytes(range(16)).hex(), "name": "K\u00e4mera",
                                   "version": 0x10000})
        self.assertEqual((ack["connection"], ack["name"]), (12, "K\u00e4mera"))
        self.assertEqual((refusal["reason"], refusal["reasonName"]), (2, "PTPInitFailReasonBusy"))

    def test_a_data_phase_over_ip(self):
        request, start, data, end = self.records(
            packet(6, struct.pack("<IHI", 1, 0x1004, 5)) + packet(9, struct.pack("<IQ", 5, 3)) +
            packet(10, struct.pack("<I", 5) + b"ab") + packet(12, struct.pack("<I", 5) + b"c"))
        self.assertEqual((request["dataPhase"], request["codeName"]), (1, "PTPOperationCodeGetStorageIDs"))
        self.assertNotIn("parameters", request)
        self.assertEqual(start["totalLength"], 3)
        self.assertEqual((data["payload"], end["payload"]), ("6162", "63"))

    def test_for_people_each_field_is_a_line(self):
        lines = self.brivoctl("dataset", self.write(usb(1, 0x1007, 3))).stdout.decode().splitlines()
        self.assertEqual(lines[0], "PTP USB container")
        self.assertIn("  code                    4103 (0x1007)", lines)
        self.assertIn("  codeName                PTPOperationCodeGetObjectHandles", lines)

    def test_for_people_control_characters_in_names_are_escaped_and_payloads_cut(self):
        text = self.brivoctl("dataset", self.write(dataset(name="a\x1b[31m"))).stdout.decode()
        self.assertNotIn("\x1b", text)
        text = self.brivoctl("dataset", self.write(usb(2, 0x1009, 3, bytes(1000)))).stdout.decode()
        self.assertIn("  payload                 " + 64 * "0" + "...\n", text)

    def test_standard_input(self):
        result = self.brivoctl("dataset", "--json", "-", input=dataset(9))
        self.assertEqual(json.loads(result.stdout)["objectHandle"], 9)

    def test_bytes_that_are_none_of_these_are_a_failure_that_says_so(self):
        message, lines = self.refused(b"This is a text, and no dataset.\n")
        self.assertIn("what is at offset 0 is no whole object-info dataset or PTP container", message)
        self.assertEqual(lines, [])

    def test_what_is_good_is_shown_before_what_is_not_is_named(self):
        message, lines = self.refused(dataset() + b"rubbish")
        self.assertIn(f"what is at offset {len(dataset())} is no whole", message)
        self.assertEqual(len(lines), 1)

    def test_every_cut_is_a_failure(self):
        for whole in (dataset(), usb(1, 0x1007, 3, bytes(12)), packet(9, bytes(12))):
            for size in range(1, len(whole)):
                self.refused(whole[:size])

    def test_an_empty_file_a_folder_and_a_missing_file_are_failures(self):
        self.assertIn("is empty", self.refused(b"")[0])
        self.assertIn("directory", self.brivoctl("dataset", "/", code=FAILURE).stderr.decode())
        self.assertIn("No such file", self.brivoctl("dataset", self.path + ".gone", code=FAILURE).stderr.decode())

    def test_a_file_that_does_not_end_is_a_failure(self):
        self.assertIn("larger than 64 MiB", self.brivoctl("dataset", "/dev/zero", code=FAILURE).stderr.decode())

    def test_random_bytes_end_in_an_exit_code(self):
        chance = random.Random(7)
        for _ in range(50):
            content = bytearray(chance.choice((dataset(), usb(2, 0x1009, 3, bytes(40)), packet(1, bytes(60)))))
            for _ in range(3):
                content[chance.randrange(len(content))] = chance.randrange(256)
            result = subprocess.run([BRIVOCTL, "dataset", "-"], input=bytes(content), capture_output=True,
                                    timeout=WAIT)
            self.assertIn(result.returncode, (SUCCESS, FAILURE), result.stderr)

    def test_a_file_must_be_named(self):
        self.brivoctl("dataset", code=USAGE)
