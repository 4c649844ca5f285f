"""webapi-exec --follow on a terminal of its own, and a task that does what a test tells it."""

import fcntl
import json
import os
import pty
import re
import select
import struct
import subprocess
import termios
import time
from pathlib import Path

import pytest

from exec_program import EXEC, call, run

API = "QELO.Test.Following"
TASK = "QELO.Work.Task"
PATIENCE = 30  # seconds until a test gives up
INTERRUPT = "\x03"


def counts(done, total, **members):
    return {"data": {"files": {"done": done, "total": total}, **members}}


class Work:
    """The parameters of a task, and its gates: it goes on when one is opened."""

    def __init__(self, gates, *results, keep=True):
        self.gates = gates
        self.results = results
        self.keep = keep

    def arguments(self):
        parameters = {"results": self.results, "gates": str(self.gates), "keep": self.keep}
        call = ("--api", API, "--method", "start", "--user", "alice")
        for name, value in parameters.items():
            call += ("--param", f"{name}={json.dumps(value)}")
        return call

    def open(self, *numbers):
        for number in numbers or range(1, len(self.results) + 1):
            (self.gates / str(number)).touch()


class Terminal:
    """A terminal with webapi-exec --follow on it; the result goes there too if asked for."""

    def __init__(self, *arguments, columns=80, output=False, **environment):
        self.leader, terminal = pty.openpty()
        self.resize(columns)
        self.raw = b""
        self.process = subprocess.Popen(
            [EXEC, "--follow", *map(str, arguments)],
            stdin=terminal,
            stdout=terminal if output else subprocess.PIPE,
            stderr=terminal,
            env={"TERM": "xterm", **environment},
            start_new_session=True,
            preexec_fn=lambda: fcntl.ioctl(2, termios.TIOCSCTTY, 0),
        )
        os.close(terminal)

    def resize(self, columns):
        self.columns = columns
        fcntl.ioctl(self.leader, termios.TIOCSWINSZ, struct.pack("HHHH", 24, columns, 0, 0))

    def settings(self):
        return termios.tcgetattr(self.leader)

    def type(self, text):
        os.write(self.leader, text.encode())

    def _read(self, seconds):
        """@return False at the end of what is printed"""
        if select.select([self.leader], [], [], seconds)[0]:
            try:
                piece = os.read(self.leader, 65536)
            except OSError:
                return False
            self.raw += piece
            return bool(piece)
        return True

    @property
    def printed(self):
        return self.raw.decode(errors="replace")

    def wait_for(self, text, times=1):
        self.wait_until(lambda screen: self.printed.count(text) >= times, text)

    def wait_until(self, condition, what="the condition"):
        """Waits until the screen, a list of lines, is as it should be."""
        deadline = time.monotonic() + PATIENCE
        while not condition(self.screen()):
            assert time.monotonic() < deadline, (what, self.printed)
            assert self._read(0.1), (what, self.printed)

    def finish(self):
        """The exit status and what the program printed to standard output."""
        deadline = time.monotonic() + PATIENCE
        while self._read(0.1):
            assert time.monotonic() < deadline, self.printed
        output = self.process.stdout.read().decode() if self.process.stdout else ""
        return self.process.wait(timeout=PATIENCE), output

    def close(self):
        if self.process.poll() is None:
            self.process.kill()
        self.process.wait()
        if self.process.stdout:
            self.process.stdout.close()
        os.close(self.leader)

    def screen(self):
        """What a person sees: the lines, as a terminal makes them of what was printed. Fails for
        commands to the terminal that the program has no use for."""
        return render(self.printed, self.columns)

    def task_id(self):
        line = re.compile(r"Task (\S+)\r\n")
        self.wait_until(lambda screen: line.search(self.printed), "the task's id")
        return line.search(self.printed).group(1)


def render(text, columns):
    lines, column = [""], 0
    while text:
        if text.startswith("\x1b[K"):
            lines[-1] = lines[-1][:column]
            text = text[3:]
            continue
        char, text = text[0], text[1:]
        if char == "\n":
            lines.append(" " * column)
        elif char == "\r":
            column = 0
        else:
            if char == "\x1b" and not "[K".startswith(text[:2]):
                raise AssertionError(f"a command to the terminal: {text[:20]!r}")
            if column == columns:
                lines.append("")
                column = 0
            line = lines[-1].ljust(column)
            lines[-1] = line[:column] + char + line[column + 1:]
            column += 1
    return [line.rstrip() for line in lines]


def task(method, full_id, *arguments):
    """The answer of QELO.Work.Task for alice."""
    process = run("--api", TASK, "--method", method, "--user", "alice",
                  "--param", f"task_id={full_id}", *arguments)
    return json.loads(process.stdout)


def status_of(full_id):
    return task("status", full_id)["data"]


@pytest.fixture
def following(describe):
    describe(API, "following.so",
             methods={"1": [{"start": {"runAs": "root", "grantable": True}}]})


@pytest.fixture
def work(tmp_path):
    made = []

    def make(*results, **options):
        gates = tmp_path / str(len(made))
        gates.mkdir()
        made.append(Work(gates, *results, **options))
        return made[-1]

    yield make
    for each in made:
        each.open()  # whatever became of the test, the tasks end


@pytest.fixture
def follow():
    """Starts webapi-exec --follow on a terminal."""
    terminals = []

    def start(*arguments, **options):
        terminals.append(Terminal(*arguments, **options))
        return terminals[-1]

    yield start
    for terminal in terminals:
        terminal.close()


def shown(percent, *texts):
    """Whether the last line that was begun shows this."""
    def is_shown(screen):
        line = screen[-1] or screen[-2] if len(screen) > 1 else screen[-1]
        return f"{percent}%" in line and all(text in line for text in texts)
    return is_shown


def task_ids():
    return json.loads(call(TASK, "list").stdout)["data"]["user"]


def children_of(process):
    return Path(f"/proc/{process.pid}/task/{process.pid}/children").read_text().split()


def following_id(process):
    """The id of the task that a program watches, once it does: it has a child then that waits."""
    while process.poll() is None:
        running = [full_id for full_id in task_ids() if not status_of(full_id)["finish"]]
        if len(children_of(process)) == 1 and running:
            return running[-1]
    raise AssertionError(process.communicate())
