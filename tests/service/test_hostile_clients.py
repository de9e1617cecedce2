# SPDX-License-Identifier: MIT
"""Clients that break rules, vanish or do not read. Each ends alone; the others notice nothing."""
import os
import signal
import struct

from gi.repository import GLib
from harness import WAIT, ServiceTest, wait_until

AUTHENTICATION = b"\0AUTH EXTERNAL " + str(os.geteuid()).encode().hex().encode() + b"\r\nNEGOTIATE_UNIX_FD\r\nBEGIN\r\n"


class HostileClientTest(ServiceTest):
    def setUp(self):
        super().setUp()
        self.path = self.folder_card("CARD", {f"100ABCDE/IMG_{i:04}.JPG": b"picture" for i in range(1, 21)})
        self.watching = self.manager()
        self.honest = self.device(self.watching, self.path)
        self.honest.enumerate()
        self.handle = self.honest.wait_for("IMG_0020.JPG")["IMG_0020.JPG"].handle
        self.descriptors = len(self.service.targets())

    def tearDown(self):
        """Whatever was done, the honest client is served and nothing is left of the others."""
        self.assertEqual(self.honest.read(self.handle, 0, 7)["OVReadData"], b"picture")
        self.assertEqual(len(self.watching.devices()), 1)
        self.assertFalse(self.honest.closed.is_set())
        self.assertFalse(self.watching.closed.is_set())
        wait_until(lambda: len(self.service.targets()) <= self.descriptors, "the descriptors to go")
        super().tearDown()

    def ends(self, said, and_end=False):
        """Whether the service hangs up on who says this to the manager. The process of an ended manager connection
        loses all it has, so it is not this one."""
        return self.other_client().ask("say", said.hex(), and_end)

    def test_a_client_that_says_nonsense_instead_of_authenticating(self):
        for beginning in (b"\xff" * 64, b"\0AUTH EXTERNAL zz\r\n", b"GET / HTTP/1.1\r\n\r\n", b"\0BEGIN\r\n" * 9000):
            self.assertTrue(self.ends(beginning, and_end=True))

    def test_a_client_that_ends_in_the_middle_of_a_message(self):
        header = b"l\x01\x00\x01" + struct.pack("<III", 1000, 1, 60)
        for sent in range(0, len(header) + 1, 4):
            self.assertTrue(self.ends(AUTHENTICATION + header[:sent], and_end=True))

    def test_a_message_that_claims_to_be_oversized_ends_its_connection(self):
        self.assertTrue(self.ends(AUTHENTICATION + b"l\x01\x00\x01" + struct.pack("<III", 0x7FFFFFFF, 1, 16)))

    def test_a_message_that_is_none_ends_its_connection(self):
        self.assertTrue(self.ends(AUTHENTICATION + b"\xff" * 4096))

    def error_of(self, member, arguments):
        with self.assertRaises(GLib.Error) as caught:
            self.honest.call(member, arguments)
        return caught.exception.message

    def test_wrong_types_are_answered_and_the_connection_goes_on(self):
        reading = "requestReadDataFromObjectHandle_options_withReply"
        for member, arguments in (
                (reading, None),
                (reading, GLib.Variant("(s)", ("3",))),
                (reading, GLib.Variant("(ia{sv})", (3, {}))),
                (reading, GLib.Variant("(ta{ss})", (3, {}))),
                ("enumerateContentWithOptions", GLib.Variant("(as)", ([],))),
                ("registerInterestedEventNotifications", GLib.Variant("(ai)", ([1],))),
                ("requestStartUsingDeviceWithReply", GLib.Variant("(s)", ("x",)))):
            self.assertIn("org.freedesktop.DBus.Error.InvalidArgs", self.error_of(member, arguments))

    def test_unknown_members_are_answered_and_the_connection_goes_on(self):
        for member in ("noSuchMember", "openDeviceSessionWithReply", "sendPTPCommand_andPayload_withReply",
                       "ptpEventForwarding"):
            self.assertIn("org.freedesktop.DBus.Error.UnknownMethod", self.error_of(member, None))

    def test_options_nested_without_end_are_refused(self):
        value = GLib.Variant("s", "the end")
        for _ in range(12):
            value = GLib.Variant("a{sv}", {"deeper": value})
        self.honest.call("enumerateContentWithOptions", GLib.Variant.new_tuple(value))
        for _ in range(16):
            value = GLib.Variant("a{sv}", {"deeper": value})
        self.assertIn("org.freedesktop.DBus.Error",
                      self.error_of("enumerateContentWithOptions", GLib.Variant.new_tuple(value)))

    def test_ten_thousand_quick_connections(self):
        self.other_client().ask("connect_and_leave", 10_000)

    def test_clients_killed_in_the_middle_of_a_call(self):
        clients = [self.other_client() for _ in range(4)]
        for client in clients:
            client.ask("open", self.path)
            client.ask("enumerate")
            client.ask("open_stream", self.handle)
        self.assertGreater(len(self.service.descriptors_below(self.path)), 0)
        for client in clients:
            client.tell("read", self.handle, 0, 7)
            client.kill()
        wait_until(lambda: not self.service.descriptors_below(self.path), "the streams of the dead to be closed")

    def test_a_dead_client_does_not_take_along_the_stream_of_another(self):
        other = self.other_client()
        other.ask("open", self.path)
        self.assertEqual(other.ask("open_stream", self.handle), 0)
        self.assertEqual(self.honest.read(self.handle, OVReadBufferStreamOpen=True)["errCode"], 0)
        other.kill()
        wait_until(lambda: f"[{other.process.pid:05}] Removing Client" in self.service.log(), "its end")
        self.assertEqual(len(self.service.descriptors_below(self.path)), 1)
        self.assertEqual(self.honest.read(self.handle, OVReadBufferStreamClose=True)["errCode"], 0)
        self.assertEqual(self.service.descriptors_below(self.path), [])


class ManyObjectsTest(ServiceTest):
    def setUp(self):
        super().setUp()
        files = {f"{100 + i // 1000}ABCDE/IMG_{i % 1000:04}.JPG": b"x" for i in range(30_000)}
        self.path = self.folder_card("CARD", files)

    def test_a_client_that_never_reads_holds_up_nobody(self):
        manager = self.manager()
        device = self.device(manager, self.path)
        deaf = self.other_client()
        deaf.ask("open", self.path)
        deaf.process.send_signal(signal.SIGSTOP)
        self.addCleanup(deaf.process.send_signal, signal.SIGCONT)
        device.enumerate()
        wait_until(lambda: len(device.signals) > 30_000 + 2, "the whole catalogue", 4 * WAIT)
        self.assertEqual(len(manager.devices()), 1)
        if not self.service.is_instrumented():
            self.assertLess(self.service.resident_kilobytes(), 100_000)

    def test_two_clients_that_enumerate_at_once_get_the_same_catalogue(self):
        first, second = self.other_client(), self.other_client()
        first.ask("open", self.path)
        second.ask("open", self.path)
        first.tell("enumerate")
        second.tell("enumerate")
        first.answer()
        second.answer()
        handles = first.ask("handles", 30_031)
        self.assertEqual(len(handles), 30_031)
        self.assertEqual(second.ask("handles", 30_031), handles)
        self.assertEqual(self.service.log().count("Store Added"), 1, "the card is walked once")
