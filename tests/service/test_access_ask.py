# SPDX-License-Identifier: MIT
"""brivoctl access ask, and the grants for control: with a notification server on a session bus of its own."""
import contextlib
import json
import signal
import sqlite3
import subprocess

from harness import BRIVOCTL, PYTHON, WAIT, ServiceTest, wait_until
from notification_server import NotificationServer, SlowNotificationServer, dismissing, pressing
from session_bus import SessionBus

SUCCESS, FAILURE, USAGE, _, REFUSED = range(5)
APPLICATION = "/usr/bin/env"  # installed everywhere


class CommandTest(ServiceTest):
    grant = False

    def access(self, *arguments, code=SUCCESS, **environment):
        """Runs it, checks how it ended, and gives what it printed."""
        result = subprocess.run([BRIVOCTL, "access", *arguments], env={**self.service.environment, **environment},
                                capture_output=True, timeout=WAIT, check=False)
        self.assertEqual(result.returncode, code, result.stderr.decode())
        return result

    def json(self, *arguments, **options):
        return json.loads(self.access(*arguments, "--json", **options).stdout)

    def rows(self, table):
        with contextlib.closing(sqlite3.connect(self.service.database)) as database:
            return database.execute(f"SELECT bundle_id, whitelisted FROM {table}").fetchall()


class AskTest(CommandTest):
    def setUp(self):
        super().setUp()
        self.bus = SessionBus()
        self.addCleanup(self.bus.close)
        self.bus.start()
        self.service.environment["DBUS_SESSION_BUS_ADDRESS"] = self.bus.address

    def server(self, **options):
        server = NotificationServer(self.bus, **options)
        self.addCleanup(server.close)
        return server

    def asking(self, *arguments):
        """Begins to ask, in the background."""
        process = subprocess.Popen([BRIVOCTL, "access", "ask", *arguments], env=self.service.environment,
                                   stdout=subprocess.PIPE, stderr=subprocess.PIPE)
        self.addCleanup(process.stderr.close)
        self.addCleanup(process.stdout.close)
        self.addCleanup(process.kill)
        return process


class AnswerTest(AskTest):
    def test_the_default_button_grants_and_is_not_asked_about_again(self):
        server = self.server(answer=pressing("Allow"))
        self.assertEqual(self.json("ask", APPLICATION), {"identifier": APPLICATION, "granted": True, "asked": True})
        self.assertEqual(self.rows("orvid_apps"), [(APPLICATION, 1)])
        self.assertEqual(self.json("ask", APPLICATION), {"identifier": APPLICATION, "granted": True, "asked": False})
        self.assertEqual(len(server.shown), 1)
        self.assertEqual(self.rows("orvid_apps"), [(APPLICATION, 1)])

    def test_it_says_in_words_what_came_of_it(self):
        self.server(answer=pressing("Allow"))
        self.assertEqual(self.access("ask", APPLICATION).stdout.decode(), f"{APPLICATION} may use the cameras\n")
        self.assertEqual(self.access("ask", APPLICATION, "--control").stdout.decode(),
                         f"{APPLICATION} may control the cameras\n")

    def test_any_other_answer_is_a_refusal_that_stores_nothing(self):
        for answer in (pressing("Do Not Allow"), dismissing):
            server = self.server(answer=answer)
            for _ in range(2):
                refused = self.access("ask", APPLICATION, "--json", code=REFUSED)
                self.assertEqual(json.loads(refused.stdout),
                                 {"identifier": APPLICATION, "granted": False, "asked": True})
                self.assertIn(f"the user does not let {APPLICATION} use the cameras", refused.stderr.decode())
            self.assertEqual(len(server.shown), 2, "the next time it asks again")
            server.close()
        self.assertEqual(self.rows("orvid_apps"), [])

    def test_a_grant_that_was_never_confirmed_is_a_refusal_without_a_question(self):
        server = self.server(answer=pressing("Allow"))
        self.access("grant", APPLICATION)
        with contextlib.closing(sqlite3.connect(self.service.database)) as database, database:
            database.execute("UPDATE orvid_apps SET whitelisted = 0")
        refused = self.access("ask", APPLICATION, "--json", code=REFUSED)
        self.assertEqual(json.loads(refused.stdout), {"identifier": APPLICATION, "granted": False, "asked": False})
        self.assertEqual(server.shown, [])

    def test_the_built_in_applications_are_not_asked_about(self):
        server = self.server(answer=pressing("Do Not Allow"))
        for application in ("org.orvid.Photos", "org.orvid.OrvidCoreTests"):
            for options in ((), ("--control",)):
                self.assertEqual(self.json("ask", application, *options)["asked"], False)
        self.assertEqual(server.shown, [])
        self.assertEqual(self.rows("orvid_apps") + self.rows("camera_control"), [])

    def test_for_control_a_grant_is_stored_even_after_a_refusal(self):
        for answer in (pressing("Do Not Allow"), dismissing):
            server = self.server(answer=answer)
            refused = self.access("ask", APPLICATION, "--control", "--json", code=REFUSED)
            self.assertEqual(json.loads(refused.stdout),
                             {"identifier": APPLICATION, "granted": False, "asked": True})
            self.assertIn("revoke --control", refused.stderr.decode(), "what a person has to know then")
            self.assertEqual(self.rows("camera_control"), [(APPLICATION, 0)])
            self.assertEqual(self.json("ask", APPLICATION, "--control"),
                             {"identifier": APPLICATION, "granted": True, "asked": False})
            self.assertEqual(len(server.shown), 1)
            self.access("revoke", APPLICATION, "--control")
            server.close()

    def test_for_control_the_default_button_grants(self):
        self.server(answer=pressing("Allow"))
        self.assertEqual(self.json("ask", APPLICATION, "--control"),
                         {"identifier": APPLICATION, "granted": True, "asked": True})
        self.assertEqual(self.rows("camera_control"), [(APPLICATION, 0)])
        self.assertEqual(self.rows("orvid_apps"), [], "access is another matter")

    def test_what_is_not_installed_can_be_allowed_but_that_is_said_not_to_last(self):
        self.server(answer=pressing("Allow"))
        self.assertIn("is not installed", self.access("ask", "org.example.Nothing").stderr.decode())
        self.assertEqual(self.rows("orvid_apps"), [("org.example.Nothing", 1)])

    def test_an_identifier_is_data_wherever_it_goes(self):
        server = self.server(answer=pressing("Allow"), capabilities=("actions", "body-markup"))
        hostile = "<b>x</b>'; DROP TABLE orvid_apps; --\n{}"
        self.assertEqual(self.json("ask", hostile)["granted"], True)
        self.assertTrue(server.shown[0].body.startswith(
            "&lt;b&gt;x&lt;/b&gt;'; DROP TABLE orvid_apps; --\\x0a{} could see"), server.shown[0].body)
        self.assertEqual(self.rows("orvid_apps"), [(hostile, 1)])

    def test_a_yes_that_cannot_be_stored_is_a_failure(self):
        self.server(answer=pressing("Allow"))
        for options in ((), ("--control",)):
            failed = self.access("ask", APPLICATION, *options, code=FAILURE, XDG_DATA_HOME="/dev/null")
            self.assertIn("cannot be written", failed.stderr.decode())
            self.assertEqual(failed.stdout, b"")


class RunningServiceTest(AskTest):
    def test_the_answer_counts_for_the_next_connection_of_a_running_service(self):
        path = self.folder_card("CARD", {"100ABCDE/IMG_0001.JPG": b"x"})
        self.server(answer=pressing("Allow"))
        self.assertFalse(self.other_client().ask("is_let_in", path))
        self.access("ask", PYTHON)
        self.assertTrue(self.other_client().ask("is_let_in", path))
        self.access("revoke", PYTHON)
        self.assertFalse(self.other_client().ask("is_let_in", path))

    def test_a_grant_for_control_lets_nobody_use_a_camera(self):
        path = self.folder_card("CARD", {"100ABCDE/IMG_0001.JPG": b"x"})
        self.access("grant", PYTHON, "--control")
        self.assertFalse(self.other_client().ask("is_let_in", path))


class TextTest(AskTest):
    TEXTS = {
        "en": (("Let an application use your cameras?",
                "/usr/bin/env could see, copy and delete the pictures and movies on every camera card."),
               ("Let an application control your cameras?",
                "/usr/bin/env could change the settings of your cameras and take pictures with them."),
               ["Allow", "Do Not Allow"]),
        "de": (("Darf eine Anwendung Ihre Kameras verwenden?",
                "/usr/bin/env könnte die Bilder und Filme auf jeder Speicherkarte ansehen, kopieren und löschen."),
               ("Darf eine Anwendung Ihre Kameras steuern?",
                "/usr/bin/env könnte die Einstellungen Ihrer Kameras ändern und mit ihnen Bilder aufnehmen."),
               ["Erlauben", "Nicht erlauben"]),
        "ja": (("アプリケーションにカメラの使用を許可しますか?",
                "/usr/bin/env は、すべてのカメラのカードにある写真と動画を表示、コピー、削除できるようになります。"),
               ("アプリケーションにカメラの操作を許可しますか?",
                "/usr/bin/env は、カメラの設定を変更したり、カメラで撮影したりできるようになります。"),
               ["許可", "許可しない"]),
    }

    def test_the_question_is_in_the_users_language(self):
        server = self.server(answer=dismissing)
        for language, (access, control, buttons) in self.TEXTS.items():
            for options, texts in (((), access), (("--control",), control)):
                with self.subTest(language=language, options=options):
                    self.access("ask", APPLICATION, *options, code=REFUSED, LANG="C.UTF-8", LANGUAGE=language)
                    shown = server.shown[-1]
                    self.assertEqual((shown.title, shown.body), texts)
                    self.assertEqual(shown.buttons, buttons)
            self.access("revoke", APPLICATION, "--control")

    def test_the_default_button_grants_in_every_language(self):
        server = self.server(answer=pressing("Erlauben"))
        self.access("ask", APPLICATION, LANG="xx_XX.UTF-8", LANGUAGE="de")
        self.assertEqual(len(server.shown), 1)
        self.assertEqual(self.rows("orvid_apps"), [(APPLICATION, 1)])

    def test_what_a_program_prints_stays_as_it_is(self):
        self.server(answer=pressing("Erlauben"))
        self.assertEqual(self.access("ask", APPLICATION, LANG="C.UTF-8", LANGUAGE="de").stdout.decode(),
                         f"{APPLICATION} may use the cameras\n")


class NobodyToAskTest(AskTest):
    def ask_in_vain(self):
        for options in ((), ("--control",)):
            failed = self.access("ask", APPLICATION, "--json", *options, code=FAILURE)
            self.assertTrue(failed.stderr.startswith(b"brivoctl: nobody can be asked"), failed.stderr)
            self.assertEqual(failed.stdout, b"")
        self.assertEqual(self.rows("orvid_apps") + self.rows("camera_control"), [])

    def test_without_a_session_bus_it_fails(self):
        del self.service.environment["DBUS_SESSION_BUS_ADDRESS"]
        self.ask_in_vain()

    def test_with_a_session_bus_that_has_gone_it_fails(self):
        self.service.environment["DBUS_SESSION_BUS_ADDRESS"] = f"unix:path={self.service.folder}/none"
        self.ask_in_vain()

    def test_without_a_server_it_fails(self):
        self.ask_in_vain()

    def test_with_a_server_that_shows_no_buttons_it_fails(self):
        server = self.server(capabilities=("body", "body-markup"))
        self.ask_in_vain()
        self.assertEqual(server.shown, [])

    def test_who_has_a_grant_needs_nobody(self):
        self.access("grant", APPLICATION)
        self.assertEqual(self.json("ask", APPLICATION)["granted"], True)


class WaitingTest(AskTest):
    def test_it_waits_through_a_restart_of_the_server(self):
        first = self.server()
        process = self.asking(APPLICATION)
        first.wait_for_shown()
        first.close()
        second = self.server()
        second.press(second.wait_for_shown(), "Allow")
        self.assertEqual(process.wait(WAIT), SUCCESS)
        self.assertEqual(self.rows("orvid_apps"), [(APPLICATION, 1)])

    def test_when_the_session_ends_the_answer_is_no(self):
        server = self.server()
        process = self.asking(APPLICATION)
        server.wait_for_shown()
        self.bus.close()
        self.assertEqual(process.wait(WAIT), REFUSED)

    def test_a_signal_takes_the_question_from_the_screen_and_stores_nothing(self):
        server = self.server()
        for options in ((), ("--control",)):
            for number in (signal.SIGINT, signal.SIGTERM, signal.SIGHUP):
                with self.subTest(options=options, signal=number):
                    before = len(server.shown)
                    process = self.asking(APPLICATION, *options)
                    wait_until(lambda before=before: len(server.shown) > before, "the question")
                    process.send_signal(number)
                    self.assertEqual(process.wait(WAIT), FAILURE)
                    self.assertIn(b"interrupted", process.stderr.read())
                    wait_until(lambda: server.shown[-1].number in server.withdrawn, "an empty screen")
        self.assertEqual(self.rows("orvid_apps") + self.rows("camera_control"), [])

    def test_a_signal_before_the_server_has_answered_leaves_nothing_on_the_screen_either(self):
        server, process = self.asking_a_server_that_answers_after(2)
        process.send_signal(signal.SIGINT)
        self.assertEqual(process.wait(WAIT), FAILURE)
        wait_until(lambda: server.withdrawn == [1], "an empty screen")

    def test_a_second_signal_waits_for_no_server(self):
        _, process = self.asking_a_server_that_answers_after(3600)

        def ended_by_another():
            process.send_signal(signal.SIGINT)
            return process.poll() is not None

        wait_until(ended_by_another, "the end")
        self.assertEqual(process.returncode, -signal.SIGINT)
        self.assertIn(b"interrupted", process.stderr.read(), "that was the first one")

    def asking_a_server_that_answers_after(self, seconds):
        server = SlowNotificationServer(self.bus, seconds)
        self.addCleanup(server.close)
        process = self.asking(APPLICATION)
        wait_until(lambda: server.shown, "the question")
        return server, process

    def test_two_questions_at_once_are_answered_each_by_itself(self):
        server = self.server()
        processes = {}
        for application in (APPLICATION, PYTHON):
            before = len(server.shown)
            processes[application] = self.asking(application)
            wait_until(lambda before=before: len(server.shown) > before, "the question")
        server.press(server.shown[1], "Allow")
        self.assertEqual(processes[PYTHON].wait(WAIT), SUCCESS)
        self.assertIsNone(processes[APPLICATION].poll())
        server.press(server.shown[0], "Do Not Allow")
        self.assertEqual(processes[APPLICATION].wait(WAIT), REFUSED)
        self.assertEqual(self.rows("orvid_apps"), [(PYTHON, 1)])


class ControlGrantsTest(CommandTest):
    def test_they_come_and_go_apart_from_those_for_access(self):
        self.assertEqual(self.json("list", "--control"), [])
        self.assertEqual(self.json("grant", "org.example.Photos", "--control"),
                         {"identifier": "org.example.Photos", "granted": True})
        self.assertEqual(self.json("list", "--control"), [{"identifier": "org.example.Photos", "granted": True}])
        self.assertEqual(self.json("list"), [])
        self.access("revoke", "org.example.Photos", code=FAILURE)
        self.assertEqual(self.json("revoke", "--control", "org.example.Photos"),
                         {"identifier": "org.example.Photos", "granted": False})
        self.assertEqual(self.json("list", "--control"), [])
        self.access("revoke", "--control", "org.example.Photos", code=FAILURE)

    def test_granting_twice_is_one_grant(self):
        for _ in range(2):
            self.assertEqual(self.access("grant", "--control", "/opt/a b/photos").stdout, b"")
        self.assertEqual(self.rows("camera_control"), [("/opt/a b/photos", 1)])
        self.assertEqual(self.access("list", "--control").stdout.split(None, 1), [b"granted", b"/opt/a b/photos\n"])

    def test_a_database_that_cannot_be_made_is_a_failure(self):
        failed = self.access("grant", "--control", "org.example.Photos", code=FAILURE, XDG_DATA_HOME="/dev/null")
        self.assertIn("cannot be written", failed.stderr.decode())


class UsageTest(CommandTest):
    def test_an_application_has_to_be_named(self):
        for command in ("grant", "revoke", "ask"):
            for arguments in ((), ("",), ("--control",), ("a", "b")):
                with self.subTest(command=command, arguments=arguments):
                    self.assertEqual(self.access(command, *arguments, code=USAGE).stdout, b"")

    def test_help_says_what_there_is(self):
        text = self.access("--help").stdout.decode()
        for command in ("list", "grant", "revoke", "ask", "whoami"):
            self.assertIn(f"\n  {command} ", text)
            self.assertIn("--json", self.access(command, "--help").stdout.decode())
        for command in ("list", "grant", "revoke", "ask"):
            self.assertIn("--control", self.access(command, "--help").stdout.decode())
