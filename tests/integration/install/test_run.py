"""The command that builds and serves, as root and as an ordinary user."""

import os
import pwd
import re
import shutil
import signal
import socket
import subprocess
import tempfile
from contextlib import contextmanager
from pathlib import Path

import pytest

from conftest import SOURCE, needs_root
from webserver import free_port

ORDINARY_USER = "nobody"
CONFIGURATIONS = {"nginx": "nginx", "apache": "apache2"}


@pytest.fixture(scope="module")
def checkout():
    """A copy of the sources that belongs to an ordinary user, with a build tree of its own."""
    if os.geteuid() != 0:
        yield SOURCE
        return
    parent = Path(tempfile.mkdtemp(prefix="webapi-run-"))
    copy = parent / "checkout"
    unwanted = shutil.ignore_patterns("build", ".git", "__pycache__")
    shutil.copytree(SOURCE, copy, ignore=unwanted)
    account = pwd.getpwnam(ORDINARY_USER)
    for path in (parent, copy, *copy.rglob("*")):
        os.chown(path, account.pw_uid, account.pw_gid)
    yield copy
    shutil.rmtree(parent)


def as_user(*words):
    """A command line of the ordinary user."""
    return ["runuser", "-u", ORDINARY_USER, "--", *words] if os.geteuid() == 0 else list(words)


def command(*arguments):
    """./run as the ordinary user."""
    return as_user("./run", *map(str, arguments))


def answer_of(line):
    """What the ordinary user's shell prints for lines."""
    return subprocess.run(
        as_user("bash", "-c", line), cwd="/", capture_output=True, text=True, check=True
    ).stdout


def run(checkout, *arguments):
    # Without optimisation the build takes a third of the time.
    environment = {**os.environ, "CMAKE_BUILD_TYPE": "Debug"}
    return subprocess.run(
        command(*arguments),
        cwd=checkout,
        env=environment,
        stdin=subprocess.DEVNULL,
        capture_output=True,
        text=True,
        timeout=400,
        check=False,
    )


def is_free(port):
    with socket.socket() as probe:
        return probe.connect_ex(("127.0.0.1", port)) != 0


def check_answers(result, port):
    assert result.returncode == 0, result.stdout + result.stderr
    for piece in ('"sid"', '"user":"alice"', '"api":"QELO.Catalog.API"', '"code":105'):
        assert piece in result.stdout
    assert "WRONG" not in result.stdout
    assert is_free(port)


def test_Check_AsAnOrdinaryUser_IsRight(checkout):
    port = free_port()
    check_answers(run(checkout, "--check", "--port", port), port)
    owner = pwd.getpwuid((checkout / "build" / "dev" / "root").stat().st_uid).pw_name
    assert owner != "root"


@pytest.mark.parametrize("server", ["nginx", "apache"])
def test_Check_ByAnotherServer_AsAnOrdinaryUser_IsRight(checkout, server):
    port = free_port()
    result = run(checkout, "--check", "--port", port, "--server", server)
    check_answers(result, port)
    assert "The same by the fork server" in result.stdout
    assert "List by workers" in result.stdout
    assert (checkout / "build" / "dev" / f"server-{port}" / f"{CONFIGURATIONS[server]}.conf").exists()
    for process in Path("/proc").glob("[0-9]*/cmdline"):
        try:
            assert f"server-{port}/" not in process.read_text(errors="replace")
        except OSError:
            pass  # it has ended


@needs_root
@pytest.mark.parametrize("server", ["lighttpd", "nginx", "apache"])
def test_Check_AsRoot_IsRight(server):
    port = free_port()
    result = subprocess.run(
        ["./run", "--check", "--port", str(port), "--server", server],
        cwd=SOURCE, stdin=subprocess.DEVNULL, capture_output=True, text=True, timeout=400,
        check=False,
    )
    check_answers(result, port)


def test_Check_WithAWrongAnswer_Fails(checkout):
    library = checkout / "build" / "dev" / "apis" / "QELO.Catalog.API.so"
    content = library.read_bytes()
    library.write_bytes(b"no library")
    result = run(checkout, "--check", "--port", free_port())
    library.write_bytes(content)
    assert result.returncode == 1
    assert "WRONG" in result.stdout
    assert "Wrong answers: 2" in result.stderr, "by both roads"


def test_PortThatIsTaken_IsSaid(checkout):
    with socket.socket() as taken:
        taken.bind(("127.0.0.1", 0))
        taken.listen()
        port = taken.getsockname()[1]
        result = run(checkout, "--port", port)
    assert result.returncode == 1
    assert f"Port {port} of 127.0.0.1 is taken" in result.stderr


@pytest.mark.parametrize("arguments", [
    ["--port"], ["--port", "x"], ["--port", "70000"], ["--server"], ["--server", "other"], ["--no"]])
def test_WrongArguments_AreRefused(checkout, arguments):
    assert run(checkout, *arguments).returncode == 2


def test_PortThatIsTaken_IsSaidBeforeAnythingIsBuilt(tmp_path):
    copy = tmp_path / "tree"
    shutil.copytree(SOURCE / "packaging", copy / "packaging")
    shutil.copy(SOURCE / "run", copy)
    with socket.socket() as taken:
        taken.bind(("127.0.0.1", 0))
        taken.listen()
        result = subprocess.run(["./run", "--port", str(taken.getsockname()[1])], cwd=copy,
                                capture_output=True, text=True, timeout=60, check=False)
    assert result.returncode == 1
    assert "is taken by another program" in result.stderr
    assert result.stdout == ""
    assert not (copy / "build").exists()


def test_BuildWithoutATerminal_IsSaidBeforeIt(tmp_path):
    """The tree is one that was built before."""
    copy = tmp_path / "tree"
    shutil.copytree(SOURCE / "packaging", copy / "packaging")
    shutil.copy(SOURCE / "run", copy)
    program = copy / "build" / "dev" / "programs" / "entry.cgi"
    program.parent.mkdir(parents=True)
    program.touch(mode=0o755)
    result = subprocess.run(["./run", "--port", str(free_port())], cwd=copy, capture_output=True,
                            text=True, timeout=60, check=False)
    assert result.returncode == 1  # there is nothing to build
    assert result.stdout == "Building what has changed.\n"


@pytest.mark.parametrize("program", ["run", "test"])
@pytest.mark.parametrize("option", ["-h", "--help"])
def test_Help_IsPrinted(program, option):
    result = subprocess.run([SOURCE / program, option], capture_output=True, text=True, check=False)
    assert (result.returncode, result.stderr) == (0, "")
    assert f"Usage: ./{program} [" in result.stdout
    assert all(part in result.stdout for part in ("-h", "--help"))


@contextmanager
def serving(checkout, port):
    """./run until the end of the block; gives what it printed and its process."""
    process = subprocess.Popen(
        command("--port", port), cwd=checkout, stdin=subprocess.DEVNULL, stdout=subprocess.PIPE,
        stderr=subprocess.STDOUT, text=True, start_new_session=True,
    )
    try:
        printed = ""
        for line in process.stdout:
            printed += line
            if "Ctrl-C" in line:
                break
        yield printed
    finally:
        os.killpg(process.pid, signal.SIGINT)
        status = process.wait(timeout=20)
        process.stdout.close()
    assert status != 0
    assert is_free(port)


def test_Serving_PrintsLinesThatWork_AndLeavesNothingBehind(checkout):
    with serving(checkout, free_port()) as printed:
        lines = re.findall(r"^  ((?:SID=|curl |/\S+/webapi-exec ).*)$", printed, re.MULTILINE)
        assert len(lines) == 4, printed
        answer = answer_of("\n".join(lines[:3]))
        assert '"user":"alice"' in answer and '"api":"QELO.Catalog.API"' in answer
        assert '"user":"alice"' in answer_of(lines[3])
        for account in ("admin", "alice", "bob"):
            assert re.search(rf"^ +{account} +{account}-pw", printed, re.MULTILINE)


def test_SecondServer_HasADirectoryAndAProcessIdOfItsOwn(checkout):
    build = checkout / "build" / "dev"
    ports = free_port(), free_port()
    note = "Another server of this tree gets the restarts that methods ask for"
    with serving(checkout, ports[0]) as first:
        pid = build / "root" / "run" / "web-server.pid"
        process = pid.read_text()
        with serving(checkout, ports[1]) as second:
            assert note not in first and note in second
            assert pid.read_text() == process
            own = build / f"server-{ports[1]}"
            assert (own / "web-server.pid").read_text() != process
            for port in ports:
                assert (build / f"server-{port}" / "lighttpd.conf").exists()
                assert not is_free(port)
                assert f"Logs are in {build}/server-{port}." in first + second
        assert not is_free(ports[0])
    with serving(checkout, ports[1]) as third:
        assert note not in third
