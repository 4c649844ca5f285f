"""Servers of ours that tell when they are ready, as a service manager would run them."""

import os
import socket
import subprocess
import time
from pathlib import Path

import conftest


class Service:
    """One program, started with a socket that it tells its state by, and its log in a file."""

    def __init__(self, directory, program, *options, **environment):
        self.directory = Path(directory)
        self.program = conftest.BUILD / "programs" / program
        self.options = options
        self.environment = environment
        self.log_file = self.directory / f"{program}.log"
        self.states = []
        self.process = None
        self.notices = None

    def start(self, **how):
        path = self.directory / "notify"
        path.unlink(missing_ok=True)
        self.notices = socket.socket(socket.AF_UNIX, socket.SOCK_DGRAM)
        self.notices.bind(str(path))
        self.process = subprocess.Popen(
            [self.program, *map(str, self.options)],
            stdin=subprocess.DEVNULL,
            env={
                "PATH": os.environ["PATH"],
                "NOTIFY_SOCKET": str(path),
                "LD_PRELOAD": str(conftest.BUILD / "tests" / "integration" / "log_file.so"),
                "LOG_FILE": str(self.log_file),
                **self.environment,
            },
            **how,
        )
        self.expect_state("READY=1")
        return self

    def expect_state(self, state, seconds=10):
        """Waits until the service tells a state that begins so."""
        self.notices.settimeout(seconds)
        told = self.notices.recv(4096).decode()
        assert told.startswith(state), told

    def signal(self, number):
        self.process.send_signal(number)

    def wait(self, seconds=10):
        return self.process.wait(timeout=seconds)

    def stop(self):
        if self.process is not None and self.process.poll() is None:
            self.process.terminate()
            try:
                self.process.wait(timeout=10)
            except subprocess.TimeoutExpired:
                self.process.kill()
                self.process.wait()
        if self.notices is not None:
            self.notices.close()

    def log(self):
        return self.log_file.read_text(errors="replace") if self.log_file.exists() else ""

    def log_line(self, part, seconds=5):
        """The first log line that holds a text, as soon as there is one."""
        deadline = time.monotonic() + seconds
        while time.monotonic() < deadline:
            for line in self.log().splitlines():
                if part in line:
                    return line
            time.sleep(0.02)
        raise AssertionError(f"no line with {part!r} in:\n{self.log()}")

    def children(self):
        """The processes that it has started and that are not gone."""
        found = []
        for status in Path("/proc").glob("[0-9]*/stat"):
            try:
                name_end = status.read_text().rpartition(")")[2].split()
            except OSError:
                continue
            if int(name_end[1]) == self.process.pid and name_end[0] != "Z":
                found.append(int(status.parent.name))
        return found
