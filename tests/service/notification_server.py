# SPDX-License-Identifier: MIT
"""A notification server on a session bus, which does what the test says."""
import contextlib
import threading

import gi

gi.require_version("Gio", "2.0")
from gi.repository import Gio, GLib  # noqa: E402

from harness import WAIT, wait_until  # noqa: E402

NAME = "org.freedesktop.Notifications"
PATH = "/org/freedesktop/Notifications"
INTERFACE = Gio.DBusNodeInfo.new_for_xml(f"""
<node><interface name="{NAME}">
  <method name="GetCapabilities"><arg type="as" direction="out"/></method>
  <method name="Notify">
    <arg type="s" direction="in"/><arg type="u" direction="in"/><arg type="s" direction="in"/>
    <arg type="s" direction="in"/><arg type="s" direction="in"/><arg type="as" direction="in"/>
    <arg type="a{{sv}}" direction="in"/><arg type="i" direction="in"/><arg type="u" direction="out"/>
  </method>
  <method name="CloseNotification"><arg type="u" direction="in"/></method>
</interface></node>""").interfaces[0]


class Notification:
    def __init__(self, number, client, arguments):
        self.number = number
        self.client = client
        _, _, _, self.title, self.body, actions, _, _ = arguments
        self.keys = dict(zip(actions[1::2], actions[0::2]))

    @property
    def buttons(self):
        return list(self.keys)


class NotificationServer:
    """Owns the name until it is closed. `answer`, when it is set, hears each new notification."""

    def __init__(self, bus, capabilities=("body", "actions"), answer=None):
        self.capabilities = list(capabilities)
        self.answer = answer
        self.shown = []
        self.withdrawn = []
        self._context = GLib.MainContext()
        self._loop = GLib.MainLoop(self._context)
        self._ready = threading.Event()
        self._thread = threading.Thread(target=self._run, args=(bus.address,), daemon=True)
        self._thread.start()
        assert self._ready.wait(WAIT)

    def _run(self, address):
        self._context.push_thread_default()
        flags = Gio.DBusConnectionFlags.AUTHENTICATION_CLIENT | Gio.DBusConnectionFlags.MESSAGE_BUS_CONNECTION
        self._bus = Gio.DBusConnection.new_for_address_sync(address, flags, None, None)
        self._bus.set_exit_on_close(False)
        self._bus.register_object(PATH, INTERFACE, self._on_call, None, None)
        self._bus.call_sync("org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus", "RequestName",
                            GLib.Variant("(su)", (NAME, 0)), None, 0, -1, None)
        self._ready.set()
        self._loop.run()
        with contextlib.suppress(GLib.Error):  # the bus may have gone before
            self._bus.flush_sync(None)
            self._bus.close_sync(None)
        self._context.pop_thread_default()

    def _on_call(self, _bus, sender, _path, _interface, method, arguments, call):
        if method == "GetCapabilities":
            call.return_value(GLib.Variant("(as)", (self.capabilities,)))
        elif method == "Notify":
            self._show(Notification(len(self.shown) + 1, sender, arguments.unpack()), call)
        else:
            self.withdrawn.append(arguments.unpack()[0])
            call.return_value(None)

    def _show(self, notification, call):
        call.return_value(GLib.Variant("(u)", (notification.number,)))
        self.shown.append(notification)
        if self.answer:
            self.answer(self, notification)

    def _signal(self, member, arguments):
        self._bus.emit_signal(None, PATH, NAME, member, arguments)

    def press(self, notification, label):
        self._signal("ActionInvoked", GLib.Variant("(us)", (notification.number, notification.keys[label])))

    def dismiss(self, notification):
        self._signal("NotificationClosed", GLib.Variant("(uu)", (notification.number, 2)))

    def wait_for_shown(self):
        """The last notification, when who asked for it knows that it is there."""
        notification = wait_until(lambda: self.shown and self.shown[-1], "a notification")
        self._bus.call_sync(notification.client, "/", "org.freedesktop.DBus.Peer", "Ping", None, None, 0, WAIT * 1000, None)
        return notification

    def close(self):
        """Ends it, after what it has answered has gone out."""
        self._loop.quit()
        self._thread.join(WAIT)


class SlowNotificationServer(NotificationServer):
    """Shows a notification, and says so `delay` seconds later."""

    def __init__(self, bus, delay):
        self.delay = delay
        super().__init__(bus)

    def _show(self, notification, call):
        self.shown.append(notification)
        timer = GLib.timeout_source_new(self.delay * 1000)
        timer.set_callback(lambda _: call.return_value(GLib.Variant("(u)", (notification.number,))))
        timer.attach(self._context)


def pressing(label):
    """Answers every notification with one button."""
    return lambda server, notification: server.press(notification, label)


def dismissing(server, notification):
    server.dismiss(notification)
