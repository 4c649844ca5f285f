"""webapi-exec: who may call as whom, the names that it lists, its help."""

import json
import subprocess

import pytest

from accounts import account, reachable
from conftest import DESCRIPTIONS, needs_root
from exec_program import COMPLETION, ENTRIES, EXEC, IDENTITY, call, data_of, described, run

pytestmark = pytest.mark.usefixtures("described")

# Users


@needs_root
def test_User_IsRootWhenRootCalls():
    assert data_of(run("--api", ENTRIES, "--method", "process", "--version", 2))["user"] == "root"


@needs_root
@pytest.mark.parametrize("user", ["alice", "admin"])
def test_User_IsWhomRootNames(user):
    data = data_of(call(IDENTITY, "asUser", user=user))
    assert data["user"] == user
    assert (data["euid"], data["egid"]) == account(user)
    assert data["isAdmin"] == (user == "admin")


def test_User_WhoDoesNotExist_IsAFailure():
    process = call(ENTRIES, "echo", user="nobody-here")
    assert (process.returncode, process.stdout) == (1, "")
    users = "admin, alice, bob"
    assert process.stderr == (
        f"webapi-exec: there is no user nobody-here here; --user takes one of {users}\n")


@needs_root
def test_User_OtherThanOneself_IsForRootAlone():
    if not reachable(EXEC):
        pytest.skip("the build tree cannot be read by others")
    uid, gid = account("alice")
    identity = {"user": uid, "group": gid, "extra_groups": []}

    def as_alice(method, *arguments):
        return run("--api", IDENTITY, "--method", method, *arguments, cwd="/", **identity)

    own = as_alice("asUser", "--user", "alice")
    assert (data_of(own)["user"], data_of(own)["euid"]) == ("alice", uid)
    other = as_alice("asUser", "--user", "bob")
    assert (other.returncode, other.stdout) == (1, "")
    assert other.stderr == "webapi-exec: only root may call as another user\n"
    # The rights are the operating system's: what runs as another account cannot be run.
    plain = as_alice("plain", "--user", "alice")
    assert json.loads(plain.stdout)["error"]["code"] == 117
    assert plain.stderr == (
        "webapi-exec: error 117: the method could not be run or gave no answer; "
        "the method runs as system: call it as root\n")
    # The private root's accounts are none of the host, so the caller's own has no name here.
    nameless = as_alice("asUser")
    assert nameless.returncode == 1
    assert nameless.stderr.endswith("; --user takes one of alice\n")


@needs_root
@pytest.mark.parametrize(
    "attributes, account_name",
    [({"runAs": "bob"}, "bob"), ({"grantByDefault": True}, "root"), ({}, "admin"),
     ({"runAs": "nobody-here"}, None)],
)
def test_MethodThatRunsAsAnotherAccount_IsNoUsersOwn(describe, attributes, account_name):
    if not reachable(EXEC):
        pytest.skip("the build tree cannot be read by others")
    describe(ENTRIES, "entries.so", runAs="admin", methods={"1": [{"echo": attributes}]})
    uid, gid = account("alice")
    process = run("--api", ENTRIES, "--method", "echo", "--user", "alice", cwd="/",
                  user=uid, group=gid, extra_groups=[])
    assert json.loads(process.stdout)["error"]["code"] == 117
    reason = f"{account_name}: call it as root" if account_name else (
        "nobody-here, and there is no such account")
    assert process.stderr.endswith(f"gave no answer; the method runs as {reason}\n")
    calls = json.dumps([{"api": ENTRIES, "version": 1, "method": "echo"}])
    table = run("--batch", "-", "--user", "alice", text=calls, cwd="/",
                user=uid, group=gid, extra_groups=[]).stdout
    assert table.endswith(f"gave no answer; the method runs as {reason}\n")


@needs_root
def test_MethodThatRunsAsNobodyKnown_IsSaidToRootToo(describe):
    describe(ENTRIES, "entries.so", runAs="nobody-here", methods={"1": ["echo"]})
    process = call(ENTRIES, "echo")
    assert process.returncode == 1
    assert process.stderr.endswith(
        "; the method runs as nobody-here, and there is no such account\n")


# Names and help


def test_List_PrintsTheNamesOfAPIsAndMethods():
    names = run("--list").stdout.splitlines()
    assert names == sorted(names)
    assert {"QELO.Host.Info", ENTRIES, IDENTITY, "QELO.Entry.Request"} <= set(names)
    assert run("--list", "--api", ENTRIES).stdout == "echo\nfail\nlarge\nprocess\n"
    assert run("--list", "--api", ENTRIES, "--version", "2").stdout == "process\n"
    assert "asUser" in run("--list", "--api", IDENTITY).stdout.splitlines()


def test_List_OfAnUnknownAPI_Fails():
    process = run("--list", "--api", "QELO.Test.Nowhere")
    assert process.returncode == 1
    assert process.stderr == "webapi-exec: there is no API QELO.Test.Nowhere\n"


def test_List_OfAnUnknownVersion_Fails():
    process = run("--list", "--api", ENTRIES, "--version", "3")
    assert (process.returncode, process.stdout) == (1, "")
    assert process.stderr == f"webapi-exec: no such version: {ENTRIES} has 1, 2\n"


def test_List_WithoutDescriptions_Fails():
    moved = DESCRIPTIONS.with_name("webapi.moved")
    DESCRIPTIONS.rename(moved)
    try:
        process = run("--list")
    finally:
        moved.rename(DESCRIPTIONS)
    assert process.returncode == 1
    assert "there are no APIs" in process.stderr


@pytest.mark.parametrize("option", ["--help", "-h"])
def test_Help_NamesEveryOption(option):
    process = run(option)
    assert (process.returncode, process.stderr) == (0, "")
    assert "private root" in process.stdout
    for option in ("api", "method", "version", "user", "param", "json", "output", "batch", "list",
                   "follow", "task"):
        assert f"--{option}" in process.stdout
    assert all(len(line) <= 100 for line in process.stdout.splitlines())


@pytest.mark.parametrize(
    "arguments",
    [
        (),
        ("--api", ENTRIES),
        ("--method", "echo"),
        ("--nonsense",),
        ("--api",),
        ("word",),
        ("--api", ENTRIES, "--method", "echo", "word"),
        ("--api", ENTRIES, "--method", "echo", "--version", "0"),
        ("--api", ENTRIES, "--method", "echo", "--version", "1x"),
        ("--api", ENTRIES, "--method", "echo", "--param", "novalue"),
        ("--api", ENTRIES, "--method", "echo", "--param", "=x"),
        ("--api", ENTRIES, "--method", "echo", "--json", "/no/such/file"),
        ("--api", ENTRIES, "--method", "echo", "--json", ""),
        ("--api", ENTRIES, "--method", "echo", "--output", ""),
        ("--batch", ""),
        ("--batch", "/no/such/file"),
        ("--batch", "/dev/null", "--api", ENTRIES),
        ("--batch", "/dev/null", "--output", "x"),
        ("--batch", "/dev/null", "--json", "x"),
        ("--batch", "/dev/null", "--list"),
        ("--list", "--method", "echo"),
        ("--list", "--version", "1"),
        ("--follow",),
        ("--follow", "--list"),
        ("--follow", "--batch", "/dev/null"),
        ("--follow", "--task", ""),
        ("--follow", "--task", "alice/x", "--api", ENTRIES, "--method", "echo"),
        ("--follow", "--task", "alice/x", "--param", "a=1"),
        ("--follow", "--task", "alice/x", "--output", "x"),
        ("--api", ENTRIES, "--method", "echo", "--user", ""),
        ("--batch", "/dev/null", "--user", ""),
        ("--task", "alice/x"),
    ],
)
def test_WrongUse_SaysSo(arguments):
    process = run(*arguments)
    assert (process.returncode, process.stdout) == (2, "")
    assert process.stderr.endswith("see webapi-exec --help\n")


def completions(*words):
    """What bash offers for the last of the words."""
    script = f"""
        . {COMPLETION}
        COMP_WORDS=({EXEC} {' '.join(f"'{word}'" for word in words)})
        COMP_CWORD=$((${{#COMP_WORDS[@]}} - 1))
        _webapi_exec
        printf '%s\\n' "${{COMPREPLY[@]}}"
    """
    process = subprocess.run(["bash", "-c", script], capture_output=True, text=True, check=True)
    assert process.stderr == ""
    return process.stdout.split()


def test_Completion_OffersOptionsAndNamesOfTheCatalogue(tmp_path):
    assert completions("--ba") == ["--batch"]
    assert completions("--fo") == ["--follow"]
    assert completions("--ta") == ["--task"]
    assert "--method" in completions("")
    assert completions("--api", "QELO.Host.I") == ["QELO.Host.Info"]
    assert set(completions("--api", "QELO.Test.E")) == {ENTRIES}
    assert completions("--api", ENTRIES, "--method", "e") == ["echo"]
    methods = {"echo", "fail", "large", "process"}
    assert set(completions("--api", ENTRIES, "--method", "")) == methods
    assert completions("--method", "e") == []
    assert "root" in completions("--user", "roo")
    (tmp_path / "calls.json").touch()
    assert completions("--batch", f"{tmp_path}/ca") == [f"{tmp_path}/calls.json"]
    assert completions("--param", "x") == []
    assert completions("--task", "x") == []
