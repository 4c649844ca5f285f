"""How files look."""

import re
import shutil
from collections import Counter

import pytest

from sources import SOURCE, cpp_files, files, name, run, scripts

MAX_LINES = {"product": 350, "tests": 400}
MAX_FILES = 25  # of one folder; past that it is two subjects
# What others include by its name, one header a public class, stays where it is.
MAX_FILES_OF = {"include/webapi": 32}


def test_Cpp_IsFormatted():
    names = [name(path) for path in cpp_files()]
    result = run("clang-format", "--dry-run", "--Werror", *names, cwd=SOURCE)
    assert sorted(set(re.findall(r"^(\S+?):\d+:\d+: error", result.stderr, re.MULTILINE))) == []
    assert result.returncode == 0, result.stderr[:4000]


def test_Scripts_PassShellcheck():
    assert scripts()
    result = run("shellcheck", "-x", *map(name, scripts()), cwd=SOURCE)
    assert result.returncode == 0, result.stdout


def test_TestModules_HaveNamesOfTheirOwn():
    # Two modules of one name cannot be collected together.
    names = Counter(path.name for path in (SOURCE / "tests").rglob("test_*.py"))
    assert [name for name, count in names.items() if count > 1] == []


def test_Files_AreShort():
    checked = cpp_files() + files("*.py", "*.cmake", "CMakeLists.txt") + scripts()
    long = []
    for path in checked:
        kind = "tests" if name(path).startswith("tests/") else "product"
        lines = len(path.read_text().splitlines())
        if lines > MAX_LINES[kind]:
            long.append(f"{name(path)}: {lines} lines")
    assert long == []


def test_Folders_HoldOneSubject():
    folders = Counter(name(path.parent) for path in files("*") if path.name != ".gitignore")
    assert {folder: count for folder, count in folders.items() if count > MAX_FILES_OF.get(folder, MAX_FILES)} == {}


def test_Headers_AreGuarded():
    unguarded = [name(path) for path in files("*.h") if "#pragma once" not in path.read_text()]
    assert unguarded == []


def test_Texts_NameNoPathOfADeveloper():
    """A path of the machine where something was written is wrong on every other."""
    foreign = re.compile(r"(?<![\w.}/])/(root|work|Users)/\w|/tmp/(build|brief)|/home/(?!admin|alice|bob)\w")
    found = []
    for path in files("*"):
        if path.name == "test_style.py":
            continue
        text = path.read_bytes().decode("utf-8", errors="replace")
        for number, line in enumerate(text.splitlines(), 1):
            if foreign.search(line):
                found.append(f"{name(path)}:{number}: {line.strip()}")
    assert found == []


def test_Texts_LeaveNothingForLater():
    found = []
    marks = re.compile(r"\b(TO" + r"DO|FIX" + r"ME|XX" + r"X)\b")
    for path in files("*.cpp", "*.h", "*.py", "*.md", "*.cmake", "CMakeLists.txt") + scripts():
        for number, line in enumerate(path.read_text().splitlines(), 1):
            if marks.search(line):
                found.append(f"{name(path)}:{number}: {line.strip()}")
    assert found == []


def test_Cpp_EndsLinesPlainly():
    found = [
        f"{name(path)}:{number}"
        for path in cpp_files()
        for number, line in enumerate(path.read_text().split("\n"), 1)
        if "\t" in line or line.endswith((" ", "\r"))
    ]
    assert found == []


def test_Commands_AreExecutable():
    commands = ["run", "test", ".ci/run", "packaging/setup", "packaging/private-root", "bench/run"]
    missing = [
        command
        for command in commands
        if not (SOURCE / command).stat().st_mode & 0o111
    ]
    assert missing == []


@pytest.mark.parametrize("tool", ["clang-format", "shellcheck"])
def test_Tools_AreInstalled(tool):
    assert shutil.which(tool)
