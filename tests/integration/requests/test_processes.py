"""The table of processes in DEVELOPING.md, held against real ones: whose rights each has and where its
descriptors lead."""

import fcntl
import json
import os
import pwd
import re
import shutil
import stat
import subprocess
import tempfile
import time
from pathlib import Path

import pytest

from accounts import account, reachable
from client import Client
from conftest import BUILD, ENTRY, PASSWORDS, ROOT, SOURCE, needs_root
from scgi import ForkServer
from service import Service
from webserver import WebServer

API = "QELO.Test.Looking"
SERVER = "www-data"
STANDARD = {"0": "input", "1": "output", "2": "errors"}
COLUMNS = ("stage", "users", "groups", "supplementary", "input", "output", "errors", "others")
SOCKET = "socket"  # not in the table, which says why
# What a descriptor leads to, by the link in /proc, in the words of the table.
KINDS = [
    (r"pipe:", "pipe"),
    (r"/dev/null$", "null"),
    (r"socket:", SOCKET),
    (r".*/www-data-server/(?:cgi|error|access)\.log$", "server's log"),
    (r".*/www-data-server/pid$", "pid file"),
    (rf"{re.escape(os.getcwd())}$", "caller's directory"),
    (r".*/usr/qelo/qeloman/webapi$", "descriptions"),
    (r".*/tokens\.db(?:-wal|-shm)?$", "token database"),
    (r".*/tasks(?:/\d+)?(?:/tasks\.db(?:-wal|-shm)?)?$", "task store"),
    (r"anon_inode:", "kernel's"),
    (r"/memfd:api library", "library copies"),
]

pytestmark = needs_root


def table():
    """The rows of the table by stage."""
    text = (SOURCE / "DEVELOPING.md").read_text()
    rows = re.findall(r"^\| `([\w ]+)` \|(.*)\|$", text, re.MULTILINE)
    return {stage: [cell.strip() for cell in cells.split("|")] for stage, cells in rows}


def names(ids, group=False):
    """Ids in the words of the table."""
    words = {account(name)[group]: name for name in ("root", "system", "alice")}
    words[pwd.getpwnam(SERVER)[3 if group else 2]] = SERVER
    return " ".join(words.get(number, str(number)) for number in ids)


def kind(target):
    for pattern, word in KINDS:
        if re.match(pattern, target):
            return word
    return target


def cells(seen):
    """A process as a row of the table."""
    targets = {number: kind(target) for number, target in seen["descriptors"].items()}
    others = sorted({word for number, word in targets.items() if number not in STANDARD} - {SOCKET})
    return [
        names(seen["users"]),
        names(seen["groups"], group=True),
        names(sorted(seen["supplementary"]), group=True) or "none",
        *(targets.get(number, "closed") for number in STANDARD),
        ", ".join(others) or "none",
    ]


def process(number):
    """A process as it is from outside."""
    status = Path(f"/proc/{number}/status").read_text()
    fields = dict(re.findall(r"^(\w+):\t(.*)$", status, re.MULTILINE))
    return {
        "users": [int(word) for word in fields["Uid"].split()[:3]],
        "groups": [int(word) for word in fields["Gid"].split()[:3]],
        "supplementary": [int(word) for word in fields["Groups"].split()],
        "descriptors": {path.name: os.readlink(path) for path in Path(f"/proc/{number}/fd").iterdir()},
    }


@pytest.fixture(scope="module")
def installed(root):
    """entry.cgi as an installation has it, set-user-id for the web server's group, behind a server
    that runs as an ordinary account."""
    directory = Path(tempfile.mkdtemp(prefix="webapi-processes-"))
    directory.chmod(0o755)
    if os.statvfs(directory).f_flag & os.ST_NOSUID or not reachable(ENTRY):
        shutil.rmtree(directory)
        pytest.skip("no set-user-id program can be run here")
    entry = directory / "entry.cgi"
    shutil.copy(ENTRY, entry)
    shutil.chown(entry, "root", SERVER)
    entry.chmod(stat.S_ISUID | 0o750)
    server_directory = directory / "www-data-server"
    server_directory.mkdir()
    shutil.chown(server_directory, SERVER)
    server = WebServer(server_directory, entry, f'server.username = "{SERVER}"\n'
                                                f'server.groupname = "{SERVER}"\n')
    shutil.chown(server_directory / "uploads", SERVER)
    yield server.start()
    server.stop()
    shutil.rmtree(directory)


@pytest.fixture
def record(installed):
    """A file that every account may add lines to."""
    path = installed.directory.parent / "record"
    path.touch()
    path.chmod(0o666)
    yield path
    path.unlink()


@pytest.fixture
def looking(describe):
    describe(API, "looking.so", authLevel=1, allowUser=["normal.local"],
             methods={"1": ["run", "later", "background"]})


def stages(record, last):
    """What was written down, by stage, once the last stage is there."""
    deadline = time.monotonic() + 20
    while time.monotonic() < deadline:
        lines = [json.loads(line) for line in record.read_text().splitlines()]
        found = {line["stage"]: line for line in lines}
        if last in found:
            return found
        time.sleep(0.05)
    raise AssertionError(f"{last} never came: {record.read_text()}")


def call(installed, **parameters):
    client = Client(installed.port)
    sid = client.login("alice", PASSWORDS["alice"]).data["sid"]
    return client.call(_sid=sid, **parameters)


def expect(stage, seen):
    assert dict(zip(COLUMNS[1:], cells(seen))) == dict(zip(COLUMNS[1:], table()[stage]))


def test_WebServer_HasNoRightsOfOurs(installed):
    expect("web server", process(installed.process.pid))


def test_Call_HasRootsRightsUntilItTakesTheMethods(installed, looking, record):
    assert call(installed, api=API, method="run", record=record).code == 0
    seen = stages(record, "method")
    expect("entry before", seen["before"])
    expect("entry after", seen["method"])


def test_CompoundEntry_RunsInAChildThatGoesTheSameWay(installed, looking, record):
    entry = {"api": API, "version": 1, "method": "run", "record": str(record)}
    answer = call(installed, api="QELO.Entry.Request", method="request",
                  compound=json.dumps([entry]))
    assert not answer.data["has_fail"], answer.json
    seen = stages(record, "method")
    expect("compound before", seen["before"])
    expect("compound after", seen["method"])


def test_Callback_HasTheMethodsRightsAndNoClient(installed, looking, record):
    assert call(installed, api=API, method="later", record=record).code == 0
    expect("callback", stages(record, "callback")["callback"])


def test_BackgroundTask_HasTheMethodsRightsAndNoClient(installed, looking, record):
    assert call(installed, api=API, method="background", record=record).code == 0
    expect("background task", stages(record, "task")["task"])


def run_blocked(*command):
    """A program, looked at when it has something to say: nobody reads it before."""
    reading, writing = os.pipe()
    size = fcntl.fcntl(writing, fcntl.F_SETPIPE_SZ, 4096)
    os.write(writing, b"." * size)
    program = subprocess.Popen(command, stdin=subprocess.DEVNULL, stdout=writing,
                               stderr=subprocess.PIPE)
    os.close(writing)
    deadline = time.monotonic() + 20
    while not Path(f"/proc/{program.pid}/wchan").read_text().endswith("pipe_write"):
        if time.monotonic() > deadline:
            program.kill()
        assert program.poll() is None, "it never wrote anything"
        time.sleep(0.02)
    seen = process(program.pid)
    with os.fdopen(reading, "rb") as output:
        answer = output.read()[size:]
    program.communicate(timeout=20)
    return seen, answer


def test_Exec_StaysRoot_AndItsChildTakesTheMethodsRights(root, looking, record, installed):
    words = ["--user", "alice", "--api", API, "--method", "run", "--param", f"record={record}"]
    seen, answer = run_blocked(BUILD / "programs" / "webapi-exec", *words)
    assert json.loads(answer)["success"], answer
    expect("exec", seen)
    children = stages(record, "method")
    expect("exec child before", children["before"])
    expect("exec child after", children["method"])


def test_TokenProgram_StaysRoot(root):
    seen, answer = run_blocked(BUILD / "programs" / "webapi-token", "create", "--user", "alice",
                               "--api", "QELO.Host.Info")
    assert answer.strip()
    expect("token", seen)


def test_DaemonsCall_HasRootsRightsUntilItTakesTheMethods(root, describe, record, tmp_path):
    described = {"authLevel": 1, "allowUser": ["normal.local"], "methods": {"1": ["run"]}}
    describe(API, "looking.so", socket=str(ROOT / "run" / "webapi" / "api" / "looking.sock"), **described)
    daemon = Service(tmp_path, "qeloapid")
    try:
        daemon.start(stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL, extra_groups=[])
        words = ["--user", "alice", "--api", API, "--method", "run", "--param", f"record={record}"]
        subprocess.run([BUILD / "programs" / "webapi-exec", *words], check=True, timeout=30,
                       stdout=subprocess.DEVNULL)
        expect("daemon", process(daemon.process.pid))
    finally:
        daemon.stop()
    seen = stages(record, "method")
    expect("daemon call before", seen["before"])
    expect("daemon call after", seen["method"])


def test_ForkServersRequest_HasRootsRightsUntilItTakesTheMethods(client, looking, record, tmp_path):
    sid = client.login("alice", PASSWORDS["alice"]).data["sid"]
    server = ForkServer(tmp_path)
    try:
        server.start(stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL, extra_groups=[])
        assert server.call(f"api={API}&version=1&method=run&record={record}&_sid={sid}")["success"]
        expect("fork server", process(server.process.pid))
    finally:
        server.stop()
    seen = stages(record, "method")
    expect("forked before", seen["before"])
    expect("forked after", seen["method"])


def test_Table_HasNoOtherRows():
    text = Path(__file__).read_text()
    assert set(table()) == set(re.findall(r'expect\("([\w ]+)"', text))
