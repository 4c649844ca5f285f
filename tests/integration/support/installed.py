"""A build for the host itself, installed below a directory, and the steps of guides."""

import os
import re
import subprocess
import textwrap

import pytest

from conftest import BUILD, SOURCE

# Nothing that the guide does reaches the host: each directory is laid over with an empty one.
OVERLAYS = """
set -e
mount -t tmpfs none {work}
for name in usr etc var run; do
  mkdir {work}/$name.upper {work}/$name.work
  mount -t overlay overlay /$name \\
    -o lowerdir=/$name,upperdir={work}/$name.upper,workdir={work}/$name.work
done
"""


def run(*command, **options):
    result = subprocess.run(
        [str(word) for word in command], capture_output=True, text=True, check=False, **options
    )
    assert result.returncode == 0, result.stdout[-4000:] + result.stderr[-4000:]
    return result.stdout


@pytest.fixture(scope="module")
def stage(tmp_path_factory):
    """A build for the host itself, installed below a directory that stands for its root."""
    build = BUILD / "host"
    run("cmake", "-S", SOURCE, "-B", build, "-DCMAKE_BUILD_TYPE=Debug",
        "-DCMAKE_INSTALL_PREFIX=/usr/local")
    run("cmake", "--build", build, "-j", os.cpu_count())
    stage = tmp_path_factory.mktemp("stage")
    run("cmake", "--install", build, env={**os.environ, "DESTDIR": str(stage)})
    return stage


@pytest.fixture(scope="module")
def prefix(stage):
    return stage / "usr" / "local"


def step(guide, name):
    found = re.search(rf"<!-- test: {name} -->\n *```\w*\n(.*?)```", guide, re.DOTALL)
    return textwrap.dedent(found[1]).replace("build/host", str(BUILD / "host"))
