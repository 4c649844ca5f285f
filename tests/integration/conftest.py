"""A private root, real accounts and a real web server for all tests of a run."""

import json
import os
import shutil
import subprocess
import sys
from pathlib import Path

import pytest

sys.path.insert(0, str(Path(__file__).with_name("support")))

os.umask(0o022)  # what others may write is not loaded

from client import Client
from webserver import SOURCE, WebServer

BUILD = Path(os.environ.get("WEBAPI_BUILD_DIR", SOURCE / "build" / "test"))
ROOT = BUILD / "root"
PLUGINS = BUILD / "tests" / "plugins"
DESCRIPTIONS = ROOT / "usr" / "qelo" / "qeloman" / "webapi"
SESSIONS = ROOT / "run" / "webapi" / "sessions"
ENTRY = BUILD / "programs" / "entry.cgi"

PASSWORDS = {"admin": "admin-pw", "alice": "alice-pw", "bob": "bob-pw"}

needs_root = pytest.mark.skipif(
    os.geteuid() != 0, reason="needs root: an ordinary user's accounts share one id"
)


@pytest.fixture(scope="session")
def root():
    """A fresh private root with the bundled and the tests' descriptions."""
    shutil.rmtree(ROOT, ignore_errors=True)
    subprocess.run(
        [SOURCE / "packaging" / "private-root", ROOT, "--description-dir", BUILD / "descriptions"],
        check=True,
        stdout=subprocess.DEVNULL,
    )
    for file in Path(__file__).with_name("descriptions").glob("*.lib"):
        text = file.read_text().replace("@PLUGIN_DIR@", str(PLUGINS))
        (DESCRIPTIONS / file.name).write_text(text)
    return ROOT


@pytest.fixture(scope="session")
def server(root, tmp_path_factory):
    server = WebServer(tmp_path_factory.mktemp("server"), ENTRY, "server.max-read-idle = 3\n")
    yield server.start()
    server.stop()


@pytest.fixture(scope="session")
def client(server):
    return Client(server.port)


def session_of(client, account):
    answer = client.login(account, PASSWORDS[account])
    return answer.data


@pytest.fixture
def admin(client):
    """A fresh session of the administrator: its "sid", "token" and "user"."""
    return session_of(client, "admin")


@pytest.fixture
def alice(client):
    return session_of(client, "alice")


@pytest.fixture
def describe(root):
    """Describes an API for one test: describe(api, library, **members), or with text=..."""
    before = {}

    def write(api, library="", text=None, **members):
        file = DESCRIPTIONS / f"{api}.lib"
        before.setdefault(file, file.read_text() if file.exists() else None)
        if text is None:
            description = {
                "lib": str(PLUGINS / library) if library else "",
                "minVersion": 1,
                "maxVersion": 3,
                "authLevel": 0,
                "methods": {"1": ["run"], "2": ["run"], "3": ["run"]},
                **members,
            }
            text = json.dumps({api: description})
        file.write_text(text)
        return file

    yield write
    for file, content in before.items():
        if content is None:
            file.unlink(missing_ok=True)
        else:
            file.write_text(content)


def run_entry(query=None, body=None, length=None, program="entry.cgi", **environment):
    """Runs entry.cgi, or rest.cgi, without a web server; answers its whole output."""
    variables = {"REQUEST_METHOD": "GET", "REMOTE_ADDR": "127.0.0.1", **environment}
    if query is not None:
        variables["QUERY_STRING"] = query
    if body is not None:
        variables["REQUEST_METHOD"] = "POST"
        variables.setdefault("CONTENT_TYPE", "application/x-www-form-urlencoded")
        variables["CONTENT_LENGTH"] = str(len(body) if length is None else length)
    process = subprocess.run(
        [ENTRY.with_name(program)], input=body or b"", env=variables, capture_output=True, timeout=30, check=False
    )
    assert process.returncode == 0, process
    return process.stdout


def answer_of(output):
    """The JSON of an answer that must be whole: header lines, an empty line, one JSON text."""
    head, body = output.split(b"\r\n\r\n", 1)
    lines = head.split(b"\r\n")
    assert sum(line.lower().startswith(b"content-type:") for line in lines) == 1, lines
    assert all(b": " in line for line in lines), lines
    return json.loads(body)
