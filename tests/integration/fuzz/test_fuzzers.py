"""Each fuzzer for a few seconds, from its corpus on."""

import re
import subprocess

import pytest

from conftest import BUILD
from webserver import SOURCE

FUZZERS = sorted(path.name for path in (SOURCE / "fuzz" / "corpus").iterdir())


@pytest.mark.parametrize("name", FUZZERS)
def test_Fuzzer_FindsNothing(name, tmp_path):
    result = subprocess.run(
        [BUILD / "fuzz" / f"fuzz_{name}", "--seconds", "3", SOURCE / "fuzz" / "corpus" / name],
        capture_output=True, text=True, timeout=120, cwd=tmp_path, check=False)
    assert result.returncode == 0, result.stderr[-4000:]
    runs, inputs, places = map(int, re.fullmatch(
        r"(\d+) runs, (\d+) inputs, (\d+) places\n", result.stdout).groups())
    corpus = len(list((SOURCE / "fuzz" / "corpus" / name).iterdir()))
    assert runs > corpus
    assert inputs > corpus / 2, "the corpus reaches new code"
    assert places > 300
