# SPDX-License-Identifier: MIT
"""What brivoctl says of itself: its subcommands and their options, from --help."""
import functools
import re
import subprocess

from harness import BRIVOCTL


@functools.cache
def help_of(*command):
    return subprocess.run([BRIVOCTL, *command, "--help"], check=True, capture_output=True, text=True).stdout


def _lines_below(heading, text):
    part = re.search(rf"^{heading}:\n((?: .*\n)*)", text, re.MULTILINE)
    return part.group(1).splitlines() if part else []


def options_of(*command):
    """Both names of each option: {"-l", "--long", ...}."""
    named = (re.match(r" {2}(-\S+)", line) for line in _lines_below("Options", help_of(*command)))
    return {name for match in named if match for name in match.group(1).split(",")}


def subcommands_of(*command):
    """The names of the subcommands below this one, in order."""
    named = (re.match(r" {2}([a-z]+) ", line) for line in _lines_below("Subcommands", help_of(*command)))
    return [match.group(1) for match in named if match]


def all_commands():
    """Every subcommand that does something, as a tuple of words."""
    def below(command):
        inner = subcommands_of(*command)
        return [leaf for name in inner for leaf in below((*command, name))] if inner else [command]
    return below(())
