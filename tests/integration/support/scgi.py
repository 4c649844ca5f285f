"""Requests to the fork server, as a web server would pass them on."""

import socket

import pytest

from conftest import answer_of
from service import Service

FORM = "application/x-www-form-urlencoded"


def variables(query=None, body=None, length=None, **environment):
    """What run_entry() gives entry.cgi for the same arguments."""
    found = {"REQUEST_METHOD": "GET", "REMOTE_ADDR": "127.0.0.1", **environment}
    if query is not None:
        found["QUERY_STRING"] = query
    if body is not None:
        found["REQUEST_METHOD"] = "POST"
        found.setdefault("CONTENT_TYPE", FORM)
    size = 0 if body is None else len(body) if length is None else length
    return {"CONTENT_LENGTH": str(size), "SCGI": "1", **found}


def header(values):
    text = b"".join(part.encode("utf-8", "surrogateescape") + b"\0"
                    for pair in values.items() for part in pair)
    return f"{len(text)}:".encode() + text + b","


class ForkServer(Service):
    """webapi-server at a socket in the directory."""

    def __init__(self, directory, *options, **environment):
        self.path = directory / "server.sock"
        super().__init__(directory, "webapi-server", "--socket", self.path, *options, **environment)

    def connect(self, timeout=20):
        connection = socket.socket(socket.AF_UNIX)
        connection.settimeout(timeout)
        connection.connect(str(self.path))
        return connection

    def raw(self, data, end=False):
        """Sends bytes and answers all that comes back."""
        with self.connect() as connection:
            connection.sendall(data)
            if end:
                connection.shutdown(socket.SHUT_WR)
            return rest(connection)

    def request(self, query=None, body=None, length=None, **environment):
        """The whole answer."""
        return self.raw(header(variables(query, body, length, **environment)) + (body or b""))

    def call(self, query, **environment):
        return answer_of(self.request(query, **environment))


def rest(connection):
    received = b""
    try:
        while piece := connection.recv(65536):
            received += piece
    except ConnectionResetError:
        pass
    return received


def status(answer):
    """The HTTP status of an answer that a CGI program gives."""
    first = answer.split(b"\r\n", 1)[0]
    return int(first[8:11]) if first.startswith(b"Status: ") else 200 if first else 0


@pytest.fixture
def start(root, tmp_path):
    """Starts the fork server with options; it ends with the test."""
    started = []

    def run(*options, **environment):
        server = ForkServer(tmp_path, *options, **environment)
        started.append(server)
        return server.start()

    yield run
    for server in started:
        server.stop()


# An API whose calls share a process.
STAYING = "QELO.Test.Staying"
EVERYBODY = [f"{kind}.{store}" for kind in ("admin", "normal") for store in ("local", "domain", "ldap")]
SHARED = ("state", "who", "leave", "escape", "crash", "finish", "fail", "silent", "echo", "large", "bytes",
          "slow", "later", "refused")


def methods():
    listed = [{name: {"isolation": "worker"}} for name in SHARED]
    listed += [{name: {"isolation": "worker", "grantByUser": True}} for name in ("asUser", "userSlow")]
    listed += [{"asAlice": {"isolation": "worker", "runAs": "alice"}},
               {"asRoot": {"isolation": "worker", "runAs": "root"}}, {"apart": {"isolation": "process"}}]
    return {"1": listed}


@pytest.fixture
def staying(describe):
    """The API, for logged-in callers of all classes; answers the query of a call."""
    describe(STAYING, "staying.so", authLevel=1, allowUser=EVERYBODY, methods=methods())
    return f"api={STAYING}&version=1&method="


@pytest.fixture
def start_workers(root, tmp_path):
    """Starts the fork server with workers; it ends with the test."""
    started = []
    directory = tmp_path / "workers"
    directory.mkdir()

    def run(*options):
        server = ForkServer(directory, "--fronts", 2, *options)
        started.append(server)
        return server.start()

    yield run
    for server in started:
        server.stop()
