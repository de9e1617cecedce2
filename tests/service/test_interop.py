# SPDX-License-Identifier: MIT
"""Tools and programs that were made without this service in mind, and the examples."""
import os
import re
import shutil
import subprocess
import unittest
import xml.etree.ElementTree as ElementTree

from harness import KORVEL, MANAGER, PATH, WAIT, ServiceTest, needs

EXAMPLES = os.path.realpath(f"{os.path.dirname(__file__)}/../../examples")
WIRE = os.path.realpath(f"{os.path.dirname(__file__)}/../../docs/wire.md")

READING = "requestReadDataFromObjectHandle_options_withReply"
MANAGER_METHODS = {
    "requestDeviceListWithReply": ("", "a{sv}"),
    "openDevice_withReply": ("s", "a{sv}"),
    "closeDevice_withReply": ("s", "a{sv}"),
}
MANAGER_SIGNALS = {"notifyAddedDevice": "a{sv}", "notifyRemovedDevice": "a{sv}"}
DEVICE_METHODS = {
    "requestStartUsingDeviceWithReply": ("", "a{sv}"),
    "enumerateContentWithOptions": ("a{sv}", ""),
    "registerInterestedEventNotifications": ("as", ""),
    "unregisterInterestedEventNotifications": ("as", ""),
    "requestMetadataForObjectHandle_options_withReply": ("ta{sv}", "a{sv}"),
    "requestThumbnailDataForObjectHandle_options_withReply": ("ta{sv}", "a{sv}"),
    "requestDownloadObjectHandle_options_withReply": ("ta{sv}", "a{sv}"),
    READING: ("ta{sv}", "a{sv}"),
    "requestDeleteObjectHandle_options_withReply": ("ta{sv}", "a{sv}"),
    "openDeviceSessionWithReply": ("", ""),
    "sendPTPCommand_andPayload_withReply": ("", ""),
    "ptpEventForwarding": ("", ""),
}
DEVICE_SIGNALS = {
    "notifyAddedItems": "a{sv}",
    "postNotification": "a{sv}",
    "notifyContentCatalogPercentCompleted": "u",
    "orvidEventNotification_completion": "v",
    "notifyPtpEvent": "v",
    "notifyDeviceCloseWithUSBLocationID": "v",
}


class InteropTest(ServiceTest):
    def setUp(self):
        super().setUp()
        self.path = self.folder_card("CARD", {"100ABCDE/IMG_0001.JPG": b"a picture"})
        for program in ("gdbus", "busctl", "python3"):
            if shutil.which(program):
                self.service.grant(os.path.realpath(shutil.which(program)))

    def run_tool(self, *command, **options):
        return subprocess.run(command, capture_output=True, text=True, timeout=WAIT, check=False,
                              env={**os.environ, **self.service.environment}, **options)

    def members(self, connection, interface):
        """Signatures in and out of each method, and of each signal; every argument has a name."""
        text = connection.call("Introspect", interface="org.freedesktop.DBus.Introspectable")
        node = next(i for i in ElementTree.fromstring(text).iter("interface") if i.get("name") == interface)
        for argument in node.iter("arg"):
            self.assertTrue(argument.get("name"), ElementTree.tostring(argument))

        def signature(member, direction):
            return "".join(a.get("type") for a in member.iter("arg") if a.get("direction", "out") == direction)
        methods = {m.get("name"): (signature(m, "in"), signature(m, "out")) for m in node.iter("method")}
        return methods, {s.get("name"): signature(s, "out") for s in node.iter("signal")}

    def test_introspection_lists_every_method_and_signal_with_argument_names(self):
        manager = self.manager()
        self.assertEqual(self.members(manager, MANAGER), (MANAGER_METHODS, MANAGER_SIGNALS))
        device = self.device(manager, self.path)
        self.assertEqual(self.members(device, KORVEL), (DEVICE_METHODS, DEVICE_SIGNALS))

    def test_the_page_about_the_wire_names_every_member(self):
        with open(WIRE, encoding="utf-8") as page:
            named = set(re.findall(r"`(\w+)`", page.read()))
        members = {*MANAGER_METHODS, *MANAGER_SIGNALS, *DEVICE_METHODS, *DEVICE_SIGNALS}
        self.assertEqual(members - named, set())

    def test_peer_answers_a_ping(self):
        self.assertEqual(self.manager().call("Ping", interface="org.freedesktop.DBus.Peer"), [])

    @needs("gdbus")
    def test_gdbus_drives_a_device(self):
        def call(address, member, *arguments):
            done = self.run_tool("gdbus", "call", "--address", address, "--dest", ":1.0", "--object-path", PATH,
                                 "--method", member, *arguments)
            self.assertEqual(done.returncode, 0, done.stderr)
            return done.stdout

        handle = self.manager().wait_for_device(self.path)["OVDeviceHandle"]
        self.assertIn(handle, call(self.service.address, f"{MANAGER}.requestDeviceListWithReply"))
        opened = call(self.service.address, f"{MANAGER}.openDevice_withReply", handle)
        endpoint = re.search("'OVDeviceEndpoint': <'([^']*)'>", opened).group(1)
        self.assertIn("'OVDeviceName': <'CARD'>", call(endpoint, f"{KORVEL}.requestStartUsingDeviceWithReply"))
        self.assertEqual(call(endpoint, f"{KORVEL}.enumerateContentWithOptions", "{}"), "()\n")
        unknown = call(endpoint, f"{KORVEL}.{READING}", "4000000000", "{'OVReadLength': <uint64 1>}")
        self.assertIn("'errCode': <-21449>", unknown)

    @needs("gdbus")
    def test_gdbus_introspects(self):
        done = self.run_tool("gdbus", "introspect", "--address", self.service.address, "--dest", ":1.0",
                             "--object-path", PATH)
        self.assertEqual(done.returncode, 0, done.stderr)
        self.assertIn("openDevice_withReply(in  s uuid,\n                           out a{sv} device)", done.stdout)

    @needs("busctl")
    def test_busctl_calls_and_introspects(self):
        called = self.run_tool("busctl", f"--address={self.service.address}", "--json=short", "call", ":1.0", PATH,
                               MANAGER, "requestDeviceListWithReply")
        self.assertEqual(called.returncode, 0, called.stderr)
        self.assertIn('"OVDeviceContexts"', called.stdout)
        listed = self.run_tool("busctl", f"--address={self.service.address}", "introspect", ":1.0", PATH)
        self.assertEqual(listed.returncode, 0, listed.stderr)
        self.assertIn("openDevice_withReply", listed.stdout)

    def test_the_python_example_lists_the_cards_and_saves_a_picture(self):
        self.manager().wait_for_device(self.path)
        done = self.run_tool("/usr/bin/python3", f"{EXAMPLES}/python/list_cards.py", cwd=self.service.folder)
        self.assertEqual((done.returncode, done.stderr), (0, ""))
        self.assertIn("CARD\n", done.stdout)
        self.assertIn("IMG_0001.JPG", done.stdout)
        with open(f"{self.service.folder}/IMG_0001.JPG", "rb") as saved:
            self.assertEqual(saved.read(), b"a picture")

    @needs("gdbus", "awk")
    def test_the_shell_example_lists_the_cards(self):
        self.manager().wait_for_device(self.path)
        done = self.run_tool(f"{EXAMPLES}/shell/list-cards")
        self.assertEqual((done.returncode, done.stderr), (0, ""))
        self.assertRegex(done.stdout, r"CARD\n +3 objects\n(.*\n)* +\d+ +9  IMG_0001\.JPG\n")


if __name__ == "__main__":
    unittest.main()
