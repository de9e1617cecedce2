# SPDX-License-Identifier: MIT
"""The completions of brivoctl in bash and zsh at a terminal, and in fish."""
import os
import subprocess
import unittest

from command_line import all_commands, options_of, subcommands_of
from harness import BUILD, WAIT, Service, ServiceTest, make_card, wait_until
from terminal import bash, zsh

COMPLETIONS = os.path.realpath(f"{os.path.dirname(__file__)}/../../packaging/completions")
NAMES = ["EOS DIGITAL", "NIKON D5"]


class Fish:
    """Fish tells what it would offer without a terminal."""

    def __init__(self, environment, file):
        self.environment = environment
        self.file = file

    def completed(self, line):
        words = line.split(" ")
        offered = subprocess.run(
            ["fish", "--no-config", "-c", f"source {self.file}; complete -C {line!r}"], env=self.environment,
            check=True, capture_output=True, text=True, timeout=WAIT).stdout.splitlines()
        return words[:-1] + [offer.split("\t")[0] for offer in offered] if offered else words

    def close(self):
        pass


class Completions:
    """What holds in every shell. `shell` opens one."""

    @classmethod
    def setUpClass(cls):
        cls.service = Service()
        for name in NAMES:
            make_card(f"{cls.service.volumes}/{name}", {"100ABCDE/IMG_0001.JPG": b"picture"})
        wait_until(lambda: cls.service.brivoctl("devices").stdout.count(b"\n") == len(NAMES), "the devices")
        cls.environment = {**cls.service.environment, "PATH": f"{BUILD}/bin:{os.environ['PATH']}", "LC_ALL": "C.UTF-8"}
        cls.terminal = cls.open()

    @classmethod
    def tearDownClass(cls):
        cls.terminal.close()
        cls.service.close()

    def assertOffers(self, line, offers):
        """That the last word of the line is completed to these, in any order."""
        before = line.split(" ")[:-1]
        completed = [word.rstrip("/") for word in self.terminal.completed(line)]  # which shells add to a folder or not
        self.assertEqual(sorted(completed), sorted(before + list(offers)), line)

    def test_the_subcommands_are_offered(self):
        self.assertOffers("brivoctl ", subcommands_of())
        self.assertOffers("brivoctl access ", subcommands_of("access"))

    def test_the_options_of_each_subcommand_are_offered(self):
        for command in [(), ("access",), *all_commands()]:
            with self.subTest(command=command):
                self.assertOffers(f"brivoctl {' '.join(command)} -".replace("  ", " "), options_of(*command))

    def test_a_word_that_was_begun_is_finished(self):
        self.assertOffers("brivoctl im", ["import"])
        self.assertOffers("brivoctl import --no-v", ["--no-verify"])

    def test_the_devices_are_offered_by_name_as_one_word_each(self):
        for command in ("ls", "info", "read", "rm", "thumb", "sheet", "get", "import"):
            with self.subTest(command=command):
                self.assertOffers(f"brivoctl {command} ", NAMES)
        self.assertOffers("brivoctl ls --long EOS", ["EOS DIGITAL"])

    def test_the_devices_are_offered_by_mount_path(self):
        self.assertOffers(f"brivoctl ls {self.service.volumes}/", [f"{self.service.volumes}/{name}" for name in NAMES])

    def test_the_grants_are_offered_to_be_revoked(self):
        self.service.grant("org.example.Photos")
        self.assertOffers("brivoctl access revoke org.", ["org.example.Photos"])

    def test_folders_are_offered_behind_the_option_for_one(self):
        os.makedirs(f"{self.service.folder}/pictures/inner", exist_ok=True)
        self.assertOffers(f"brivoctl import -d {self.service.folder}/pictures/in",
                          [f"{self.service.folder}/pictures/inner"])

    def test_nothing_is_offered_where_a_number_is_wanted(self):
        self.assertOffers("brivoctl ls --timeout ", self.nothing)


class BashTest(Completions, unittest.TestCase):
    nothing = []

    @classmethod
    def open(cls):
        return bash(cls.environment, f"{COMPLETIONS}/brivoctl.bash")


class ZshTest(Completions, unittest.TestCase):
    nothing = []

    @classmethod
    def open(cls):
        return zsh(cls.environment, f"{COMPLETIONS}/_brivoctl")


class FishTest(Completions, unittest.TestCase):
    nothing = [""]

    @classmethod
    def open(cls):
        return Fish(cls.environment, f"{COMPLETIONS}/brivoctl.fish")


class WithoutServiceTest(ServiceTest):
    def test_the_completions_keep_quiet_when_there_is_no_service(self):
        self.service.stop()
        environment = {**self.service.environment, "PATH": f"{BUILD}/bin:{os.environ['PATH']}"}
        terminal = bash(environment, f"{COMPLETIONS}/brivoctl.bash")
        self.addCleanup(terminal.close)
        self.assertEqual(terminal.completed("brivoctl ls "), ["brivoctl", "ls"])
        self.assertNotIn(b"no service", terminal.printed)


if __name__ == "__main__":
    unittest.main()
