"""What a request may hold, and what it may cost: far beyond what a person sends, and one beyond the
limit."""

import json
import subprocess
from urllib.parse import urlencode

import pytest

from conftest import BUILD, ENTRY, answer_of, run_entry

OPEN = "api=QELO.Test.Open&version=1&method=plain"
MOST_VALUES = 50_000
MOST_PARAMETERS = 10_000
LONGEST_CREDENTIAL = 4_096
LONGEST_NAME = 1 << 20
MIB = 1024  # KiB


def code_of(answer):
    return 0 if answer["success"] else answer["error"]["code"]


def zeros(count):
    return f"[{','.join(['0'] * count)}]"


@pytest.fixture
def logged(tmp_path):
    """Runs entry.cgi with parameters in a body: its answer, and the lines that it logs."""

    def run(**parameters):
        log = tmp_path / "log"
        log.unlink(missing_ok=True)
        body = urlencode({"version": 1, "method": "get", **parameters}).encode()
        output = run_entry(
            body=body,
            LD_PRELOAD=str(BUILD / "tests" / "integration" / "log_file.so"),
            ASAN_OPTIONS="verify_asan_link_order=0",
            LOG_FILE=str(log),
        )
        return answer_of(output), log.read_text().splitlines() if log.exists() else []

    return run


def preloaded(*libraries):
    return " ".join(str(BUILD / "tests" / "integration" / f"{name}.so") for name in libraries)


def test_NoMemoryToBeginWith_IsLogged(tmp_path, root):
    log = tmp_path / "log"
    process = subprocess.run(
        [ENTRY],
        input=b"",
        env={
            "REQUEST_METHOD": "GET",
            "QUERY_STRING": OPEN,
            "LD_PRELOAD": preloaded("starving", "log_file"),
            "LOG_FILE": str(log),
        },
        capture_output=True,
        timeout=30,
        check=False,
    )
    assert (process.returncode, process.stdout) == (1, b"")
    (line,) = log.read_text().splitlines()
    assert line.startswith("main.cpp:") and line.endswith(" std::bad_alloc")


def test_LibraryThatNeedsMoreThanARequest_IsGivenIt(describe):
    describe("QELO.Test.Call", "greedy.so")
    call = {"api": "QELO.Test.Call", "version": 1, "method": "run"}
    alone = answer_of(run_entry(urlencode(call)))
    assert alone == {"data": True, "success": True}
    compound = {"api": "QELO.Entry.Request", "version": 1, "method": "request",
                "compound": json.dumps([call])}
    answer = answer_of(run_entry(urlencode(compound)))
    assert answer["data"]["result"] == [{**call, **alone}]


def test_ApiNameOfAMegabyte_LeavesAShortLogLine(logged):
    answer, lines = logged(api="A" * (1 << 20))
    assert code_of(answer) == 102
    (line,) = [line for line in lines if "WebAPI AAA" in line]
    assert line.endswith(f"{'A' * 256}... (1048576 bytes) is not valid")
    assert max(map(len, lines)) < 512


@pytest.mark.parametrize("name", ["api", "method"])
def test_NameBeyondAMebibyte_IsRefusedUnread(logged, name):
    names = {"api": "QELO.Test.Open", "method": "plain", name: "A" * (LONGEST_NAME + 1)}
    answer, lines = logged(**names)
    assert (code_of(answer), lines) == (101, [])


def test_ApiNameWithLineBreaks_StaysOneLogLine(logged):
    answer, lines = logged(api="A\nentry.cgi: all is well\r\0\x1b[2J")
    assert code_of(answer) == 102
    assert [line for line in lines if "all is well" in line] == [
        line for line in lines if "A?entry.cgi: all is well" in line
    ]


@pytest.mark.parametrize("name", ["api", "method", "account", "_sid", "tid", "task_id", "a"])
def test_TextOfAMegabyte_LeavesShortLogLines(logged, root, name):
    _, lines = logged(**{"api": "QELO.Access.Session", "method": "login", name: "x" * (1 << 20)})
    assert max(map(len, lines), default=0) < 512


@pytest.mark.parametrize("count", [LONGEST_CREDENTIAL, LONGEST_CREDENTIAL + 1, 1_000_000])
def test_Credentials_AreLimited(client, count):
    for name in ("_sid", "tid", "_sharing_id", "_sharing_sid"):
        answer = client.post(f"{OPEN}&{name}={'x' * count}")
        assert (answer.code == 101) == (count > LONGEST_CREDENTIAL), name


@pytest.mark.parametrize("count, code", [(MOST_VALUES - 5, 0), (MOST_VALUES, 101), (2_000_000, 101)])
def test_Values_AreLimited(client, count, code):
    assert client.post(f"{OPEN}&a={zeros(count)}").code == code


def test_Values_OfSeveralParametersCountTogether(client):
    half = zeros(MOST_VALUES // 2)
    assert client.post(f"{OPEN}&a={half}").code == 0
    assert client.post(f"{OPEN}&a={half}&b={half}").code == 101


@pytest.mark.parametrize("count, code", [(20_000, 0), (MOST_VALUES, 101)])
def test_Values_OfAQueryAreLimited(root, count, code):
    assert code_of(answer_of(run_entry(f"{OPEN}&a={zeros(count)}"))) == code


@pytest.mark.parametrize("count, code", [(MOST_PARAMETERS - 3, 0), (MOST_PARAMETERS, 101)])
def test_Parameters_AreLimited(client, count, code):
    assert client.post(OPEN + "&a=1" * count).code == code


def test_Texts_AreLimitedByTheBodyAlone(client):
    text = "[0," * 1_000_000
    assert client.post(f"{OPEN}&a={text}").data["parameters"]["a"] == text
    quoted = '"' + "0,[]{}" * 100_000 + '"'
    assert client.post(f"{OPEN}&a={quoted}").data["parameters"]["a"] == quoted[1:-1]


def test_HostileBodies_CostFourTimesTheirSizeAndTwentyMebibytes(root, tmp_path):
    program = BUILD / "tests" / "integration" / "intake_peak"
    output = subprocess.run(
        [program, ENTRY, tmp_path], capture_output=True, text=True, timeout=600, check=True
    ).stdout
    rows = [line.split() for line in output.splitlines()]
    assert len(rows) > 30
    assert [
        f"{name}: {size} KiB take {peak} KiB"
        for name, size, peak, _ in rows
        if int(peak) > 4 * int(size) + 20 * MIB
    ] == []
    codes = {name: int(code) for name, _, _, code in rows}
    assert [name for name, code in codes.items() if code <= 0] == [], "an answer, and no success"
    for name in ("zeros", "empty-arrays", "empty-objects", "encoded-arrays", "parameters", "compound"):
        assert codes[name] == 101, name
