"""What must not work by a sharing link, or without one."""

import json
import shutil

import pytest

from client import Client
from conftest import PLUGINS, session_of
from sharing import (API, CHECKS, PROJECT, Visitor, alice, bob, change_database,  # noqa: F401
                     fresh_addresses, shared, stranger, visit)

pytestmark = pytest.mark.usefixtures("shared")

BAD_PROJECTS = ["../x", "a/../../x", "/tmp/x", "a/b", ".", "..", ".x", "", "a b", "x" * 65, "a\nb"]


@pytest.mark.parametrize("project", BAD_PROJECTS)
def test_ProjectThatLeadsElsewhere_MakesNoLink(alice, project):
    assert alice.call("create", project=json.dumps(project)).code == 101


def test_ProjectOfAChangedDatabase_OpensNothingElsewhere(alice, visit):
    """A library that is root's, but does not stand where check libraries do."""
    shutil.copy(PLUGINS / "link_checks.so", CHECKS.parent / "elsewhere.so")
    link = alice.make()
    visitor = visit(link)
    assert visitor.call("asRoot").code == 0
    change_database(f"UPDATE links SET project = '../elsewhere' WHERE id = {link['id']}")
    assert visitor.call("asRoot").code == 127


def test_LibraryThatOthersMayWrite_IsNotAsked(alice, visit):
    visitor = visit(alice.make())
    (CHECKS / f"{PROJECT}.so").chmod(0o666)
    assert visitor.call("asRoot").code == 127


def test_ForeignLinks_AreNobodyElses(alice, bob):
    link = alice.make()
    assert bob.call("change", id=link["id"], name="mine").code == 400
    assert bob.call("remove", id=link["id"]).code == 400
    assert link["id"] not in [each["id"] for each in bob.call("list").data["links"]]


def test_RemovedAndRenewedLinks_AreGone(alice, visit):
    link = alice.make()
    visitor = visit(link)
    renewed = alice.call("change", id=link["id"], renew="true").data
    assert visitor.call().code == 126
    assert visitor.open().code == 400
    assert Visitor(visitor.client, renewed["link"], visitor.sid).call().code == 123
    assert alice.call("remove", id=link["id"]).code == 0
    assert Visitor(visitor.client, renewed["link"], visitor.sid).call().code == 126


def test_Id_ServesWholeAlone(alice, visit):
    """Each id with one character changed, and each shorter one."""
    visitor = visit(alice.make())
    for place in range(1, 43, 6):
        other = "A" if visitor.link[place] != "A" else "B"
        link = visitor.link[:place] + other + visitor.link[place + 1:]
        assert Visitor(visitor.client, link, visitor.sid).call().code == 126
        assert Visitor(visitor.client, visitor.link[:place], visitor.sid).call().code in (101, 126)
        other = "A" if visitor.sid[place] != "A" else "B"
        sid = visitor.sid[:place] + other + visitor.sid[place + 1:]
        assert Visitor(visitor.client, visitor.link, sid).call().code == 122
    assert visitor.call().code == 0


def test_LoginSession_IsNoSharingSession(alice, stranger):
    link = alice.make()
    assert Visitor(stranger, link["link"], alice.sid).call().code == 122


def test_SharingSession_IsNoLoginSession(alice, visit):
    visitor = visit(alice.make(protect="owner"))
    answer = visitor.client.call("QELO.Test.Identity", "asUser", _sid=visitor.sid)
    assert answer.code == 119


def test_LoginBesideALink_GivesTheVisitorNothing(alice, client, visit):
    admin = session_of(client, "admin")
    visitor = visit(alice.make(), client)
    headers = {"Cookie": f"id={admin['sid']}; sharing_sid={visitor.sid}",
               "X-Qelo-Token": admin["token"], "X-Qelo-Sharing": visitor.link}
    data = client.get("api=QELO.Test.Open&version=1&method=plain", headers).data
    assert (data["user"], data["session"], data["isAdmin"]) == ("", "", False)
    refused = client.get("api=QELO.Host.Info&version=1&method=get", headers)
    assert refused.code == 126


@pytest.mark.parametrize("method", ["create", "list", "change", "remove"])
def test_Visitor_IsNoOwner(alice, visit, method):
    """Links are not made by links, even in the owner's name."""
    visitor = visit(alice.make(protect="owner"))
    assert visitor.call(method, API, project="x", id=1).code == 126
    assert visitor.client.call(API, method, project="x", id=1).code in (105, 119)


def test_PasswordGuessedFast_HasToWait(alice, stranger, server):
    visitor = Visitor(stranger, alice.make(password="open-sesame")["link"])
    for _ in range(5):
        assert visitor.open("guess").code == 404
    answer = visitor.open("open-sesame")
    assert answer.code == 407
    assert int(answer.headers["Retry-After"]) == answer.json["error"]["errors"]["retry_after"] > 0
    elsewhere = Visitor(Client(server.port, next(fresh_addresses)), visitor.link)
    assert elsewhere.open("open-sesame").code == 0


def test_Open_ByGetOrFromAnotherSite_IsRefused(alice, stranger):
    link = alice.make()["link"]
    assert stranger.get(f"api={API}&version=1&method=open&link={link}").code == 405
    answer = Visitor(stranger, link).open(Origin="http://evil.example")
    assert answer.code == 403
    assert answer.headers.get_all("Set-Cookie") is None


@pytest.mark.parametrize("terms", [
    {"name": "x" * 129}, {"path": "x" * 4097}, {"protect": "all"}, {"expires": -1},
    {"maxUses": "many"}, {"maxBytes": 1e30}, {"upload": 1}, {"matchAddress": "perhaps"},
    {"password": "x" * 129}, {"protect": "none", "password": "secret"},
])
def test_BadTerms_MakeNoLink(alice, terms):
    answer = alice.call("create", project=PROJECT, **terms)
    assert answer.code == 101
    assert answer.json["error"]["errors"][0]["path"] == f"/{list(terms)[-1]}"


@pytest.mark.parametrize("method,name", [
    ("create", "project"), ("change", "id"), ("remove", "id"), ("qr", "link"), ("open", "link")])
def test_ParameterThatIsMissing_IsNamed(alice, method, name):
    answer = alice.call(method)
    assert answer.code == 101
    assert [fault["path"] for fault in answer.json["error"]["errors"]] == [f"/{name}"]


def test_TermsThatOnlyTogetherAreWrong_AreToldSo(alice):
    link = alice.make(password="secret")
    answer = alice.call("change", id=link["id"], protect="none")
    assert answer.code == 101
    assert [fault["rule"] for fault in answer.json["error"]["errors"]] == ["terms"]


def test_Links_OfOneOwner_AreLimited(bob):
    bob.make()
    change_database(
        "WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 1000)"
        " INSERT INTO links(hash, owner, uid, project, name, path, protect, match_address, upload,"
        " password, created, expires, max_uses, uses, max_bytes)"
        " SELECT i, 'bob', uid, project, name, path, protect, match_address, upload, password,"
        " created, expires, max_uses, uses, max_bytes FROM links, n"
        " WHERE id = (SELECT max(id) FROM links)")
    try:
        assert bob.call("create", project=PROJECT).code == 406
    finally:
        change_database("DELETE FROM links WHERE typeof(hash) = 'integer'")
