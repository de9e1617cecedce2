# SPDX-License-Identifier: MIT
"""The command line: what it prints, to people and to programs, and how it ends."""
import base64
import contextlib
import json
import os
import shutil
import signal
import sqlite3
import subprocess
import unittest

from harness import BRIVOCTL, WAIT, ServiceTest, wait_until

TOP_LEVEL = 0xFFFFFFFE
SUCCESS, FAILURE, USAGE, NO_SERVICE, REFUSED = range(5)
OBJECT_KEYS = ["handle", "parent", "path", "folder", "size", "width", "height", "orientation", "captured", "modified",
               "thumbOffset", "thumbSize", "thumbWidth", "thumbHeight", "protected"]
PICTURES = {"100ABCDE/IMG_0001.JPG": b"first picture", "100ABCDE/IMG_0002.JPG": b"the second"}
FIRST = "DCIM/100ABCDE/IMG_0001.JPG"
SECOND = "DCIM/100ABCDE/IMG_0002.JPG"


class BrivoctlTest(ServiceTest):
    def brivoctl(self, *arguments, code=SUCCESS, **options):
        """Runs it, checks how it ended, and gives what it printed."""
        result = self.service.brivoctl(*arguments, **options)
        self.assertEqual(result.returncode, code, result.stderr.decode())
        if code in (FAILURE, NO_SERVICE, REFUSED):
            self.assertTrue(result.stderr.startswith(b"brivoctl: "), result.stderr)
        return result

    def json(self, *arguments, **options):
        return json.loads(self.brivoctl(*arguments, "--json", **options).stdout)

    def json_lines(self, *arguments, **options):
        return [json.loads(line) for line in self.brivoctl(*arguments, "--json", **options).stdout.splitlines()]

    def card(self, name="CARD", files=None):
        """Makes a card and waits until the service lists it."""
        path = self.folder_card(name, PICTURES if files is None else files)
        self.handle_of(path)
        return path

    def handle_of(self, path):
        return wait_until(lambda: next((d["handle"] for d in self.json("devices") if d["path"] == path), None), path)

    def out(self, name=""):
        """A path for saved files."""
        return f"{self.service.folder}/out/{name}".rstrip("/")


class DevicesTest(BrivoctlTest):
    def test_each_device_is_a_line_with_handle_name_and_mount_path(self):
        path = self.card("EOS DIGITAL")
        lines = self.brivoctl("devices").stdout.decode().splitlines()
        self.assertEqual(len(lines), 1)
        self.assertEqual(lines[0].split(None, 1)[0], self.handle_of(path))
        self.assertIn("  EOS DIGITAL  ", lines[0])
        self.assertTrue(lines[0].endswith(path))

    def test_as_json_the_list_is_one_document(self):
        path = self.card("EOS DIGITAL")
        self.assertEqual(self.json("devices"), [{"handle": self.handle_of(path), "name": "EOS DIGITAL", "path": path}])

    def test_without_devices_the_list_is_empty_and_that_is_no_failure(self):
        self.assertEqual(self.brivoctl("devices").stdout, b"")
        self.assertEqual(self.json("devices"), [])

    def test_the_address_can_be_given(self):
        self.card()
        self.service.environment["BRIVOD_RUNTIME_DIR"] = f"{self.service.folder}/elsewhere"
        self.brivoctl("devices", code=NO_SERVICE)
        self.assertEqual(len(self.json("devices", "--address", self.service.address)), 1)


class ListTest(BrivoctlTest):
    def test_the_catalogue_as_json(self):
        path = self.card()
        os.utime(f"{path}/{FIRST}", (1_600_000_000, 1_600_000_000))
        objects = self.json("ls")
        for entry in objects:
            self.assertEqual(list(entry), OBJECT_KEYS)
        self.assertEqual([entry["path"] for entry in objects[:2]], ["DCIM", "DCIM/100ABCDE"], "folders first")
        found = {entry["path"]: entry for entry in objects}
        self.assertEqual(sorted(found), ["DCIM", "DCIM/100ABCDE", FIRST, SECOND])
        self.assertEqual(found["DCIM"]["parent"], TOP_LEVEL)
        self.assertEqual(found["DCIM/100ABCDE"]["parent"], found["DCIM"]["handle"])
        picture = found[FIRST]
        self.assertEqual(picture["parent"], found["DCIM/100ABCDE"]["handle"])
        self.assertEqual([picture[key] for key in ("folder", "size", "modified", "protected", "thumbSize")],
                         [False, 13, 1_600_000_000, False, 1])
        self.assertGreaterEqual(picture["captured"], 1_600_000_000)
        self.assertIs(found["DCIM"]["folder"], True)

    def test_the_catalogue_as_text(self):
        self.card()
        objects = {entry["path"]: entry for entry in self.json("ls")}
        lines = self.brivoctl("ls").stdout.decode().splitlines()
        self.assertEqual(len(lines), 4)
        by_path = {line.split()[-1]: line.split() for line in lines}
        self.assertEqual(by_path[FIRST][:3], [str(objects[FIRST]["handle"]), "13", "B"])
        self.assertEqual(by_path["DCIM/"][:2], [str(objects["DCIM"]["handle"]), "-"])

    def test_a_device_is_named_by_handle_prefix_volume_name_or_mount_path(self):
        one = self.card("ONE", {"100ABCDE/IMG_0001.JPG": b"1"})
        two = self.card("TWO", {"100ABCDE/IMG_0002.JPG": b"2"})
        handles = [self.handle_of(one), self.handle_of(two)]
        length = len(os.path.commonprefix(handles)) + 1
        for selector in (handles[1], handles[1].lower(), handles[1][:length], "TWO", two, f"{two}/"):
            with self.subTest(selector):
                self.assertEqual(self.json("ls", selector)[-1]["path"], SECOND)

    def test_with_two_devices_one_must_be_named(self):
        paths = [self.card("ONE"), self.card("TWO")]
        message = self.brivoctl("ls", code=USAGE).stderr.decode()
        for path in paths:
            self.assertIn(self.handle_of(path), message)
            self.assertIn(path, message)

    def test_a_prefix_of_several_devices_is_refused(self):
        handles = [self.handle_of(self.card(f"CARD{i:02}", {})) for i in range(17)]  # of 16 first digits one comes twice
        first = next(h[0] for i, h in enumerate(handles) if h[0] in [other[0] for other in handles[:i]])
        message = self.brivoctl("ls", first, code=USAGE).stderr.decode()
        for handle in handles:
            self.assertEqual(handle in message, handle.startswith(first))

    def test_an_unknown_device_and_none_at_all_fail(self):
        self.assertIn(b"there is no device", self.brivoctl("ls", code=FAILURE).stderr)
        self.card()
        self.assertIn(b"no such device: NONE", self.brivoctl("ls", "NONE", code=FAILURE).stderr)

    def test_control_characters_are_escaped_in_text_and_exact_in_json(self):
        name = "IMG_0001.JPG\n\x1b[31mred\x07"
        path = self.card("CA\nRD", {f"100ABCDE/{name}": b"x"})
        self.assertEqual(self.json("ls")[-1]["path"], f"DCIM/100ABCDE/{name}")
        self.assertEqual(self.json("devices")[0], {"handle": self.handle_of(path), "name": "CA\nRD", "path": path})
        for command in ("ls", "devices"):
            text = self.brivoctl(command).stdout
            self.assertEqual([byte for byte in text if byte < 32 and byte != 10], [], text)
        self.assertIn("IMG_0001.JPG\\x0a\\x1b[31mred\\x07", self.brivoctl("ls").stdout.decode())
        self.assertIn("CA\\x0aRD", self.brivoctl("devices").stdout.decode())
        self.assertEqual(len(self.brivoctl("devices").stdout.splitlines()), 1)

    def test_a_closed_pipe_ends_it_quietly(self):
        self.card(files={f"100ABCDE/IMG_{i:04}.JPG": b"x" for i in range(2000)})
        for ignored in (False, True):  # whoever starts it may ignore SIGPIPE
            for arguments in (("ls",), ("ls", "--json")):
                with self.subTest(arguments=arguments, ignored=ignored):
                    process = subprocess.Popen([BRIVOCTL, *arguments], env=self.service.environment,
                                               restore_signals=not ignored, stdout=subprocess.PIPE,
                                               stderr=subprocess.PIPE)
                    process.stdout.close()
                    message = process.stderr.read()
                    process.stderr.close()
                    self.assertIn(process.wait(WAIT), (FAILURE,) if ignored else (FAILURE, -signal.SIGPIPE), message)
                    self.assertNotIn(b"terminate", message)

    def test_output_that_cannot_be_written_is_a_failure(self):
        self.card(files={f"100ABCDE/IMG_{i:04}.JPG": b"x" for i in range(2000)})
        for arguments in (("ls",), ("ls", "--json"), ("devices",), ("read", FIRST.replace("0001", "0003"))):
            with self.subTest(arguments), open("/dev/full", "wb") as full:
                result = subprocess.run([BRIVOCTL, *arguments], env=self.service.environment, stdout=full,
                                        stderr=subprocess.PIPE, timeout=WAIT * 2, check=False)
                self.assertEqual(result.returncode, FAILURE, result.stderr)
                self.assertTrue(result.stderr.startswith(b"brivoctl: "), result.stderr)


class ReadTest(BrivoctlTest):
    def test_an_object_is_named_by_path_or_handle_with_or_without_the_device(self):
        path = self.card()
        handle = next(entry["handle"] for entry in self.json("ls") if entry["path"] == FIRST)
        for arguments in ((FIRST,), (str(handle),), ("CARD", FIRST), (path, str(handle))):
            with self.subTest(arguments):
                self.assertEqual(self.brivoctl("read", *arguments).stdout, b"first picture")

    def test_ranges(self):
        self.card()
        for options, expected in (((), b"first picture"), (("--offset", "6"), b"picture"),
                                  (("--length", "5"), b"first"), (("--offset", "2", "--length", "3"), b"rst"),
                                  (("--offset", "13"), b""), (("--length", "0"), b"")):
            with self.subTest(options):
                self.assertEqual(self.brivoctl("read", FIRST, *options).stdout, expected)

    def test_past_the_end_is_a_failure(self):
        self.card()
        for options in (("--offset", "14"), ("--length", "14"), ("--offset", "10", "--length", "4")):
            with self.subTest(options):
                self.assertEqual(self.brivoctl("read", FIRST, *options, code=FAILURE).stdout, b"")

    def test_a_failure_of_the_service_shows_its_code_and_what_is_known_of_it(self):
        self.card()
        message = self.brivoctl("read", FIRST, "--length", "14", code=FAILURE).stderr
        self.assertTrue(message.endswith(b" (error -21449, bad range)\n"), message)

    def test_as_json_the_bytes_are_base64(self):
        self.card(files={"100ABCDE/IMG_0001.JPG": bytes(range(256))})
        document = self.json("read", FIRST, "--offset", "200")
        self.assertEqual(list(document), ["handle", "offset", "data"])
        self.assertEqual((document["offset"], base64.b64decode(document["data"])), (200, bytes(range(200, 256))))

    def test_more_than_one_read_holds_comes_in_one_piece(self):
        content = os.urandom(9_000_000)
        self.card(files={"100ABCDE/IMG_0001.MOV": content})
        self.assertTrue(self.brivoctl("read", "DCIM/100ABCDE/IMG_0001.MOV").stdout == content)
        whole = self.json("read", "DCIM/100ABCDE/IMG_0001.MOV", "--offset", "100", "--length", "8000000")
        self.assertTrue(base64.b64decode(whole["data"]) == content[100:8_000_100])

    def test_an_unknown_object_is_a_failure(self):
        self.card()
        for selector in ("DCIM/100ABCDE/IMG_0009.JPG", "4000000000", "99999999999999999999"):
            with self.subTest(selector):
                message = self.brivoctl("read", selector, code=FAILURE).stderr.decode()
                self.assertIn(f"no such object: {selector}", message)

    def test_a_folder_cannot_be_read(self):
        self.card()
        self.brivoctl("read", "DCIM", code=FAILURE)


class GetTest(BrivoctlTest):
    def test_files_are_saved_in_a_folder_that_is_made(self):
        self.card()
        result = self.brivoctl("get", FIRST, SECOND, "-d", self.out("new"))
        self.assertEqual(sorted(os.listdir(self.out("new"))), ["IMG_0001.JPG", "IMG_0002.JPG"])
        with open(self.out("new/IMG_0001.JPG"), "rb") as file:
            self.assertEqual(file.read(), b"first picture")
        self.assertEqual(result.stdout.decode().splitlines()[0], f"{self.out('new/IMG_0001.JPG')}  13 B")

    def test_as_json_each_file_is_a_line(self):
        self.card()
        lines = self.json_lines("get", "CARD", FIRST, SECOND, "-d", self.out())
        handles = {entry["path"]: entry["handle"] for entry in self.json("ls")}
        self.assertEqual(lines, [{"handle": handles[path], "path": path, "file": self.out(os.path.basename(path)),
                                  "size": size} for path, size in ((FIRST, 13), (SECOND, 10))])

    def test_without_a_directory_the_current_one_is_used(self):
        self.card()
        os.makedirs(self.out())
        self.brivoctl("get", FIRST, cwd=self.out())
        self.assertEqual(os.listdir(self.out()), ["IMG_0001.JPG"])

    def test_a_large_file_is_saved_whole(self):
        content = os.urandom(9_000_000)
        self.card(files={"100ABCDE/IMG_0001.MOV": content})
        self.brivoctl("get", "DCIM/100ABCDE/IMG_0001.MOV", "-d", self.out())
        with open(self.out("IMG_0001.MOV"), "rb") as file:
            self.assertTrue(file.read() == content)

    def test_an_existing_file_is_replaced_only_by_force(self):
        self.card()
        os.makedirs(self.out())
        with open(self.out("IMG_0001.JPG"), "wb") as file:
            file.write(b"mine")
        self.assertIn(b"--force", self.brivoctl("get", FIRST, "-d", self.out(), code=FAILURE).stderr)
        self.assertEqual(self.saved("IMG_0001.JPG"), b"mine")
        self.brivoctl("get", FIRST, "-d", self.out(), "--force")
        self.assertEqual(self.saved("IMG_0001.JPG"), b"first picture")

    def test_of_several_one_fails_and_the_others_are_saved(self):
        self.card()
        os.makedirs(self.out("IMG_0001.JPG"))
        lines = self.json_lines("get", FIRST, "DCIM", SECOND, "-d", self.out(), code=FAILURE)
        self.assertEqual([line["path"] for line in lines], [SECOND])
        self.assertEqual(self.saved("IMG_0002.JPG"), b"the second")
        self.assertEqual(sorted(os.listdir(self.out())), ["IMG_0001.JPG", "IMG_0002.JPG"])

    def test_a_folder_that_cannot_be_made_is_a_failure(self):
        path = self.card()
        self.brivoctl("get", FIRST, "-d", f"{path}/{FIRST}/below", code=FAILURE)

    def saved(self, name):
        with open(self.out(name), "rb") as file:
            return file.read()


class RemoveTest(BrivoctlTest):
    def test_files_are_deleted(self):
        path = self.card()
        self.assertEqual(self.brivoctl("rm", FIRST).stdout, b"")
        self.assertEqual(os.listdir(f"{path}/DCIM/100ABCDE"), ["IMG_0002.JPG"])

    def test_of_several_one_fails_and_the_others_are_deleted(self):
        path = self.card()
        handles = {entry["path"]: entry["handle"] for entry in self.json("ls")}
        lines = self.json_lines("rm", "CARD", FIRST, "DCIM/100ABCDE", SECOND, code=FAILURE)
        self.assertEqual(lines, [{"handle": handles[object], "path": object, "deleted": deleted} for object, deleted in
                                 ((FIRST, True), ("DCIM/100ABCDE", False), (SECOND, True))])
        self.assertEqual(os.listdir(f"{path}/DCIM/100ABCDE"), [])

    def test_an_unknown_object_among_others_deletes_nothing(self):
        path = self.card()
        self.brivoctl("rm", FIRST, "DCIM/none", code=FAILURE)
        self.assertTrue(os.path.exists(f"{path}/{FIRST}"))


class AccessTest(BrivoctlTest):
    grant = False

    def test_grants_come_and_go(self):
        self.assertEqual(self.json("access", "list"), [])
        self.assertEqual(self.json("access", "grant", "org.example.Photos"),
                         {"identifier": "org.example.Photos", "granted": True})
        self.assertEqual(self.brivoctl("access", "grant", "/opt/a b/photos").stdout, b"")
        self.assertEqual(self.json("access", "list"), [{"identifier": "org.example.Photos", "granted": True},
                                                       {"identifier": "/opt/a b/photos", "granted": True}])
        text = self.brivoctl("access", "list").stdout.decode().splitlines()
        self.assertEqual([line.split(None, 1) for line in text],
                         [["granted", "org.example.Photos"], ["granted", "/opt/a b/photos"]])
        self.assertEqual(self.json("access", "revoke", "org.example.Photos"),
                         {"identifier": "org.example.Photos", "granted": False})
        self.assertEqual([row["identifier"] for row in self.json("access", "list")], ["/opt/a b/photos"])

    def test_granting_twice_is_one_grant(self):
        for _ in range(2):
            self.brivoctl("access", "grant", "org.example.Photos")
        self.assertEqual(len(self.json("access", "list")), 1)

    def test_a_grant_that_was_never_confirmed_shows_as_such_and_is_confirmed_by_granting(self):
        self.brivoctl("access", "grant", "org.example.Photos")
        with contextlib.closing(sqlite3.connect(self.service.database)) as connection, connection:
            connection.execute("UPDATE orvid_apps SET whitelisted = 0")
        self.assertEqual(self.json("access", "list"), [{"identifier": "org.example.Photos", "granted": False}])
        self.assertTrue(self.brivoctl("access", "list").stdout.startswith(b"unconfirmed  org.example.Photos"))
        self.brivoctl("access", "grant", "org.example.Photos")
        self.assertEqual(self.json("access", "list"), [{"identifier": "org.example.Photos", "granted": True}])

    def test_revoking_what_is_not_granted_is_a_failure(self):
        self.brivoctl("access", "revoke", "org.example.None", code=FAILURE)

    def test_the_database_needs_no_service(self):
        self.service.stop()
        self.brivoctl("access", "grant", "org.example.Photos")
        self.assertEqual(len(self.json("access", "list")), 1)

    def test_a_database_that_cannot_be_made_is_a_failure(self):
        self.service.environment["XDG_DATA_HOME"] = "/dev/null"
        message = self.brivoctl("access", "grant", "org.example.Photos", code=FAILURE).stderr.decode()
        self.assertIn("cannot be written", message)

    def test_whoami_is_the_built_in_application_where_it_is_installed(self):
        self.assertEqual(self.json("access", "whoami"), {"identifier": "org.orvid.Photos", "builtIn": True})
        self.assertTrue(self.brivoctl("access", "whoami").stdout.startswith(b"org.orvid.Photos  "))

    def test_a_copy_goes_by_its_path(self):
        copy = copied_brivoctl(self.service)
        result = subprocess.run([copy, "access", "whoami", "--json"], env=self.service.environment,
                                capture_output=True, timeout=WAIT, check=True)
        self.assertEqual(json.loads(result.stdout), {"identifier": copy, "builtIn": False})


def copied_brivoctl(service):
    return shutil.copy(BRIVOCTL, f"{service.folder}/brivoctl-copy")


class ExitCodeTest(BrivoctlTest):
    def test_wrong_usage(self):
        for arguments in ((), ("none",), ("ls", "--none"), ("ls", "A", "B"), ("read",), ("get",), ("rm",), ("access",),
                          ("access", "grant"), ("access", "revoke"), ("access", "none"), ("devices", "extra"),
                          ("read", "X", "--offset", "many"), ("read", "X", "--offset", "-1"),
                          ("devices", "--timeout", "soon"), ("devices", "--timeout", "-1"), ("devices", "--address")):
            with self.subTest(arguments):
                result = self.brivoctl(*arguments, code=USAGE)
                self.assertNotEqual(result.stderr, b"")
                self.assertEqual(result.stdout, b"")

    def test_help_and_version_succeed(self):
        self.assertRegex(self.brivoctl("--version").stdout, rb"^\d+\.\d+\.\d+\n$")
        for command in ("devices", "watch", "ls", "read", "get", "rm", "access"):
            with self.subTest(command):
                self.assertIn(command.encode(), self.brivoctl("--help").stdout)
                self.assertIn(b"--help", self.brivoctl(command, "--help").stdout)

    def test_without_a_service_everything_that_needs_it_says_so(self):
        self.service.stop()
        for arguments in (("devices",), ("watch",), ("ls",), ("read", "1"), ("get", "1"), ("rm", "1")):
            with self.subTest(arguments):
                for options in ((), ("--json",)):
                    self.assertEqual(self.brivoctl(*arguments, *options, code=NO_SERVICE).stdout, b"")

    def test_a_program_without_a_grant_is_refused(self):
        self.card()
        copy = copied_brivoctl(self.service)
        for arguments in (("ls",), ("read", FIRST), ("get", FIRST, "-d", self.out()), ("rm", FIRST)):
            with self.subTest(arguments):
                result = subprocess.run([copy, *arguments], env=self.service.environment, capture_output=True,
                                        timeout=WAIT, check=False)
                self.assertEqual(result.returncode, REFUSED, result.stderr)
                self.assertIn(b"brivoctl access", result.stderr)
                self.assertEqual(result.stdout, b"")
        listed = subprocess.run([copy, "devices"], env=self.service.environment, capture_output=True, timeout=WAIT,
                                check=True)
        self.assertIn(b"CARD", listed.stdout, "the list is open to everybody")

    def test_a_granted_copy_is_let_in(self):
        self.card()
        copy = copied_brivoctl(self.service)
        self.brivoctl("access", "grant", copy)
        subprocess.run([copy, "ls"], env=self.service.environment, capture_output=True, timeout=WAIT, check=True)

    def test_a_service_that_does_not_answer_is_a_failure_in_time(self):
        self.card()
        self.service.process.send_signal(signal.SIGSTOP)
        self.addCleanup(self.service.process.send_signal, signal.SIGCONT)
        result = self.brivoctl("ls", "--timeout", "0.5", code=FAILURE)
        self.assertIn(b"no answer in time", result.stderr)


class WatchTest(BrivoctlTest):
    def watch(self, *arguments):
        output = open(f"{self.service.folder}/watched", "w+b")
        self.addCleanup(output.close)
        process = subprocess.Popen([BRIVOCTL, "watch", *arguments], env=self.service.environment, stdout=output,
                                   stderr=subprocess.PIPE)

        def end():
            process.kill()
            process.wait()
            process.stderr.close()
        self.addCleanup(end)
        return process

    def lines(self):
        with open(f"{self.service.folder}/watched", "rb") as output:
            return output.read().split(b"\n")[:-1]

    def events(self, name):
        return [event for event in map(json.loads, self.lines()) if event["event"] == name]

    def test_a_card_comes_is_walked_and_goes(self):
        process = self.watch("--json")
        path = self.card("EOS DIGITAL")
        added = wait_until(lambda: self.events("added"), "the card")
        handle = self.handle_of(path)
        self.assertEqual(added, [{"event": "added", "handle": handle, "name": "EOS DIGITAL", "path": path}])
        wait_until(lambda: sum(len(event["items"]) for event in self.events("items")) == 4, "the objects")
        self.assertEqual(self.events("ready"), [{"event": "ready", "device": handle, "count": 4}])
        items = [item for event in self.events("items") for item in event["items"]]
        self.assertEqual({event["device"] for event in self.events("items")}, {handle})
        self.assertEqual(sorted(item["path"] for item in items), ["DCIM", "DCIM/100ABCDE", FIRST, SECOND])
        for item in items:
            self.assertEqual(list(item), OBJECT_KEYS)
        percent = wait_until(lambda: self.events("percent"), "the percentage")
        self.assertEqual(list(percent[0]), ["event", "device", "percent"])
        os.rename(path, f"{self.service.folder}/away")
        removed = wait_until(lambda: self.events("removed"), "the removal")
        self.assertEqual(removed, [{**added[0], "event": "removed"}])
        self.ends_well(process, signal.SIGINT)

    def test_a_card_that_is_there_already_is_told_as_text(self):
        name = "IMG_0001.JPG\n\x1b[31mred"
        path = self.card("CARD", {f"100ABCDE/{name}": b"x"})
        process = self.watch()
        wait_until(lambda: any(b"IMG_0001" in line for line in self.lines()), "the picture")
        lines = [line.decode() for line in self.lines()]
        self.assertEqual(lines[0], f"added    {self.handle_of(path)}  {path}")
        self.assertIn("ready    3 objects", lines)
        self.assertTrue(any("IMG_0001.JPG\\x0a\\x1b[31mred" in line for line in lines), lines)
        self.ends_well(process, signal.SIGTERM)

    def test_devices_only_opens_none(self):
        process = self.watch("--devices-only", "--json")
        path = self.card()
        wait_until(lambda: self.events("added"), "the card")
        os.rename(path, f"{self.service.folder}/away")
        wait_until(lambda: self.events("removed"), "the removal")
        self.ends_well(process, signal.SIGINT)
        self.assertEqual([json.loads(line)["event"] for line in self.lines()], ["added", "removed"])

    def test_it_ends_well_however_often_it_is_interrupted(self):
        self.card()
        for _ in range(20):
            process = self.watch("--json")
            wait_until(lambda: self.events("percent"), "the end of the walk")
            self.ends_well(process, signal.SIGINT)

    def test_it_ends_when_the_service_does(self):
        process = self.watch("--json")
        self.card()
        wait_until(lambda: self.events("percent"), "the end of the walk")
        self.service.stop()
        self.assertEqual(process.wait(WAIT), NO_SERVICE)
        self.assertIn(b"the service has gone", process.stderr.read())

    def ends_well(self, process, with_signal):
        process.send_signal(with_signal)
        self.assertEqual(process.wait(WAIT), SUCCESS)
        self.assertEqual(process.stderr.read(), b"")


if __name__ == "__main__":
    unittest.main()
