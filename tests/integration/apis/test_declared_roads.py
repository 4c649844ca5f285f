"""Declared parameters on every road: texts arrive as they were sent, and a wrong call runs nothing."""

import json
from urllib.parse import quote, urlencode

import pytest

from conftest import answer_of, run_entry
from daemon import describe_there, path  # noqa: F401  (fixtures)
from exec_program import call as exec_call
from upload import BOUNDARY, Form

API = "QELO.Test.Good"
TEXTS = ("12345", "007", "-0", "1.0", "1e3", "12345678901234567890", "true", "null", "[1]", '{"a": 1}', '"5"', "",
         " 5", "5\n", "ä😀", "%41+&=", "\\u0041", "[" * 300)
LETTERS = {"type": "object", "required": ["name", "size"], "additionalProperties": False,
           "properties": {"name": {"type": "string"}, "size": {"type": "integer", "maximum": 9},
                          "more": {"type": "object", "properties": {"deep": {"default": "d"}}, "default": {}}}}
# What is wrong with these, and what a call answers then.
WRONG = {"size": 10, "other": "x"}
FAULTS = {("/name", "required"), ("/size", "maximum"), ("/other", "additionalProperties")}


def by_query(client, method, parameters, api=API, sid=""):
    query = urlencode({"api": api, "version": 1, "method": method, "_sid": sid, **parameters}, quote_via=quote)
    return client.get(query).json


def by_form(client, method, parameters, api=API, sid=""):
    return client.call(api, method, _sid=sid, **parameters).json


def by_rest(client, method, parameters, api=API, sid=""):
    return client.request("POST", f"/webapi/rest/{api}/v1/{method}?_sid={sid}", json.dumps(parameters),
                          {"Content-Type": "application/json"}).json


def by_rest_query(client, method, parameters, api=API, sid=""):
    query = urlencode({"_sid": sid, **parameters})
    return client.request("POST", f"/webapi/rest/{api}/v1/{method}?{query}").json


def by_compound(client, method, parameters, api=API, sid="", mode="sequential"):
    entries = [{"api": api, "version": 1, "method": method, **parameters}]
    return client.call("QELO.Entry.Request", "request", _sid=sid, mode=mode,
                       compound=json.dumps(entries)).data["result"][0]


def by_parallel(client, method, parameters, api=API, sid=""):
    return by_compound(client, method, parameters, api, sid, "parallel")


def by_exec(client, method, parameters, api=API, sid=""):
    words = [word for name, value in parameters.items() for word in ("--param", f"{name}={value}")]
    return json.loads(exec_call(api, method, *words).stdout)


ROADS = [by_query, by_form, by_rest, by_rest_query, by_compound, by_parallel, by_exec]


@pytest.fixture
def good(describe):
    describe(API, "good.so", maxVersion=1, methods={"1": [{"echo": {"params": LETTERS}}]})


def wrong(answer):
    assert answer["success"] is False and answer["error"]["code"] == 101, answer
    return {(fault["path"], fault["rule"]) for fault in answer["error"]["errors"]}


@pytest.mark.parametrize("road", ROADS)
def test_Texts_ArriveAsTheyWereSent(client, alice, good, road):
    for text in TEXTS:
        answer = road(client, "echo", {"name": text, "size": 3}, sid=alice["sid"])
        assert answer["success"], (text, answer)
        data = answer["data"]
        assert (data["name"], data["size"], data["more"]) == (text, 3, {"deep": "d"})


def test_TextsOfAForm_ArriveAsTheyWereSent(client, describe):
    describe("QELO.Test.Upload", "uploading.so", methods={"1": [{"take": {"allowUpload": True, "params": {
        "type": "object", "properties": {"name": {"type": "string"}, "size": {"type": "integer"}}}}}]})
    for text in TEXTS:
        form = Form().file("f", "x", b"content").field("name", text).field("size", "3")
        answer = client.request(
            "POST", "/webapi/entry.cgi?api=QELO.Test.Upload&version=1&method=take", form.body(),
            {"Content-Type": f"multipart/form-data; boundary={BOUNDARY}"})
        assert (answer.data["params"]["name"], answer.data["params"]["size"]) == (text, 3), text


@pytest.mark.parametrize("road", ROADS)
def test_AWrongCall_RunsNothing_AndNamesEachField(client, alice, describe, road):
    """The method would kill its process."""
    describe("QELO.Test.Losing", "losing.so", methods={"1": [{"killed": {"params": LETTERS}}]})
    assert wrong(road(client, "killed", WRONG, "QELO.Test.Losing", alice["sid"])) == FAULTS


def test_AWrongCall_IsNotHandedToTheDaemon(describe_there):  # noqa: F811
    """There is none, so that a call that is right fails."""
    describe_there(API, "", methods={"1": [{"echo": {"params": LETTERS}}]})
    query = f"api={API}&version=1&method=echo&"
    assert wrong(answer_of(run_entry(query + urlencode(WRONG)))) == FAULTS
    assert answer_of(run_entry(query + "name=5&size=3"))["error"]["code"] not in (0, 101)


def test_AWrongCall_StartsNoTask(client, alice, describe):
    describe("QELO.Test.Background", "background.so", authLevel=1, methods={"1": [{"start": {"params": LETTERS}}]},
             allowUser=["admin.local", "normal.local"])
    tasks = lambda: client.call("QELO.Work.Task", "list", _sid=alice["sid"]).data
    before = tasks()
    assert wrong(client.call("QELO.Test.Background", "start", _sid=alice["sid"], **WRONG).json) == FAULTS
    assert tasks() == before
