"""Each test plugin says at its head what it stands for and which tests use it, and they do."""

import re

import pytest

from sources import files, name

PLUGINS = files("tests/plugins/**/*.cpp")


def head_of(path):
    return re.match(r"(?://[^\n]*\n)*", path.read_text()).group()


@pytest.mark.parametrize("path", PLUGINS, ids=name)
def test_Plugin_NamesItsTests(path):
    tests = re.search(r"^// Tests: (.+)$", head_of(path), re.MULTILINE)
    assert tests, "the head ends with // Tests: the files that use it"
    for test in tests.group(1).split(", "):
        use = re.compile(rf'["/]{path.stem}(\.so)?"')
        assert any(use.search(found.read_text()) for found in files(f"tests/**/{test}")), (
            f"{test} does not use {path.stem}")


def test_Plugins_SayEachInItsOwnWords():
    first = [head_of(path).split("\n", 1)[0][:30] for path in PLUGINS]
    assert len(first) > 1
    assert sorted({words for words in first if first.count(words) > 1}) == []
