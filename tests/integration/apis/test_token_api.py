"""QELO.Access.Token: users make, list and revoke access tokens of their own."""

import json
import time

import pytest
from conftest import run_entry

API = "QELO.Access.Token"
TEST = "QELO.Test.Identity"


def create(client, session, scopes=({"api": "*"},), name="of a test", **terms):
    return client.call(API, "create", _sid=session["sid"], name=json.dumps(name),
                       scopes=json.dumps(scopes), **terms)


@pytest.fixture(autouse=True)
def no_tokens_left(client, alice):
    yield
    for token in client.call(API, "list", _sid=alice["sid"]).data["tokens"]:
        client.call(API, "revoke", _sid=alice["sid"], id=token["id"])


def test_Token_IsShownOnceAndStandsForItsUser(client, alice):
    made = create(client, alice).data
    assert len(made["token"]) == 43
    answer = client.call(TEST, "plain", tid=made["token"])
    assert answer.data["user"] == "alice"
    header = client.call(TEST, "plain", headers={"X-Qelo-Access-Token": made["token"]})
    assert header.data["user"] == "alice"
    assert "tid" not in header.data["parameters"]
    listed = client.call(API, "list", _sid=alice["sid"])
    assert made["token"] not in listed.body.decode()
    [token] = [each for each in listed.data["tokens"] if each["id"] == made["id"]]
    assert abs(token.pop("used") - time.time()) < 60
    assert token == {key: made[key] for key in token}
    assert set(made) - set(token) == {"token", "used"}
    assert (token["name"], token["readOnly"], token["address"]) == ("of a test", False, "")
    assert token["scopes"] == [{"api": "*", "method": "*"}]
    assert token["expires"] == token["created"] + 90 * 86400


def test_Token_IsForItsScopes(client, alice):
    token = create(client, alice, [{"api": "QELO.Test.*", "method": "plain"}, {"api": "QELO.Catalog.API"}])
    tid = token.data["token"]
    assert client.call(TEST, "plain", tid=tid).code == 0
    assert client.call("QELO.Catalog.API", "list", tid=tid).code == 0
    assert client.call(TEST, "patient", tid=tid).code == 119
    assert client.call("QELO.Work.Task", "list", tid=tid).code == 119


def test_TokenForReadingOnly_ChangesNothing(client, alice):
    tid = create(client, alice, readOnly="true").data["token"]
    for api, method in (("QELO.Catalog.API", "list"), (API, "list"), ("QELO.Access.Session", "current"),
                        ("QELO.Work.Task", "list")):
        assert client.call(api, method, tid=tid).code == 0, (api, method)
    assert client.call(TEST, "plain", tid=tid).code == 119  # its description does not say
    assert client.call(API, "create", tid=tid, name="x", scopes='[{"api":"*"}]').code == 119
    entries = json.dumps([{"api": "QELO.Catalog.API", "version": 1, "method": "list"},
                          {"api": TEST, "version": 1, "method": "plain"}])
    answer = client.call("QELO.Entry.Request", "request", tid=tid, compound=entries)
    assert [entry["success"] for entry in answer.data["result"]] == [True, False]


def test_Token_MayBeForAnAddress(client, alice):
    tid = create(client, alice, address="127.0.0.1/32").data["token"]
    assert client.call(TEST, "plain", tid=tid).code == 0
    query = f"api={TEST}&version=1&method=plain&tid={tid}"
    for address, code in (("127.0.0.1", None), ("127.0.0.2", 119), ("::1", 119)):
        answer = json.loads(run_entry(query, REMOTE_ADDR=address).split(b"\r\n\r\n", 1)[1])
        assert answer.get("error", {}).get("code") == code, address


def test_Token_MakesAndRevokesNoTokens(client, alice):
    made = create(client, alice).data
    assert client.call(API, "create", tid=made["token"], name="x", scopes='[{"api":"*"}]').code == 403
    assert client.call(API, "revoke", tid=made["token"], id=made["id"]).code == 403
    assert len(client.call(API, "list", tid=made["token"]).data["tokens"]) == 1


def test_Revoked_IsRefused(client, alice, admin):
    made = create(client, alice).data
    assert client.call(API, "revoke", _sid=admin["sid"], id=made["id"]).code == 404  # not admin's
    assert client.call(TEST, "plain", tid=made["token"]).code == 0
    assert client.call(API, "revoke", _sid=alice["sid"], id=made["id"]).code == 0
    assert client.call(TEST, "plain", tid=made["token"]).code == 119
    assert client.call(API, "revoke", _sid=alice["sid"], id=made["id"]).code == 404
    for wrong in ("", "x", "-1x", "[]"):
        assert client.call(API, "revoke", _sid=alice["sid"], id=wrong).code == 101
    assert client.call(API, "revoke", _sid=alice["sid"], id=-1).code == 404


def test_TermsThatAreWrong_MakeNone(client, alice):
    for terms in ({"name": ""}, {"name": "n" * 65}, {"scopes": []}, {"scopes": [{"api": "a b"}]},
                  {"scopes": [{"api": "*"}] * 33}, {"days": 0}, {"days": 3651}, {"readOnly": "maybe"},
                  {"address": "here"}):
        assert create(client, alice, **terms).code == 400, terms
    assert client.call(API, "create", _sid=alice["sid"]).code == 400
    assert client.call(API, "list", _sid=alice["sid"]).data["tokens"] == []


def test_CallerWhoIsNotLoggedIn_IsRefused(client):
    for method in ("create", "list", "revoke"):
        assert client.call(API, method, id=1).code == 105


def test_ForeignTokens_AreRefused(client, alice):
    token = create(client, alice).data["token"]
    for wrong in (token[:-1], token + "A", "A" + token[1:], token[:-1] + ("A" if token[-1] != "A" else "B"),
                  token.swapcase(), "", "x" * 43, "../" + token):
        assert client.call(TEST, "plain", tid=wrong).code in (105, 119), wrong
        assert client.call(TEST, "plain", headers={"X-Qelo-Access-Token": wrong}).code in (105, 119)
