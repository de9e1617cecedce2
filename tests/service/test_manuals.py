# SPDX-License-Identifier: MIT
"""The manual pages against the programs that they describe."""
import glob
import os
import re
import subprocess
import unittest

from command_line import all_commands, options_of

ROOT = os.path.realpath(f"{os.path.dirname(__file__)}/../..")
MAN = f"{ROOT}/packaging/man"
OPTION = re.compile(r"(?<![\w-])--?[a-z][a-z-]*")
OF_EVERY_COMMAND = "Options of every subcommand"
OF_SERVICE_COMMANDS = "Options of subcommands that talk to the service"


def plain(text):
    """A line of a page without its fonts and escapes."""
    return re.sub(r"\\f[A-Z]", "", text).replace("\\-", "-").replace('"', "")


def page(name):
    with open(f"{MAN}/{name}", encoding="utf-8") as file:
        return file.read()


def sections():
    """The options that each section of brivoctl(1) has as a list, under its heading."""
    found, heading, is_tag = {}, None, False
    for line in page("brivoctl.1").splitlines():
        if line.startswith((".SS ", ".SH ")):
            heading = plain(line[4:])
            found[heading] = set()
        elif is_tag:
            found[heading] |= set(OPTION.findall(plain(line)))
        is_tag = line == ".TP"
    return found


def command_of(heading):
    """The words of a heading in front of what is put in: ("access", "grant") of "access grant IDENTIFIER"."""
    return tuple(re.match(r"(?:[a-z]+ ?)*", heading).group(0).split())


def documented_commands():
    listed = page("brivoctl.1").split(".SH SUBCOMMANDS")[1].split("\n.SH ")[0]
    return [command_of(plain(line[4:])) for line in listed.splitlines() if line.startswith(".SS ")]


class ManualOfTheCommandLine(unittest.TestCase):
    def test_every_subcommand_has_a_section_and_every_section_a_subcommand(self):
        self.assertGreater(len(all_commands()), 10)
        self.assertEqual(sorted(documented_commands()), sorted(all_commands()))

    def test_the_options_of_each_subcommand_are_those_of_its_section_and_the_common_ones(self):
        documented = {command_of(heading): options for heading, options in sections().items()}
        every, service = sections()[OF_EVERY_COMMAND], sections()[OF_SERVICE_COMMANDS]
        for command in all_commands():
            common = every | {"-h", "--help"}
            if command[0] not in ("access", "explain", "dataset"):  # which the page says have no service
                common |= service
            with self.subTest(command=command):
                self.assertEqual(documented[command] | common, options_of(*command))

    def test_the_options_of_the_program_itself_are_listed(self):
        self.assertEqual(sections()["OPTIONS"], options_of())

    def test_every_exit_code_is_listed(self):
        with open(f"{ROOT}/src/brivoctl/command.h", encoding="utf-8") as file:
            codes = re.search(r"enum ExitCode \{(.*)\}", file.read()).group(1)
        listed = page("brivoctl.1").split(".SH EXIT STATUS")[1].split("\n.SH ")[0]
        self.assertEqual(re.findall(r"^\.B (\d)$", listed, re.MULTILINE), re.findall(r"= (\d)", codes))


class ManualsOfTheService(unittest.TestCase):
    def test_every_variable_of_its_own_that_the_programs_read_is_documented_and_no_other(self):
        read = set()
        for path in glob.glob(f"{ROOT}/src/**/*.cpp", recursive=True):
            with open(path, encoding="utf-8") as file:
                read |= set(re.findall(r'"(BRIVOD_[A-Z_]+)"', file.read()))
        self.assertGreater(len(read), 3)
        listed = page("org.orvid.brivod.5").split(".SH ENVIRONMENT")[1].split("\n.SH ")[0]
        self.assertEqual(set(re.findall(r"^\.BR? (BRIVOD_[A-Z_]+)$", listed, re.MULTILINE)), read)
        with open(f"{ROOT}/docs/settings.md", encoding="utf-8") as file:
            self.assertEqual(set(re.findall(r"^\| `(BRIVOD_[A-Z_]+)`", file.read(), re.MULTILINE)), read)
        for name in read:
            with self.subTest(variable=name):
                self.assertIn(name, page("brivod.8"))


class EveryManual(unittest.TestCase):
    def test_is_well_formed(self):
        pages = sorted(glob.glob(f"{MAN}/*"))
        self.assertEqual(len(pages), 3)
        said = subprocess.run(["mandoc", "-T", "lint", "-W", "warning", *pages], capture_output=True, text=True)
        self.assertEqual((said.returncode, said.stdout + said.stderr), (0, ""))

    def test_refers_to_pages_that_there_are(self):
        ours = {os.path.basename(path) for path in glob.glob(f"{MAN}/*")}
        others = {"gettext.3", "sd_listen_fds.3", "sd-daemon.3"}
        for name in ours:
            for title, number in re.findall(r"^\.BR (\S+) \((\d)\)", page(name), re.MULTILINE):
                with self.subTest(page=name, reference=title):
                    self.assertIn(f"{plain(title)}.{number}", ours | others)


if __name__ == "__main__":
    unittest.main()
