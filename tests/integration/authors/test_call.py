"""webapi call is webapi-exec by another name."""

import json

import pytest

from author_program import webapi
from exec_program import EXEC, run

CALL = ["--api", "QELO.Access.Session", "--method", "current", "--user", "alice"]


def test_Call_Answers(root):
    result = webapi("call", *CALL)
    assert result.returncode == 0, result
    assert json.loads(result.stdout)["data"]["user"] == "alice"


@pytest.mark.parametrize("arguments", [
    [], ["--help"], ["--list"], ["--wrong"], ["word"], ["--api", "QELO.No.Such", "--method", "x", "--user", "alice"],
    ["--list", "--api", "QELO.No.Such"], ["--follow", *CALL],
], ids=" ".join)
def test_Call_IsTheSameProgram_ButForItsName(root, arguments):
    call, own = webapi("call", *arguments), run(*arguments)
    assert call.returncode == own.returncode
    for one, other in ((call.stdout, own.stdout), (call.stderr, own.stderr)):
        assert one == other.replace(f"{EXEC}: ", "webapi call: ").replace("webapi-exec", "webapi call")
    assert "webapi-exec" not in call.stdout + call.stderr
