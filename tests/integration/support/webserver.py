"""Real web servers in front of entry.cgi."""

import os
import shutil
import signal
import socket
import subprocess
import tempfile
import time
from pathlib import Path

SOURCE = Path(__file__).resolve().parents[3]
PACKAGING = SOURCE / "packaging"
PAGES = SOURCE / "apis" / "QELO.Share.Link" / "page"
FORK_SERVER = Path(os.environ.get("WEBAPI_BUILD_DIR", SOURCE / "build" / "test")) / "programs" / "webapi-server"


def free_port():
    with socket.socket() as probe:
        probe.bind(("127.0.0.1", 0))
        return probe.getsockname()[1]


class WebServer:
    """A lighttpd that serves one entry.cgi from a directory of its own until it is stopped."""

    template = "lighttpd.conf.in"

    def __init__(self, directory, entry, extra="", pid=None):
        self.directory = Path(directory)
        self.port = free_port()
        for folder in ("www", "uploads"):
            (self.directory / folder).mkdir(parents=True, exist_ok=True)
        shutil.copytree(PAGES, self.directory / "sharing", dirs_exist_ok=True)
        text = (PACKAGING / self.template).read_text()
        self.socket = None
        if "@SOCKET@" in text:  # in a directory that nobody but root may write
            self.socket = Path(tempfile.mkdtemp(prefix="webapi-socket-")) / "server.sock"
            self.socket.parent.chmod(0o755)
        values = {"SOCKET": self.socket, "DIR": directory, "PORT": self.port, "ENTRY": entry, "REST": Path(entry).with_name("rest.cgi"), "PID": pid or f"{directory}/pid",
                  "PAGES": self.directory / "sharing"}
        for name, value in values.items():
            text = text.replace(f"@{name}@", str(value))
        self.entry = entry
        self.configuration = self.directory / self.template.removesuffix(".in")
        self.configuration.write_text(text + extra)
        self.process = None
        self.helpers = []

    def command(self):
        return ["/usr/sbin/lighttpd", "-D", "-f", self.configuration]

    def start_helpers(self, **identity):
        """Starts what the server needs beside it; gives the processes, each a group's first."""
        return []

    def start(self, *wrapper, **identity):
        """Runs it by a wrapping command, as another user; both optional, as Popen has them."""
        self.helpers = self.start_helpers(**identity)
        self.process = subprocess.Popen(
            [*wrapper, *self.command()], stdin=subprocess.DEVNULL, **identity
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
        for helper in self.helpers:
            os.killpg(helper.pid, signal.SIGTERM)  # fcgiwrap leaves its children behind
            helper.wait(timeout=10)
        self.helpers = []
        if self.socket is not None:
            shutil.rmtree(self.socket.parent)

    def programs(self):
        """The processes that serve requests at present."""
        program = FORK_SERVER if self.socket is not None else self.entry
        helpers = {helper.pid for helper in self.helpers}
        found = []
        for link in Path("/proc").glob("[0-9]*/exe"):
            try:
                target = os.readlink(link).removesuffix(" (deleted)")
            except OSError:
                continue  # it has ended
            if target == str(program) and self.is_ours(int(link.parent.name), helpers):
                found.append(int(link.parent.name))
        return found

    def is_ours(self, process, helpers):
        """Whether a process of the program serves this server's requests."""
        if self.socket is None:
            return True
        try:
            parent = int(Path(f"/proc/{process}/stat").read_text().rpartition(")")[2].split()[1])
        except OSError:
            return False
        return parent in helpers

    def start_fork_server(self, **identity):
        """webapi-server, which needs root's rights as entry.cgi does."""
        client = ["--client", identity["user"]] if "user" in identity else []
        with open(self.directory / "cgi.log", "ab") as log:
            helper = subprocess.Popen([FORK_SERVER, "--socket", self.socket, *client],
                                      stdin=subprocess.DEVNULL, stdout=log, stderr=log,
                                      start_new_session=True)
        deadline = time.monotonic() + 10
        while not self.socket.exists() and time.monotonic() < deadline:
            assert helper.poll() is None, self.log()
            time.sleep(0.01)
        assert self.socket.exists(), self.log()
        return [helper]

    def log(self):
        """All that the server and the programs behind it wrote."""
        files = [self.directory / name for name in ("error.log", "cgi.log", "access.log")]
        return "".join(file.read_text(errors="replace") for file in files if file.exists())


class LighttpdScgi(WebServer):
    """lighttpd, and our fork server."""

    template = "lighttpd-scgi.conf.in"

    def start_helpers(self, **identity):
        return self.start_fork_server(**identity)


class Nginx(WebServer):
    """nginx, and fcgiwrap with some processes."""

    template = "nginx.conf.in"
    processes = 4

    def command(self):
        log = self.directory / "error.log"  # until it has read its configuration
        return ["/usr/sbin/nginx", "-e", log, "-c", self.configuration, "-g", "daemon off;"]

    def start_helpers(self, **identity):
        path = self.directory / "fcgiwrap.sock"
        with open(self.directory / "cgi.log", "ab") as log:
            helper = subprocess.Popen(
                ["/usr/sbin/fcgiwrap", "-f", "-c", str(self.processes), "-p", self.entry, "-p", Path(self.entry).with_name("rest.cgi"),
                 "-s", f"unix:{path}"],
                stdin=subprocess.DEVNULL, stdout=log, stderr=log, start_new_session=True, **identity,
            )
        deadline = time.monotonic() + 10
        while not path.exists() and time.monotonic() < deadline:
            time.sleep(0.01)
        assert path.exists(), self.log()
        return [helper]


class NginxScgi(Nginx):
    """nginx, and our fork server."""

    template = "nginx-scgi.conf.in"

    def start_helpers(self, **identity):
        return self.start_fork_server(**identity)


class ApacheCgi(WebServer):
    """Apache with a process a connection."""

    template = "apache2.conf.in"
    definitions = ()

    def command(self):
        options = [word for name in self.definitions for word in ("-D", name)]
        return ["/usr/sbin/apache2", *options, "-D", "FOREGROUND", "-f", self.configuration]


class ApacheCgid(ApacheCgi):
    """Apache with threads."""

    definitions = ("CGID",)


class ApacheScgi(ApacheCgi):
    """Apache with threads, and our fork server."""

    template = "apache2-scgi.conf.in"

    def start_helpers(self, **identity):
        return self.start_fork_server(**identity)
