"""Whose rights a method runs with."""

import os
import pwd

import pytest

from accounts import account
from conftest import DESCRIPTIONS, ROOT, needs_root

API = "QELO.Test.Identity"


def ids_of(answer):
    return answer.data["euid"], answer.data["egid"]


@needs_root
def test_PrivateRoot_MadeByRoot_GivesEachAccountItsOwnId(root):
    names = ["root", "system", "admin", "alice", "bob"]
    assert len({account(name)[0] for name in names}) == len(names)
    assert account("root") == (0, 0)


@needs_root
@pytest.mark.parametrize(
    "method, name",
    [
        ("plain", "system"),
        ("asUser", "bob"),
        ("asRoot", "root"),
        ("asAlice", "alice"),
        ("grantable", "system"),
    ],
)
def test_Method_RunsWithTheRightsThatItsDescriptionNames(client, method, name):
    bob = client.login("bob", "bob-pw").data
    answer = client.call(API, method, _sid=bob["sid"])
    assert ids_of(answer) == account(name)


@needs_root
def test_Method_WithoutGrantable_CannotComeBack(client, alice):
    data = client.call(API, "plain", _sid=alice["sid"]).data
    user, group = account("system")
    assert (data["suid"], data["sgid"]) == (user, group)
    assert 0 not in data["groups"]


@needs_root
def test_Method_Grantable_KeepsTheWayBack(client, alice):
    data = client.call(API, "grantable", _sid=alice["sid"]).data
    assert data["euid"] == account("system")[0]
    assert data["suid"] == 0


@needs_root
def test_Method_ByUser_HasTheUsersGroupsOnly(client, admin):
    data = client.call(API, "asUser", _sid=admin["sid"]).data
    assert data["euid"] == account("admin")[0]
    groups = {int(line.split(":")[2]) for line in (ROOT / "etc" / "group").read_text().splitlines()
              if "admin" in line.split(":")[3].split(",")}
    assert set(data["groups"]) == groups | {account("admin")[1]}


def test_Method_ByUser_WithoutLogin_IsNotCalled(client, describe):
    describe(
        "QELO.Test.Open",
        "identity.so",
        methods={"1": [{"plain": {"grantByUser": True}}]},
    )
    assert client.call("QELO.Test.Open", "plain").code == 117


def test_Method_RunAsAnUnknownAccount_IsNotCalled(client, describe):
    describe("QELO.Test.Open", "identity.so", runAs="no-such-account", methods={"1": ["plain"]})
    assert client.call("QELO.Test.Open", "plain").code == 117


def test_Method_StandsInTheDescriptionDirectory(client, alice):
    directory = client.call(API, "plain", _sid=alice["sid"]).data["directory"]
    assert os.path.samefile(directory, DESCRIPTIONS)


def test_LoginUid_IsTheAccounts(client, alice):
    assert client.call(API, "asUser", _sid=alice["sid"]).data["uid"] == account("alice")[0]


@pytest.mark.skipif(os.geteuid() == 0, reason="shows an ordinary user's private root")
def test_PrivateRoot_MadeByAnOrdinaryUser_GivesAllAccountsThatUsersId(root):
    assert account("alice")[0] == account("system")[0] == os.geteuid()
    assert pwd.getpwuid(os.geteuid()).pw_uid == os.geteuid()
