"""webapi diff tells what breaks callers of an old description, and ends with status 1 then."""

import copy
import json
import re

import pytest

from author_program import webapi
from conftest import BUILD

ALL = ["admin.local", "normal.local"]
PARAMS = {
    "type": "object",
    "required": ["path"],
    "properties": {
        "path": {"type": "string", "minLength": 1, "maxLength": 100},
        "size": {"type": ["integer", "null"], "minimum": 0, "maximum": 9, "default": 5},
        "sort": {"enum": ["name", "time"]},
        "tags": {"type": "array", "items": {"type": "string"}, "maxItems": 5},
        "more": {"type": "object", "properties": {"deep": {"type": "boolean"}}},
    },
}
RETURNS = {
    "type": "object",
    "required": ["id"],
    "properties": {"id": {"type": "integer"}, "name": {"type": "string"}, "kind": {"enum": ["a", "b"]},
                   "list": {"type": "array", "items": {"type": "object", "properties": {"x": {}}}}},
}


def api():
    return {
        "lib": "/x.so", "minVersion": 1, "maxVersion": 2, "authLevel": 1, "allowUser": ALL,
        "methods": {
            "1": ["list", {"get": {"params": copy.deepcopy(PARAMS), "returns": copy.deepcopy(RETURNS)}}],
            "2": ["list", {"put": {"allowUpload": True, "readOnly": True, "allowSharing": True,
                                   "allowUser": ALL, "allowTimeout": True}}],
        },
    }


@pytest.fixture
def diff(tmp_path):
    """Compares two descriptions of APIs by name; answers what is told, and the status."""

    def run(old, new, *options):
        for name, content in (("old.lib", old), ("new.lib", new)):
            text = content if isinstance(content, str) else json.dumps(content, indent=1)
            (tmp_path / name).write_text(text)
        result = webapi("diff", *options, tmp_path / "old.lib", tmp_path / "new.lib")
        assert result.stderr == ""
        lines = [re.fullmatch(r".*/(old|new)\.lib:\d+:\d+: (.*)", line) for line in result.stdout.splitlines()]
        assert all(lines), result.stdout
        return [f"{line[1]}: {line[2]}" for line in lines], result.returncode

    return run


def changed(change):
    new = api()
    change(new)
    return {"A.B": new}


def test_Diff_OfBundledDescriptionsWithThemselves_TellsNothing():
    files = sorted((BUILD / "descriptions").glob("*.lib"))
    assert len(files) > 5
    for file in files:
        result = webapi("diff", file, file)
        assert (result.returncode, result.stdout, result.stderr) == (0, "", "")


def param(new, name):
    return new["methods"]["1"][1]["get"]["params"]["properties"][name]


def params(new):
    return new["methods"]["1"][1]["get"]["params"]


def returns(new):
    return new["methods"]["1"][1]["get"]["returns"]


def put(new):
    return new["methods"]["2"][1]["put"]


BREAKS = [
    (lambda a: a.update(maxVersion=1), "old: breaks: version 2 is gone"),
    (lambda a: a["methods"].pop("2"), "old: breaks: version 2 is gone"),
    (lambda a: a["methods"].update({"2": ["list"]}), 'old: breaks: method "put" of version 2 is gone'),
    (lambda a: a.update(appPriv="photos"), "new: breaks: callers need another privilege than before"),
    (lambda a: a.update(allowUser=["admin.local"]),
     'new: breaks: "list" of version 1: users of the class "normal.local" may not call it'),
    (lambda a: a.pop("allowUser"),
     'new: breaks: "list" of version 1: users of the class "normal.local" may not call it'),
    (lambda a: put(a).update(allowUser=["normal.local"]),
     'new: breaks: "put" of version 2: users of the class "admin.local" may not call it'),
    (lambda a: put(a).pop("allowUpload"), 'new: breaks: "put" of version 2: it has no "allowUpload" any more'),
    (lambda a: put(a).update(readOnly=False), 'new: breaks: "put" of version 2: it has no "readOnly" any more'),
    (lambda a: put(a).update(allowDownload=True),
     'new: breaks: "put" of version 2: "allowDownload" is another, and so is the form of the answer'),
    (lambda a: put(a).update(params={}), 'new: breaks: "put" of version 2: parameters are checked now, and were not'),
    (lambda a: params(a)["required"].append("size"), "new: breaks: parameter /size is required now"),
    (lambda a: params(a)["properties"].pop("size"), "old: breaks: parameter /size is gone"),
    (lambda a: params(a).update(additionalProperties=False),
     "new: breaks: parameters: others than the named ones are not taken as before"),
    (lambda a: param(a, "path").update(type="integer"),
     "new: breaks: parameter /path: no value of the type string is taken any more"),
    (lambda a: param(a, "size").update(type="integer"),
     "new: breaks: parameter /size: no value of the type null is taken any more"),
    (lambda a: param(a, "size").update(minimum=1), 'new: breaks: parameter /size: "minimum" is 1, and was 0'),
    (lambda a: param(a, "size").update(exclusiveMaximum=8), 'new: breaks: parameter /size: "exclusiveMaximum" is 8 now'),
    (lambda a: param(a, "path").update(maxLength=99), 'new: breaks: parameter /path: "maxLength" is 99, and was 100'),
    (lambda a: param(a, "path").update(pattern="^/"), 'new: breaks: parameter /path: "pattern" is another now'),
    (lambda a: param(a, "sort").update(enum=["name"]), 'new: breaks: parameter /sort: "time" is not taken any more'),
    (lambda a: param(a, "path").update(enum=["x"]), "new: breaks: parameter /path: certain values alone are taken now"),
    (lambda a: param(a, "tags")["items"].update(minLength=2), 'new: breaks: parameter /tags/*: "minLength" is 2 now'),
    (lambda a: param(a, "tags").update(uniqueItems=True),
     "new: breaks: parameter /tags: no value may stand there twice any more"),
    (lambda a: param(a, "more")["properties"].pop("deep"), "old: breaks: parameter /more/deep is gone"),
    (lambda a: params(a)["properties"].update(size=False), "new: breaks: parameter /size: nothing is taken any more"),
    (lambda a: returns(a)["properties"].pop("name"), "old: breaks: result /name is gone"),
    (lambda a: returns(a).update(required=[]), "new: breaks: results: id may be missing now"),
    (lambda a: returns(a)["properties"]["id"].update(type="string"),
     "new: breaks: result /id: it may be of the type string now"),
    (lambda a: returns(a)["properties"]["kind"]["enum"].append("c"),
     "new: breaks: result /kind: it may have values that it did not have"),
    (lambda a: returns(a)["properties"]["list"]["items"]["properties"].pop("x"),
     "old: breaks: result /list/*/x is gone"),
]


@pytest.mark.parametrize("change,told", BREAKS, ids=range(len(BREAKS)))
def test_Diff_TellsWhatBreaks(diff, change, told):
    lines, status = diff({"A.B": api()}, changed(change), "--breaks")
    assert (told in lines, status) == (True, 1), lines


LOOSER = [
    lambda a: a.update(maxVersion=3),
    lambda a: a["methods"]["1"].append("more"),
    lambda a: a.update(authLevel=0),
    lambda a: a.update(authLevel=2),
    lambda a: a.update(appPriv=""),
    lambda a: a.update(allowUser=[*ALL, "admin.ldap"]),
    lambda a: put(a).update(skipCheckIP=True),
    lambda a: params(a).update(required=[]),
    lambda a: params(a)["properties"].update(new={"type": "string"}),
    lambda a: param(a, "path").update(type=["string", "integer"], minLength=0, maxLength=200),
    lambda a: param(a, "path").pop("minLength"),
    lambda a: param(a, "size").update(type=["number", "null"]),
    lambda a: param(a, "sort")["enum"].append("size"),
    lambda a: params(a)["properties"].update(size=True),
    lambda a: returns(a)["properties"].update(more={"type": "string"}),
    lambda a: returns(a)["required"].append("name"),
    lambda a: returns(a)["properties"]["kind"].update(enum=["a"]),
]


@pytest.mark.parametrize("change", LOOSER, ids=range(len(LOOSER)))
def test_Diff_OfWhatIsLooser_BreaksNothing(diff, change):
    assert diff({"A.B": api()}, changed(change), "--breaks") == ([], 0)


def test_Diff_TellsWhatIsNew_AndWhatToKnow(diff):
    def change(new):
        new["methods"]["1"] = [{"list": {"runAs": "root"}}, *new["methods"]["1"][1:], "more"]
        param(new, "size")["default"] = 6
        params(new)["properties"]["extra"] = {}

    new = changed(change)
    new["A.C"] = api()
    assert diff({"A.B": api()}, new) == ([
        'new: changes: "list" of version 1: it runs as "root", and did as "system"',
        "new: changes: parameter /size: the default was 5",
        "new: new: parameter /extra",
        'new: new: method "more" of version 1',
        'new: new: the API "A.C"',
    ], 0)


def test_Diff_OfAnApiThatIsGone_Breaks(diff):
    assert diff({"A.B": api(), "A.C": api()}, {"A.B": api()}) == (['old: breaks: the API "A.C" is gone'], 1)


def test_Diff_TellsThePlaces(diff, tmp_path):
    old = '{\n "A.B": {"lib": "", "minVersion": 1, "maxVersion": 1,\n  "methods": {"1": ["a", "b"]}}}'
    new = old.replace('"a", "b"', '"a"')
    (tmp_path / "o.lib").write_text(old)
    (tmp_path / "n.lib").write_text(new)
    result = webapi("diff", "o.lib", "n.lib", cwd=tmp_path)
    assert result.stdout == 'o.lib:3:26: breaks: method "b" of version 1 is gone\n'


@pytest.mark.parametrize("new,reason", [
    ("", "new.lib:1:1: error: no JSON from here on"),
    ("[" * 10000, "new.lib:1:257: error: no JSON from here on"),
    ("[]", "new.lib: it must be an object"),
    ('{"A.B": {}}', 'new.lib:1:9: error: no description of "A.B": "lib" is no string'),
    (json.dumps({"A.B": {**api(), "methods": {"1": ["x"] * 1001}}}),
     'new.lib:1:9: error: no description of "A.B": version 1 has more than 1000 methods'),
    (None, "new.lib: No such file or directory"),
])
def test_Diff_OfWhatIsNoDescription_SaysWhy(tmp_path, new, reason):
    (tmp_path / "old.lib").write_text(json.dumps({"A.B": api()}))
    if new is not None:
        (tmp_path / "new.lib").write_text(new)
    result = webapi("diff", "old.lib", "new.lib", cwd=tmp_path)
    assert (result.returncode, result.stdout, result.stderr) == (2, "", f"webapi diff: {reason}\n")


@pytest.mark.parametrize("arguments", [[], ["one"], ["a", "b", "c"], ["--no", "a", "b"]])
def test_Diff_WrongUse_IsStatusTwo(arguments):
    result = webapi("diff", *arguments)
    assert (result.returncode, "see webapi diff --help" in result.stderr) == (2, True)
