"""QELO.Catalog.API: what a caller may call."""

import json

API = "QELO.Catalog.API"


def listed(client, session, **parameters):
    data = client.call(API, "list", _sid=session["sid"], **parameters).data
    return {api["api"]: api for api in data["apis"]}


def test_List_WithoutLogin_IsRefused(client):
    assert client.call(API, "list").refusal == (105, "noprivilege")
    assert client.call(API, "describe", name=API).refusal == (105, "noprivilege")


def test_List_ShowsEachCallerItsOwnApis(client, alice, admin):
    common = {"QELO.Access.Session", "QELO.Catalog.API", "QELO.Entry.Request"}
    assert common <= set(listed(client, alice))
    assert "QELO.Host.Info" not in listed(client, alice)
    assert common | {"QELO.Host.Info"} <= set(listed(client, admin))


def test_List_LeavesOutMethodsThatTheCallerMayNotCall(client, alice, admin):
    assert "adminOnly" not in listed(client, alice)["QELO.Test.Identity"]["methods"]["1"]
    assert "adminOnly" in listed(client, admin)["QELO.Test.Identity"]["methods"]["1"]


def test_List_TellsAttributes(client, admin):
    methods = listed(client, admin)["QELO.Test.Identity"]["methods"]["1"]
    assert methods["patient"] == {"allowTimeout": True}
    assert methods["adminOnly"] == {"allowUser": ["admin.local"]}
    assert methods["plain"] == {}
    assert methods["asAlice"] == {}


def test_List_TellsAllowUserOnlyWhereItIsAsked(client, alice, describe):
    users = ["admin.local", "normal.local"]
    methods = {"1": ["plain", {"own": {"allowUser": users, "allowTimeout": True}}]}
    for level in (0, 1, 2):
        describe("QELO.Test.Asked", "identity.so",
                 authLevel=level, allowUser=users, methods=methods)
        api = listed(client, alice)["QELO.Test.Asked"]
        assert api["authLevel"] == level
        asked = {"allowUser": users} if level else {}
        assert api["methods"]["1"] == {"plain": {}, "own": {"allowTimeout": True, **asked}}
        assert api.get("allowUser") == asked.get("allowUser")


def test_List_WithPrefix_ShowsOnlyThose(client, alice):
    assert set(listed(client, alice, prefix="QELO.Access.S")) == {"QELO.Access.Session"}
    assert set(listed(client, alice, prefix="NoSuch")) == set()


def test_List_NeverTellsPaths(client, admin):
    text = json.dumps(listed(client, admin))
    assert ".so" not in text
    assert "/" not in text
    assert '"lib"' not in text and "runAs" not in text


def test_List_LeavesOutVersionsOutOfRange(client, alice, describe):
    describe(
        "QELO.Test.Range",
        "identity.so",
        minVersion=2,
        maxVersion=3,
        methods={"1": ["a"], "2": ["b"], "3": "c", "03": ["d"], "x": ["e"], "4": ["f"]},
    )
    assert set(listed(client, alice)["QELO.Test.Range"]["methods"]) == {"2"}


def test_List_LeavesOutWhatACallWouldNotFind(client, alice, describe):
    describe("QELO.Test.Elsewhere", text=json.dumps({"QELO.Hidden.Api": {
        "lib": "", "minVersion": 1, "maxVersion": 1, "authLevel": 0, "methods": {"1": ["run"]}}}))
    assert "QELO.Hidden.Api" not in listed(client, alice)
    assert client.call("QELO.Hidden.Api", "run").code == 102


def test_List_BesideBrokenDescriptions_ShowsTheOthers(client, alice, describe):
    describe("QELO.Test.NoJson", text="no json")
    describe("QELO.Test.NoObject", text="[1, 2]")
    describe("QELO.Test.Wrong", text='{"QELO.Test.Wrong": {"lib": 5}, "QELO.Test.Null": null}')
    apis = listed(client, alice)
    assert "QELO.Access.Session" in apis
    assert not {"QELO.Test.NoJson", "QELO.Test.NoObject", "QELO.Test.Wrong"} & set(apis)


def test_Describe_TellsOneApi(client, alice):
    api = client.call(API, "describe", name=API, _sid=alice["sid"]).data
    assert api["api"] == API
    assert (api["minVersion"], api["maxVersion"], api["authLevel"]) == (1, 1, 1)
    assert set(api["methods"]["1"]) == {"list", "describe", "openapi"}
    told = api["methods"]["1"]["describe"]
    assert told["params"]["required"] == ["name"]
    assert told["summary"] and told["example"] == {"name": API}
    for method in api["methods"]["1"].values():
        for key in ("summary", "description", "params", "returns", "errors", "example"):
            method.pop(key, None)
    assert api == listed(client, alice)[API], "which has neither texts nor schemas"


def test_Describe_OfAnUnknownOrForbiddenApi_IsNoSuchApi(client, alice, admin):
    for name in ("QELO.No.Such", "QELO.Host.Info", "", "../lib", "/etc/passwd"):
        answer = client.call(API, "describe", name=name, _sid=alice["sid"])
        assert answer.code == 102, name
    assert client.call(API, "describe", name="QELO.Host.Info", _sid=admin["sid"]).code == 0


def test_Describe_WithoutName_IsBadInput(client, alice):
    assert client.call(API, "describe", _sid=alice["sid"]).code == 101
    assert client.call(API, "describe", name="[]", _sid=alice["sid"]).code == 102, "a text"
    answer = client.call(API, "describe", _sid=alice["sid"])
    assert [fault["path"] for fault in answer.json["error"]["errors"]] == ["/name"]
