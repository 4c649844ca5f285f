"""Manual pages and completion know what the programs know."""

import re
import shutil
import subprocess

import pytest

from conftest import BUILD, SOURCE

MANUALS = SOURCE / "packaging" / "man"
COMMANDS = ("check", "diff", "doctor", "new")
ASKED = {
    "webapi.1": [["webapi", command, "--help"] for command in COMMANDS],
    "webapi-exec.1": [["webapi-exec", "--help"]],
    "webapi-token.8": [["webapi-token", "--help"]],
    "qeloapid.8": [["qeloapid", "--help"]],
    "webapi-server.8": [["webapi-server", "--help"]],
}


def told(program, *arguments):
    result = subprocess.run([BUILD / "programs" / program, *arguments], capture_output=True, text=True,
                            timeout=30, check=False)
    return result.stdout + result.stderr


def completed(root, *words):
    script = f"""
        . {SOURCE}/packaging/completion/webapi-exec.bash
        . {SOURCE}/packaging/completion/webapi.bash
        COMP_WORDS=("$@") COMP_CWORD=$(($# - 1))
        _webapi
        printf '%s\\n' "${{COMPREPLY[@]}}"
    """
    result = subprocess.run(["bash", "-c", script, "bash", BUILD / "programs" / "webapi", *words],
                            capture_output=True, text=True, check=True)
    assert result.stderr == ""
    return result.stdout.split()


@pytest.mark.parametrize("manual", ASKED)
def test_Manual_HasEveryOption(manual):
    text = (MANUALS / manual).read_text()
    options = {option for words in ASKED[manual] for option in re.findall(r"--([a-z][a-z-]*)", told(*words))}
    options -= {"help"}
    assert options
    assert [option for option in sorted(options) if f"Fl -{option}" not in text] == []


def test_Manuals_AreThoseOfAllPrograms():
    assert {file.name for file in MANUALS.iterdir()} == set(ASKED)


@pytest.mark.skipif(shutil.which("groff") is None, reason="groff is not installed")
@pytest.mark.parametrize("manual", ASKED)
def test_Manual_IsGoodMdoc(manual):
    result = subprocess.run(["groff", "-mdoc", "-Tascii", "-ww", MANUALS / manual], capture_output=True, text=True, check=True)
    assert result.stderr == ""
    title, section = manual.rsplit(".", 1)
    assert f"{title.upper()}({section})" in result.stdout


def test_Completion_OfCommandsAndOptions(root, tmp_path):
    assert completed(root, "") == ["call", "check", "diff", "doctor", "new", "--help"]
    assert completed(root, "d") == ["diff", "doctor"]
    for command in COMMANDS:
        options = set(re.findall(r"--[a-z-]+", told("webapi", command, "--help")))
        assert set(completed(root, command, "--")) == options | {"--help"}
    (tmp_path / "some.lib").touch()
    assert completed(root, "check", f"{tmp_path}/so") == [f"{tmp_path}/some.lib"]


def test_Completion_OfCalls_AsOfTheOtherName(root):
    assert "--follow" in completed(root, "call", "--f")
    assert "QELO.Host.Info" in completed(root, "call", "--api", "QELO.Host")
    assert completed(root, "call", "--api", "QELO.Host.Info", "--method", "") == ["get"]
