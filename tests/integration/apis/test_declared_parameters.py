"""Declared parameters on all roads of a call: alone, in a compound request, from code, by REST."""

import json
from urllib.parse import quote

import pytest

from conftest import run_entry

from exec_program import call as exec_call, data_of

API = "QELO.Test.Good"
SCHEMA = {
    "type": "object",
    "required": ["name"],
    "additionalProperties": False,
    "properties": {
        "name": {"type": "string", "maxLength": 20},
        "size": {"type": "integer", "minimum": 1, "default": 7},
    },
}


@pytest.fixture
def good(describe):
    methods = {"1": [{"echo": {"params": SCHEMA, "summary": "Answers what it gets"}}]}
    describe(API, "good.so", maxVersion=1, methods=methods)


def wrong(error):
    assert error["code"] == 101, error
    return {(fault["path"], fault["rule"]) for fault in error["errors"]}


def test_AFormCall_GetsTextsAsTheyWereSent(client, good):
    for text in ("12345", "true", "[1]", "null", '"5"', "x"):
        assert client.call(API, "echo", name=text).data["name"] == text
    assert client.call(API, "echo", name="x").data["size"] == 7


def test_AFormCall_IsToldEveryWrongField(client, good):
    answer = client.call(API, "echo", size=0, other=1)
    assert wrong(answer.json["error"]) == {
        ("/name", "required"), ("/size", "minimum"), ("/other", "additionalProperties")}


def test_HostileValues_AreAnsweredSoon(client, good):
    for name in ("x" * 5_000_000, "[" * 100_000, "9" * 1_000_000):
        assert wrong(client.call(API, "echo", name=name).json["error"]) == {("/name", "maxLength")}
    many = {f"p{i}": i for i in range(9_000)}
    assert len(client.call(API, "echo", name="x", **many).json["error"]["errors"]) == 50


def test_EntriesOfACompoundRequest_AreChecked(client, alice, good):
    entries = [{"api": API, "version": 1, "method": "echo", "name": "5"},
               {"api": API, "version": 1, "method": "echo", "name": 5}]
    for mode in ("sequential", "parallel"):
        results = client.call("QELO.Entry.Request", "request", _sid=alice["sid"], mode=mode,
                              compound=json.dumps(entries), name="outer").data["result"]
        assert results[0]["data"]["name"] == "5"
        assert wrong(results[1]["error"]) == {("/name", "type")}


def test_ACallFromTheCommandLine_GetsTextsAsTheyWereGiven(root, good):
    for text in ("12345", "true", "[1]"):
        assert data_of(exec_call(API, "echo", "--param", f"name={text}"))["name"] == text
    refused = exec_call(API, "echo", "--param", "size=0")
    assert refused.returncode != 0
    assert wrong(json.loads(refused.stdout)["error"]) == {("/name", "required"), ("/size", "minimum")}


def test_ACompoundCallFromTheCommandLine_LeavesItsEntriesAsTheyAre(root, good):
    entries = [{"api": API, "version": 1, "method": "echo", "name": name} for name in ("5", 5)]
    answer = exec_call("QELO.Entry.Request", "request", "--param", f"compound={json.dumps(entries)}", "--param",
                       "name=5")
    results = data_of(answer)["result"]
    assert results[0]["data"]["name"] == "5"
    assert wrong(results[1]["error"]) == {("/name", "type")}


class Rest:
    def __init__(self, client):
        self.client = client

    def post(self, path, body=None, query="", **headers):
        headers = {name.replace("_", "-"): value for name, value in headers.items()}
        if body is not None:
            headers.setdefault("Content-Type", "application/json")
            body = body if isinstance(body, (str, bytes)) else json.dumps(body)
        return self.client.request("POST", f"/webapi/rest/{path}{query}", body, headers)


@pytest.fixture
def rest(client):
    return Rest(client)


def test_Rest_TakesJsonAndLeavesItAsItIs(rest, good):
    answer = rest.post(f"{API}/v1/echo", {"name": "12345", "size": 3})
    assert answer.status == 200
    assert answer.data["name"] == "12345"
    assert answer.data["size"] == 3
    assert answer.headers["Content-Type"] == 'application/json; charset="UTF-8"'


def test_Rest_ReadsTextsOfTheQueryAloneAsTheyWereSent(rest, good):
    path = f"{API}/v1/echo"
    for text in ("12345", "true", "[1]", '"5"'):
        assert rest.post(path, query=f"?name={quote(text)}").data["name"] == text
        assert rest.post(path, {"size": 3}, query=f"?name={quote(text)}").data["name"] == text
        assert rest.post(path, {"name": text}, query="?name=5").data["name"] == text
    for body, query in (({"name": 5}, "?name=5"), ({"name": True}, "?name=true")):
        assert wrong(rest.post(path, body, query=query).json["error"]) == {("/name", "type")}


def test_Rest_TellsErrorsByStatus(rest, good, alice, describe):
    answer = rest.post(f"{API}/v1/echo", {"name": 12345})
    assert answer.status == 400
    assert wrong(answer.json["error"]) == {("/name", "type")}
    assert rest.post(f"{API}/v1/nothing").status == 404
    assert rest.post(f"{API}/v9/echo").status == 404
    assert rest.post("QELO.No.Such/v1/echo").status == 404
    for path in ("", "x", f"{API}/1/echo", f"{API}/v01/echo", f"{API}/v1/", f"{API}/v1/echo/more"):
        answer = rest.post(path)
        assert (answer.status, answer.code) == (404, 102), path
    assert rest.post("QELO.Catalog.API/v1/list").status == 401
    assert rest.post("QELO.Host.Info/v1/get", query=f"?_sid={alice['sid']}").status == 403
    describe(API, "good.so", methods={"1": ["fail", "silent"]})
    assert rest.post(f"{API}/v1/fail").status == 422
    assert rest.post(f"{API}/v1/silent").status == 500


def test_Rest_RefusesOtherMethodsAndBodies(rest, client, good):
    path = f"{API}/v1/echo"
    answer = client.request("GET", f"/webapi/rest/{path}?name=x")
    assert (answer.status, answer.code, answer.headers["Allow"]) == (405, 101, "POST")
    for body in ("", "[1]", "{", '{"name": "x"} more', "name=x", b"\xff", "[" * 300,
                 '{"name": "x"}\0', '{"name": "x"}\0, "size": 3}'):
        answer = rest.post(path, body or " ")
        assert (answer.status, answer.code) == (400, 101), body
    assert rest.post(path, {"a": list(range(60_000))}).status == 400
    assert rest.post(path, "name=x", Content_Type="application/x-www-form-urlencoded").status == 415
    assert rest.post(path, "x", Content_Type="multipart/form-data; boundary=x").status == 415
    assert rest.post(path, {"name": "x"}, Content_Type="APPLICATION/JSON; charset=utf-8").status == 200


def test_Rest_RefusesABodyThatIsCutOff(good):
    answer = run_entry(program="rest.cgi", body=b'{"name": "x"}', length=14, CONTENT_TYPE="application/json",
                       PATH_INFO=f"/{API}/v1/echo")
    assert b"\r\nStatus: 400\r\n" in answer


def test_Rest_TakesCredentialsAsEver(rest, alice):
    path = "QELO.Access.Session/v1/current"
    assert rest.post(path, query=f"?_sid={alice['sid']}").data["user"] == "alice"
    cookie = {"Cookie": f"id={alice['sid']}"}
    assert rest.post(path, **cookie).code == 105
    assert rest.post(path, X_Qelo_Token=alice["token"], **cookie).data["user"] == "alice"
    assert rest.post(path, {"_sid": alice["sid"]}).status == 401, "not in the body"


def test_Rest_BodyNamesNoOtherCall(rest, good):
    answer = rest.post(f"{API}/v1/echo", {"name": "x", "api": "QELO.Host.Info", "method": "get"})
    assert answer.data["api"] == API
