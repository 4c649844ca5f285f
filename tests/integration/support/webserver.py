"""A real lighttpd in front of entry.cgi."""

import socket
import subprocess
import time
from pathlib import Path

SOURCE = Path(__file__).resolve().parents[3]
TEMPLATE = SOURCE / "packaging" / "lighttpd.conf.in"


def free_port():
    with socket.socket() as probe:
        probe.bind(("127.0.0.1", 0))
        return probe.getsockname()[1]


class WebServer:
    """Serves one entry.cgi from a directory of its own until it is stopped."""

    def __init__(self, directory, entry, extra="", pid=None):
        self.directory = Path(directory)
        self.port = free_port()
        for folder in ("www", "uploads"):
            (self.directory / folder).mkdir(parents=True, exist_ok=True)
        text = TEMPLATE.read_text()
        values = {"DIR": directory, "PORT": self.port, "ENTRY": entry, "PID": pid or f"{directory}/pid"}
        for name, value in values.items():
            text = text.replace(f"@{name}@", str(value))
        self.configuration = self.directory / "lighttpd.conf"
        self.configuration.write_text(text + extra)
        self.process = None

    def start(self, *wrapper, **identity):
        """Runs it by a wrapping command, as another user; both optional, as Popen has them."""
        self.process = subprocess.Popen(
            [*wrapper, "/usr/sbin/lighttpd", "-D", "-f", self.configuration],
            stdin=subprocess.DEVNULL,
            **identity,
        )
        deadline = time.monotonic() + 10
        while time.monotonic() < deadline:
            assert self.process.poll() is None, self.log()
            try:
                socket.create_connection(("127.0.0.1", self.port), timeout=1).close()
                return self
            except OSError:
                time.sleep(0.02)
        raise AssertionError("the web server does not answer: " + self.log())

    def stop(self):
        if self.process is not None:
            self.process.terminate()
            self.process.wait(timeout=10)
            self.process = None

    def log(self):
        """All that the server and the programs behind it wrote."""
        files = [self.directory / name for name in ("error.log", "cgi.log", "access.log")]
        return "".join(file.read_text(errors="replace") for file in files if file.exists())
