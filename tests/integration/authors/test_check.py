"""webapi check finds what is wrong with a description, and where."""

import json
import os
import random
import shutil

import pytest

from author_program import webapi
from conftest import BUILD, PLUGINS, needs_root

GOOD = """{
  "QELO.Test.Good": {
    "lib": "/nonexistent.so",
    "minVersion": 1,
    "maxVersion": 1,
    "authLevel": 1,
    "allowUser": ["admin.local"],
    "methods": {
      "1": ["echo", {"get": {"grantByUser": true}}]
    }
  }
}
"""


@pytest.fixture
def check(root, tmp_path):
    """Checks a text as a file; answers the lines without the file's name, and the status."""

    def run(text, *options, name="QELO.Test.Good.lib", library=False):
        file = tmp_path / name
        file.write_bytes(text if isinstance(text, bytes) else text.encode())
        result = webapi("check", *([] if library else ["--no-library"]), *options, file)
        assert result.stderr == ""
        lines = result.stdout.splitlines()
        assert all(line.startswith(str(file)) for line in lines), lines
        return [line.removeprefix(str(file)).lstrip(":") for line in lines], result.returncode

    return run


def test_Check_OfBundledDescriptions_FindsNothing(root):
    """With their libraries, whose tables are read."""
    files = sorted(path for path in (BUILD / "descriptions").iterdir() if path.is_file())
    assert len(files) > 5
    result = webapi("check", *files)
    assert (result.returncode, result.stdout, result.stderr) == (0, "", "")


def test_Check_OfGoodText_FindsNothing(check):
    assert check(GOOD) == ([], 0)
    assert check("\ufeff// with a comment\n" + GOOD.replace('"authLevel": 1,', "/* none */")) == ([], 0)


@pytest.mark.parametrize("good,bad,finding", [
    ("grantByUser", "grantByUsr", '9:30: error: there is no "grantByUsr" in a method; did you mean "grantByUser"?'),
    ("grantByUser", "GRANTBYUSER", '9:30: error: there is no "GRANTBYUSER" in a method; did you mean "grantByUser"?'),
    ("grantByUser", "colour", '9:30: error: there is no "colour" in a method'),
    ("authLevel", "authlevle", '6:5: error: there is no "authlevle" in an API; did you mean "authLevel"?'),
    ('"authLevel": 1', '"authLevel": 3', "6:18: error: it must be an integer from 0 to 2"),
    ('"authLevel": 1', '"authLevel": "0"', '6:18: error: "authLevel" is an integer, not a text'),
    ('"authLevel": 1', '"authLevel": 4000000000', '6:18: error: "authLevel" is an integer, not an integer beyond 32 bits'),
    ('"authLevel": 1', '"priority": -11', "6:17: error: it must be an integer from -10 to 10"),
    ('"authLevel": 1', '"runAs": "nobody-here"', '6:14: error: there is no account "nobody-here" here, and calls answer 117'),
    ('"authLevel": 1', '"runAs": ""', "6:14: error: the account has no name, and calls answer 117"),
    ('"authLevel": 1', '"appPriv": 5', '6:16: error: "appPriv" is a text or null, not an integer'),
    ("admin.local", "admin.locl", '7:19: error: there is no user class "admin.locl"; did you mean "admin.local"?'),
    ('["admin.local"]', '[5]', "7:19: error: a user class is a text, not an integer"),
    ('["admin.local"]', '"admin.local"', '7:18: error: "allowUser" is a list, not a text'),
    ('"lib": "/nonexistent.so",', "", '2:3: error: "lib" is missing, and calls answer 102'),
    ('"maxVersion": 1', '"maxVersion": 2', '8:16: error: version 2 has no methods'),
    ('"1": [', '"01": [', '9:7: error: a version is a number from 1 on, not "01"'),
    ('["echo", {"get": {"grantByUser": true}}]', "[]", "9:12: error: the version has no methods"),
    ('["echo", {"get": {"grantByUser": true}}]', '"echo"', "9:12: error: a version's methods are a list, not a text"),
    ('"echo", {"get"', '"get", {"get"', '9:20: error: the method "get" is listed already, and that one counts'),
    ('{"get": {"grantByUser": true}}', '{"get": {}, "put": {}}',
     "9:21: error: a method is its name, or an object of one member: the name with the method's attributes"),
    ('{"grantByUser": true}', "true", "9:29: error: a method's attributes are an object, not true or false"),
    (": true", ': "true"', '9:45: error: "grantByUser" is true or false, not a text'),
    ('"authLevel": 1', '"lib": "other.so"', '6:5: error: "lib" stands here already, and the last one counts'),
    ('"QELO.Test.Good"', '"QELO.Other.Good"',
     "2:3: error: calls of it do not look here, but for QELO.Other.lib, QELO.Other.Good.lib"),
])
def test_Check_FindsWithPlace(check, good, bad, finding):
    assert good in GOOD
    lines, status = check(GOOD.replace(good, bad, 1))
    assert (finding in lines, status) == (True, 1), lines


@pytest.mark.parametrize("good,bad,finding", [
    ("true}", 'true, "grantByDefault": true}',
     '9:45: warning: "grantByUser" does nothing beside "grantByDefault": the method runs as root'),
    ("grantByUser", "deferUpload", '9:45: warning: "deferUpload" does nothing without "allowUpload"'),
    ('["admin.local"]', "[]", "7:18: warning: an empty list lets nobody call"),
    ('"authLevel": 1', '"authLevel": 0',
     '9:45: warning: with "authLevel" 0 nobody is logged in, and the method answers 117'),
])
def test_Check_WarnsOfWhatIsOfNoUse(check, good, bad, finding):
    assert check(GOOD.replace(good, bad, 1)) == ([finding], 0)


@pytest.mark.parametrize("attributes,finding", [
    ('"params": {"typ": "object"}', '9:41: error: no schema has "typ"; did you mean "type"?'),
    ('"params": {"type": "array"}', '9:49: error: parameters are an object: "type" is "object"'),
    ('"params": {"properties": {"a": {"minimum": "1"}}}', '9:73: error: "minimum" is a number'),
    ('"params": [1]', '9:40: error: a schema is an object, not a list'),
    ('"returns": {"items": {"type": "txt"}}', '9:60: error: there is no type "txt"'),
    ('"isolation": "wroker"', '9:43: error: there is no isolation "wroker"; did you mean "worker"?'),
    ('"summary": 5', '9:41: error: "summary" is a text, not an integer'),
    ('"errors": {"399": "x"}', '9:48: error: "/errors/399" codes of an API are integers from 400 on'),
    ('"params": {"$ref": "#/definitions/x"}', None),
    ('"params": {"properties": {"a": {"pattern": "("}}}', None),
])
def test_Check_OfWhatIsToldOfParameters_FindsWithPlace(check, attributes, finding):
    lines, status = check(GOOD.replace('"grantByUser": true', attributes))
    assert status == 1
    assert finding in lines if finding else lines, lines


def test_Check_OfGoodSchemas_FindsNothing(check):
    told = """"summary": "S", "description": "D", "errors": {"400": "none"}, "example": {"n": 5},
        "params": {"type": "object", "properties": {"n": {"type": "integer", "minimum": 1}}},
        "returns": {"type": "array", "items": {"$ref": "#/definitions/x"}, "definitions": {"x": {}}}"""
    assert check(GOOD.replace('"grantByUser": true', told)) == ([], 0)


def test_Check_MembersOfTheApisOwn_AreGood(check):
    assert check(GOOD.replace('"authLevel": 1', '"shares": "/etc/webapi/shares.json"')) == ([], 0)


def test_Check_AccountsOfAnotherHost_AreLeftOut(check):
    text = GOOD.replace('"authLevel": 1', '"runAs": "nobody-here"')
    assert check(text, "--no-accounts") == ([], 0)
    assert check(text.replace("nobody-here", "system")) == ([], 0)


def test_Check_OfDefaults_KnowsTheirKeys(check):
    assert check('{"authLevel": 1, "methods": {"readOnly": true}}', name="lib.def") == ([], 0)
    lines, status = check('{"runAs": "root", "methods": {"readonly": true}}', name="lib.def")
    assert (lines, status) == ([
        '1:2: error: there is no "runAs" in lib.def',
        '1:31: error: there is no "readonly" in a method; did you mean "readOnly"?',
    ], 1)


def test_Check_OfFileThatAnotherHides_TellsWhich(check, tmp_path):
    (tmp_path / "QELO.Test.Good.lib").write_text(GOOD)
    lines, status = check(GOOD, name="QELO.Test.lib")
    assert (lines, status) == (["2:3: error: calls of it read QELO.Test.Good.lib beside this file"], 1)


@pytest.mark.parametrize("text,finding", [
    (b"", "1:1: error: no JSON from here on"),
    (b"\x7fELF\x00\x01\xff\xfe", "1:1: error: no JSON from here on"),
    (b'{"A.B": ' + b"[" * 100000, "1:264: error: no JSON from here on"),
    (b"[" + b"1," * 60000 + b"1]", " it has more than 50000 values"),
    (b'{"a": "' + b"x" * (1 << 20) + b'"}', " it is larger than 1 MiB, or cannot be read"),
    (b"[]", "1:1: error: it must be an object, not a list"),
    (b"{}", "1:1: error: it describes no API"),
    (b'{"A.B": {"\x1b[31m": 1}}', '1:11: error: no JSON from here on'),
], ids=range(8))
def test_Check_OfHostileFile_SaysWhatItIs(check, text, finding):
    lines, status = check(text)
    assert (lines[0], status) == (finding, 1)


def test_Check_OfManyErrors_EndsAfterAHundred(check):
    methods = ", ".join(f'{{"m{i}": {{"no": 1}}}}' for i in range(900))
    lines, status = check(GOOD.replace('"echo"', methods))
    assert (len(lines), status) == (101, 1)
    assert "that is enough" in lines[-1]


def test_Check_OfTooMuch_SaysSo(check):
    methods = ", ".join(f'"m{i}"' for i in range(1001))
    assert check(GOOD.replace('"echo"', methods)) == (["2:3: error: version 1 has more than 1000 methods"], 1)
    versions = ", ".join(f'"{i}": ["x"]' for i in range(2, 1002))
    assert check(GOOD.replace('"1": [', versions + ', "1": [')) == (["2:3: error: it has more than 1000 versions"], 1)
    lines, _ = check(GOOD.replace('"maxVersion": 1', '"maxVersion": 2000000000'))
    assert lines == ["5:19: error: that makes more than 1000 versions"]


def test_Check_OfControlCharacters_PrintsNone(check):
    lines, _ = check(GOOD.replace("grantByUser", "\\u001b[31m\\u009b"))
    assert lines and not any(c < " " or "\x7f" <= c < "\xa0" for line in lines for c in line)


def test_Check_OfBrokenTexts_AlwaysEnds(check):
    """Cut, doubled and changed anywhere."""
    source = random.Random(5)
    for _ in range(150):
        text = bytearray(GOOD.encode())
        for _ in range(source.randint(1, 4)):
            place = source.randrange(len(text))
            text[place:place + source.randint(0, 9)] = source.choice([b"", b"{", b"]", b'"', b"\\", b"/*", b"\x80", b"1"])
        _, status = check(bytes(text))
        assert status in (0, 1)


@pytest.mark.parametrize("path", ["/nonexistent", "/", "/dev/zero"])
def test_Check_OfWhatIsNoFile_SaysSo(root, path):
    result = webapi("check", path)
    assert (result.returncode, len(result.stdout.splitlines())) == (1, 1)


@pytest.mark.parametrize("arguments,reason", [
    ([], "a file is missing"),
    (["--libary", "x", "y"], "--libary is no option"),
    (["--library"], "--library needs a value"),
    (["--no-library=1", "y"], "--no-library takes no value"),
    (["--timeout", "0", "y"], "--timeout takes a number from 1 to 600"),
    (["--no-library", "--library", "x", "y"], "--library and --no-library exclude each other"),
])
def test_Check_WrongUse_IsStatusTwo(arguments, reason):
    result = webapi("check", *arguments)
    assert (result.returncode, result.stdout) == (2, "")
    assert result.stderr == f"webapi check: {reason}; see webapi check --help\n"


def test_Program_WithoutKnownCommand_SaysSo():
    assert webapi().stderr == "webapi: a command is missing; see webapi --help\n"
    assert webapi("chekc").returncode == 2
    assert "check" in webapi("--help").stdout
    assert "--no-accounts" in webapi("check", "--help").stdout


def described(methods, library="good.so", **members):
    return json.dumps({"QELO.Test.Good": {
        "lib": str(PLUGINS / library), "minVersion": 1, "maxVersion": 1, "methods": {"1": methods}, **members}})


def test_Check_ComparesWithTheLibrarysTable(check):
    lines, _ = check(described([]), library=True)
    has = [line.split('"')[1] for line in lines if "which is not listed" in line]
    assert "echo" in has
    assert check(described(has), library=True) == ([], 0)
    lines, status = check(described([*has[1:], has[0] + "x"]), library=True)
    assert status == 1
    assert [line.split("error: ")[1] for line in lines] == [
        f'the library has "{has[0]}" of version 1, which is not listed, and calls answer 103',
        f'the library\'s table has no "{has[0]}x" of version 1 and API "QELO.Test.Good", and calls answer 121; did you mean "{has[0]}"?',
    ]


@pytest.mark.parametrize("library,reason", [
    ("nonexistent.so", "it cannot be loaded: "),
    ("no_table.so", 'it has no function GetAPITable (extern "C" forgotten?)'),
    ("null_table.so", "GetAPITable gives no table"),
    ("endless_table.so", "its table has no end: an entry without an API's name"),
    ("throwing_constructor.so", "loading it ended the process: Aborted"),
    ("hanging.so", "it was not loaded within 1 second"),
])
def test_Check_OfFaultyLibrary_SaysWhy(check, library, reason):
    lines, status = check(described(["run"], library), "--timeout", "1", library=True)
    assert (len(lines), status) == (1, 1)
    assert f"{PLUGINS / library}: {reason}" in lines[0]
    assert lines[0].count(str(PLUGINS / library)) == 1


def test_Check_OfRelativeLibrary_LooksBesideTheFile(check, tmp_path):
    shutil.copy(PLUGINS / "no_table.so", tmp_path / "Own.so")
    lines, _ = check(described(["run"]).replace(str(PLUGINS / "good.so"), "./Own.so"), library=True)
    assert f"{tmp_path}/./Own.so: it has no function" in lines[0]


@needs_root
def test_Check_OfLibraryThatOthersMayWrite_SaysSo(check, tmp_path):
    """And it is read by an account that may not even look into the directory."""
    library = shutil.copy(PLUGINS / "good.so", tmp_path / "Own.so")
    os.chmod(tmp_path, 0o700)
    text = described([]).replace(str(PLUGINS / "good.so"), "./Own.so")
    assert not any("may write" in line for line in check(text, library=True)[0])
    os.chmod(library, 0o666)
    lines, _ = check(text, library=True)
    assert any("others than root may write" in line for line in lines)
    assert any("which is not listed" in line for line in lines)
