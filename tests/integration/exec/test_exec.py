"""webapi-exec: calls from the command line."""

import json
import subprocess

import pytest

from exec_program import DOWNLOAD, ENTRIES, EXEC, call, data_of, described, on_terminal, run

pytestmark = pytest.mark.usefixtures("described")

# Answers


def test_Success_IsOneLineOfJsonInAPipe():
    process = call(ENTRIES, "echo", "--param", "a=ä")
    assert process.stdout == (
        '{"data":{"a":"ä","api":"QELO.Test.Entries","method":"echo","version":1},'
        '"httpd_restart":false,"success":true}\n'
    )
    assert (process.returncode, process.stderr) == (0, "")


def test_Success_IsIndentedOnATerminal():
    text, status = on_terminal(
        "--api", ENTRIES, "--method", "echo", "--user", "alice", "--param", "a=ä"
    )
    assert status == 0
    assert '\n    "a" : "ä",\n' in text
    assert json.loads(text)["data"]["a"] == "ä"


def test_ControlCharacters_DoNotReachATerminal():
    text, status = on_terminal(
        "--api", ENTRIES, "--method", "echo", "--user", "alice", "--param", "a=\x1b[31m\x7f\x9b5n"
    )
    assert status == 0
    assert not set(text) & {"\x1b", "\x7f", "\x9b"}
    assert json.loads(text)["data"]["a"] == "\x1b[31m\x7f\x9b5n"


@pytest.mark.parametrize(
    "arguments, code, meaning",
    [
        (("--api", "QELO.Test.Nowhere", "--method", "x"), 102, "no such API"),
        (("--api", ENTRIES, "--method", "x"), 103, "the API's version has no such method"),
        (
            ("--api", ENTRIES, "--method", "echo", "--version", "9"),
            104,
            "the API has no such version",
        ),
        (("--api", ENTRIES, "--method", "fail"), 400, "an error of the API's own"),
        (
            ("--api", "QELO.Test.Losing", "--method", "killed"),
            117,
            "the method could not be run or gave no answer",
        ),
    ],
)
def test_Error_FailsAndSaysWhatItMeans(arguments, code, meaning):
    process = run(*arguments, "--user", "alice")
    assert process.returncode == 1
    assert json.loads(process.stdout)["error"]["code"] == code
    assert process.stderr == f"webapi-exec: error {code}: {meaning}\n"


def test_AnswerThatCannotBePrinted_IsAFailure():
    with open("/dev/full", "w", encoding="ascii") as full:
        process = subprocess.run(
            [EXEC, "--api", ENTRIES, "--method", "echo", "--user", "alice"],
            stdout=full,
            stderr=subprocess.PIPE,
            check=False,
        )
    assert process.returncode == 1


def test_BundledAPI_Answers():
    assert "hostName" in data_of(call("QELO.Host.Info", "get", user="admin"))


# Parameters


@pytest.mark.parametrize(
    "text, value",
    [
        ("5", 5),
        ("-1.5", -1.5),
        ("true", True),
        ("null", None),
        ('"5"', "5"),
        ("[1,2]", [1, 2]),
        ('{"a":"b"}', {"a": "b"}),
        ("", ""),
        ("five", "five"),
        ("a=b&c=d%20+e", "a=b&c=d%20+e"),
        ("123456789012345678901234567890", "123456789012345678901234567890"),
        ("[1,", "[1,"),
    ],
)
def test_Param_IsReadLikeOnTheWire(text, value):
    assert data_of(call(ENTRIES, "echo", "--param", f"name={text}"))["name"] == value


def test_Param_NameMayHoldAnything():
    assert data_of(call(ENTRIES, "echo", "--param", "a&b%41 ä=1"))["a&b%41 ä"] == 1


def test_Json_GivesParameters_AndParamCountsBefore(tmp_path):
    file = tmp_path / "params.json"
    file.write_text('{"a": 1, "b": [1, 2], "method": "fail"}')
    for arguments in (("--json", file, "--param", "a=2"), ("--param", "a=2", "--json", file)):
        data = data_of(call(ENTRIES, "echo", *arguments))
        assert (data["a"], data["b"], data["method"]) == (2, [1, 2], "echo")


def test_Json_ComesFromStandardInput():
    assert data_of(call(ENTRIES, "echo", "--json", "-", text='{"a": "x"}'))["a"] == "x"


@pytest.mark.parametrize("text", ["", "{", "[1]", "5", '{"a": 1} x'])
def test_Json_ThatIsNoObject_IsWrongUse(tmp_path, text):
    file = tmp_path / "params.json"
    file.write_text(text)
    for arguments in (("--json", file), ("--json", "-")):
        process = call(ENTRIES, "echo", *arguments, text=text)
        assert (process.returncode, process.stdout) == (2, "")
        assert process.stderr.startswith("webapi-exec: ")


# What a method prints


def test_Output_GetsTheBodyAlone(tmp_path):
    file = tmp_path / "body"
    file.write_text("what was there before, and longer")
    arguments = ("--param", "body=first\r\n\r\nsecond", "--output", file)
    assert data_of(call(DOWNLOAD, "print", *arguments)) == "printed"
    assert file.read_bytes() == b"first\r\n\r\nsecond"


def test_Output_OfManyBytesIsWhole(tmp_path):
    file = tmp_path / "body"
    data_of(call(DOWNLOAD, "bytes", "--param", "size=3000000", "--output", file))
    assert file.read_bytes() == (bytes(range(256)) * 11719)[:3000000]


def test_Output_NotAskedFor_IsDropped():
    process = call(DOWNLOAD, "print", "--param", "body=text")
    assert process.stdout == '{"data":"printed","httpd_restart":false,"success":true}\n'


def test_Output_ThatCannotBeWritten_Fails(tmp_path):
    process = call(DOWNLOAD, "print", "--output", tmp_path / "no" / "body")
    assert (process.returncode, process.stdout) == (1, "")
    assert "No such file or directory" in process.stderr


@pytest.mark.parametrize("size", [10, 3000000])
def test_Output_OnAFullDisk_FailsAndKeepsTheAnswer(size):
    process = call(DOWNLOAD, "bytes", "--param", f"size={size}", "--output", "/dev/full")
    assert process.returncode == 1
    assert process.stderr == "webapi-exec: /dev/full: No space left on device\n"
    assert json.loads(process.stdout)["success"] is True


# Batches

CALLS = [
    {"api": ENTRIES, "version": 1, "method": "echo"},
    {"api": ENTRIES, "version": 1, "method": "fail", "code": 444},
    {"api": "QELO.Test.Losing", "version": 1, "method": "killed"},
    {"api": ENTRIES, "version": 2, "method": "process"},
    {"api": "\x1b[31m", "method": "x\ny"},
]


def table(*outcomes):
    rows = [
        ("#", "API", "VERSION", "METHOD", "RESULT"),
        ("1", ENTRIES, "1", "echo", outcomes[0]),
        ("2", ENTRIES, "1", "fail", outcomes[1]),
        ("3", "QELO.Test.Losing", "1", "killed", outcomes[2]),
        ("4", ENTRIES, "2", "process", outcomes[3]),
        ("5", " [31m", "-", "x y", outcomes[4]),
    ]
    return "".join(f"{a:1}  {b:17}  {c:7}  {d:7}  {e}\n" for a, b, c, d, e in rows)


def test_Batch_ShowsTheResultsInTheOrderOfTheCalls(tmp_path):
    file = tmp_path / "calls.json"
    file.write_text(json.dumps(CALLS))
    process = run("--batch", file, "--user", "alice")
    assert process.returncode == 1
    assert process.stdout == table(
        "ok",
        "error 444: an error of the API's own",
        "no answer",
        "ok",
        "error 102: no such API",
    )
    assert process.stderr == "webapi-exec: 3 of 5 calls failed\n"


def test_Batch_InParallel_AndFromStandardInput():
    process = run(
        "--batch", "-", "--user", "alice", "--param", "mode=parallel", text=json.dumps(CALLS)
    )
    assert process.stdout == table(
        "ok",
        "error 444: an error of the API's own",
        "error 117: the method could not be run or gave no answer",
        "ok",
        "error 102: no such API",
    )


def test_Batch_ThatStopsWhenACallFails(tmp_path):
    file = tmp_path / "calls.json"
    stopped = "error 112: not run, since a call before it failed"
    expected = table("ok", "error 444: an error of the API's own", stopped, stopped, stopped)
    for text, arguments in (
        (json.dumps(CALLS), ("--param", "stop_when_error=true")),
        (json.dumps({"compound": CALLS, "stop_when_error": True}), ()),
    ):
        file.write_text(text)
        assert run("--batch", file, "--user", "alice", *arguments).stdout == expected


def test_Batch_ThatAllSucceeds_IsASuccess(tmp_path):
    file = tmp_path / "calls.json"
    for calls in (CALLS[:1] * 3, []):
        file.write_text(json.dumps(calls))
        process = run("--batch", file, "--user", "alice")
        assert (process.returncode, process.stderr) == (0, "")
        assert len(process.stdout.splitlines()) == 1 + len(calls)


@pytest.mark.parametrize("text", ["", "{}", "5", '{"compound": {}}'])
def test_Batch_WithoutAList_IsWrongUse(text):
    process = run("--batch", "-", "--user", "alice", text=text)
    assert (process.returncode, process.stdout) == (2, "")
