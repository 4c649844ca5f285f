"""webapi doctor says what calls need on a host, and lack."""

import os
import shutil
import socket

import pytest

from author_program import webapi
from conftest import DESCRIPTIONS, PLUGINS, ROOT, SOURCE, needs_root


def lines_of(*arguments):
    result = webapi("doctor", *arguments)
    assert result.stderr == ""
    lines = result.stdout.splitlines()
    assert all(line.startswith(("ok: ", "note: ", "wrong: ")) for line in lines), lines
    assert result.returncode == (1 if any(line.startswith("wrong: ") for line in lines) else 0)
    return lines


def wrong(*arguments):
    """What is wrong, but for the host's own log, which a container may lack."""
    return [line.removeprefix("wrong: ") for line in lines_of(*arguments)
            if line.startswith("wrong: ") and "/dev/log" not in line]


@pytest.fixture
def put_back(root):
    """Puts a file back as it was: put_back(path) before it is changed."""
    kept = []

    def keep(path):
        kept.append((path, path.read_bytes(), path.stat()))
        return path

    yield keep
    for path, content, status in kept:
        path.write_bytes(content)
        os.chown(path, status.st_uid, status.st_gid)
        path.chmod(status.st_mode)


def test_Doctor_OfAGoodHost_FindsNothingWrong(root):
    assert wrong() == []
    lines = lines_of()
    for part in ("account system", "group administrators", "directory of tasks", "QELO.Host.Info.lib", "entry.cgi"):
        assert any(line.startswith("ok: ") and part in line for line in lines), part


def test_Doctor_TellsWhatIsMadeByItself_AndWhatByTheAdministrator(root):
    hosts = ROOT / "etc" / "webapi" / "relay.json"
    hosts.unlink(missing_ok=True)
    lines = lines_of()
    assert f"ok: hosts that calls are passed to {hosts} is not there, and need not be" in lines
    assert not any("qeloinfo.conf" in line and "will be made" in line for line in lines)
    hosts.write_text("{}")
    hosts.chmod(0o640)  # it holds tokens, and is not read then
    try:
        assert wrong() == [f"hosts that calls are passed to {hosts} has the mode 0640; chmod 0600 {hosts}"]
    finally:
        hosts.unlink()


def test_Doctor_TellsOfSyslog_WhatIsTrue(root):
    line = next(line for line in lines_of() if "/dev/log" in line)
    with socket.socket(socket.AF_UNIX, socket.SOCK_DGRAM) as log:
        answers = log.connect_ex("/dev/log") in (0, 91)  # or it is a stream
    assert line.startswith("ok: " if answers else "wrong: ")


def test_Doctor_FindsMissingAccountAndGroup(put_back):
    for name in ("passwd", "group"):
        file = put_back(ROOT / "etc" / name)
        file.write_text("".join(line for line in file.read_text().splitlines(True)
                                if not line.startswith(("system:", "administrators:"))))
    assert [line.split(";")[0] for line in wrong()] == [
        "there is no account system, and calls answer 117",
        "there is no group administrators, so nobody is administrator",
    ]


def test_Doctor_FindsModesAndWhatToDo(put_back):
    file = put_back(DESCRIPTIONS / "lib.def")
    file.chmod(0o666)
    assert wrong() == [f"defaults of descriptions {file} has the mode 0666; chmod 0644 {file}"]
    file.unlink()
    assert wrong() == [f"defaults of descriptions {file} is missing; install again, or make it"]
    file.mkdir()
    try:
        assert wrong() == [f"defaults of descriptions {file} is no regular file; remove it"]
    finally:
        file.rmdir()


@needs_root
def test_Doctor_FindsWhatIsSomebodyElses(put_back):
    file = put_back(DESCRIPTIONS / "lib.def")
    os.chown(file, 1002, 0)
    assert wrong() == [f"defaults of descriptions {file} belongs to the user 1002; chown root {file}"]
    os.chown(file, 0, 0)


def test_Doctor_FindsFaultyDescriptions(describe, tmp_path):
    file = describe("QELO.Test.Sick", text="{")
    assert wrong() == [f"{file}:1:2: error: no JSON from here on; its APIs answer 102"]
    describe("QELO.Test.Sick", text='{"QELO.Test.Sick": {"lib": ""}}')
    assert wrong() == [f'{file}: QELO.Test.Sick: "minVersion" is no integer; webapi check {file}']
    describe("QELO.Test.Sick", "gone.so")
    assert wrong() == [f"the library of QELO.Test.Sick, {PLUGINS}/gone.so, is not there; install it, or its calls answer 111"]
    library = shutil.copy(PLUGINS / "good.so", tmp_path / "open.so")
    os.chmod(library, 0o666)
    describe("QELO.Test.Sick", str(library))
    assert len(wrong()) == 1 and "others may write" in wrong()[0]


def test_Doctor_TellsOfSockets(describe, tmp_path):
    path = tmp_path / "api.sock"
    describe("QELO.Test.Daemon", "good.so", socket=str(path))
    assert any(line.startswith("note: ") and str(path) in line for line in lines_of())
    with socket.socket(socket.AF_UNIX) as listener:
        listener.bind(str(path))
        path.chmod(0o755)
        assert any(line.startswith("ok: ") and str(path) in line for line in lines_of())
        path.chmod(0o777)
        assert any("is handed sessions" in line for line in wrong())


def test_Doctor_ReadsTheConfiguration(root, tmp_path):
    assert wrong("--config", SOURCE / "packaging" / "lighttpd.conf.in") == []
    file = tmp_path / "lighttpd.conf"
    file.write_text('cgi.assign = ("entry.cgi" => "")\naccesslog.filename = "x"\n# "url-normalize"\n')
    found = wrong("--config", file)
    assert [line.split(";")[0] for line in found] == [
        f"{file} lets the server change queries", f"{file} logs queries, and session ids with them"]
    file.write_text("# entry.cgi\n")
    assert wrong("--config", file) == [
        f"{file} names neither entry.cgi nor webapi-server; docs/webservers.md has recipes"]
    assert len(wrong("--config", tmp_path / "none")) == 1


def test_Doctor_FindsAMissingProgram(root):
    assert wrong("--entry", "/nonexistent") == [
        "the CGI program /nonexistent: No such file or directory; install again"]


@pytest.mark.parametrize("arguments", [["word"], ["--config"], ["--none"]])
def test_Doctor_WrongUse_IsStatusTwo(arguments):
    result = webapi("doctor", *arguments)
    assert (result.returncode, result.stdout, "see webapi doctor --help" in result.stderr) == (2, "", True)
