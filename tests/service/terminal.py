# SPDX-License-Identifier: MIT
"""A shell at a terminal, to which a test types."""
import os
import pty
import re
import select
import signal
import time

from harness import WAIT

PROMPT = b"ready> "
TO_THE_START, TO_THE_END, ENTER = "\x01", "\x05", "\r"


class Terminal:
    """Runs an interactive shell. `all_matches` are the keys that put every match of the word in front of the cursor
    into the line."""

    def __init__(self, arguments, environment, settings, all_matches):
        self.all_matches = all_matches
        self.seen = b""
        self.printed = b""  # while the last line was completed
        self.process, self.terminal = pty.fork()
        if self.process == 0:
            os.execvpe(arguments[0], arguments, {**environment, "TERM": "dumb", "PS1": PROMPT.decode()})
        self._wait_for(PROMPT)
        for line in settings:
            self._type(line + ENTER)
            self._wait_for(PROMPT)

    def close(self):
        os.kill(self.process, signal.SIGKILL)
        os.waitpid(self.process, 0)
        os.close(self.terminal)

    def completed(self, line):
        """Types a line, lets the shell complete its last word, and gives the words of the line as a program gets them."""
        self._type(line + self.all_matches + TO_THE_START + r"printf '\x02%s\x03' " + TO_THE_END + " end" + ENTER)
        self.printed = self._wait_for(b"\x02end\x03")
        self._wait_for(PROMPT)
        return [word.decode() for word in re.findall(b"\x02(.*?)\x03", self.printed, re.DOTALL)][:-1]

    def _type(self, text):
        os.write(self.terminal, text.encode())

    def _wait_for(self, expected):
        """What comes up to and with that; the rest is kept."""
        deadline = time.monotonic() + WAIT
        while expected not in self.seen:
            readable, _, _ = select.select([self.terminal], [], [], max(0, deadline - time.monotonic()))
            if not readable:
                raise AssertionError(f"no {expected!r} in {WAIT} s, but {self.seen!r}")
            self.seen += os.read(self.terminal, 65536)
        end = self.seen.index(expected) + len(expected)
        found, self.seen = self.seen[:end], self.seen[end:]
        return found


def bash(environment, file):
    return Terminal(
        ["bash", "--norc", "--noprofile", "-i"], {**environment, "INPUTRC": "/dev/null"},
        ["bind 'set enable-bracketed-paste off'", f"source {file}"], all_matches="\x1b*")


def zsh(environment, file):
    """The file is found by its name, as where it is installed."""
    return Terminal(
        ["zsh", "-f", "-i"], environment,
        ["unsetopt prompt_sp prompt_cr; unset zle_bracketed_paste",
         f"fpath=({os.path.dirname(file)} $fpath); autoload -U compinit; compinit -u -D",
         "zstyle ':completion:all-matches::::' completer _all_matches _complete",
         "zstyle ':completion:all-matches:*' insert true",
         "zle -C all-matches complete-word _generic; bindkey -e; bindkey '^Xm' all-matches"],
        all_matches="\x18m")
