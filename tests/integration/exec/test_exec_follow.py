"""webapi-exec --follow: progress of a background task, and its result."""

import json

import pytest

from conftest import needs_root
from exec_follow import counts, follow, following, shown, work  # noqa: F401
from exec_program import ENTRIES, EXEC, call, described, run  # noqa: F401
from accounts import account, reachable
from checksum import home, put  # noqa: F401  (home is a fixture)

pytestmark = pytest.mark.usefixtures("described", "following")


# On a terminal


def test_Bar_IsDrawnInPlaceAndEndsAt100Percent(work, follow):
    steps = work(
        counts(1, 4, current="photos/1.jpg", state="reading", seconds_left=125),
        counts(2, 4),
        counts(4, 4, answer="all"),
    )
    terminal = follow(*steps.arguments(), columns=100)
    terminal.wait_until(shown(25, "[####...", "1/4 files", "2:05 left", "reading", "photos/1.jpg"))
    steps.open(1)
    terminal.wait_until(shown(50, "2/4 files"))
    assert "photos" not in terminal.screen()[1]
    steps.open(2, 3)
    status, output = terminal.finish()
    answer = json.loads(output)
    assert (status, answer["success"], answer["data"]["answer"]) == (0, True, "all")
    assert set(answer) == {"success", "data"}
    assert output.count("\n") == 1, "one line, as in any pipe"
    task_line, bar, rest = terminal.screen()
    assert task_line.startswith("Task alice/")
    assert bar.startswith("100% [####") and "." not in bar.split("]")[0]
    assert rest == ""


def test_Bytes_ComeBeforeFiles_InUnitsForPeople(work, follow):
    size = {"done": 1536, "total": 3 << 30}
    terminal = follow(*work(counts(3, 4, bytes=size)).arguments())
    terminal.wait_until(shown(0, "0.0/3.0 GiB", "3/4 files"))


def test_Progress_MayBeAPercentage(work, follow):
    terminal = follow(*work({"data": {"progress": 42.9}}).arguments())
    terminal.wait_until(shown(42, "["))


def test_WorkWithoutNumbers_ShowsTheTimeThatPassed(work, follow):
    steps = work({"data": {"state": "thinking", "files": {"done": 0, "total": 0}}})
    terminal = follow(*steps.arguments())
    for passed in ("0:00", "0:01", "0:02"):
        terminal.wait_for(f"{passed}  thinking")
    assert "%" not in terminal.screen()[-1]
    steps.open()
    assert terminal.finish()[0] == 0
    assert terminal.screen()[1].startswith("100% [")


def test_Result_IsIndentedWhereItGoesToATerminal(work, follow):
    steps = work(counts(1, 1))
    steps.open()
    terminal = follow(*steps.arguments(), output=True)
    assert terminal.finish()[0] == 0
    text = "\n".join(terminal.screen()[2:])
    assert text.startswith("{\n") and json.loads(text)["data"]["files"]["done"] == 1


@pytest.mark.parametrize("columns", [20, 7, 2])
def test_NarrowTerminal_GetsLinesThatFit(work, follow, columns):
    steps = work(counts(1, 2, current="a/" * 500, state="s" * 500), counts(2, 2))
    terminal = follow(*steps.arguments(), columns=columns)
    terminal.wait_for("\x1b[K")
    steps.open()
    assert terminal.finish()[0] == 0
    drawn = terminal.printed.split("\r")[1:]
    bars = [line.replace("\x1b[K", "").rstrip("\n") for line in drawn if line.endswith("\x1b[K")]
    assert bars and all(len(bar) < columns for bar in bars)
    if columns == 20:
        assert " 50% [######......]" in bars


def test_Terminal_ThatBecomesNarrower_GetsShorterLines(work, follow):
    steps = work(counts(1, 2, current="x" * 300))
    terminal = follow(*steps.arguments(), columns=120)
    terminal.wait_until(lambda screen: len(screen[-1]) == 119)
    terminal.resize(40)
    end = len(terminal.printed)
    terminal.wait_until(
        lambda screen: any(line.endswith("\x1b[K") and len(line) < 40 + len("\x1b[K")
                           for line in terminal.printed[end:].split("\r"))
    )


def test_Name_WithEscapeCharacters_DoesNotReachTheTerminal(work, follow):
    name = "\x1b[2J\x07a\x9b31mb\u202ec\nd\x7f"
    steps = work(
        counts(1, 2, current=name, state=name, **{name: {"done": 1, "total": 2}}), counts(2, 2))
    terminal = follow(*steps.arguments(), columns=200)
    seen = "?[2J?a?31mb?c?d?"
    terminal.wait_until(shown(50, f"  1/2 {seen}  {seen}  {seen}"))
    steps.open()
    assert terminal.finish()[0] == 0
    assert not set(terminal.printed.replace("\x1b[K", "")) & set("\x1b\x07\x9b\u202e\x7f")


@pytest.mark.parametrize(
    "environment", [{"TERM": "dumb"}, {"NO_COLOR": "1"}, {"TERM": ""}], ids=str
)
def test_PlainTerminal_GetsLines(work, follow, environment):
    steps = work(counts(1, 2), counts(2, 2))
    terminal = follow(*steps.arguments(), **environment)
    terminal.wait_for(" 50% [")
    steps.open()
    assert terminal.finish()[0] == 0
    assert "\x1b" not in terminal.printed
    assert "\r" not in terminal.printed.replace("\r\n", "\n")
    assert terminal.screen()[-2].startswith("100% [")


# What cannot be followed


def test_MethodWithoutATask_IsAFailureWithItsAnswer():
    process = call(ENTRIES, "echo", "--follow")
    assert process.returncode == 1
    assert json.loads(process.stdout)["data"]["method"] == "echo"
    assert process.stderr == (
        "webapi-exec: --follow needs a method that starts a task; this one did not\n")


def test_StartThatFails_IsThatFailure():
    process = call(ENTRIES, "fail", "--follow")
    assert process.returncode == 1
    assert json.loads(process.stdout)["error"]["code"] == 400
    assert process.stderr == "webapi-exec: error 400: an error of the API's own\n"


@pytest.mark.parametrize("full_id, code", [
    ("alice/none", 508), ("bob/none", 503), ("none", 503), ("\x1b[31m/x", 503)])
def test_TaskThatIsNotThere_IsAFailure(full_id, code):
    process = run("--follow", "--user", "alice", "--task", full_id)
    assert (process.returncode, process.stdout) == (1, "")
    assert f"error {code}: " in process.stderr
    assert "\x1b" not in process.stderr


@needs_root
def test_OrdinaryUser_FollowsOwnTasks(home):  # noqa: F811
    if not reachable(EXEC):
        pytest.skip("the build tree cannot be read by others")
    put(home / "file", b"x")
    uid, gid = account("alice")
    process = run("--follow", "--user", "alice", "--api", "QELO.Work.Checksum", "--method", "start",
                  "--param", f"path={home}", cwd="/", user=uid, group=gid, extra_groups=[])
    assert (process.returncode, process.stderr) == (0, "")
    assert json.loads(process.stdout)["data"]["manifest"].endswith("  file\n")


def test_Checksum_IsFollowedToItsEnd(home, follow):  # noqa: F811
    for number in range(50):
        put(home / str(number), b"x" * number)
    terminal = follow("--user", "alice", "--api", "QELO.Work.Checksum", "--method", "start",
                      "--param", f"path={home}")
    status, output = terminal.finish()
    assert (status, len(json.loads(output)["data"]["manifest"].splitlines())) == (0, 50)
    assert terminal.screen()[-2].startswith("100% [")
    assert "50/50 files" in terminal.screen()[-2]
